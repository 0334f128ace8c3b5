package android.DVB;

import java.util.concurrent.BlockingQueue;
import java.util.concurrent.LinkedBlockingQueue;

/**
 * A JVM of its own beside the end-to-end tests, on the event database that DVB_EPG_DB names.
 * "fill ONID:TSID:SID..." starts the receiver, collects those services and prints "stored SID"
 * as each one's store commits, until it is killed; "open ONID:TSID:SID" starts the receiver and
 * prints what EPG_GetEvent then answers for the service. Both first print "open RESULT", the
 * start-up event's result.
 */
final class ReceiverChild {
    public static void main(String[] args) throws InterruptedException {
        BlockingQueue<int[]> events = new LinkedBlockingQueue<>();
        DVB dvb = new DVB();
        dvb.setOnEventListener((d, msg, e1, e2, obj) -> events.add(new int[] {msg, e1, e2}));
        dvb.getScnm().Dvb_SystemInit(new Scnm.DVB_Config());
        int[] e;
        while ((e = events.take())[0] != 230) continue;
        System.out.println("open " + e[1]);
        Strm strm = dvb.getStrm();
        for (int i = 1; i < args.length; i++) {
            String[] ids = args[i].split(":");
            Strm.EpgSvc svc = new Strm.EpgSvc();
            svc.onId = Integer.parseInt(ids[0]);
            svc.tsId = Integer.parseInt(ids[1]);
            svc.svcId = Integer.parseInt(ids[2]);
            if (args[0].equals("fill")) {
                strm.EpgMd_AddService(svc);
                continue;
            }
            Strm.STRM_OpenSettings open = new Strm.STRM_OpenSettings();
            open.szPath = "";
            Strm.EpgEvent event = new Strm.EpgEvent();
            int result = strm.EPG_GetEvent(strm.Strm_Open(open), svc, event, new Strm.ExtEpgEvent());
            System.out.println("event " + result + " " + event.evtId + " " + event.startTime);
        }
        while (args[0].equals("fill")) {
            if ((e = events.take())[0] == 260) System.out.println("stored " + e[1]);
        }
        dvb.release();
        // The receiver's service thread is attached to this VM: leave without waiting for it.
        System.exit(0);
    }
}
