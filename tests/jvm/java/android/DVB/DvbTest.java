package android.DVB;

import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertFalse;
import static org.junit.jupiter.api.Assertions.assertNotEquals;
import static org.junit.jupiter.api.Assertions.assertNull;
import static org.junit.jupiter.api.Assertions.assertSame;
import static org.junit.jupiter.api.Assertions.assertTrue;

import java.lang.ref.WeakReference;
import java.lang.reflect.InvocationTargetException;
import java.lang.reflect.Method;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.Collections;
import java.util.List;
import org.junit.jupiter.api.Test;

/** Library entry, binding of the DVB object, the listener and its events. */
class DvbTest extends SpyTestBase {

    /** %p as this C library prints it. */
    static String pointer(long address) {
        return address == 0 ? "(nil)" : String.format("0x%x", address);
    }

    static long onlyDvb() {
        long[] live = Spy.liveDvbs();
        assertEquals(1, live.length, "live DVB objects");
        return live[0];
    }

    static void invoke(DVB target, String name, Object... args) throws Exception {
        Class<?>[] types = new Class<?>[args.length];
        Arrays.fill(types, Object.class);
        Method m = DVB.class.getDeclaredMethod(name, types);
        m.setAccessible(true);
        try {
            m.invoke(target, args);
        } catch (InvocationTargetException e) {
            throw (Exception) e.getCause();
        }
    }

    @Test
    void loadRegistersEveryClassAndReturnsVersion14() {
        assertEquals(0x00010004, Spy.callOnLoad());
        assertLogs("2 DVB register_android_dvb_DVB was called",
                "2 CFG register_android_dvb_Cfg was called");
    }

    @Test
    void setupBindsNewObjectWithOneReferenceAndListener() {
        long address = onlyDvb();
        assertNotEquals(0, dvb.nativeContext());
        if (Spy.pointerSize() == 4) assertEquals(address, dvb.nativeContext() & 0xFFFFFFFFL);
        assertEquals(1, Spy.strongCount(address), "the Java object's reference only");
        assertTrue(Spy.hasListener(address));
        assertEquals(1, Spy.liveListenerCount());
    }

    @Test
    void setupWritesItsLogLines() {
        dvb.release();
        Spy.takeLogs();
        dvb = new DVB();
        long address = onlyDvb();
        assertLogs("2 DVB android_dvb_DVB_native_setup was called",
                "2 DVB setDVB was called",
                "2 DVB setDVB dvb.get() " + pointer(address),
                "2 DVB setDVB dvb obj was set to context " + pointer(address));
    }

    @Test
    void releaseDestroysObjectAndListenerAndSecondReleaseOnlyLogs() {
        dvb.release();
        assertEquals(0, dvb.nativeContext());
        assertEquals(0, Spy.liveDvbCount());
        assertEquals(0, Spy.liveListenerCount());
        assertLogs("2 DVB android_dvb_DVB_release was called",
                "2 DVB setDVB was called",
                "2 DVB setDVB dvb.get() (nil)",
                "2 DVB setDVB dvb obj was set to context (nil)");
        dvb.release();
        assertLogs("2 DVB android_dvb_DVB_release was called",
                "2 DVB setDVB was called",
                "2 DVB setDVB dvb.get() (nil)",
                "2 DVB setDVB dvb obj was set to context (nil)");
        dvb = null;
    }

    @Test
    void finalizeLogsThenReleases() {
        dvb.finalize();
        assertEquals(0, Spy.liveDvbCount());
        assertLogs("2 DVB android_dvb_DVB_native_finalize was called",
                "2 DVB android_dvb_DVB_release was called",
                "2 DVB setDVB was called",
                "2 DVB setDVB dvb.get() (nil)",
                "2 DVB setDVB dvb obj was set to context (nil)");
        dvb = null;
    }

    @Test
    void secondSetupReplacesAndDropsFirstObject() throws Exception {
        long first = onlyDvb();
        int firstContext = dvb.nativeContext();
        invoke(dvb, "native_setup", new WeakReference<>(dvb));
        long second = onlyDvb();
        assertNotEquals(first, second);
        assertNotEquals(firstContext, dvb.nativeContext());
        assertEquals(1, Spy.strongCount(second));
        assertEquals(1, Spy.liveListenerCount(), "the first listener went with its object");
    }

