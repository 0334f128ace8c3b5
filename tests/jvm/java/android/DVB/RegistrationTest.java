package android.DVB;

import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertTrue;

import java.lang.reflect.InvocationTargetException;
import java.lang.reflect.Method;
import java.lang.reflect.Modifier;
import java.util.ArrayList;
import java.util.List;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.CsvSource;

/**
 * Every native method that the Java classes declare is registered: called on an unbound
 * object, each one reaches the library and fails there with IllegalStateException, never with
 * UnsatisfiedLinkError.
 */
class RegistrationTest extends SpyTestBase {

    static Object defaultValue(Class<?> type) {
        if (type == int.class) return 0;
        if (type == long.class) return 0L;
        if (type == boolean.class) return false;
        return null;
    }

    @ParameterizedTest
    @CsvSource({"Scnm, 12", "Strm, 23", "Cfg, 27", "Subttl, 11", "Teltxt, 4"})
    void everyNativeOfTheClassIsRegistered(String name, int count) throws Exception {
        Class<?> cls = Class.forName("android.DVB." + name);
        Object unbound = cls.getDeclaredConstructor(int.class).newInstance(0);
        List<String> natives = new ArrayList<>();
        for (Method m : cls.getDeclaredMethods()) {
            if (!Modifier.isNative(m.getModifiers())) continue;
            natives.add(m.getName());
            Object[] args = new Object[m.getParameterCount()];
            for (int i = 0; i < args.length; i++) args[i] = defaultValue(m.getParameterTypes()[i]);
            try {
                m.invoke(unbound, args);
                throw new AssertionError(m.getName() + " returned on an unbound object");
            } catch (InvocationTargetException e) {
                assertTrue(e.getCause() instanceof IllegalStateException,
                        m.getName() + " threw " + e.getCause());
            }
        }
        assertEquals(count, natives.size(), "natives of " + name + ": " + natives);
        assertEquals(0, Spy.callCount());
    }
}
