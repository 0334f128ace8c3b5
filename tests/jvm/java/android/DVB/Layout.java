package android.DVB;

import static org.junit.jupiter.api.Assertions.*;

import java.lang.reflect.Field;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.nio.charset.StandardCharsets;
import java.util.*;

/**
 * Where the fields of one Java record class live in a native record, written from the interface
 * description (never from the library's own maps), with the conversions every contract test
 * runs: Java values into record bytes, record bytes into Java values, patterned values for both.
 * A layout line lists "javaName:kind@offset". Kinds: i32 u8 u16 s16 (int fields); u32j i64 (long
 * fields); strN (text of N bytes, cut at N on the way in); nstrN (an empty field is null); lang
 * (three bytes in, four out); eng (lang, null meaning "eng"); pathN (text that must fit with its
 * zero byte); bytesN (zero-ended text as exactly its bytes); allN (every byte); yccN (N colour
 * entries as ARGB); pixN (width times height pixels of at most N, the width and height 20 and
 * 16 bytes before them); fe (the 76-byte front-end block, whose type code picks its parameters).
 */
final class Layout {
    static final String FE_COMMON = "diseqctype:i32@36 tone:u8@40 lnbpower:u8@41 lnbLowLO:i32@44"
            + " lnbHigLO:i32@48 port:u8@52 port16:u8@53 posIndex:u8@54 satPosition:i32@56"
            + " myLongitude:i32@60 myLatitude:i32@64 toneBurst:u8@68 ubSlot:u8@69 ubFreq:u16@70"
            + " ubSat:u8@72 out5v:u8@73";
    static final String[] FE = "type frequency symbolRate fecInner modulation polarization rolloff bandwidth".split(" ");
    static final int[] FE_TYPES = {1, 2, 0, 3, 7, -1};

    record Slot(Field field, String kind, int offset, int width) {
        boolean text() {
            return kind.matches("str|nstr|lang|eng|path");
        }
    }

    final Class<?> cls;
    final int size;
    final List<Slot> slots = new ArrayList<>();

    Layout(Class<?> cls, int size, String line) {
        this.cls = cls;
        this.size = size;
        for (String item : line.trim().split("\\s+")) {
            String[] p = item.split("[:@]");
            int at = Integer.parseInt(p[2]);
            if (p[1].equals("fe")) {
                slots.add(new Slot(null, "fe", at, 76));
                for (String f : FE_COMMON.split(" ")) add(f.split("[:@]"), at);
            } else {
                add(p, 0);
            }
        }
    }

    private void add(String[] p, int base) {
        String kind = p[1].replaceAll("(str|nstr|path|bytes|all|ycc|pix)\\d+", "$1");
        int width = switch (p[1]) {
            case "u8" -> 1;
            case "u16", "s16" -> 2;
            case "i64" -> 8;
            default -> kind.equals(p[1]) ? 4 : Integer.parseInt(p[1].substring(kind.length()));
        };
        Field f = Arrays.stream(cls.getFields()).filter(x -> x.getName().equals(p[0])).findFirst().get();
        slots.add(new Slot(f, kind, base + Integer.parseInt(p[2]), width));
    }

    Object create() throws ReflectiveOperationException {
        return cls.getDeclaredConstructor().newInstance();
    }

    static int hash(int seed, int k) {
        int x = seed * 0x9E3779B9 + k * 0x85EBCA6B + 0x165667B1;
        x = (x ^ (x >>> 15)) * 0x2C1B3C6D;
        return x ^ (x >>> 12);
    }

    /** Text for a field of `width` bytes: empty, short, the width, longer, or one byte. */
    static String text(int seed, int width, boolean mayOverflow) {
        int n = new int[] {0, 2, width, width + 3, 1}[Math.floorMod(seed, mayOverflow ? 5 : 3)];
        StringBuilder s = new StringBuilder();
        for (int i = 0; i < n; i++) s.append((char) (i == 1 && seed % 2 == 0 && mayOverflow ? 0xE9 : 'a' + (seed + i) % 26));
        return s.toString();
    }

    /** Sets every mapped field of `o` (every int of a front-end block) from `seed`. */
    Object fill(Object o, int seed) throws ReflectiveOperationException {
        int k = 0;
        for (Slot s : slots) {
            k++;
            if (s.kind.equals("fe")) {
                for (String f : FE) cls.getField(f).setInt(o, hash(seed, ++k));
                cls.getField("type").setInt(o, FE_TYPES[Math.floorMod(seed, FE_TYPES.length)]);
            } else if (s.field.getType() == long.class) {
                s.field.setLong(o, (long) hash(seed, k) << 32 | hash(seed, -k) & 0xFFFFFFFFL);
            } else if (s.text()) {
                int width = s.kind.matches("lang|eng") ? 3 : s.kind.equals("path") ? s.width - 1 : s.width;
                boolean absent = s.kind.equals("eng") && seed % 4 == 3;
                s.field.set(o, absent ? null : text(seed + k, width, !s.kind.equals("path")));
            } else if (s.field.getType() == int.class) {
                s.field.setInt(o, hash(seed, k));
            }
        }
        return o;
    }

