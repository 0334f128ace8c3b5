package dvbdemo;

import android.DVB.DVB;
import android.DVB.Scnm;
import android.DVB.Strm;
import android.DVB.Subttl;
import android.DVB.Teltxt;
import java.awt.image.BufferedImage;
import java.io.File;
import java.io.IOException;
import java.time.Instant;
import java.time.ZoneOffset;
import java.time.format.DateTimeFormatter;
import java.util.ArrayList;
import java.util.HashSet;
import java.util.Set;
import java.util.Arrays;
import java.util.Comparator;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;
import java.util.concurrent.BlockingQueue;
import java.util.concurrent.LinkedBlockingQueue;
import java.util.concurrent.TimeUnit;
import javax.imageio.ImageIO;

/**
 * The whole android.DVB API against the receiver behind it: start-up, a scan of each delivery
 * system, the channel list, a service played with its status, components and events, its
 * schedule for tomorrow from the event database, a subtitle display set and a teletext page
 * written as PNGs, then shut-down. Options: --service NAME-OR-NUMBER, --page NNN, --out DIR,
 * --broadcast PATH (a capture, a folder of captures or a broadcast file instead of the built-in
 * broadcast: the receiver reads it from DVB_BROADCAST, so the demo runs again with it set).
 */
public final class Demo {
    static final DateTimeFormatter TIME = DateTimeFormatter.ofPattern("EEE HH:mm").withZone(ZoneOffset.UTC);

    /** A service found by a scan, with the scan settings that found its network. */
    static final class Channel {
        Scnm.SCNM_ServiceInfo info;
        Scnm.SCNM_StartSettings scan;
        List<Scnm.SCNMNET_FrontEndSettings> transponders;
        String name;
    }

    final DVB dvb = new DVB();
    final BlockingQueue<int[]> events = new LinkedBlockingQueue<>();
    final String wantedService;
    final int page;
    final File out;

    Demo(String service, int page, File out) {
        this.wantedService = service;
        this.page = page;
        this.out = out;
        dvb.setOnEventListener((d, msg, ext1, ext2, obj) -> events.add(new int[] {msg, ext1, ext2}));
    }

    public static void main(String[] args) throws Exception {
        String service = null;
        int page = 0x100;
        File out = new File("demo-out");
        for (int i = 0; i + 1 < args.length; i += 2) {
            if (args[i].equals("--service")) service = args[i + 1];
            else if (args[i].equals("--page")) page = Integer.parseInt(args[i + 1], 16);
            else if (args[i].equals("--out")) out = new File(args[i + 1]);
            else if (args[i].equals("--broadcast") && !args[i + 1].equals(System.getenv("DVB_BROADCAST"))) {
                System.exit(relaunch(args, args[i + 1]));
            }
        }
        out.mkdirs();
        new Demo(service, page, out).run();
        System.exit(0);
    }

    /** Runs the demo in a JVM of its own with DVB_BROADCAST set to `broadcast`; gives its exit code. */
    static int relaunch(String[] args, String broadcast) throws IOException, InterruptedException {
        List<String> cmd = new ArrayList<>();
        cmd.add(System.getProperty("java.home") + "/bin/java");
        cmd.addAll(java.lang.management.ManagementFactory.getRuntimeMXBean().getInputArguments());
        cmd.addAll(Arrays.asList("-cp", System.getProperty("java.class.path"), Demo.class.getName()));
        cmd.addAll(Arrays.asList(args));
        ProcessBuilder pb = new ProcessBuilder(cmd).inheritIO();
        pb.environment().put("DVB_BROADCAST", broadcast);
        return pb.start().waitFor();
    }

    /** Whether the receiver plays captures rather than its built-in broadcast. */
    static boolean capture() {
        String b = System.getenv("DVB_BROADCAST");
        return b != null && !b.isEmpty() && !b.equals("builtin");
    }

    static void title(String text) {
        System.out.println();
        System.out.println("== " + text);
    }

