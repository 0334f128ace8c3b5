package android.DVB;

import static org.junit.jupiter.api.Assertions.assertArrayEquals;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertThrows;

import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.util.Arrays;
import java.util.Collections;
import java.util.List;
import java.util.function.ToLongFunction;
import java.util.stream.Stream;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.Arguments;
import org.junit.jupiter.params.provider.MethodSource;
import org.junit.jupiter.params.provider.ValueSource;

class TeltxtTest extends SpyTestBase {
    static final int CHUNK = 524288;

    Teltxt teltxt() {
        return dvb.getTeltxt();
    }

    /** The byte the spy's decoder holds at `position` of its data. */
    static byte teletextByte(long position) {
        return (byte) ((position * 31 + 7) ^ (position >> 8));
    }

    static String repeat(char c, int n) {
        char[] chars = new char[n];
        Arrays.fill(chars, c);
        return new String(chars);
    }

    static byte[] ascii(String s) {
        byte[] b = new byte[s.length()];
        for (int i = 0; i < b.length; i++) b[i] = (byte) s.charAt(i);
        return b;
    }

    static Teltxt.TELTXT_Settings settings(String langCode, String streamName, int pid) {
        Teltxt.TELTXT_Settings s = new Teltxt.TELTXT_Settings();
        s.devId = -0x12345678;
        s.pid = pid;
        s.type = 0x1A2;
        s.langCode = langCode;
        s.magazineNumber = 0x1B3;
        s.pageNumber = -1;
        s.componetTag = 0x2C4;
        s.streamName = streamName;
        return s;
    }

    /**
     * Language code, its bytes in the record, stream name, its bytes in the record, and the
     * PID as the record holds it; the bytes are written out by hand, not derived.
     */
    static Stream<Arguments> settingsCases() {
        String name32 = "ABCDEFGHIJKLMNOPQRSTUVWXYZ012345";
        return Stream.of(
                Arguments.of("deu", bytes('d', 'e', 'u', 0), "ARD Text", ascii("ARD Text"),
                        0x1FFF, 0x1FFF),
                Arguments.of("", bytes(0, 0, 0, 0), "", new byte[0], 70000, 4464),
                Arguments.of("engl5", ascii("engl"), name32, ascii(name32), 0x1234, 0x1234),
                Arguments.of("nld", ascii("nld\0"), name32 + "abcdefgh", ascii(name32), -1, 0xFFFF),
                // modified UTF-8: U+0000 as C0 80, a two-byte letter cut after its first byte
                Arguments.of("a\0b", bytes(0x61, 0xC0, 0x80, 0x62), "\u00fc", bytes(0xC3, 0xBC),
                        0, 0),
                Arguments.of("xyz\u00e9", bytes('x', 'y', 'z', 0xC3), "\u20ac",
                        bytes(0xE2, 0x82, 0xAC), 0x100, 0x100));
    }

    @ParameterizedTest
    @MethodSource("settingsCases")
    void startBuildsTheSettingsRecord(String langCode, byte[] langBytes, String streamName,
            byte[] nameBytes, int pid, int storedPid) {
        Teltxt.TELTXT_Settings s = settings(langCode, streamName, pid);
        Spy.setResult("Teltxt::Start", 5);
        assertEquals(5L, teltxt().Teltxt_Start(s));
        ByteBuffer want = ByteBuffer.allocate(48).order(ByteOrder.LITTLE_ENDIAN);
        want.putInt(0, -0x12345678).putShort(4, (short) storedPid).put(6, (byte) 0xA2);
        want.position(7);
        want.put(langBytes);
        want.put(11, (byte) 0xB3).put(12, (byte) 0xFF).put(13, (byte) 0xC4);
        want.position(14);
        want.put(nameBytes);
        want.putShort(46, (short) storedPid);
        assertArrayEquals(want.array(), Spy.record(onlyCall("Teltxt::Start"), 0));
        assertLogs();
    }

    @ParameterizedTest
    @ValueSource(ints = {5, -2, 0, Integer.MIN_VALUE, Integer.MAX_VALUE})
    void startWidensTheHandleWithItsSign(int handle) {
        Spy.setResult("Teltxt::Start", handle);
        assertEquals((long) handle, teltxt().Teltxt_Start(settings("deu", "x", 1)));
    }

    /** Java handles and the 32-bit handles the module must see. */
    static final long[][] HANDLES = {
        {5, 5}, {(1L << 32) + 5, 5}, {-2, -2}, {0x80000000L, Integer.MIN_VALUE}, {-1L << 32, 0},
    };

