package android.DVB;

import static org.junit.jupiter.api.Assertions.*;
import static org.junit.jupiter.api.Assumptions.assumeTrue;

import java.lang.ref.WeakReference;
import java.util.*;
import java.util.concurrent.atomic.AtomicLong;
import org.junit.jupiter.api.Test;

/** Library entry, binding of the DVB object, its references, the listener and its events. */
class DvbTest extends SpyTestBase {

    /** The lines of DVB `methods`, each its own, then setDVB's with `address` (0: none) as %p. */
    static List<String> lines(long address, String... methods) {
        String p = address == 0 ? "(nil)" : String.format("0x%x", address);
        List<String> lines = new ArrayList<>();
        for (String m : methods) lines.add("2 DVB android_dvb_DVB_" + m + " was called");
        lines.addAll(List.of("2 DVB setDVB was called", "2 DVB setDVB dvb.get() " + p,
                "2 DVB setDVB dvb obj was set to context " + p));
        return lines;
    }

    /** The only live DVB object, which only the Java object holds, with the only listener. */
    static long onlyDvb() {
        long[] live = Spy.liveDvbs();
        assertEquals(List.of(1, 1, 1), List.of(live.length, Spy.strongCount(live[0]), Spy.liveListenerCount()),
                "live objects, references to it (the Java object's only), listeners (earlier ones gone)");
        return live[0];
    }

    /** Nothing bound, not even by earlier tests, and no global reference events so far. */
    void startUnbound() {
        dvb.release();
        dvb = null;
        for (int i = 0; i < 3 && Spy.liveDvbs().length > 0; i++) {
            System.gc();
            System.runFinalization();
        }
        assertEquals(0, Spy.liveDvbs().length + Spy.liveListenerCount(), "earlier tests' objects");
        Spy.takeGlobalRefEvents();
        Spy.takeLogs();
    }

    /** Global references made on the test and service threads, and made minus deleted. */
    static List<Integer> refs() {
        String[] events = Spy.takeGlobalRefEvents();
        int made = (int) Arrays.stream(events).filter(e -> e.startsWith("new")).count();
        return List.of(made, 2 * made - events.length);
    }

    @Test
    void loadRegistersEveryClassAndReturnsVersion14() {
        assertArrayEquals(new int[] {0x00010004, 0, 0}, Spy.entryPoints(),
                "JNI_OnLoad's version, then the callbacks' 0");
        assertEquals(List.of("2 DVB register_android_dvb_DVB was called",
                "2 CFG register_android_dvb_Cfg was called"), List.of(Spy.takeLogs()));
    }

    @Test
    void bindingLifeCycleWithItsLinesAndReferences() throws Throwable {
        startUnbound();
        dvb = new DVB();
        assertEquals(List.of("new class", "new object"), List.of(Spy.takeGlobalRefEvents()));
        long first = onlyDvb();
        if (!WIDE) assertEquals(first, dvb.nativeContext() & 0xFFFFFFFFL);
        int firstContext = dvb.nativeContext();
        Spy.takeLogs();
        call(dvb, "native_setup", new WeakReference<>(dvb)); // binds anew, drops the first
        long second = onlyDvb();
        assertNotEquals(first, second);
        assertNotEquals(firstContext, dvb.nativeContext());
        assertEquals(lines(second, "native_setup"), List.of(Spy.takeLogs()));
        assertEquals(List.of(2, 0), refs(), "the first binding's references went with it");
        dvb.release();
        assertEquals(List.of("delete object", "delete class"), List.of(Spy.takeGlobalRefEvents()));
        assertEquals(List.of(0, 0, 0), List.of(dvb.nativeContext(), Spy.liveDvbs().length, Spy.liveListenerCount()));
        assertEquals(lines(0, "release"), List.of(Spy.takeLogs()));
        dvb.release(); // an unbound object only logs
        assertEquals(lines(0, "release"), List.of(Spy.takeLogs()));
        dvb.finalize();
        assertEquals(lines(0, "native_finalize", "release"), List.of(Spy.takeLogs()));
        dvb = null;
    }