    /** Waits up to `seconds` for event `msg`, and gives it (null when none came). */
    int[] await(int msg, int seconds) throws InterruptedException {
        long end = System.nanoTime() + TimeUnit.SECONDS.toNanos(seconds);
        for (int[] e; (e = events.poll(end - System.nanoTime(), TimeUnit.NANOSECONDS)) != null; ) {
            if (e[0] == msg) return e;
        }
        return null;
    }

    void run() throws Exception {
        Scnm scnm = dvb.getScnm();
        title("System start-up");
        Scnm.DVB_Config config = new Scnm.DVB_Config();
        System.out.println("Dvb_SystemInit -> " + scnm.Dvb_SystemInit(config) + " (the event database exists)");

        List<Channel> channels = new ArrayList<>();
        if (capture()) {
            // Where the captures' transponders are is theirs to say: sweep every band.
            System.out.println("broadcast: " + System.getenv("DVB_BROADCAST"));
            scan(scnm, "Terrestrial, full band", terrestrial(474000), 2, channels);
            scan(scnm, "Cable, full band", cable(306000), 2, channels);
            scan(scnm, "Satellite 19.2E, full band", satellite(10714000, 27500000, 0, 10, 0, 192), 2, channels);
        } else {
            scan(scnm, "Satellite 19.2E", satellite(11362000, 22000000, 1, 1, 0, 192), 1, channels);
            scan(scnm, "Satellite 13.0E", satellite(10719000, 27500000, 0, 2, 1, 130), 1, channels);
            scan(scnm, "Cable", cable(394000), 1, channels);
            scan(scnm, "Terrestrial", terrestrial(506000), 1, channels);
        }

        title("Channel list");
        // By logical channel number; services without one last.
        channels.sort(Comparator.comparingLong(c -> c.info.lcn == 0 ? Long.MAX_VALUE : c.info.lcn));
        for (Channel c : channels) {
            String type = c.info.svcType == 2 ? "radio" : c.info.svcType == 0x19 ? "TV HD" : "TV";
            System.out.printf("%4d  %-30s %-6s %s%s%n", c.info.lcn, c.name, type,
                    c.info.caSysId0 != 0 ? "scrambled " : "", delivery(c.scan.type));
        }
        if (channels.isEmpty()) {
            System.out.println("no service found");
        } else {
            Channel chosen = choose(channels);
            Components shown = play(chosen);
            if (capture()) others(chosen, shown, channels);
        }

        title("Shut-down");
        System.out.println("Dvb_SystemUnInit -> " + scnm.Dvb_SystemUnInit(config));
        dvb.release();
    }

    static String delivery(int type) {
        return type == 0 ? "satellite" : type == 1 ? "cable" : "terrestrial";
    }

    static Scnm.SCNM_StartSettings satellite(int khz, int rate, int modulation, int fec, int pol, int position) {
        Scnm.SCNM_StartSettings s = new Scnm.SCNM_StartSettings();
        s.type = 0;
        s.frequency = khz;
        s.symbolRate = rate;
        s.modulation = modulation;
        s.fecInner = fec;
        s.polarization = pol;
        s.lnbLowLO = 9750;
        s.lnbHigLO = 10600;
        s.tone = 2; // the band follows the frequency
        s.lnbpower = 1;
        s.satPosition = position;
        return s;
    }

    static Scnm.SCNM_StartSettings cable(int khz) {
        Scnm.SCNM_StartSettings s = new Scnm.SCNM_StartSettings();
        s.type = 1;
        s.frequency = khz;
        s.symbolRate = 6900000;
        s.modulation = 7; // auto
        s.fecInner = 10;
        return s;
    }

    static Scnm.SCNM_StartSettings terrestrial(int khz) {
        Scnm.SCNM_StartSettings s = new Scnm.SCNM_StartSettings();
        s.type = 2;
        s.frequency = khz;
        s.bandwidth = 8000;
        return s;
    }