    @Test
    void stopPassesTheLowHandleBitsAndReturnsZeroWhateverTheModuleSays() {
        for (long[] h : HANDLES) {
            Spy.reset();
            Spy.setResult("Teltxt::Stop", -1);
            assertEquals(0, teltxt().Teltxt_Stop(h[0]));
            assertArrayEquals(new long[] {h[1]}, Spy.args(onlyCall("Teltxt::Stop")), "" + h[0]);
        }
        assertLogs();
    }

    @Test
    void setDataWritesAllFourValuesAndReturnsTheModuleResult() {
        Spy.setOut("Teltxt::SetData", 3, 0, le32(100));
        Spy.setOut("Teltxt::SetData", 4, 0, le32(-190));
        Spy.setOut("Teltxt::SetData", 5, 0, le32(210));
        Spy.setOut("Teltxt::SetData", 6, 0, le32(0x7FFFFFFF));
        Spy.setResult("Teltxt::SetData", -9);
        Teltxt.TELTXT_NavPages nav = new Teltxt.TELTXT_NavPages();
        assertEquals(-9, teltxt().Teltxt_SetData((1L << 32) + 5, -3, 0x10000, nav));
        assertEquals(Arrays.asList(100, -190, 210, 0x7FFFFFFF),
                Arrays.asList(nav.prev100, nav.prev10, nav.next10, nav.next100));
        int call = onlyCall("Teltxt::SetData");
        assertArrayEquals(new long[] {5, -3, 0x10000, 0, 0, 0, 0}, Spy.args(call));
        for (int r = 0; r < 4; r++) assertArrayEquals(le32(0), Spy.record(call, r), "value " + r);
        assertLogs();
    }

    @Test
    void setDataValueTheModuleLeavesAloneArrivesAsZero() {
        Spy.setOut("Teltxt::SetData", 5, 0, le32(399));
        Spy.setResult("Teltxt::SetData", 1);
        Teltxt.TELTXT_NavPages nav = new Teltxt.TELTXT_NavPages();
        nav.prev100 = nav.prev10 = nav.next10 = nav.next100 = 77;
        assertEquals(1, teltxt().Teltxt_SetData(-2, 0, 0, nav));
        assertEquals(Arrays.asList(0, 0, 399, 0),
                Arrays.asList(nav.prev100, nav.prev10, nav.next10, nav.next100));
        assertEquals(-2, Spy.args(onlyCall("Teltxt::SetData"))[0]);
    }

    /** A byte count and the (offset, count) pieces the module must be asked for. */
    static Stream<Arguments> pieces() {
        return Stream.of(
                Arguments.of(1, new int[][] {{0, 1}}),
                Arguments.of(CHUNK, new int[][] {{0, CHUNK}}),
                Arguments.of(CHUNK + 1, new int[][] {{0, CHUNK}, {CHUNK, 1}}),
                Arguments.of(1200000, new int[][] {{0, CHUNK}, {CHUNK, CHUNK}, {1048576, 151424}}));
    }

    @ParameterizedTest
    @MethodSource("pieces")
    void getDataFetchesInPiecesAndFillsTheWholeArray(int count, int[][] expected) {
        Spy.setResult("Teltxt::GetData", -1);
        byte[] data = new byte[count];
        assertEquals(0, teltxt().Teltxt_GetData((1L << 32) + 5, 0, count, data));
        assertEquals(expected.length, Spy.callCount());
        for (int i = 0; i < expected.length; i++) {
            assertEquals("Teltxt::GetData", Spy.op(i));
            assertArrayEquals(new long[] {5, expected[i][0], expected[i][1], 0}, Spy.args(i),
                    "piece " + i);
        }
        for (int i = 0; i < count; i++) {
            if (data[i] != teletextByte(i)) assertEquals(teletextByte(i), data[i], "byte " + i);
        }
        assertLogs();
    }

    @Test
    void getDataWritesFromTheStartIndexAndLeavesTheRest() {
        byte[] data = new byte[60];
        Arrays.fill(data, (byte) 0x55);
        assertEquals(0, teltxt().Teltxt_GetData(-2, 10, 40, data));
        assertArrayEquals(new long[] {-2, 0, 40, 0}, Spy.args(onlyCall("Teltxt::GetData")));
        for (int i = 0; i < data.length; i++) {
            byte want = i >= 10 && i < 50 ? teletextByte(i - 10) : 0x55;
            assertEquals(want, data[i], "element " + i);
        }
    }