    @Test
    void oneEventArrivesAsOneCallWithNullObject() throws Exception {
        List<Object[]> got = Collections.synchronizedList(new ArrayList<>());
        dvb.setOnEventListener((d, msg, e1, e2, obj) ->
                got.add(new Object[] {d, msg, e1, e2, obj, Thread.currentThread()}));
        Spy.raise(1, 2, 3, 1, 1);
        assertEquals(1, got.size());
        Object[] e = got.get(0);
        assertSame(dvb, e[0]);
        assertEquals(Arrays.asList(1, 2, 3), Arrays.asList(e[1], e[2], e[3]));
        assertNull(e[4]);
        assertNotEquals(Thread.currentThread(), e[5], "delivered on the service's thread");
    }

    @Test
    void eventsFromSeveralServiceThreadsAreNeitherLostNorDoubled() {
        int[] count = new int[1];
        dvb.setOnEventListener((d, msg, e1, e2, obj) -> {
            synchronized (count) {
                count[0]++;
            }
        });
        Spy.raise(7, -1, Integer.MIN_VALUE, 250, 4);
        assertEquals(1000, count[0]);
    }

    @Test
    void throwingListenerLosesNoLaterEvent() {
        List<Throwable> uncaught = Collections.synchronizedList(new ArrayList<>());
        Thread.UncaughtExceptionHandler previous = Thread.getDefaultUncaughtExceptionHandler();
        Thread.setDefaultUncaughtExceptionHandler((t, e) -> uncaught.add(e));
        try {
            int[] count = new int[1];
            dvb.setOnEventListener((d, msg, e1, e2, obj) -> {
                count[0]++;
                throw new IllegalStateException("listener " + e1);
            });
            Spy.raise(5, 9, 0, 3, 1);
            assertEquals(3, count[0]);
            assertEquals(3, uncaught.size());
            assertEquals("listener 9", uncaught.get(0).getMessage());
        } finally {
            Thread.setDefaultUncaughtExceptionHandler(previous);
        }
    }

    @Test
    void eventsReachEachObjectsOwnTarget() {
        DVB other = new DVB();
        try {
            List<DVB> got = Collections.synchronizedList(new ArrayList<>());
            dvb.setOnEventListener((d, msg, e1, e2, obj) -> got.add(d));
            other.setOnEventListener((d, msg, e1, e2, obj) -> got.add(d));
            Spy.raise(1, 0, 0, 1, 1);
            assertEquals(2, got.size());
            assertTrue(got.contains(dvb) && got.contains(other));
        } finally {
            other.release();
        }
    }

    @Test
    void listenerHoldsTwoGlobalRefsAndDeletesObjectBeforeClass() {
        dvb.release();
        Spy.trackGlobalRefs();
        Spy.takeGlobalRefEvents();
        dvb = new DVB();
        assertEquals(Arrays.asList("new class", "new object"), Arrays.asList(Spy.takeGlobalRefEvents()));
        dvb.release();
        assertEquals(Arrays.asList("delete object", "delete class"),
                Arrays.asList(Spy.takeGlobalRefEvents()));
        dvb = null;
    }

    @Test
    void nothingLeaksOverManyBindings() {
        dvb.release();
        Spy.trackGlobalRefs();
        Spy.takeGlobalRefEvents();
        for (int i = 0; i < 200; i++) {
            DVB d = new DVB();
            if (i % 2 == 0) Spy.raise(1, i, 0, 1, 1);
            d.release();
        }
        assertEquals(0, Spy.liveDvbCount());
        assertEquals(0, Spy.liveListenerCount());
        int balance = 0;
        for (String e : Spy.takeGlobalRefEvents()) balance += e.startsWith("new") ? 1 : -1;
        assertEquals(0, balance, "global references made minus deleted");
        dvb = null;
    }

    @Test
    void releasedObjectKeepsNoContext() {
        int context = dvb.nativeContext();
        dvb.release();
        assertEquals(0, dvb.nativeContext());
        assertFalse(context == 0);
        dvb = null;
    }
}