    /**
     * A scan (type 1: the network of one transponder, from its NIT; 2: the full band) with a
     * progress bar, adding what it found.
     */
    void scan(Scnm scnm, String what, Scnm.SCNM_StartSettings settings, int type, List<Channel> channels)
            throws InterruptedException {
        title("Scan: " + what);
        Scnm.SCNM_OpenSettings open = new Scnm.SCNM_OpenSettings();
        long handle = scnm.Scnm_Open(open);
        settings.scanType = type;
        settings.langCode = "eng";
        int started = scnm.Scnm_Start(handle, settings);
        Scnm.SCNM_GetStatus status = new Scnm.SCNM_GetStatus();
        int shown = -1;
        do {
            Thread.sleep(20);
            scnm.Scnm_GetStatus(handle, status);
            if (status.sfStatus == shown) continue;
            shown = status.sfStatus;
            int bar = Math.max(0, Math.min(40, shown * 40 / 100));
            System.out.printf("\r[%-40s] %3d%%", new String(new char[bar]).replace('\0', '#'), shown);
        } while (started == 0 && status.result == 1);
        System.out.println(status.result == 2 ? "  done" : "  result " + status.result + " (start " + started + ")");
        List<Scnm.SCNMNET_FrontEndSettings> transponders = new ArrayList<>();
        for (int i = 0, n = scnm.Scnm_CreateNetworkList(handle); i < n; i++) {
            Scnm.SCNMNET_FrontEndSettings t = new Scnm.SCNMNET_FrontEndSettings();
            scnm.Scnm_GetNetworkList(i, t);
            transponders.add(t);
        }
        int services = scnm.Scnm_CreateServiceList(handle);
        for (int i = 0; i < services; i++) {
            Channel c = new Channel();
            c.info = new Scnm.SCNM_ServiceInfo();
            scnm.Scnm_GetServiceList(i, c.info);
            c.name = BroadcastText.decode(c.info.svcName);
            c.scan = settings;
            c.transponders = transponders;
            channels.add(c);
        }
        System.out.println(transponders.size() + " transponders, " + services + " services");
        scnm.Scnm_Close(handle);
    }

    Channel choose(List<Channel> channels) {
        for (Channel c : channels) {
            if (wantedService == null ? c.info.svcType != 2 && (c.name.contains("Kanal Eins HD") || capture() && c.info.lcn != 0)
                    : c.name.equalsIgnoreCase(wantedService) || wantedService.equals("" + c.info.lcn)) {
                return c;
            }
        }
        return channels.get(0);
    }

    static Strm.STRM_FrontEnd frontEnd(Scnm.SCNM_StartSettings s, Scnm.SCNMNET_FrontEndSettings t) {
        Strm.STRM_FrontEnd f = new Strm.STRM_FrontEnd();
        f.type = s.type;
        f.frequency = t.frequency;
        f.symbolRate = t.symbolRate;
        f.fecInner = t.fecInner;
        f.modulation = t.modulation;
        f.polarization = t.polarization;
        f.rolloff = t.rolloff;
        f.bandwidth = s.type == 2 ? t.symbolRate : s.bandwidth;
        f.tone = s.tone;
        f.lnbpower = s.lnbpower;
        f.lnbLowLO = s.lnbLowLO;
        f.lnbHigLO = s.lnbHigLO;
        f.satPosition = s.satPosition;
        return f;
    }

    /** What a played service carries: its subtitle components and its teletext pages. */
    static final class Components {
        final List<Strm.SubtitleContent> subtitles = new ArrayList<>();
        final List<Strm.TeletextContent> teletext = new ArrayList<>();
    }

