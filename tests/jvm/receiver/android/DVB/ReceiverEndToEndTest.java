package android.DVB;

import static org.junit.jupiter.api.Assertions.*;

import java.awt.image.BufferedImage;
import java.io.*;
import java.lang.management.ManagementFactory;
import java.nio.*;
import java.nio.charset.StandardCharsets;
import java.util.*;
import javax.imageio.ImageIO;
import org.junit.jupiter.api.*;

/**
 * The API against the emulated receiver and its built-in broadcast, on a clock that starts at
 * 2024-03-01T20:00:00Z and runs 20 times faster than real time: start-up, a scan, a service
 * played with its status, components and events, subtitles and teletext, in one sequence, with
 * the listener's events in their order.
 */
@TestMethodOrder(MethodOrderer.OrderAnnotation.class)
class ReceiverEndToEndTest {
    static final DVB dvb = new DVB();
    static final List<List<Integer>> events = Collections.synchronizedList(new ArrayList<>());
    static final Map<Integer, Integer> seen = new HashMap<>(); // events of each code taken
    static final File EPG_DB = new File(System.getProperty("dvb.epgdb"));
    static long stream;
    static Scnm.SCNM_ServiceInfo kanalEins;
    static final List<String> scanned = new ArrayList<>(); // "onid:tsid:sid" of each service found

    static {
        dvb.setOnEventListener((d, msg, e1, e2, obj) -> events.add(List.of(msg, e1, e2)));
    }

    @AfterAll
    static void release() {
        dvb.release();
    }

    /** The next event of code `msg` not taken yet, in the order they came; fails after 20 s. */
    static List<Integer> next(int msg) throws InterruptedException {
        int skip = seen.getOrDefault(msg, 0);
        for (long end = System.currentTimeMillis() + 20000; System.currentTimeMillis() < end; Thread.sleep(10)) {
            List<List<Integer>> of = new ArrayList<>();
            synchronized (events) {
                for (List<Integer> e : events) if (e.get(0) == msg) of.add(e);
            }
            if (of.size() > skip) {
                seen.put(msg, skip + 1);
                return of.get(skip);
            }
        }
        throw new AssertionError("no event " + msg);
    }

    @Test
    @Order(1)
    void startUpCreatesTheEventDatabase() throws InterruptedException {
        for (String end : new String[] {"", "-wal", "-shm"}) new File(EPG_DB + end).delete();
        assertEquals(0, dvb.getScnm().Dvb_SystemInit(new Scnm.DVB_Config()));
        assertTrue(EPG_DB.exists());
        assertEquals(List.of(230, 0, 0), next(230));
    }

    @Test
    @Order(2)
    void aNetworkScanFindsEveryServiceOfTheTerrestrialNetwork() throws InterruptedException {
        Scnm scnm = dvb.getScnm();
        long scan = scnm.Scnm_Open(new Scnm.SCNM_OpenSettings());
        Scnm.SCNM_StartSettings s = new Scnm.SCNM_StartSettings();
        s.type = 2;
        s.frequency = 506000;
        s.bandwidth = 8000;
        s.scanType = 1;
        assertEquals(0, scnm.Scnm_Start(scan, s));
        assertEquals((int) scan, next(201).get(1));
        List<Integer> progress;
        synchronized (events) {
            progress = events.stream().filter(e -> e.get(0) == 200).map(e -> e.get(2)).toList();
        }
        assertEquals(progress.stream().sorted().toList(), progress, "progress only grows");
        assertEquals(100, progress.get(progress.size() - 1));
        Scnm.SCNM_GetStatus st = new Scnm.SCNM_GetStatus();
        scnm.Scnm_GetStatus(scan, st);
        assertEquals(List.of(2, 100), List.of(st.result, st.sfStatus));
        Map<Long, String> found = new TreeMap<>();
        for (int i = 0, n = scnm.Scnm_CreateServiceList(scan); i < n; i++) {
            Scnm.SCNM_ServiceInfo info = new Scnm.SCNM_ServiceInfo();
            scnm.Scnm_GetServiceList(i, info);
            found.put(info.lcn, new String(info.svcName, StandardCharsets.ISO_8859_1));
            if (info.lcn == 1) kanalEins = info;
            scanned.add(info.onId + ":" + info.tsId + ":" + info.svcId);
        }
        // Table 00 names: "Straßenfeger" holds ISO 6937's 0xFB for the sharp s.
        assertEquals(Map.of(1L, "Kanal Eins", 3L, "Regional Berlin-Brandenburg", 4L, "Nachrichten 24",
                5L, "Sport Direkt", 6L, "Kultur Kanal", 7L, "Stra\u00FBenfeger Radio"), found);
        assertEquals(3, scnm.Scnm_CreateNetworkList(scan));
        assertEquals(0, scnm.Scnm_Close(scan));
    }

