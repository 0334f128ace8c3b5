package dvbdemo;

import java.nio.charset.Charset;
import java.nio.charset.StandardCharsets;
import java.text.Normalizer;

/**
 * Broadcast text for display: the first byte selects the character table (table 00, ISO/IEC
 * 6937, when it is a printable character; 0x01..0x0B ISO 8859-5..15; 0x10 0x00 NN ISO 8859-NN;
 * 0x11 UCS-2; 0x15 UTF-8). Emphasis marks are dropped and the CR/LF control becomes a newline,
 * as the receiver's own decoder does for its database.
 */
final class BroadcastText {
    private BroadcastText() {}

    /** ISO/IEC 6937's non-spacing diacritics 0xC1..0xCF as combining marks (0: none). */
    private static final char[] DIACRITICS = {
        '\u0300', '\u0301', '\u0302', '\u0303', '\u0304', '\u0306', '\u0307', '\u0308', 0,
        '\u030A', '\u0327', 0, '\u030B', '\u0328', '\u030C'};

    /** ISO/IEC 6937 0xA0..0xBF and 0xD0..0xFF (0: not a character). */
    private static final String UPPER_A0 = "\u00A0\u00A1\u00A2\u00A3\0\u00A5\0\u00A7\u00A4\u2018"
            + "\u201C\u00AB\u2190\u2191\u2192\u2193\u00B0\u00B1\u00B2\u00B3\u00D7\u00B5\u00B6\u00B7"
            + "\u00F7\u2019\u201D\u00BB\u00BC\u00BD\u00BE\u00BF";
    private static final String UPPER_D0 = "\u2015\u00B9\u00AE\u00A9\u2122\u266A\u00AC\u00A6\0\0"
            + "\0\0\u215B\u215C\u215D\u215E\u2126\u00C6\u0110\u00AA\u0126\0\u0132\u013F\u0141"
            + "\u00D8\u0152\u00BA\u00DE\u0166\u014A\u0149\u0138\u00E6\u0111\u00F0\u0127\u0131\u0133"
            + "\u0140\u0142\u00F8\u0153\u00DF\u00FE\u0167\u014B\u00AD";

    static String decode(byte[] b) {
        if (b == null || b.length == 0) return "";
        int first = b[0] & 0xFF;
        if (first >= 0x20) return clean(iso6937(b, 0));
        if (first >= 0x01 && first <= 0x0B) return clean(single(b, 1, "ISO-8859-" + (first + 4)));
        if (first == 0x10 && b.length >= 3) return clean(single(b, 3, "ISO-8859-" + (b[2] & 0xFF)));
        if (first == 0x11) return clean(new String(b, 1, (b.length - 1) & ~1, StandardCharsets.UTF_16BE));
        if (first == 0x15) return clean(new String(b, 1, b.length - 1, StandardCharsets.UTF_8));
        return clean(single(b, 1, "US-ASCII"));
    }

    private static String single(byte[] b, int from, String charset) {
        Charset cs = Charset.isSupported(charset) ? Charset.forName(charset) : StandardCharsets.ISO_8859_1;
        return new String(b, from, b.length - from, cs);
    }

    private static String iso6937(byte[] b, int from) {
        StringBuilder s = new StringBuilder();
        for (int i = from; i < b.length; i++) {
            int c = b[i] & 0xFF;
            if (c >= 0xC1 && c <= 0xCF && i + 1 < b.length && DIACRITICS[c - 0xC1] != 0) {
                s.append((char) (b[++i] & 0xFF)).append(DIACRITICS[c - 0xC1]);
            } else if (c >= 0xA0 && c < 0xC0 && UPPER_A0.charAt(c - 0xA0) != 0) {
                s.append(UPPER_A0.charAt(c - 0xA0));
            } else if (c >= 0xD0 && UPPER_D0.charAt(c - 0xD0) != 0) {
                s.append(UPPER_D0.charAt(c - 0xD0));
            } else if (c < 0x80 || (c >= 0x80 && c < 0xA0)) {
                s.append((char) c);
            }
        }
        return Normalizer.normalize(s, Normalizer.Form.NFC);
    }

    /** Drops the control codes, emphasis included; CR/LF becomes a newline. */
    private static String clean(String s) {
        StringBuilder out = new StringBuilder();
        for (char c : s.toCharArray()) {
            if (c == '\u008A' || c == '\uE08A' || c == '\n') out.append('\n');
            else if (c >= 0x20 && !(c >= 0x7F && c < 0xA0) && !(c >= 0xE080 && c <= 0xE09F)) out.append(c);
        }
        return out.toString();
    }
}
