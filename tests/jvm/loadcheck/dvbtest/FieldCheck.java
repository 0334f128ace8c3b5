package dvbtest;

import java.lang.reflect.InvocationTargetException;
import java.lang.reflect.Method;
import java.lang.reflect.Modifier;

/**
 * Runs on API classes whose record classes have lost every field: each native method that
 * reads or fills a record object must stop at its first failed look-up and leave the VM's
 * NoSuchFieldError for Java (under -Xcheck:jni, making no further JNI call), never crash.
 */
public final class FieldCheck {
    public static void main(String[] args) throws Exception {
        Class<?> dvbClass = Class.forName("android.DVB.DVB");
        Object dvb = dvbClass.getConstructor().newInstance();
        int checked = 0;
        for (String name : new String[] {"Scnm", "Strm", "Cfg", "Subttl", "Teltxt"}) {
            Class<?> cls = Class.forName("android.DVB." + name);
            Object module = cls.getConstructor(dvbClass).newInstance(dvb);
            for (Method m : cls.getDeclaredMethods()) {
                if (!Modifier.isNative(m.getModifiers()) || !takesRecord(m)) continue;
                Object[] values = new Object[m.getParameterCount()];
                Class<?>[] types = m.getParameterTypes();
                for (int i = 0; i < values.length; i++) values[i] = valueOf(types[i]);
                try {
                    m.invoke(module, values);
                    fail(m.getName() + " returned normally");
                } catch (InvocationTargetException e) {
                    if (!(e.getCause() instanceof NoSuchFieldError)) {
                        fail(m.getName() + " threw " + e.getCause());
                    }
                }
                checked++;
            }
        }
        dvbClass.getMethod("release").invoke(dvb);
        if (checked != 42) fail(checked + " methods take a record object, expected 42");
        System.out.println("FieldCheck: " + checked + " methods left NoSuchFieldError pending");
    }

    static boolean takesRecord(Method m) {
        for (Class<?> t : m.getParameterTypes()) {
            if (t.getName().startsWith("android.DVB.")) return true;
        }
        return false;
    }

    static Object valueOf(Class<?> type) throws Exception {
        if (type == int.class) return 0;
        if (type == long.class) return 0L;
        if (type == boolean.class) return false;
        if (type == String.class) return "x";
        if (type == byte[].class) return new byte[16];
        return type.getConstructor().newInstance();
    }

    static void fail(String message) {
        System.out.println("FieldCheck failed: " + message);
        System.exit(1);
    }
}