    @Test
    @Order(3)
    void aServicePlaysWithItsStatusComponentsAndEvents() throws InterruptedException {
        Strm strm = dvb.getStrm();
        stream = EndToEnd.play(strm, kanalEins, "deu", "eng", 506000);
        Strm.STRM_GetStatus a = new Strm.STRM_GetStatus(), b = new Strm.STRM_GetStatus();
        for (int i = 0; i < 500 && (a.feStatus & 0x10) == 0; i++, Thread.sleep(10)) strm.Strm_GetStatus(stream, a);
        Thread.sleep(100);
        strm.Strm_GetStatus(stream, b);
        assertEquals(0x1F, b.feStatus & 0x1F);
        assertEquals(List.of(25, 0, 1), List.of(b.fpsInteger, b.fpsDecimal, b.pictureStatus));
        assertTrue(Integer.compareUnsigned(b.localPts, a.localPts) > 0, "PTS advances");

        Strm.STRM_StreamInfo info = new Strm.STRM_StreamInfo();
        strm.Strm_CreatStreamInfo(stream, info);
        assertEquals(List.of(1, 3, 1, 2), List.of(info.videoCount, info.audioCount, info.subtitleCount,
                info.teletextCount));
        Strm.AudioContent ac3 = new Strm.AudioContent();
        strm.Strm_GetAudioStreamInfo(2, ac3);
        assertEquals(List.of(1, "deu"), List.of(ac3.isDolbyAC3, ac3.langCode0));

        Strm.EpgEvent now = new Strm.EpgEvent(), following = new Strm.EpgEvent();
        Strm.ExtEpgEvent nowExt = new Strm.ExtEpgEvent();
        strm.Strm_GetAllEvent(stream, now, following, nowExt, new Strm.ExtEpgEvent());
        long clock = strm.Strm_GetTime(stream, 0);
        assertTrue(now.startTime <= clock && clock < (long) now.startTime + now.duration, "now runs");
        assertEquals((long) now.startTime + now.duration, following.startTime, "next follows");
        assertEquals(List.of(220, (int) stream, now.evtId), next(220));
        assertTrue(nowExt.itemCount > 0 && now.name.length > 0);

        // The event database: the service's week stored, then walked from now on.
        Strm.EpgSvc epg = EndToEnd.epg(kanalEins);
        assertEquals(0, strm.EpgMd_ClearService());
        assertEquals(0, strm.EpgMd_AddService(epg));
        assertEquals(kanalEins.svcId, (int) next(260).get(1));
        Strm.EpgEvent db = new Strm.EpgEvent();
        for (Strm.EpgEvent want : List.of(now, following)) {
            assertEquals(0, strm.EPG_GetEvent(stream, epg, db, new Strm.ExtEpgEvent()));
            assertEquals(List.of(want.evtId, want.startTime, want.duration), List.of(db.evtId, db.startTime, db.duration));
            assertArrayEquals(want.name, db.name);
        }
    }

    @Test
    @Order(4)
    void subtitlesAndTeletextOfThePlayingService() throws Exception {
        Strm.SubtitleContent sc = new Strm.SubtitleContent();
        dvb.getStrm().Strm_GetSubTilteStreamInfo(0, sc);
        Subttl sub = dvb.getSubttl();
        // A dump of the transponder runs meanwhile, for ffmpeg to render its subtitles.
        File dump = new File(EPG_DB.getParent(), "e2e-dump.ts");
        assertEquals(0, dvb.getCfg().Cfg_TSDumpStart(0, 0, 0, dump.getPath()));
        long decoder = EndToEnd.start(sub, sc, stream);
        next(240); // the display set on the air at the start, sent before the dump began
        while (next(240).get(2) == 0) continue;
        Subttl.SUBTTL_Data_t data = new Subttl.SUBTTL_Data_t();
        assertEquals(0, sub.Subttl_GetData(decoder, data));
        assertTrue(data.numRegions > 0 && data.numCluts > 0);
        BufferedImage shown = dvbdemo.DisplaySetImage.compose(sub, data);
        Thread.sleep(200);
        assertEquals(0, dvb.getCfg().Cfg_TSDumpStop());
        List<Integer> differing = ffmpegFrames(dump, sc.pid).stream().map(f -> EndToEnd.differing(f, shown)).toList();
        assertTrue(differing.isEmpty() || differing.contains(0), "ffmpeg renders what the readers give: " + differing);
        Subttl.SUBTTL_Region_t region = new Subttl.SUBTTL_Region_t();
        sub.Subttl_GetRegionData(0, region);
        assertEquals(region.i_width * region.i_height, region.p_pixbuf.length);
        Subttl.SUBTTL_Clut clut = new Subttl.SUBTTL_Clut();
        sub.Subttl_GetClutData(0, clut);
        int[] table = region.i_depth == 1 ? clut.c_2b : region.i_depth == 2 ? clut.c_4b : clut.c_8b;
        Set<Integer> alphas = new TreeSet<>();
        for (byte p : region.p_pixbuf) alphas.add(table[p & 0xFF] >>> 24);
        assertTrue(alphas.contains(255) && alphas.size() > 2, "opaque text, anti-aliased: " + alphas);
        assertEquals(0, sub.Subttl_Stop(decoder));

        Strm.TeletextContent tc = new Strm.TeletextContent();
        dvb.getStrm().Strm_GetTeleTextStreamInfo(0, tc);
        Teltxt ttx = dvb.getTeltxt();
        Teltxt.TELTXT_Settings t = new Teltxt.TELTXT_Settings();
        t.pid = tc.pid;
        t.langCode = tc.langCode;
        t.streamName = "";
        long page = ttx.Teltxt_Start(t);
        Teltxt.TELTXT_NavPages nav = new Teltxt.TELTXT_NavPages();
        assertEquals(0, ttx.Teltxt_SetData(page, 0x100, 0, nav));
        byte[] image = new byte[8032];
        ttx.Teltxt_GetData(page, 0, image.length, image);
        ByteBuffer b = ByteBuffer.wrap(image).order(ByteOrder.LITTLE_ENDIAN);
        StringBuilder header = new StringBuilder();
        for (int col = 0; col < 8; col++) header.appendCodePoint(b.getInt(32 + col * 8));
        assertEquals(List.of(0x100, 1, " P100   "), List.of((int) b.getShort(0), (int) image[7], header.toString()));
        assertEquals(0, ttx.Teltxt_Stop(page));
        assertEquals(0, dvb.getStrm().Strm_Close(stream));
    }

