package android.DVB;

import java.awt.image.BufferedImage;
import java.util.stream.IntStream;

/**
 * What the end-to-end suites do alike: play a scanned service, name it to the event database,
 * compose display sets from the readers (dvbdemo.DisplaySetImage) against ffmpeg's rendering.
 */
final class EndToEnd {
    /**
     * Opens a stream and starts scanned service `info` on the first terrestrial frequency (kHz)
     * that carries it, with audio languages `lang0` and `lang1`.
     */
    static long play(Strm strm, Scnm.SCNM_ServiceInfo info, String lang0, String lang1, int... frequencies) {
        Strm.STRM_OpenSettings open = new Strm.STRM_OpenSettings();
        open.szPath = "";
        long stream = strm.Strm_Open(open);
        Strm.STRM_Service svc = new Strm.STRM_Service();
        svc.svcId = info.svcId;
        svc.videoPid = info.videoPid;
        svc.audioPid = info.audioPid;
        svc.pcrPid = info.pcrPid;
        Strm.STRM_LangCode langs = new Strm.STRM_LangCode();
        langs.langCode0 = lang0;
        langs.langCode1 = lang1;
        for (int frequency : frequencies) {
            Strm.STRM_FrontEnd fe = new Strm.STRM_FrontEnd();
            fe.type = 2;
            fe.frequency = frequency;
            fe.bandwidth = 8000;
            if (strm.Strm_Start(stream, svc, langs, fe) == 0) return stream;
        }
        throw new AssertionError("no transponder carries service " + info.svcId);
    }

    /** Scanned service `info` as the event database names it. */
    static Strm.EpgSvc epg(Scnm.SCNM_ServiceInfo info) {
        Strm.EpgSvc epg = new Strm.EpgSvc();
        epg.svcId = info.svcId;
        epg.tsId = info.tsId;
        epg.onId = info.onId;
        return epg;
    }

    /** Starts a subtitle decoder on component `sc` of stream `stream`. */
    static long start(Subttl sub, Strm.SubtitleContent sc, long stream) {
        Subttl.SUBTTL_Settings s = new Subttl.SUBTTL_Settings();
        s.pid = sc.pid;
        s.langCode = sc.langCode;
        s.compositionPageId = sc.compositionPageId;
        s.ancillaryPageId = sc.ancillaryPageId;
        s.hstrm = stream;
        return sub.Subttl_Start(s);
    }

    /**
     * Pixels of `a` and `b` (same size) that differ by more than 1 in a channel: ffmpeg converts
     * Y, Cr, Cb with its own rounding, the CLUT readers truncate. Fully transparent pixels have
     * no colour to compare. -1 when neither shows anything.
     */
    static int differing(BufferedImage a, BufferedImage b) {
        int differ = 0, shown = 0;
        for (int y = 0; y < a.getHeight(); y++) for (int x = 0; x < a.getWidth(); x++) {
            int p = a.getRGB(x, y), q = b.getRGB(x, y);
            if ((p >>> 24) == 0 && (q >>> 24) == 0) continue;
            shown++;
            if (IntStream.of(0, 8, 16, 24).anyMatch(s -> Math.abs((p >>> s & 0xFF) - (q >>> s & 0xFF)) > 1)) differ++;
        }
        return shown == 0 ? -1 : differ;
    }
}