    /**
     * Opens a stream and starts `c` on the first of its network's transponders that carries it;
     * says how it went when `print`.
     */
    long start(Channel c, boolean print) {
        Strm strm = dvb.getStrm();
        Strm.STRM_OpenSettings open = new Strm.STRM_OpenSettings();
        open.szPath = "";
        long handle = strm.Strm_Open(open);
        Strm.STRM_Service svc = new Strm.STRM_Service();
        svc.svcId = c.info.svcId;
        svc.videoPid = c.info.videoPid;
        svc.videoType = c.info.videoType;
        svc.audioPid = c.info.audioPid;
        svc.audioType = c.info.audioType;
        svc.pcrPid = c.info.pcrPid;
        svc.pmtPid = c.info.pmtPid;
        svc.caSysId0 = c.info.caSysId0;
        Strm.STRM_LangCode langs = new Strm.STRM_LangCode();
        langs.langCode0 = "deu";
        langs.langCode1 = "eng";
        int started = -1;
        for (Scnm.SCNMNET_FrontEndSettings t : c.transponders) {
            started = strm.Strm_Start(handle, svc, langs, frontEnd(c.scan, t));
            if (started == 0) break;
        }
        if (print) System.out.println("Strm_Start -> " + started);
        return handle;
    }

    /** The components of the service stream `handle` plays, printed when `print`. */
    static Components components(Strm strm, long handle, boolean print) {
        Strm.STRM_StreamInfo info = new Strm.STRM_StreamInfo();
        strm.Strm_CreatStreamInfo(handle, info);
        Components found = new Components();
        if (print) System.out.printf("components: PCR PID %d, CA %04x%n", info.pcrPid, info.caSysId0);
        for (int i = 0; i < info.videoCount && print; i++) {
            Strm.VideoContent v = new Strm.VideoContent();
            strm.Strm_GetVideoStreamInfo(i, v);
            System.out.printf("  video    PID %4d type 0x%02x%n", v.pid, v.type);
        }
        for (int i = 0; i < info.audioCount && print; i++) {
            Strm.AudioContent a = new Strm.AudioContent();
            strm.Strm_GetAudioStreamInfo(i, a);
            System.out.printf("  audio    PID %4d type 0x%02x %s%s %s%n", a.pid, a.type, a.langCode0,
                    a.isDolbyAC3 != 0 ? " AC-3" : "", a.streamName);
        }
        for (int i = 0; i < info.subtitleCount; i++) {
            Strm.SubtitleContent s = new Strm.SubtitleContent();
            strm.Strm_GetSubTilteStreamInfo(i, s);
            found.subtitles.add(s);
            if (print) System.out.printf("  subtitle PID %4d type 0x%02x %s pages %d/%d%n", s.pid, s.type,
                    s.langCode, s.compositionPageId, s.ancillaryPageId);
        }
        for (int i = 0; i < info.teletextCount; i++) {
            Strm.TeletextContent t = new Strm.TeletextContent();
            strm.Strm_GetTeleTextStreamInfo(i, t);
            found.teletext.add(t);
            if (print) System.out.printf("  teletext PID %4d %s page %d%02x type %d %s%n", t.pid, t.langCode,
                    t.magazineNumber, t.pageNumber, t.type, t.streamName);
        }
        return found;
    }

    Components play(Channel c) throws Exception {
        title("Playing " + c.info.lcn + " " + c.name);
        Strm strm = dvb.getStrm();
        long handle = start(c, true);
        Strm.STRM_GetStatus st = new Strm.STRM_GetStatus();
        for (int i = 0; i < 100 && (st.feStatus & 0x10) == 0; i++) {
            Thread.sleep(20);
            strm.Strm_GetStatus(handle, st);
        }
        Thread.sleep(100);
        strm.Strm_GetStatus(handle, st);
        System.out.printf("status 0x%02x, strength %d%%, SNR %.1f dB, video PTS %d, %d.%03d fps, picture %d%n",
                st.feStatus, st.feStrength, st.feSnr / 10.0, st.videoPts & 0xFFFFFFFFL, st.fpsInteger,
                st.fpsDecimal, st.pictureStatus);

        Components found = components(strm, handle, true);

        events(strm, handle);
        schedule(strm, handle, c);
        if (!found.subtitles.isEmpty()) subtitles(handle, found.subtitles);
        if (!found.teletext.isEmpty()) pages(handle, found.teletext);
        stop(strm, handle);
        return found;
    }