    @Test
    @Order(5)
    void aStoreKilledMidwayLeavesADatabaseThatOpensWithWhatItCommitted() throws Exception {
        File db = new File(EPG_DB.getParent(), "killed-epg.db");
        for (String end : new String[] {"", "-wal", "-shm"}) new File(db + end).delete();
        Process fill = child(db, "fill", scanned);
        BufferedReader out = fill.inputReader(StandardCharsets.UTF_8);
        assertEquals("open 0", out.readLine());
        String stored = out.readLine();
        fill.destroyForcibly().waitFor();
        assertTrue(stored.startsWith("stored "), stored);
        String sid = stored.substring(7);
        // SQLite's own tool reads the file that the killed process left.
        Process sqlite = new ProcessBuilder("sqlite3", db.getPath(), "PRAGMA integrity_check",
                "SELECT count(*) > 100 FROM event WHERE sid = " + sid).start();
        assertEquals(List.of("ok", "1"), lines(sqlite));
        String service = scanned.stream().filter(s -> s.endsWith(":" + sid)).findFirst().get();
        List<String> reopened = lines(child(db, "open", List.of(service)));
        assertEquals("open 0", reopened.get(0));
        assertTrue(reopened.get(1).matches("event 0 [1-9][0-9]* [1-9][0-9]*"), reopened.toString());
    }

    /**
     * ffmpeg's rendering of subtitle PID `pid` of transport stream `ts`, a frame per display set;
     * none where ffmpeg is not installed (the 32-bit build has none).
     */
    static List<BufferedImage> ffmpegFrames(File ts, int pid) throws Exception {
        File dir = new File(ts.getParent(), "e2e-frames");
        List<BufferedImage> frames = new ArrayList<>();
        if (dir.exists()) for (File f : dir.listFiles()) f.delete();
        dir.mkdirs();
        try {
            String sub = new File(dir, "sub.ts").getPath();
            assertEquals(0, new ProcessBuilder("ffmpeg", "-nostdin", "-loglevel", "error", "-y", "-i", ts.getPath(),
                    "-map", "0:i:" + pid, "-c", "copy", "-f", "mpegts", sub).inheritIO().start().waitFor());
            assertEquals(0, new ProcessBuilder("ffmpeg", "-nostdin", "-loglevel", "error", "-y", "-i", sub,
                    "-filter_complex", "[0:0]showinfo[s]", "-map", "[s]", "-fps_mode", "passthrough",
                    new File(dir, "f%03d.png").getPath()).inheritIO().start().waitFor());
        } catch (IOException noFfmpeg) {
            return frames;
        }
        for (File f : new TreeSet<>(List.of(dir.listFiles((d, name) -> name.endsWith(".png"))))) frames.add(ImageIO.read(f));
        assertFalse(frames.isEmpty(), "ffmpeg rendered no frame");
        return frames;
    }

    /** A JVM with this one's options on event database `db`, running ReceiverChild. */
    static Process child(File db, String mode, List<String> services) throws IOException {
        List<String> cmd = new ArrayList<>();
        cmd.add(System.getProperty("java.home") + "/bin/java");
        cmd.addAll(ManagementFactory.getRuntimeMXBean().getInputArguments());
        cmd.addAll(List.of("-cp", jarOf(DVB.class) + File.pathSeparator + jarOf(ReceiverChild.class),
                ReceiverChild.class.getName(), mode));
        cmd.addAll(services);
        ProcessBuilder pb = new ProcessBuilder(cmd).redirectError(ProcessBuilder.Redirect.INHERIT);
        pb.environment().put("DVB_EPG_DB", db.getPath());
        return pb.start();
    }

    static String jarOf(Class<?> c) {
        return new File(c.getProtectionDomain().getCodeSource().getLocation().getPath()).getPath();
    }

    static List<String> lines(Process p) throws Exception {
        List<String> all = p.inputReader(StandardCharsets.UTF_8).lines().toList();
        assertEquals(0, p.waitFor());
        return all;
    }
}
