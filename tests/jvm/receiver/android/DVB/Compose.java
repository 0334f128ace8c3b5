package android.DVB;

import java.awt.image.BufferedImage;

/** Display sets composed from the readers (dvbdemo.DisplaySetImage) against ffmpeg's rendering. */
final class Compose {
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
        for (int y = 0; y < a.getHeight(); y++) {
            for (int x = 0; x < a.getWidth(); x++) {
                int p = a.getRGB(x, y), q = b.getRGB(x, y);
                if ((p >>> 24) == 0 && (q >>> 24) == 0) continue;
                shown++;
                for (int shift = 0; shift < 32; shift += 8) {
                    if (Math.abs((p >>> shift & 0xFF) - (q >>> shift & 0xFF)) > 1) {
                        differ++;
                        break;
                    }
                }
            }
        }
        return shown == 0 ? -1 : differ;
    }
}