    /** Lays `o` over `record`, as the library must build the record from it. */
    byte[] toRecord(Object o, byte[] record) throws ReflectiveOperationException {
        ByteBuffer b = ByteBuffer.wrap(record).order(ByteOrder.LITTLE_ENDIAN);
        for (Slot s : slots) {
            int at = s.offset;
            switch (s.kind) {
                case "fe" -> {
                    int[] v = new int[FE.length];
                    for (int i = 0; i < v.length; i++) v[i] = cls.getField(FE[i]).getInt(o);
                    int code = v[0] == 1 || v[0] == 2 ? v[0] : 0; // every other type is 0
                    b.putInt(at, code).putInt(at + 4, v[1]);
                    if (code == 2) b.putInt(at + 8, v[7]);
                    for (int i = 0; code != 2 && i < (code == 0 ? 5 : 3); i++) b.putInt(at + 8 + 4 * i, v[2 + i]);
                }
                case "i32" -> b.putInt(at, s.field.getInt(o));
                case "u8" -> b.put(at, (byte) s.field.getInt(o));
                case "u16", "s16" -> b.putShort(at, (short) s.field.getInt(o));
                case "u32j" -> b.putInt(at, (int) s.field.getLong(o));
                case "i64" -> b.putLong(at, s.field.getLong(o));
                default -> {
                    String v = (String) s.field.get(o);
                    byte[] t = (v == null ? "eng" : v).getBytes(StandardCharsets.UTF_8);
                    Arrays.fill(record, at, at + s.width, (byte) 0);
                    System.arraycopy(t, 0, record, at, Math.min(t.length, s.kind.matches("lang|eng") ? 3 : s.width));
                }
            }
        }
        return record;
    }

    /** Record bytes from `seed`, every text field of the `shaping` layouts made text. */
    byte[] pattern(int seed, List<Layout> shaping) {
        byte[] r = new byte[size];
        for (int i = 0; i < size; i++) r[i] = (byte) hash(seed, i);
        for (Layout l : shaping) l.shapeText(r, seed);
        return r;
    }

    byte[] pattern(int seed) {
        return pattern(seed, List.of(this));
    }

    /**
     * Text fields get ASCII text (bytes fields high bytes): empty, half, full without a zero
     * byte, or one byte long. After the zero comes noise that must not reach Java.
     */
    private void shapeText(byte[] r, int seed) {
        int k = 0;
        for (Slot s : slots) {
            k++;
            if (!s.text() && !s.kind.equals("bytes")) continue;
            int n = new int[] {0, s.width / 2, s.width, 1}[Math.floorMod(seed + k, 4)];
            for (int i = 0; i < s.width; i++) {
                int c = s.text() ? 'A' + (seed + k + i) % 26 : 0x80 | hash(seed, i);
                r[s.offset + i] = (byte) (i < n ? c : i == n ? 0 : hash(k, i) | 1);
            }
        }
    }

    /** Each mapped Java field of `o` holds what `record` says; the others still equal `kept`'s. */
    void assertJava(byte[] record, Object o, Object kept) throws IllegalAccessException {
        List<Field> mapped = new ArrayList<>();
        for (Slot s : slots) {
            if (s.field == null) continue;
            mapped.add(s.field);
            assertEquals(Arrays.deepToString(new Object[] {javaValue(s, record)}),
                    Arrays.deepToString(new Object[] {s.field.get(o)}), s.field.getName());
        }
        for (Field f : cls.getFields()) if (!mapped.contains(f)) assertEquals(f.get(kept), f.get(o), "unmapped " + f.getName());
    }

    static Object javaValue(Slot s, byte[] r) {
        ByteBuffer b = ByteBuffer.wrap(r).order(ByteOrder.LITTLE_ENDIAN);
        int at = s.offset;
        switch (s.kind) {
            case "i32": return b.getInt(at);
            case "u8": return b.get(at) & 0xFF;
            case "u16": return b.getShort(at) & 0xFFFF;
            case "s16": return (int) b.getShort(at);
            case "u32j": return b.getInt(at) & 0xFFFFFFFFL;
            case "i64": return b.getLong(at);
            case "all": return Arrays.copyOfRange(r, at, at + s.width);
            case "pix": return Arrays.copyOfRange(r, at, at + b.getInt(at - 20) * b.getInt(at - 16));
            case "ycc":
                int[] c = new int[s.width];
                for (int i = 0, p = at; i < s.width; i++, p += 4) {
                    c[i] = argb(r[p] & 0xFF, r[p + 1] & 0xFF, r[p + 2] & 0xFF, r[p + 3] & 0xFF);
                }
                return c;
            default:
                int n = 0;
                while (n < s.width && r[at + n] != 0) n++;
                byte[] t = Arrays.copyOfRange(r, at, at + n);
                if (s.kind.equals("bytes")) return t;
                return n == 0 && s.kind.equals("nstr") ? null : new String(t, StandardCharsets.UTF_8);
        }
    }

    /** BT.601 in its centred form, scaled by 1000, truncated toward zero, then limited. */
    static int argb(int y, int cr, int cb, int t) {
        if (y == 0) return 0;
        int r = limit(1164 * (y - 16) + 1596 * (cr - 128));
        int g = limit(1164 * (y - 16) - 813 * (cr - 128) - 392 * (cb - 128));
        return (255 - t) << 24 | r << 16 | g << 8 | limit(1164 * (y - 16) + 2017 * (cb - 128));
    }

    static int limit(int scaled) {
        return Math.max(0, Math.min(255, scaled / 1000));
    }
}
