package android.DVB;

import static org.junit.jupiter.api.Assertions.*;
import static org.junit.jupiter.api.Assumptions.assumeTrue;

import java.lang.reflect.*;
import java.util.*;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.*;

/**
 * The failure paths that every module method shares, swept over each class's declared natives:
 * no DVB object, no module, null argument objects, null strings in a record. None of them
 * reaches a module, and each writes exactly its class's lines.
 */
class FailureTest extends SpyTestBase {
    static List<Method> natives(Class<?> cls) {
        return Arrays.stream(cls.getDeclaredMethods()).filter(m -> Modifier.isNative(m.getModifiers()))
                .sorted(Comparator.comparing(Method::getName)).toList();
    }

    static final Map<Class<?>, Object> PLAIN = Map.of(int.class, 0, long.class, 0L, boolean.class, false,
            String.class, "x", byte[].class, new byte[8]);

    /** Arguments for `m`: zeros, and fresh objects whose strings are set; null at `nullAt`. */
    static Object[] args(Method m, int nullAt) throws ReflectiveOperationException {
        Class<?>[] types = m.getParameterTypes();
        Object[] values = new Object[types.length];
        for (int i = 0; i < types.length; i++) {
            Class<?> t = types[i];
            if (i == nullAt) continue;
            values[i] = PLAIN.containsKey(t) ? PLAIN.get(t) : t.getDeclaredConstructor().newInstance();
            for (Field f : t.getFields()) if (f.getType() == String.class) f.set(values[i], "abc");
        }
        return values;
    }

    /** The lines a call of `method` writes when its module is out of reach. */
    static List<String> noModuleLines(String cls, String method, boolean bound) {
        List<String> lines = entryLines(cls, method);
        if (cls.equals("Scnm")) {
            if (!bound) lines.add("2 SCNM could not get the dvb obj from context");
            lines.add(method.matches("Scnm_(Init|Open|Close|Start|Stop|GetStatus)")
                    ? "2 SCNM android_dvb_Scnm_Init,could not get the dvb obj from context"
                    : "2 SCNM android_dvb_Tuner_StartAVPlay,could not get the dvb obj from context");
        }
        if (cls.equals("Cfg") && !bound) lines.add("3 CFG could not get the dvb obj from context");
        return lines;
    }

    static void assertRaises(Class<? extends Throwable> type, String message, Object target,
            Method m, Object[] values) {
        Throwable e = assertThrows(type, () -> assertTimeoutPreemptively(NO_HANG,
                () -> call(target, m.getName(), values)), m.getName());
        assertEquals(message, e.getMessage(), m.getName());
    }

    /** A null argument object is named; an unbound object or a missing module is refused. */
    @ParameterizedTest
    @CsvSource({"Scnm, 12", "Strm, 23", "Cfg, 27", "Subttl, 11", "Teltxt, 4"})
    void everyNativeIsRegisteredAndRefusesNullsAndAMissingModule(String name, int count)
            throws Throwable {
        Class<?> cls = Class.forName("android.DVB." + name);
        assertEquals(count, natives(cls).size());
        Object target = module(dvb, name);
        for (Method m : natives(cls)) {
            Class<?>[] types = m.getParameterTypes();
            for (int i = 0; i < types.length; i++) {
                if (types[i].isPrimitive()) continue;
                String what = types[i] == String.class ? "path"
                        : types[i] == byte[].class ? "data" : types[i].getSimpleName();
                assertRaises(NullPointerException.class, what + " is null", target, m, args(m, i));
                assertEquals(entryLines(name, m.getName()), logs(), m.getName());
            }
        }
        Object unbound = cls.getDeclaredConstructor(int.class).newInstance(0);
        dvb.release();
        Spy.omit(new String[] {name});
        dvb = new DVB();
        Spy.takeLogs();
        for (Object refusing : List.of(unbound, module(dvb, name))) { // the second lacks its module
            for (Method m : natives(cls)) {
                assertRaises(IllegalStateException.class, null, refusing, m, args(m, -1));
                assertEquals(noModuleLines(name, m.getName(), refusing != unbound), logs(), m.getName());
            }
        }
        assertEquals(0, Spy.callCount());
    }

    @Test
    void aNullStringInARecordIsNamedWithItsField() throws Throwable {
        for (ContractTest.Row r : ContractTest.ROWS) for (int i = 0; i < r.args().length; i++) {
            if (!(r.args()[i] instanceof ContractTest.Rec rec) || !rec.in()) continue;
            for (Layout.Slot s : rec.layout().slots) {
                if (s.field() == null || s.field().getType() != String.class || s.kind().equals("eng")) continue;
                Object[] values = r.args().clone();
                for (int k = 0; k < values.length; k++) {
                    if (values[k] instanceof ContractTest.Rec x) values[k] = x.layout().fill(x.layout().create(), 1);
                }
                s.field().set(values[i], null);
                Throwable e = assertThrows(NullPointerException.class,
                        () -> call(module(dvb, r.cls()), r.method(), values), r.method());
                assertEquals(rec.layout().cls.getSimpleName() + "." + s.field().getName() + " is null",
                        e.getMessage());
            }
        }
        assertEquals(0, Spy.callCount());
    }

    @Test
    void aReleasedContextNoLongerReachesItsObject() throws Throwable {
        assumeTrue(WIDE, "a 32-bit context is the object's address, which the next object may well reuse");
        Cfg stale = dvb.getCfg();
        dvb.release();
        dvb = new DVB();
        assertNull(assertThrows(IllegalStateException.class, () -> stale.Cfg_Stop(0)).getMessage());
        assertEquals(0, Spy.callCount());
    }
}
