package android.DVB;

import static org.junit.jupiter.api.Assertions.*;
import static org.junit.jupiter.api.Assumptions.assumeTrue;

import java.awt.image.BufferedImage;
import java.io.File;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.time.Instant;
import java.util.*;
import java.util.regex.*;
import javax.imageio.ImageIO;
import org.junit.jupiter.api.*;

/**
 * The API against the receiver playing real captures (DVB_BROADCAST names captures.txt beside
 * this folder), checked against the truth files made by independent decoders (libdvbpsi,
 * iconv, ffmpeg): the services that a full-band scan finds, the events of the French
 * multiplex from present/following and from the event database, and the Canal+ subtitle
 * display set composed from the readers against ffmpeg's rendering, pixel for pixel.
 */
@TestMethodOrder(MethodOrderer.OrderAnnotation.class)
class CaptureEndToEndTest {
    static final File TESTDATA = new File(System.getProperty("dvb.testdata"));
    static final DVB dvb = new DVB();
    static final List<int[]> events = Collections.synchronizedList(new ArrayList<>());
    static final Map<Integer, Scnm.SCNM_ServiceInfo> found = new TreeMap<>();
    static final List<Scnm.SCNMNET_FrontEndSettings> transponders = new ArrayList<>();

    static {
        dvb.setOnEventListener((d, msg, e1, e2, obj) -> events.add(new int[] {msg, e1, e2}));
    }

    @BeforeAll
    static void captures() {
        assumeTrue(TESTDATA.isDirectory(), "no captures at " + TESTDATA + ": skipped");
    }

    @AfterAll
    static void release() {
        dvb.release();
    }

    /** A truth file on one line, as {"key": value, ...}, for the patterns below. */
    static String truth(String capture) throws Exception {
        return new String(Files.readAllBytes(new File(TESTDATA, "truth/" + capture + ".json").toPath()),
                StandardCharsets.UTF_8).replaceAll(",\\s*\n\\s*", ", ").replaceAll("([\\[{])\\s*\n\\s*", "$1")
                .replaceAll("\\s*\n\\s*([\\]}])", "$1");
    }

    static String hex(byte[] b) {
        StringBuilder s = new StringBuilder();
        for (int i = 0; i < b.length && b[i] != 0; i++) s.append(String.format("%02x", b[i] & 0xFF));
        return s.toString();
    }

    @Test
    @Order(1)
    void aFullBandScanFindsTheServicesOfEveryCapture() throws Exception {
        Scnm scnm = dvb.getScnm();
        String db = System.getProperty("dvb.epgdb");
        for (String end : new String[] {"", "-wal", "-shm"}) new File(db + end).delete();
        assertEquals(0, scnm.Dvb_SystemInit(new Scnm.DVB_Config()));
        long scan = scnm.Scnm_Open(new Scnm.SCNM_OpenSettings());
        Scnm.SCNM_StartSettings band = new Scnm.SCNM_StartSettings();
        band.type = 2;
        band.bandwidth = 8000;
        band.scanType = 2;
        assertEquals(0, scnm.Scnm_Start(scan, band));
        Scnm.SCNM_GetStatus st = new Scnm.SCNM_GetStatus();
        for (int i = 0; i < 3000 && st.result != 2; i++, Thread.sleep(10)) scnm.Scnm_GetStatus(scan, st);
        for (int i = 0, n = scnm.Scnm_CreateServiceList(scan); i < n; i++) {
            Scnm.SCNM_ServiceInfo info = new Scnm.SCNM_ServiceInfo();
            scnm.Scnm_GetServiceList(i, info);
            found.put(info.onId << 16 | info.svcId, info);
        }
        for (int i = 0, n = scnm.Scnm_CreateNetworkList(scan); i < n; i++) {
            Scnm.SCNMNET_FrontEndSettings t = new Scnm.SCNMNET_FrontEndSettings();
            scnm.Scnm_GetNetworkList(i, t);
            transponders.add(t);
        }
        scnm.Scnm_Close(scan);
        // The French multiplex's own services: type, name bytes as broadcast, LCN.
        Matcher m = Pattern.compile("\\{\"sid\": (\\d+), [^{]*?\"service_type\": (\\d+), [^{]*?\"name_hex\": \"(\\w*)\""
                + "[^{]*?\"lcn\": \\{\"sid\": \\d+, \"visible\": \\d, \"lcn\": (\\d+)\\}").matcher(truth("fr-dvbt-multiplex-si"));
        int actual = 0;
        for (; m.find(); actual++) {
            Scnm.SCNM_ServiceInfo info = found.get(8442 << 16 | Integer.parseInt(m.group(1)));
            assertNotNull(info, "service " + m.group(1));
            assertEquals(List.of(m.group(2), m.group(3), m.group(4)),
                    List.of("" + info.svcType, hex(info.svcName), "" + info.lcn));
        }
        assertEquals(5, actual);
        // The other captures' services, by the name bytes their SDT broadcast (the damaged one's
        // onid reads 0).
        for (String capture : new String[] {"dvbsub-canalplus-cinema", "damaged-subtitles-teletext"}) {
            Matcher s = Pattern.compile("\\{\"sid\": (\\d+), [^{]*?\"name_hex\": \"(\\w*)\"")
                    .matcher(truth(capture).substring(truth(capture).indexOf("\"services_summary\"")));
            assertTrue(s.find(), capture);
            int sid = Integer.parseInt(s.group(1));
            assertTrue(found.values().stream().anyMatch(i -> i.svcId == sid && hex(i.svcName).equals(s.group(2))),
                    capture + " service " + sid);
        }
    }

