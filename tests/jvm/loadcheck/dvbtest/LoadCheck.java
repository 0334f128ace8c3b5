package dvbtest;

import java.util.Arrays;
import java.util.List;

/**
 * Loads libDVBjni in a JVM of its own, on a class path where the API classes may be altered,
 * and checks the outcome of the load: the exception that reaches Java and the exact log lines.
 * Usage: LoadCheck MODE. Exits 0 when everything matches.
 */
public final class LoadCheck {
    private static final String REGISTER_DVB = "2 DVB register_android_dvb_DVB was called";
    private static final String REGISTER_CFG = "2 CFG register_android_dvb_Cfg was called";
    private static final String CFG_FAILED =
            "2 CFG register_android_dvb_Cfg failed, could not find the filed";
    private static final String SCNM_FAILED =
            "2 SCNM register_android_dvb_Scnm failed, could not find the filed";
    private static final String LOAD_FAILED = "6 DVB ERROR: DVB native registration failed\n";
    private static final String NATIVE_INIT = "2 DVB android_dvb_DVB_native_init was called";

    static native String[] takeLogs();

    public static void main(String[] args) {
        System.loadLibrary("dvbtest");
        String mode = args[0];
        Throwable thrown = null;
        try {
            Class.forName("android.DVB.DVB");
        } catch (Throwable t) {
            thrown = t;
        }
        List<String> logs = Arrays.asList(takeLogs());
        switch (mode) {
            case "ok":
                expect(thrown, null, null);
                expectLogs(logs, REGISTER_DVB, REGISTER_CFG, NATIVE_INIT);
                break;
            case "no-scnm-class":
                expect(thrown, "java.lang.RuntimeException", "Can't find android/DVB/Scnm");
                expectLogs(logs, REGISTER_DVB, SCNM_FAILED, LOAD_FAILED);
                break;
            case "no-scnm-field":
                expect(thrown, "java.lang.RuntimeException", "Can't find Tuner.mNativeContext");
                expectLogs(logs, REGISTER_DVB, SCNM_FAILED, LOAD_FAILED);
                break;
            case "no-strm-field":
                expect(thrown, "java.lang.RuntimeException", "Can't find Tuner.mNativeContext");
                expectLogs(logs, REGISTER_DVB, LOAD_FAILED);
                break;
            case "no-cfg-class":
                expect(thrown, "java.lang.RuntimeException", "Can't find android/DVB/Cfg");
                expectLogs(logs, REGISTER_DVB, REGISTER_CFG, CFG_FAILED, LOAD_FAILED);
                break;
            case "no-cfg-field":
                expect(thrown, "java.lang.RuntimeException", "Can't find cfg.mNativeContext");
                expectLogs(logs, REGISTER_DVB, REGISTER_CFG, CFG_FAILED, LOAD_FAILED);
                break;
            case "no-subttl-class":
                expect(thrown, "java.lang.RuntimeException", "Can't find android/DVB/Subttl");
                expectLogs(logs, REGISTER_DVB, REGISTER_CFG, LOAD_FAILED);
                break;
            case "no-teltxt-field":
                expect(thrown, "java.lang.RuntimeException", "Can't find Tuner.mNativeContext");
                expectLogs(logs, REGISTER_DVB, REGISTER_CFG, LOAD_FAILED);
                break;
            case "no-dvb-field":
                expect(thrown, "java.lang.RuntimeException", "Can't find DVB.mNativeContext");
                expectLogs(logs, REGISTER_DVB, REGISTER_CFG, NATIVE_INIT);
                break;
            case "no-post-event":
                expect(thrown, "java.lang.RuntimeException", "Can't find DVB.postEventFromNative");
                expectLogs(logs, REGISTER_DVB, REGISTER_CFG, NATIVE_INIT);
                break;
            default:
                fail("unknown mode " + mode);
        }
        System.out.println("LoadCheck " + mode + ": ok");
    }

    /** The failure reaches Java from the class's static initializer, wrapped by the VM. */
    private static void expect(Throwable thrown, String cls, String message) {
        if (cls == null) {
            if (thrown != null) fail("unexpected " + thrown);
            return;
        }
        Throwable cause = thrown instanceof ExceptionInInitializerError ? thrown.getCause() : thrown;
        if (cause == null) fail("expected " + cls + ", got nothing");
        if (!cause.getClass().getName().equals(cls) || !message.equals(cause.getMessage())) {
            fail("expected " + cls + ": " + message + ", got " + cause);
        }
    }

    private static void expectLogs(List<String> logs, String... expected) {
        if (!logs.equals(Arrays.asList(expected))) {
            fail("log lines " + logs + ", expected " + Arrays.asList(expected));
        }
    }

    private static void fail(String message) {
        System.out.println("LoadCheck failed: " + message);
        System.exit(1);
    }
}
