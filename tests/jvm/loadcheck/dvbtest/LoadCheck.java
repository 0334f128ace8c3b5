package dvbtest;

import java.lang.reflect.*;
import java.util.*;

/**
 * Loads libDVBjni in a JVM of its own, on a class path where the API classes may be altered,
 * and checks the outcome of the load: the exception that reaches Java and the exact log lines.
 * Usage: LoadCheck MODE. Exits 0 when everything matches.
 */
public final class LoadCheck {
    static final String DVB = "2 DVB register_android_dvb_DVB was called";
    static final String CFG = "2 CFG register_android_dvb_Cfg was called";
    static final String CFG_FAILED = "2 CFG register_android_dvb_Cfg failed, could not find the filed";
    static final String SCNM_FAILED = "2 SCNM register_android_dvb_Scnm failed, could not find the filed";
    static final String FAILED = "6 DVB ERROR: DVB native registration failed\n";
    static final String INIT = "2 DVB android_dvb_DVB_native_init was called";
    static final String TUNER = "Can't find Tuner.mNativeContext";

    /** Mode, the RuntimeException's message (null: none), then the log lines. */
    static final String[][] MODES = {
        {"ok", null, DVB, CFG, INIT},
        {"no-scnm-class", "Can't find android/DVB/Scnm", DVB, SCNM_FAILED, FAILED},
        {"no-scnm-field", TUNER, DVB, SCNM_FAILED, FAILED},
        {"no-strm-field", TUNER, DVB, FAILED},
        {"no-cfg-class", "Can't find android/DVB/Cfg", DVB, CFG, CFG_FAILED, FAILED},
        {"no-cfg-field", "Can't find cfg.mNativeContext", DVB, CFG, CFG_FAILED, FAILED},
        {"no-subttl-class", "Can't find android/DVB/Subttl", DVB, CFG, FAILED},
        {"no-teltxt-field", TUNER, DVB, CFG, FAILED},
        {"no-dvb-field", "Can't find DVB.mNativeContext", DVB, CFG, INIT},
        {"no-post-event", "Can't find DVB.postEventFromNative", DVB, CFG, INIT},
        {"no-fields", null, DVB, CFG, INIT},
    };

    /** Arguments of the types that are not record classes. */
    static final Map<Class<?>, Object> PLAIN =
            Map.of(int.class, 0, long.class, 0L, boolean.class, false, String.class, "x", byte[].class, new byte[16]);

    static native String[] takeLogs();

    public static void main(String[] args) throws Exception {
        System.loadLibrary("dvbtest");
        Throwable thrown = null;
        try {
            Class.forName("android.DVB.DVB");
        } catch (Throwable t) {
            thrown = t instanceof ExceptionInInitializerError ? t.getCause() : t;
        }
        List<String> logs = Arrays.asList(takeLogs());
        for (String[] m : MODES) {
            if (!m[0].equals(args[0])) continue;
            String got = thrown == null ? null : thrown.getClass().getName() + ": " + thrown.getMessage();
            String want = m[1] == null ? null : "java.lang.RuntimeException: " + m[1];
            if (want == null ? got != null : !want.equals(got)) fail("expected " + want + ", got " + got);
            List<String> lines = Arrays.asList(m).subList(2, m.length);
            if (!logs.equals(lines)) fail("log lines " + logs + ", expected " + lines);
            if (m[0].equals("no-fields")) checkFields();
            System.out.println("LoadCheck " + args[0] + ": ok");
            return;
        }
        fail("unknown mode " + args[0]);
    }

    /**
     * On record classes that have lost every field, each native method that reads or fills a
     * record object must stop at its first failed look-up and leave the VM's NoSuchFieldError
     * for Java (under -Xcheck:jni, making no further JNI call), never crash.
     */
    static void checkFields() throws Exception {
        Class<?> dvbClass = Class.forName("android.DVB.DVB");
        Object dvb = dvbClass.getConstructor().newInstance();
        int checked = 0;
        for (String name : new String[] {"Scnm", "Strm", "Cfg", "Subttl", "Teltxt"}) {
            Class<?> cls = Class.forName("android.DVB." + name);
            Object module = cls.getConstructor(dvbClass).newInstance(dvb);
            for (Method m : cls.getDeclaredMethods()) {
                List<Class<?>> types = Arrays.asList(m.getParameterTypes());
                if (!Modifier.isNative(m.getModifiers())
                        || types.stream().noneMatch(t -> t.getName().startsWith("android.DVB."))) continue;
                Object[] values = new Object[types.size()];
                for (int i = 0; i < values.length; i++) {
                    Class<?> t = types.get(i);
                    values[i] = PLAIN.containsKey(t) ? PLAIN.get(t) : t.getConstructor().newInstance();
                }
                try {
                    m.invoke(module, values);
                    fail(m.getName() + " returned normally");
                } catch (InvocationTargetException e) {
                    if (!(e.getCause() instanceof NoSuchFieldError)) fail(m.getName() + " threw " + e.getCause());
                }
                checked++;
            }
        }
        dvbClass.getMethod("release").invoke(dvb);
        if (checked != 42) fail(checked + " methods take a record object, expected 42");
    }

    static void fail(String message) {
        System.out.println("LoadCheck failed: " + message);
        System.exit(1);
    }
}
