package dvbdemo;

import android.DVB.Cfg;
import android.DVB.DVB;
import java.util.concurrent.CountDownLatch;
import java.util.concurrent.TimeUnit;

/**
 * Binds a DVB object to the substitute service, tunes a front end, reads its status and prints
 * the events that the service raises.
 */
public final class Demo {
    public static void main(String[] args) throws InterruptedException {
        int wanted = args.length > 0 ? Integer.parseInt(args[0]) : 3;
        CountDownLatch events = new CountDownLatch(wanted);
        DVB dvb = new DVB();
        dvb.setOnEventListener((source, msg, ext1, ext2, obj) -> {
            System.out.printf("event msg=%d ext1=%d ext2=%d on %s%n", msg, ext1, ext2,
                    Thread.currentThread().getName());
            events.countDown();
        });
        System.out.println("bound a DVB object to the substitute service");

        Cfg cfg = dvb.getCfg();
        Cfg.ANT_FrontendParameters fe = new Cfg.ANT_FrontendParameters();
        fe.type = 1;
        fe.frequency = 11_778_000;
        fe.symbolRate = 27_500;
        System.out.println("Cfg_Tune -> " + cfg.Cfg_Tune(0, fe));
        Cfg.ANT_Status status = new Cfg.ANT_Status();
        System.out.println("Cfg_GetStatus -> " + cfg.Cfg_GetStatus(0, status) + ": feStatus="
                + status.feStatus + " strength=" + status.strength + " quality=" + status.quality);

        boolean all = events.await(10, TimeUnit.SECONDS);
        System.out.println(all ? "received " + wanted + " events" : "timed out waiting for events");
        dvb.release();
        System.exit(all ? 0 : 1);
    }
}
