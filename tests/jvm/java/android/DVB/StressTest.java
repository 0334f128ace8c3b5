package android.DVB;

import static org.junit.jupiter.api.Assertions.assertEquals;

import java.util.ArrayList;
import java.util.List;
import java.util.concurrent.ConcurrentLinkedQueue;
import java.util.concurrent.CountDownLatch;
import java.util.concurrent.atomic.AtomicLong;
import org.junit.jupiter.api.Test;

/**
 * Java threads calling module methods while the service raises events from native threads and
 * other DVB objects are bound and released: nothing crashes, the long-lived object receives
 * every event exactly once, and afterwards every object, listener and global reference is gone.
 */
class StressTest extends SpyTestBase {
    static final int CALLERS = 3;
    static final int CALLS = 2000;
    static final int CYCLES = 300;
    static final int EVENT_THREADS = 4;
    static final int EVENTS = 500;

    @Test
    void concurrentCallsEventsAndBindings() throws Exception {
        dvb.release();
        Spy.trackGlobalRefs();
        Spy.takeGlobalRefEvents();
        dvb = new DVB();
        AtomicLong received = new AtomicLong();
        dvb.setOnEventListener((d, msg, e1, e2, obj) -> {
            if (msg == 42) received.incrementAndGet();
        });
        ConcurrentLinkedQueue<Throwable> failures = new ConcurrentLinkedQueue<>();
        CountDownLatch start = new CountDownLatch(1);
        List<Thread> threads = new ArrayList<>();
        for (int t = 0; t < CALLERS; t++) {
            threads.add(new Thread(() -> {
                try {
                    start.await();
                    Cfg cfg = dvb.getCfg();
                    Teltxt teltxt = dvb.getTeltxt();
                    Cfg.ANT_Status status = new Cfg.ANT_Status();
                    Teltxt.TELTXT_NavPages nav = new Teltxt.TELTXT_NavPages();
                    byte[] data = new byte[64];
                    for (int i = 0; i < CALLS; i++) {
                        if (cfg.Cfg_GetStatus(i, status) != 0) throw new AssertionError("status");
                        if (teltxt.Teltxt_GetData(i, 0, 64, data) != 0) throw new AssertionError("data");
                        teltxt.Teltxt_SetData(i, 1, 2, nav);
                    }
                } catch (Throwable e) {
                    failures.add(e);
                }
            }));
        }
        threads.add(new Thread(() -> {
            try {
                Spy.trackGlobalRefs();
                start.await();
                for (int i = 0; i < CYCLES; i++) {
                    DVB other = new DVB();
                    other.setOnEventListener((d, msg, e1, e2, obj) -> { });
                    other.getCfg().Cfg_Stop(i);
                    other.release();
                }
            } catch (Throwable e) {
                failures.add(e);
            }
        }));
        threads.add(new Thread(() -> {
            try {
                start.await();
                Spy.raise(42, 0, 0, EVENTS, EVENT_THREADS);
            } catch (Throwable e) {
                failures.add(e);
            }
        }));
        threads.forEach(Thread::start);
        start.countDown();
        for (Thread t : threads) t.join();
        assertEquals(new ArrayList<Throwable>(), new ArrayList<>(failures));
        assertEquals((long) EVENTS * EVENT_THREADS, received.get(), "events to the bound object");

        dvb.release();
        dvb = null;
        assertEquals(0, Spy.liveDvbCount(), "DVB objects left");
        assertEquals(0, Spy.liveListenerCount(), "listeners left");
        int balance = 0;
        int made = 0;
        for (String e : Spy.takeGlobalRefEvents()) {
            if (e.startsWith("new")) made++;
            balance += e.startsWith("new") ? 1 : -1;
        }
        assertEquals(2 * (CYCLES + 1), made, "two global references per bound object");
        assertEquals(0, balance, "global references made minus deleted");
    }
}
