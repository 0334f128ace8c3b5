package android.DVB;

import static org.junit.jupiter.api.Assertions.assertArrayEquals;
import static org.junit.jupiter.api.Assertions.assertEquals;

import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.List;
import org.junit.jupiter.api.AfterEach;
import org.junit.jupiter.api.BeforeEach;

/**
 * Common ground of the JVM tests: a fresh spy and log for every test, one bound DVB object,
 * and readers for what the spy recorded.
 */
abstract class SpyTestBase {
    static final int VERBOSE = 2;
    static final int DEBUG = 3;
    static final int ERROR = 6;

    static {
        Spy.reset(); // loads the test library first
    }

    protected DVB dvb;

    @BeforeEach
    void freshSpy() {
        Spy.reset();
        dvb = new DVB();
        Spy.takeLogs();
    }

    @AfterEach
    void releaseDvb() {
        if (dvb != null) dvb.release();
        Spy.omit(new String[0]);
    }

    /** The calls the spy saw, one op name each. */
    static List<String> ops() {
        List<String> out = new ArrayList<>();
        for (int i = 0; i < Spy.callCount(); i++) out.add(Spy.op(i));
        return out;
    }

    /** The only call the spy saw, which must be of `op`; returns its index. */
    static int onlyCall(String op) {
        assertEquals(Arrays.asList(op), ops());
        return 0;
    }

    /** Record `r` of call `call`, little-endian. */
    static ByteBuffer rec(int call, int r) {
        return ByteBuffer.wrap(Spy.record(call, r)).order(ByteOrder.LITTLE_ENDIAN);
    }

    static byte[] le32(int... values) {
        ByteBuffer b = ByteBuffer.allocate(4 * values.length).order(ByteOrder.LITTLE_ENDIAN);
        for (int v : values) b.putInt(v);
        return b.array();
    }

    static byte[] bytes(int... values) {
        byte[] b = new byte[values.length];
        for (int i = 0; i < values.length; i++) b[i] = (byte) values[i];
        return b;
    }

    /** Every log line written since the last call, as "priority tag text". */
    static List<String> logs() {
        return Arrays.asList(Spy.takeLogs());
    }

    static void assertLogs(String... expected) {
        assertEquals(Arrays.asList(expected), logs());
    }

    static void assertBytes(byte[] expected, ByteBuffer actual, int offset) {
        byte[] got = new byte[expected.length];
        ByteBuffer d = actual.duplicate();
        d.position(offset);
        d.get(got);
        assertArrayEquals(expected, got, "bytes at offset " + offset);
    }

    static void assertZero(ByteBuffer b, int from, int to) {
        for (int i = from; i < to; i++) assertEquals(0, b.get(i), "byte " + i);
    }
}