    static void stop(Strm strm, long handle) {
        System.out.println();
        System.out.println("Strm_Stop -> " + strm.Strm_Stop(handle, false) + ", Strm_Close -> "
                + strm.Strm_Close(handle));
    }

    /**
     * On captures: the subtitles of the first service that carries a subtitle component and
     * the teletext of the first that carries teletext, where the service played had none.
     */
    void others(Channel played, Components shown, List<Channel> channels) throws Exception {
        Strm strm = dvb.getStrm();
        boolean subtitles = !shown.subtitles.isEmpty(), teletext = !shown.teletext.isEmpty();
        for (Channel c : channels) {
            if (c == played || (subtitles && teletext)) continue;
            long handle = start(c, false);
            Components found = components(strm, handle, false);
            if (!subtitles && !found.subtitles.isEmpty()) {
                subtitles = true;
                subtitles(handle, found.subtitles);
            }
            if (!teletext && !found.teletext.isEmpty()) {
                teletext = true;
                pages(handle, found.teletext);
            }
            strm.Strm_Stop(handle, false);
            strm.Strm_Close(handle);
        }
    }

    /**
     * The page asked for (100 unless --page says otherwise; the first page the service's
     * teletext announces where the page asked for is not on the air), then every subtitle page
     * it announces.
     */
    void pages(long stream, List<Strm.TeletextContent> announced) throws IOException {
        Strm.TeletextContent first = announced.get(0);
        int shown = teletext(stream, first, page);
        if (shown != 0) teletext(stream, first, first.magazineNumber % 8 * 0x100 + (first.pageNumber & 0xFF));
        for (Strm.TeletextContent t : announced) {
            int number = (t.magazineNumber == 0 ? 8 : t.magazineNumber) * 0x100 + (t.pageNumber & 0xFF);
            if ((t.type == 2 || t.type == 5) && number != page) teletext(stream, t, number);
        }
    }

    static void printEvent(String which, Strm.EpgEvent e) {
        System.out.printf("%-9s %s  %3d min  %s%n           %s%n", which,
                TIME.format(Instant.ofEpochSecond(e.startTime & 0xFFFFFFFFL)), e.duration / 60,
                BroadcastText.decode(e.name), BroadcastText.decode(e.text));
    }

    void events(Strm strm, long handle) {
        title("Present and following");
        Strm.EpgEvent now = new Strm.EpgEvent();
        Strm.EpgEvent next = new Strm.EpgEvent();
        Strm.ExtEpgEvent nowExt = new Strm.ExtEpgEvent();
        Strm.ExtEpgEvent nextExt = new Strm.ExtEpgEvent();
        strm.Strm_GetAllEvent(handle, now, next, nowExt, nextExt);
        printEvent("now", now);
        for (int k = 0; k < nowExt.itemCount; k++) {
            Strm.ExtEpgEventItem item = new Strm.ExtEpgEventItem();
            strm.Strm__GetExtEPGEventNow(k, item);
            System.out.printf("           %s: %s%n", item.itemDesc, item.type);
        }
        printEvent("next", next);
        for (int k = 0; k < nextExt.itemCount; k++) {
            Strm.ExtEpgEventItem item = new Strm.ExtEpgEventItem();
            strm.Strm__GetExtEPGEventNext(k, item);
            System.out.printf("           %s: %s%n", item.itemDesc, item.type);
        }
    }