    static String firstGroup(String text, String regex) {
        Matcher m = Pattern.compile(regex).matcher(text);
        assertTrue(m.find(), regex);
        return m.group(1);
    }

    /** Starts service `key` of the scan on the transponder that carries it. */
    static long play(int key) {
        return EndToEnd.play(dvb.getStrm(), found.get(key), "fra", "fra",
                transponders.stream().mapToInt(t -> t.frequency).toArray());
    }

    @Test
    @Order(2)
    void theFrenchMultiplexsEventsAsBroadcastThroughPresentFollowingAndTheDatabase() throws Exception {
        String truth = truth("fr-dvbt-multiplex-si");
        String pf = truth.substring(truth.indexOf("\"eit_pf\""), truth.indexOf("\"eit_schedule\""));
        String schedule = truth.substring(truth.indexOf("\"eit_schedule\""));
        Strm strm = dvb.getStrm();
        Pattern event = Pattern.compile("\"event_id\": (\\d+), \"start_utc\": \"([^\"]+)\", \"duration\": \"(\\d+):(\\d+):(\\d+)\","
                + " \"name_utf8\": \"(?:[^\"\\\\]|\\\\.)*\", \"name_hex\": \"(\\w*)\"");
        for (int sid : new int[] {1025, 1026, 1031, 1045, 1046}) {
            long stream = play(8442 << 16 | sid);
            Strm.EpgEvent now = new Strm.EpgEvent(), next = new Strm.EpgEvent();
            strm.Strm_GetAllEvent(stream, now, next, new Strm.ExtEpgEvent(), new Strm.ExtEpgEvent());
            String block = pf.substring(pf.indexOf("tsid=4 sid=" + sid));
            assertEquals(List.of(firstGroup(block, "\"present\": \\{[^\\[]*\"events\": \\[\\{\"event_id\": (\\d+)"),
                            firstGroup(block, "\"following\": \\{[^\\[]*\"events\": \\[\\{\"event_id\": (\\d+)")),
                    List.of("" + now.evtId, "" + next.evtId), "present and following of " + sid);

            // The database walked from the event running now: every event the schedule broadcast
            // from then on, in order, with its bytes.
            Strm.EpgSvc svc = EndToEnd.epg(found.get(8442 << 16 | sid));
            assertEquals(0, strm.EpgMd_ClearService());
            assertEquals(0, strm.EpgMd_AddService(svc));
            awaitStore(sid);
            List<String> want = new ArrayList<>(), got = new ArrayList<>();
            Matcher m = event.matcher(schedule.substring(schedule.indexOf("tsid=4 sid=" + sid)));
            for (int count = Integer.parseInt(firstGroup(schedule.substring(schedule.indexOf("tsid=4 sid=" + sid)),
                    "\"unique_event_count\": (\\d+)")); count > 0 && m.find(); count--) {
                int start = (int) Instant.parse(m.group(2)).getEpochSecond();
                int duration = Integer.parseInt(m.group(3)) * 3600 + Integer.parseInt(m.group(4)) * 60
                        + Integer.parseInt(m.group(5));
                // The record holds 51 bytes of a name.
                String name = m.group(6).substring(0, Math.min(m.group(6).length(), 102));
                if (start + duration > now.startTime) want.add(m.group(1) + " " + start + " " + duration + " " + name);
            }
            Strm.EpgEvent e = new Strm.EpgEvent();
            for (int i = 0; i < 200 && strm.EPG_GetEvent(stream, svc, e, new Strm.ExtEpgEvent()) == 0
                    && got.size() < want.size(); i++) {
                got.add(e.evtId + " " + e.startTime + " " + e.duration + " " + hex(e.name));
            }
            assertEquals(want, got, "schedule of " + sid);
            assertEquals(0, strm.Strm_Close(stream));
        }
    }

    static void awaitStore(int sid) throws InterruptedException {
        for (int i = 0; i < 2000; i++, Thread.sleep(10)) {
            synchronized (events) {
                for (int[] e : events) if (e[0] == 260 && e[1] == sid) return;
            }
        }
        fail("no store of " + sid);
    }

    @Test
    @Order(3)
    void theCanalPlusDisplaySetComposedFromTheReadersIsFfmpegsRendering() throws Exception {
        String truth = truth("dvbsub-canalplus-cinema");
        long stream = play(1 << 16 | Integer.parseInt(firstGroup(truth, "\"sid\": (\\d+)")));
        Strm.SubtitleContent sc = new Strm.SubtitleContent();
        Strm.STRM_StreamInfo info = new Strm.STRM_StreamInfo();
        dvb.getStrm().Strm_CreatStreamInfo(stream, info);
        for (int i = 0; i < info.subtitleCount && sc.pid != 0x157; i++) dvb.getStrm().Strm_GetSubTilteStreamInfo(i, sc);
        assertEquals(0x157, sc.pid);
        Subttl sub = dvb.getSubttl();
        long decoder = EndToEnd.start(sub, sc, stream);
        Subttl.SUBTTL_Data_t data = new Subttl.SUBTTL_Data_t();
        for (int i = 0; i < 2000 && data.numRegions == 0; i++, Thread.sleep(10)) sub.Subttl_GetData(decoder, data);
        BufferedImage want = ImageIO.read(new File(TESTDATA, "truth/dvbsub-canalplus-cinema.pid0157.set1.ffmpeg.png"));
        BufferedImage got = dvbdemo.DisplaySetImage.compose(sub, data);
        assertEquals(0, EndToEnd.differing(want, got), "pixels that differ from ffmpeg's rendering");
        assertEquals(0, sub.Subttl_Stop(decoder));
        assertEquals(0, dvb.getStrm().Strm_Close(stream));
    }
}
