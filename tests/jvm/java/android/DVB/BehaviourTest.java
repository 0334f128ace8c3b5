package android.DVB;

import static org.junit.jupiter.api.Assertions.*;

import java.io.File;
import java.nio.charset.StandardCharsets;
import java.util.*;
import java.util.concurrent.atomic.AtomicInteger;
import org.junit.jupiter.api.*;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.*;

/** The methods whose arguments are not records of one layout, and the rules of their own. */
class BehaviourTest extends SpyTestBase {
    static final File EPG_DB = new File(System.getProperty("dvb.epgdb", "/nonexistent/epg.db"));

    @BeforeEach
    @AfterEach
    void removeDatabase() {
        EPG_DB.delete();
    }

    static String ascii(int length) {
        return "abcdefghijklmnopqrstuvwxyz".repeat(12).substring(0, length);
    }

    @ParameterizedTest
    @ValueSource(ints = {0, 1, 255, 256, 300})
    void aDumpPathIsCutAfter255BytesAndZeroEnded(int length) {
        Spy.setResult("Cfg::TSDumpStart", -1);
        assertEquals(0, dvb.getCfg().Cfg_TSDumpStart(1, 2, 3, ascii(length)));
        int call = onlyCall("Cfg::TSDumpStart");
        assertArrayEquals(new long[] {1, 2, 3, 0}, Spy.args(call));
        byte[] want = new byte[256];
        System.arraycopy(ascii(length).getBytes(StandardCharsets.US_ASCII), 0, want, 0, Math.min(length, 255));
        assertArrayEquals(want, Spy.record(call, 0));
    }

    /** Count, then the pieces the module must be asked for: offset, size, offset, size... */
    @ParameterizedTest
    @CsvSource({"1, 0 1", "524288, 0 524288", "524289, 0 524288 524288 1",
        "1200000, 0 524288 524288 524288 1048576 151424"})
    void teletextDataComesInPiecesOfHalfAMegabyte(int count, String pieces) {
        Spy.setResult("Teltxt::GetData", -1);
        byte[] data = new byte[count + 10];
        assertEquals(0, dvb.getTeltxt().Teltxt_GetData(HANDLE, 10, count, data));
        String[] p = pieces.split(" ");
        assertEquals(p.length / 2, Spy.callCount());
        for (int i = 0; i < p.length / 2; i++) {
            assertEquals("Teltxt::GetData", Spy.op(i));
            assertArrayEquals(new long[] {LOW, Long.parseLong(p[2 * i]), Long.parseLong(p[2 * i + 1]), 0},
                    Spy.args(i), "piece " + i);
        }
        byte[] want = new byte[count + 10]; // from 10 on, what the spy's decoder holds
        for (int at = 0; at < count; at++) want[10 + at] = (byte) ((at * 31 + 7) ^ (at >> 8));
        assertArrayEquals(want, data);
    }

    @Test
    void teletextDataOfNothingOrOfANegativeCountCallsNothing() {
        byte[] data = bytes(1, 2, 3);
        assertEquals(0, dvb.getTeltxt().Teltxt_GetData(5, 3, 0, data));
        assertThrows(ArrayIndexOutOfBoundsException.class,
                () -> dvb.getTeltxt().Teltxt_GetData(5, 4, 0, data));
        assertEquals("count -5 is negative", assertThrows(IllegalArgumentException.class,
                () -> dvb.getTeltxt().Teltxt_GetData(5, 0, -5, data)).getMessage());
        assertArrayEquals(bytes(1, 2, 3), data);
        assertEquals(0, Spy.callCount());
    }

    @ParameterizedTest
    @CsvSource({"128, 128", "300, 300", "64, 128"})
    void aStreamPathThatDoesNotFitIsRefused(int chars, int bytes) {
        Strm.STRM_OpenSettings o = new Strm.STRM_OpenSettings();
        o.szPath = chars == bytes ? ascii(chars) : "\u00e9".repeat(chars);
        assertEquals("STRM_OpenSettings.szPath is " + bytes + " bytes; at most 127 fit",
                assertThrows(IllegalArgumentException.class, () -> dvb.getStrm().Strm_Open(o)).getMessage());
        assertEquals(0, Spy.callCount());
    }

    /** Bad bytes in module text become U+FFFD (its end without a zero byte: ContractTest). */
    @Test
    void moduleTextEndsAtItsFieldAndBadBytesAreReplaced() {
        byte[] info = new byte[1728];
        le(info).putInt(68, 2);
        byte[] bad = bytes('a', 0xFF, 'b', 0xC0, 0x80, 0xE2, 0x82, 'c', 0xC3, 0);
        System.arraycopy(bad, 0, info, 72 + 46 + 13, bad.length);
        Spy.setOut("Strm::CreatStreamInfo", 1, 0, info);
        dvb.getStrm().Strm_CreatStreamInfo(0, new Strm.STRM_StreamInfo());
        Strm.AudioContent a = new Strm.AudioContent();
        dvb.getStrm().Strm_GetAudioStreamInfo(1, a);
        assertEquals("a\uFFFDb\u0000\uFFFD\uFFFDc\uFFFD", a.streamName);
    }

    @Test
    void systemStartUpWaitsForTheEventDatabaseAndShutDownNever() throws Exception {
        Scnm s = dvb.getScnm();
        Scnm.DVB_Config config = new Scnm.DVB_Config();
        config.displayMode = 1080;
        config.sdkMode = -2;
        Spy.setResult("Scnm::Dvb_SystemUnInit", -3);
        assertEquals(0, (int) assertTimeoutPreemptively(NO_HANG, () -> s.Dvb_SystemUnInit(config)));
        assertFalse(EPG_DB.exists());
        AtomicInteger result = new AtomicInteger(99);
        Spy.setResult("Scnm::Dvb_SystemInit", -3);
        Thread caller = new Thread(() -> result.set(s.Dvb_SystemInit(config)));
        caller.start();
        while (Spy.callCount() < 2 && caller.isAlive()) Thread.sleep(5);
        Thread.sleep(600); // time enough for a call that does not wait to return
        assertTrue(caller.isAlive(), "returned before the database existed");
        assertTrue(EPG_DB.createNewFile());
        caller.join(NO_HANG.toMillis());
        assertFalse(caller.isAlive(), "still waiting although the database exists");
        assertEquals(0, result.get());
        assertEquals(0, (int) assertTimeoutPreemptively(NO_HANG, () -> s.Dvb_SystemInit(config)));
        assertEquals(List.of("Scnm::Dvb_SystemUnInit", "Scnm::Dvb_SystemInit", "Scnm::Dvb_SystemInit"), ops());
        for (int call = 0; call < 3; call++) assertArrayEquals(le32(1080, -2), Spy.record(call, 0));
        assertEquals(List.of(GETTER, GETTER, GETTER), logs());
    }
}
