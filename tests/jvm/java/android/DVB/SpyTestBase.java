package android.DVB;

import static org.junit.jupiter.api.Assertions.*;

import java.lang.reflect.*;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.time.Duration;
import java.util.*;
import org.junit.jupiter.api.AfterEach;
import org.junit.jupiter.api.BeforeEach;

/** Common ground of the JVM tests: a fresh spy, log and bound DVB object for every test. */
abstract class SpyTestBase {
    /** High half set and low half negative: only the low half may reach a module. */
    static final long HANDLE = 0x7654321089ABCDEFL, LOW = (int) HANDLE;
    static final String GETTER = "2 SCNM getScnm was called";
    static final String NET_BEGIN = "2 SCNM +++android_dvb_Scnm_GetServiceList";
    static final boolean WIDE = System.getProperty("sun.arch.data.model").equals("64");
    static final Duration NO_HANG = Duration.ofMinutes(2); // reached only by a broken wait

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

    /** The module object of class `cls` ("Cfg", ...) bound to `d`. */
    static Object module(DVB d, String cls) throws Throwable {
        return call(d, "get" + cls);
    }

    /** Calls `name` on `target`, handing back what it threw as it threw it. */
    static Object call(Object target, String name, Object... args) throws Throwable {
        for (Method m : target.getClass().getDeclaredMethods()) {
            if (!m.getName().equals(name)) continue;
            m.setAccessible(true);
            try {
                return m.invoke(target, args);
            } catch (InvocationTargetException e) {
                throw e.getCause();
            }
        }
        throw new AssertionError(target.getClass().getSimpleName() + " has no " + name);
    }

    /** The calls the spy saw, one op name each. */
    static List<String> ops() {
        List<String> out = new ArrayList<>();
        for (int i = 0; i < Spy.callCount(); i++) out.add(Spy.op(i));
        return out;
    }

    /** The lines a call of `method` (of class `cls`) writes on entry, before it checks anything. */
    static List<String> entryLines(String cls, String method) {
        List<String> lines = new ArrayList<>();
        if (method.equals("Scnm_GetNetworkList")) lines.add(NET_BEGIN);
        if (cls.equals("Scnm")) lines.add(GETTER);
        if (method.equals("Cfg_Reset")) lines.add("2 CFG android_dvb_Cfg_Reset was called");
        return lines;
    }

    /** The only call the spy saw, which must be of `op`; returns its index. */
    static int onlyCall(String op) {
        assertEquals(List.of(op), ops());
        return 0;
    }

    static ByteBuffer le(byte[] b) {
        return ByteBuffer.wrap(b).order(ByteOrder.LITTLE_ENDIAN);
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

    /**
     * The log lines written since the last call, as "priority tag text", less the DVB lines:
     * objects that earlier tests dropped write theirs whenever the collector finalizes them.
     */
    static List<String> logs() {
        List<String> out = new ArrayList<>(List.of(Spy.takeLogs()));
        out.removeIf(l -> l.startsWith("2 DVB "));
        return out;
    }

    /** Every public field of `actual` equals that of `expected`, arrays element by element. */
    static void assertSameFields(Object expected, Object actual) throws IllegalAccessException {
        for (Field f : expected.getClass().getFields()) {
            assertEquals(Arrays.deepToString(new Object[] {f.get(expected)}),
                    Arrays.deepToString(new Object[] {f.get(actual)}), f.getName());
        }
    }
}