    /**
     * Collects the service's events into the event database, waits for the store, then walks
     * its schedule with EPG_GetEvent (each call gives the next event) and prints tomorrow's.
     */
    void schedule(Strm strm, long handle, Channel c) throws InterruptedException {
        title("Tomorrow on " + c.name + ", from the event database");
        Strm.EpgSvc svc = new Strm.EpgSvc();
        svc.svcId = c.info.svcId;
        svc.tsId = c.info.tsId;
        svc.onId = c.info.onId;
        strm.EpgMd_ClearService();
        strm.EpgMd_AddService(svc);
        // A database kept from an earlier run already holds the week: nothing new is stored.
        int[] stored = await(260, 3);
        System.out.println(stored != null ? stored[2] + " events of the week stored" : "the week was stored before");
        long tomorrow = (strm.Strm_GetTime(handle, 0) / 86400 + 1) * 86400;
        Strm.EpgEvent e = new Strm.EpgEvent();
        Strm.ExtEpgEvent x = new Strm.ExtEpgEvent();
        for (int i = 0; i < 200 && strm.EPG_GetEvent(handle, svc, e, x) == 0; i++) {
            long start = e.startTime & 0xFFFFFFFFL;
            if (start >= tomorrow + 86400) break;
            if (start >= tomorrow) printEvent("", e);
        }
    }

    /**
     * The built-in broadcast: the first display set of the first subtitle component, as
     * subtitle.png. Captures: the display sets (up to 20) of every component, each as
     * subtitle-PID-NN.png.
     */
    void subtitles(long stream, List<Strm.SubtitleContent> components) throws InterruptedException, IOException {
        for (Strm.SubtitleContent content : components) {
            subtitles(stream, content, capture() ? 20 : 1);
            if (!capture()) break;
        }
    }

    /**
     * Writes up to `count` display sets with regions, each composed on the display, as PNGs;
     * gives up when no new one comes within 3 seconds.
     */
    void subtitles(long stream, Strm.SubtitleContent content, int count) throws InterruptedException, IOException {
        title("Subtitles, PID " + content.pid);
        Subttl sub = dvb.getSubttl();
        sub.Subttl_Init();
        Subttl.SUBTTL_Settings s = new Subttl.SUBTTL_Settings();
        s.pid = content.pid;
        s.type = content.type;
        s.langCode = content.langCode;
        s.compositionPageId = content.compositionPageId;
        s.ancillaryPageId = content.ancillaryPageId;
        s.hstrm = stream;
        long handle = sub.Subttl_Start(s);
        // A capture plays in a loop: the first display set seen again ends it.
        Set<Integer> seen = new HashSet<>();
        for (int written = 0, guard = 0; written < count && guard < 200; guard++) {
            int[] e = await(240, 3);
            if (e == null) break;
            if (e[1] != (int) handle || e[2] == 0) continue;
            Subttl.SUBTTL_Data_t data = new Subttl.SUBTTL_Data_t();
            sub.Subttl_GetData(handle, data);
            if (data.numRegions == 0) continue;
            BufferedImage image = DisplaySetImage.compose(dvb.getSubttl(), data);
            int[] argb = image.getRGB(0, 0, image.getWidth(), image.getHeight(), null, 0, image.getWidth());
            if (!seen.add(Arrays.hashCode(argb))) break;
            File png = new File(out, count == 1 ? "subtitle.png" : String.format("subtitle-%d-%02d.png", content.pid, ++written));
            ImageIO.write(image, "png", png);
            System.out.printf("display set at PTS %d: %d regions, %d CLUTs -> %s%n", data.i_pts & 0xFFFFFFFFL,
                    data.numRegions, data.numCluts, png);
            if (count == 1) break;
        }
        sub.Subttl_Stop(handle);
    }

    /** The 2-by-3 cells of a block mosaic character (bit 0 top left ... bit 5 bottom right), or -1. */
    static int sextant(int ch) {
        if (ch == 0x258C) return 21;
        if (ch == 0x2590) return 42;
        if (ch == 0x2588) return 63;
        if (ch < 0x1FB00 || ch > 0x1FB3B) return -1;
        int v = ch - 0x1FB00 + 1;
        if (v >= 21) v++;
        if (v >= 42) v++;
        return v;
    }

    /** Teletext's colours in its order, which is also the order of the terminal's colours. */
    static final int[] RGB = {0x000000, 0xFF0000, 0x00FF00, 0xFFFF00, 0x0000FF, 0xFF00FF, 0x00FFFF, 0xFFFFFF};