    @Test
    void getDataOfNothingCallsNothing() {
        byte[] data = bytes(1, 2, 3);
        assertEquals(0, teltxt().Teltxt_GetData(5, 0, 0, data));
        assertEquals(0, teltxt().Teltxt_GetData(5, 3, 0, data));
        assertArrayEquals(bytes(1, 2, 3), data);
        assertEquals(0, Spy.callCount());
        // an empty region that starts past the end is refused like any other
        assertThrows(ArrayIndexOutOfBoundsException.class,
                () -> teltxt().Teltxt_GetData(5, 4, 0, data));
        assertEquals(0, Spy.callCount());
    }

    @ParameterizedTest
    @ValueSource(ints = {5, -1, 8})
    void getDataOutsideTheArrayLeavesTheBoundsExceptionAfterFetching(int start) {
        byte[] data = new byte[8];
        Arrays.fill(data, (byte) 0x33);
        assertThrows(ArrayIndexOutOfBoundsException.class,
                () -> teltxt().Teltxt_GetData(5, start, 10, data));
        assertArrayEquals(new long[] {5, 0, 10, 0}, Spy.args(onlyCall("Teltxt::GetData")));
        byte[] untouched = new byte[8];
        Arrays.fill(untouched, (byte) 0x33);
        assertArrayEquals(untouched, data);
    }

    @Test
    void getDataRefusesANegativeCount() {
        IllegalArgumentException e = assertThrows(IllegalArgumentException.class,
                () -> teltxt().Teltxt_GetData(5, 0, -5, new byte[8]));
        assertEquals("count -5 is negative", e.getMessage());
        assertEquals(0, Spy.callCount());
        assertLogs();
    }

    @Test
    void nullArgumentsRaiseNullPointerExceptionWithoutModuleCall() {
        String[][] cases = {
            {null, "x", "TELTXT_Settings.langCode is null"},
            {"deu", null, "TELTXT_Settings.streamName is null"},
            {null, null, "TELTXT_Settings.langCode is null"},
        };
        for (String[] c : cases) {
            NullPointerException e = assertThrows(NullPointerException.class,
                    () -> teltxt().Teltxt_Start(settings(c[0], c[1], 1)));
            assertEquals(c[2], e.getMessage());
        }
        NullPointerException e = assertThrows(NullPointerException.class,
                () -> teltxt().Teltxt_Start(null));
        assertEquals("TELTXT_Settings is null", e.getMessage());
        e = assertThrows(NullPointerException.class,
                () -> teltxt().Teltxt_SetData(5, 0, 0, null));
        assertEquals("TELTXT_NavPages is null", e.getMessage());
        e = assertThrows(NullPointerException.class,
                () -> teltxt().Teltxt_GetData(5, 0, 4, null));
        assertEquals("data is null", e.getMessage());
        assertEquals(0, Spy.callCount());
        assertLogs();
    }

    static final List<ToLongFunction<Teltxt>> EVERY_METHOD = Arrays.asList(
            t -> t.Teltxt_Start(settings("deu", "x", 1)),
            t -> t.Teltxt_Stop(5),
            t -> t.Teltxt_SetData(5, 1, 2, new Teltxt.TELTXT_NavPages()),
            t -> t.Teltxt_GetData(5, 0, 4, new byte[4]));

    void assertEveryMethodFindsNoModule(Teltxt t) {
        for (ToLongFunction<Teltxt> m : EVERY_METHOD) {
            IllegalStateException e =
                    assertThrows(IllegalStateException.class, () -> m.applyAsLong(t));
            assertEquals(null, e.getMessage());
        }
        Teltxt.TELTXT_NavPages nav = new Teltxt.TELTXT_NavPages();
        nav.prev100 = 7;
        byte[] data = bytes(9, 9);
        assertThrows(IllegalStateException.class, () -> t.Teltxt_SetData(5, 1, 2, nav));
        assertThrows(IllegalStateException.class, () -> t.Teltxt_GetData(5, 0, 2, data));
        assertEquals(7, nav.prev100);
        assertArrayEquals(bytes(9, 9), data);
        assertEquals(0, Spy.callCount());
        assertEquals(Collections.emptyList(), logs());
    }

    @Test
    void unboundObjectRaisesIllegalStateSilently() {
        assertEveryMethodFindsNoModule(new Teltxt(0));
    }

    @Test
    void missingModuleRaisesIllegalStateSilently() {
        dvb.release();
        Spy.omit(new String[] {"Teltxt"});
        dvb = new DVB();
        Spy.takeLogs();
        assertEveryMethodFindsNoModule(teltxt());
    }
}