    @Test
    void eventsAndCallsReachEachObjectsOwnTarget() {
        DVB other = new DVB();
        List<Throwable> uncaught = Collections.synchronizedList(new ArrayList<>());
        Thread.UncaughtExceptionHandler previous = Thread.getDefaultUncaughtExceptionHandler();
        Thread.setDefaultUncaughtExceptionHandler((t, e) -> uncaught.add(e));
        try {
            List<Object[]> got = Collections.synchronizedList(new ArrayList<>());
            DVB.OnEventListener l = (d, msg, e1, e2, obj) -> {
                got.add(new Object[] {d, msg, e1, e2, obj, Thread.currentThread()});
                if (d == other) throw new IllegalStateException("listener " + e1);
            };
            dvb.setOnEventListener(l);
            other.setOnEventListener(l);
            Spy.raise(1, 2, 3, 3, 1);
            assertEquals(6, got.size(), "a throwing listener loses no later event");
            for (Object[] e : got) {
                assertEquals(Arrays.asList(1, 2, 3, null), Arrays.asList(e[1], e[2], e[3], e[4]));
                assertNotEquals(Thread.currentThread(), e[5], "delivered on the service's thread");
            }
            assertEquals(List.of(3L, 3, "listener 2"), List.of(got.stream().filter(e -> e[0] == dvb).count(),
                    uncaught.size(), uncaught.get(0).getMessage()), "events to dvb, listener throws, first message");

            other.getCfg().Cfg_Stop(1);
            dvb.getCfg().Cfg_Stop(2);
            long[] live = Spy.liveDvbs();
            assertEquals(List.of(live[1], live[0]), List.of(Spy.owner(0), Spy.owner(1)));
        } finally {
            Thread.setDefaultUncaughtExceptionHandler(previous);
            other.release();
        }
    }

    /**
     * A 64-bit build keeps contexts in a table of 4096 bound objects: all of them bind, the
     * next native_setup raises RuntimeException("Out of memory") and leaves nothing behind.
     */
    @Test
    @SuppressWarnings({"deprecation", "removal"})
    void theContextTableHoldsExactly4096BoundObjects() {
        assumeTrue(WIDE, "a 32-bit context is the address itself");
        startUnbound();
        List<DVB> bound = new ArrayList<>();
        try {
            RuntimeException e = assertThrows(RuntimeException.class, () -> {
                while (bound.size() <= 4096) bound.add(new DVB());
            });
            assertEquals("java.lang.RuntimeException: Out of memory", e.toString());
            assertEquals(List.of(4096, 4096, 4096), List.of(bound.size(), Spy.liveDvbs().length,
                    Spy.liveListenerCount()), "bound; live objects and listeners, the refused one's gone");
            assertEquals(List.of(2 * 4097, 2 * 4096), refs(), "the refused listener's references too");
        } finally {
            bound.forEach(DVB::release);
            Spy.takeLogs();
        }
        assertEquals(0, Spy.liveDvbs().length);
        dvb = new DVB(); // room again
    }

    /**
     * Java threads calling module methods while the service raises events from native threads
     * and other DVB objects are bound and released: every event reaches the long-lived object
     * once, and afterwards every object, listener and global reference is gone.
     */
    @Test
    void concurrentCallsEventsAndBindings() throws Exception {
        startUnbound();
        dvb = new DVB();
        AtomicLong received = new AtomicLong();
        dvb.setOnEventListener((d, msg, e1, e2, obj) -> received.addAndGet(msg == 42 ? 1 : 0));
        List<Throwable> failures = Collections.synchronizedList(new ArrayList<>());
        List<Thread> threads = new ArrayList<>();
        for (int t = 0; t < 3; t++) {
            threads.add(new Thread(() -> {
                Teltxt.TELTXT_NavPages nav = new Teltxt.TELTXT_NavPages();
                for (int i = 0; i < 2000; i++) {
                    assertEquals(0, dvb.getCfg().Cfg_GetStatus(i, new Cfg.ANT_Status()));
                    assertEquals(0, dvb.getTeltxt().Teltxt_GetData(i, 0, 64, new byte[64]));
                    dvb.getTeltxt().Teltxt_SetData(i, 1, 2, nav);
                }
            }));
        }
        threads.add(new Thread(() -> Spy.raise(42, 0, 0, 500, 4)));
        threads.forEach(t -> t.setUncaughtExceptionHandler((th, e) -> failures.add(e)));
        threads.forEach(Thread::start);
        for (int i = 0; i < 300; i++) { // on the test thread, whose global references are watched
            DVB other = new DVB();
            other.setOnEventListener((d, msg, e1, e2, obj) -> { });
            other.getCfg().Cfg_Stop(i);
            other.release();
        }
        for (Thread t : threads) t.join();
        assertEquals(List.of(), failures);
        assertEquals(2000, received.get(), "events to the bound object");
        dvb.release();
        dvb = null;
        assertEquals(0, Spy.liveDvbs().length + Spy.liveListenerCount(), "objects or listeners left");
        assertEquals(List.of(2 * 301, 0), refs(), "two global references per bound object, all gone");
    }
}