    /**
     * Shows page `page` as coloured text on the terminal and writes it as a PNG; gives
     * Teltxt_SetData's result (nothing is shown where it is not 0).
     */
    int teletext(long stream, Strm.TeletextContent content, int page) throws IOException {
        title("Teletext page " + Integer.toHexString(page));
        Teltxt ttx = dvb.getTeltxt();
        Teltxt.TELTXT_Settings s = new Teltxt.TELTXT_Settings();
        s.pid = content.pid;
        s.type = content.type;
        s.langCode = content.langCode;
        s.magazineNumber = content.magazineNumber;
        s.pageNumber = content.pageNumber;
        s.componetTag = content.componetTag;
        s.streamName = content.streamName;
        long handle = ttx.Teltxt_Start(s);
        Teltxt.TELTXT_NavPages nav = new Teltxt.TELTXT_NavPages();
        int selected = ttx.Teltxt_SetData(handle, page, 0, nav);
        if (selected != 0) {
            System.out.println("Teltxt_SetData -> " + selected + ": not on the air");
            ttx.Teltxt_Stop(handle);
            return selected;
        }
        byte[] image = new byte[8032];
        ttx.Teltxt_GetData(handle, 0, image.length, image);
        java.nio.ByteBuffer b = java.nio.ByteBuffer.wrap(image).order(java.nio.ByteOrder.LITTLE_ENDIAN);
        System.out.printf("Teltxt_SetData -> %d; subcode %04x, control bits %04x; keys: red %x green %x yellow %x cyan %x%n",
                selected, b.getShort(2), b.getShort(4), nav.prev100, nav.prev10, nav.next10, nav.next100);
        BufferedImage png = new BufferedImage(40 * 12, 25 * 20, BufferedImage.TYPE_INT_RGB);
        java.awt.Graphics2D g = png.createGraphics();
        g.setFont(new java.awt.Font(java.awt.Font.MONOSPACED, java.awt.Font.BOLD, 16));
        for (int row = 0; row < 25; row++) {
            StringBuilder line = new StringBuilder();
            int shown = -1;
            for (int col = 0; col < 40; col++) {
                int at = 32 + (row * 40 + col) * 8;
                int ch = b.getInt(at);
                int fg = image[at + 4] & 7;
                int bg = image[at + 5] & 7;
                String text = ch == 0 ? " " : new String(Character.toChars(ch));
                if ((fg << 3 | bg) != shown) line.append("\u001b[").append(30 + fg).append(';').append(40 + bg).append('m');
                shown = fg << 3 | bg;
                line.append(text);
                int flags = b.getShort(at + 6);
                g.setColor(new java.awt.Color(RGB[bg]));
                if ((flags & 0x10) == 0) g.fillRect(col * 12, row * 20, 12, (flags & 0x08) != 0 ? 40 : 20);
                g.setColor(new java.awt.Color(RGB[fg]));
                int cells = sextant(ch);
                if (cells >= 0) {
                    int gap = (flags & 0x40) != 0 ? 2 : 0; // separated mosaics
                    for (int k = 0; k < 6; k++) {
                        if ((cells >> k & 1) != 0) g.fillRect(col * 12 + k % 2 * 6, row * 20 + k / 2 * 7, 6 - gap, 7 - gap);
                    }
                } else if ((flags & 0x10) == 0) {
                    java.awt.geom.AffineTransform saved = g.getTransform();
                    boolean tall = (flags & 0x08) != 0; // double height: this row and the next
                    g.translate(col * 12, row * 20 + (tall ? 30 : 15));
                    if (tall) g.scale(1, 2);
                    g.drawString(text, 0, 0);
                    g.setTransform(saved);
                }
            }
            System.out.println(line + "\u001b[0m");
        }
        File file = new File(out, "teletext-" + Integer.toHexString(page) + ".png");
        ImageIO.write(png, "png", file);
        System.out.println("-> " + file);
        ttx.Teltxt_Stop(handle);
        return 0;
    }
}
