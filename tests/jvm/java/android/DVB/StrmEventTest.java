package android.DVB;

import static android.DVB.StrmPlaybackTest.HANDLE;
import static android.DVB.StrmPlaybackTest.assertEveryMethodFailsWithoutModule;
import static android.DVB.StrmPlaybackTest.assertIndexRefused;
import static android.DVB.StrmPlaybackTest.assertNullsRefused;
import static android.DVB.StrmPlaybackTest.strmLogs;
import static org.junit.jupiter.api.Assertions.assertArrayEquals;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertNull;
import static org.junit.jupiter.api.Assertions.assertThrows;

import android.DVB.StrmPlaybackTest.NullCase;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.nio.charset.StandardCharsets;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.List;
import java.util.function.ToLongFunction;
import org.junit.jupiter.api.AfterAll;
import org.junit.jupiter.api.AfterEach;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.CsvSource;
import org.junit.jupiter.params.provider.ValueSource;

/** Present and following events, their extended items, the stream clock, the event database. */
class StrmEventTest extends SpyTestBase {

    Strm strm() {
        return dvb.getStrm();
    }

    @AfterEach
    void releaseAndDropDvb() {
        if (dvb != null) dvb.release();
        dvb = null;
    }

    @AfterAll
    static void finalizeLeftovers() {
        StrmPlaybackTest.finalizeLeftovers();
    }

    static byte[] ascii(String s) {
        return s.getBytes(StandardCharsets.ISO_8859_1);
    }

    static byte[] filled(int length, int first) {
        byte[] b = new byte[length];
        for (int i = 0; i < length; i++) b[i] = (byte) (first + i % 90);
        return b;
    }

    /** A 336-byte event record: narrow fields at their limits, name and text as given. */
    static byte[] event(int evtId, byte[] name, byte[] text) {
        ByteBuffer b = ByteBuffer.allocate(336).order(ByteOrder.LITTLE_ENDIAN);
        b.putShort(0, (short) evtId).putShort(2, (short) 0xEEEE).putInt(4, -1).putInt(8, 5400);
        b.put(12, (byte) 0xFF).put(13, (byte) 12).put(14, (byte) 0x80).put(15, (byte) 0xEE);
        b.putShort(16, (short) 0x8001).putShort(18, (short) 2);
        b.position(20);
        b.put(name);
        b.position(72);
        b.put(text);
        b.put(328, (byte) 1).put(329, (byte) 0xEE);
        return b.array();
    }

    static void assertEvent(int evtId, byte[] name, byte[] text, Strm.EpgEvent e) {
        assertEquals(Arrays.asList(evtId, -1, 5400, 255, 12, 128, 0x8001, 2, 1),
                Arrays.asList(e.evtId, e.startTime, e.duration, e.runStatus, e.parentalRating,
                        e.content, e.refSvcId, e.refEvtId, e.extendedFlag));
        assertArrayEquals(name, e.name, "name");
        assertArrayEquals(text, e.text, "text");
    }

    /** A 3588-byte extended record with the given item count, items and text. */
    static byte[] ext(int itemCount, List<String[]> items, byte[] text) {
        ByteBuffer b = ByteBuffer.allocate(3588).order(ByteOrder.LITTLE_ENDIAN);
        b.putInt(0, itemCount);
        for (int k = 0; k < items.size(); k++) {
            b.position(4 + 96 * k);
            b.put(ascii(items.get(k)[0]));
            b.position(4 + 96 * k + 32);
            b.put(ascii(items.get(k)[1]));
        }
        b.position(1540);
        b.put(text);
        return b.array();
    }

    /** `count` items of generation `tag`: description "<tag>d<k>", text "<tag>t<k>". */
    static List<String[]> items(String tag, int count) {
        List<String[]> out = new ArrayList<>();
        for (int k = 0; k < count; k++) out.add(new String[] {tag + "d" + k, tag + "t" + k});
        return out;
    }

    static List<String> logLines(List<String[]> items) {
        List<String> out = new ArrayList<>();
        for (String[] i : items) out.add("2 STRM mExtEvtNow item: " + i[1] + " itemDesc : " + i[0]);
        return out;
    }

    List<String> readNow(int k) {
        Strm.ExtEpgEventItem item = new Strm.ExtEpgEventItem();
        assertEquals(0, strm().Strm__GetExtEPGEventNow(k, item));
        return Arrays.asList(item.itemDesc, item.type);
    }

    List<String> readNext(int k) {
        Strm.ExtEpgEventItem item = new Strm.ExtEpgEventItem();
        assertEquals(0, strm().Strm__GetExtEPGEventNext(k, item));
        return Arrays.asList(item.itemDesc, item.type);
    }

    /** Scripts Strm::GetAllEvent with `now` and `next` items (counts as given) and calls it. */
    List<Strm.ExtEpgEvent> getAllEvent(int nowCount, List<String[]> now, int nextCount,
            List<String[]> next) {
        Spy.reset();
        Spy.setOut("Strm::GetAllEvent", 3, 0, ext(nowCount, now, ascii("now text")));
        Spy.setOut("Strm::GetAllEvent", 4, 0, ext(nextCount, next, ascii("next text")));
        Strm.ExtEpgEvent nowExt = new Strm.ExtEpgEvent();
        Strm.ExtEpgEvent nextExt = new Strm.ExtEpgEvent();
        assertEquals(0, strm().Strm_GetAllEvent(HANDLE, new Strm.EpgEvent(), new Strm.EpgEvent(),
                nowExt, nextExt));
        return Arrays.asList(nowExt, nextExt);
    }

    // ---- Strm_GetAllEvent ---------------------------------------------------------------------

    @Test
    void getAllEventFillsBothEventsTheirItemsAndTheCaches() {
        byte[] nowName = bytes(0x05, 'N', 0xE9, 'w', 's'); // a table selector and a Latin byte
        byte[] nextName = ascii("Film");
        byte[] nowText = ascii("Today's news");
        byte[] nextText = filled(200, 33);
        List<String[]> nowItems = items("a", 2);
        List<String[]> nextItems = items("b", 3);
        Spy.setOut("Strm::GetAllEvent", 1, 0, event(0xFFFF, nowName, nowText));
        Spy.setOut("Strm::GetAllEvent", 2, 0, event(7, nextName, nextText));
        Spy.setOut("Strm::GetAllEvent", 3, 0, ext(2, nowItems, ascii("now extended")));
        Spy.setOut("Strm::GetAllEvent", 4, 0, ext(3, nextItems, ascii("next extended")));
        Spy.setResult("Strm::GetAllEvent", -1);
        Strm.EpgEvent now = new Strm.EpgEvent();
        Strm.EpgEvent next = new Strm.EpgEvent();
        Strm.ExtEpgEvent nowExt = new Strm.ExtEpgEvent();
        Strm.ExtEpgEvent nextExt = new Strm.ExtEpgEvent();

        assertEquals(0, strm().Strm_GetAllEvent(HANDLE, now, next, nowExt, nextExt));
        int call = onlyCall("Strm::GetAllEvent");
        assertEquals(5, Spy.args(call)[0]);
        for (int r = 0; r < 4; r++) assertZero(rec(call, r), 0, r < 2 ? 336 : 3588);
        assertEvent(65535, nowName, nowText, now);
        assertEvent(7, nextName, nextText, next);
        assertEquals(Arrays.asList(2, "now extended", 3, "next extended"),
                Arrays.asList(nowExt.itemCount, nowExt.text, nextExt.itemCount, nextExt.text));
        List<String> lines = logLines(nowItems);
        lines.addAll(logLines(nextItems));
        assertEquals(lines, strmLogs());
        assertEquals(Arrays.asList("ad1", "at1"), readNow(1));
        assertEquals(Arrays.asList("bd2", "bt2"), readNext(2));
        assertEquals(1, Spy.callCount(), "item reads call nothing");
    }

    @ParameterizedTest
    @CsvSource({"16, 0", "8, 5", "16, 16", "16, 20", "3, -1"})
    void aDeliveryOverwritesOnlyItsItemsAndLogsEachCopiedItem(int before, int count) {
        getAllEvent(before, items("o", before), before, items("p", before));
        Spy.takeLogs();
        int copied = Integer.compareUnsigned(count, 16) > 0 ? 16 : count;
        List<Strm.ExtEpgEvent> got =
                getAllEvent(count, items("n", copied), count, items("m", copied));
        assertEquals(Arrays.asList(copied, copied),
                Arrays.asList(got.get(0).itemCount, got.get(1).itemCount));
        List<String> lines = logLines(items("n", copied));
        lines.addAll(logLines(items("m", copied)));
        assertEquals(lines, strmLogs());
        for (int k = 0; k < Math.max(before, copied); k++) {
            boolean fresh = k < copied;
            String now = fresh ? "n" : "o";
            String next = fresh ? "m" : "p";
            assertEquals(Arrays.asList(now + "d" + k, now + "t" + k), readNow(k), "now " + k);
            assertEquals(Arrays.asList(next + "d" + k, next + "t" + k), readNext(k), "next " + k);
        }
    }

    @Test
    void emptyItemFieldsReachJavaAsNull() {
        List<String[]> now = Arrays.asList(new String[] {"", "only text"},
                new String[] {"only desc", ""}, new String[] {"", ""});
        getAllEvent(3, now, 0, items("x", 0));
        assertEquals(Arrays.asList(null, "only text"), readNow(0));
        assertEquals(Arrays.asList("only desc", null), readNow(1));
        assertEquals(Arrays.asList(null, null), readNow(2));
        assertEquals(Arrays.asList("2 STRM mExtEvtNow item: only text itemDesc : ",
                "2 STRM mExtEvtNow item:  itemDesc : only desc",
                "2 STRM mExtEvtNow item:  itemDesc : "), strmLogs());
    }

    @Test
    void fullItemFieldsEndAtTheirFieldsEndInJavaAndInTheLog() {
        String desc = "D".repeat(32);
        String text = "T".repeat(64);
        getAllEvent(2, Arrays.asList(new String[] {desc, text}, new String[] {"next", "x"}), 0,
                items("x", 0));
        assertEquals(Arrays.asList(desc, text), readNow(0));
        assertEquals(Arrays.asList("2 STRM mExtEvtNow item: " + text + " itemDesc : " + desc,
                "2 STRM mExtEvtNow item: x itemDesc : next"), strmLogs());
    }

    @ParameterizedTest
    @ValueSource(ints = {0, 51, 52})
    void namesAndTextsAreExactlyTheirBytesInEveryEventMethod(int length) {
        byte[] name = filled(length, 0xA0); // bytes that are not valid modified UTF-8
        byte[] text = filled(256, 0x21);    // fills the field; extendedFlag follows
        byte[] rec = event(1, name, text);
        Spy.setOut("Strm::GetAllEvent", 1, 0, rec);
        Spy.setOut("Strm::GetAllEvent", 2, 0, rec);
        Spy.setOut("Strm::GetEvent", 1, 0, rec);
        Spy.setOut("Strm::EPG_GetEvent", 2, 0, rec);
        List<Strm.EpgEvent> got = new ArrayList<>();
        for (int i = 0; i < 4; i++) got.add(new Strm.EpgEvent());
        strm().Strm_GetAllEvent(0, got.get(0), got.get(1), new Strm.ExtEpgEvent(),
                new Strm.ExtEpgEvent());
        strm().Strm_GetEvent(0, got.get(2));
        strm().EPG_GetEvent(0, new Strm.EpgSvc(), got.get(3), new Strm.ExtEpgEvent());
        for (Strm.EpgEvent e : got) assertEvent(1, name, text, e);
    }

    @Test
    void extendedTextIsAStringEndingAtItsFieldsEnd() {
        Spy.setOut("Strm::GetAllEvent", 3, 0, ext(0, items("x", 0), ascii("e".repeat(2048))));
        byte[] bad = {'o', 'k', (byte) 0xC0, (byte) 0x80, (byte) 0xFF, (byte) 0xE2, (byte) 0x82};
        Spy.setOut("Strm::GetAllEvent", 4, 0, ext(0, items("x", 0), bad));
        Strm.ExtEpgEvent now = new Strm.ExtEpgEvent();
        Strm.ExtEpgEvent next = new Strm.ExtEpgEvent();
        strm().Strm_GetAllEvent(0, new Strm.EpgEvent(), new Strm.EpgEvent(), now, next);
        assertEquals("e".repeat(2048), now.text);
        assertEquals("ok\u0000\uFFFD\uFFFD\uFFFD", next.text);
    }

    @Test
    void silentModuleGivesZerosEmptyArraysAndEmptyText() {
        Strm.EpgEvent e = new Strm.EpgEvent();
        e.evtId = 9;
        e.name = new byte[] {1};
        Strm.ExtEpgEvent x = new Strm.ExtEpgEvent();
        x.itemCount = 9;
        x.text = null;
        assertEquals(0, strm().Strm_GetAllEvent(0, e, new Strm.EpgEvent(), x,
                new Strm.ExtEpgEvent()));
        assertEquals(0, e.evtId);
        assertArrayEquals(new byte[0], e.name);
        assertArrayEquals(new byte[0], e.text);
        assertEquals(0, x.itemCount);
        assertEquals("", x.text);
        assertEquals(Arrays.asList(), strmLogs());
    }

    // ---- item reads, clock ----------------------------------------------------------------------

    @ParameterizedTest
    @ValueSource(ints = {-1, 16, Integer.MIN_VALUE})
    void itemReadsRefuseIndexesOutsideTheCacheAndLeaveTheItem(int i) {
        Strm.ExtEpgEventItem item = new Strm.ExtEpgEventItem();
        item.itemDesc = "keep";
        assertIndexRefused(i, () -> strm().Strm__GetExtEPGEventNow(i, item));
        assertIndexRefused(i, () -> strm().Strm__GetExtEPGEventNext(i, item));
        assertIndexRefused(i, () -> strm().EPG_ExtGetEvent(i, item));
        assertEquals("keep", item.itemDesc);
    }

    @Test
    void timeIsZeroExtended() {
        Spy.setOut("Strm::GetTime", 1, 0, le32(-1));
        Spy.setResult("Strm::GetTime", -1);
        assertEquals(4294967295L, strm().Strm_GetTime(HANDLE, -1));
        int call = onlyCall("Strm::GetTime");
        assertArrayEquals(new long[] {5, 0}, Spy.args(call));
        assertArrayEquals(le32(0), Spy.record(call, 0));
        Spy.reset();
        Spy.setOut("Strm::GetTime", 1, 0, le32(1234));
        assertEquals(1234L, strm().Strm_GetTime(0, 0));
    }

    // ---- event database ---------------------------------------------------------------------

    static Strm.EpgSvc svc() {
        Strm.EpgSvc s = new Strm.EpgSvc();
        s.svcId = 70000;
        s.tsId = 0x12345;
        s.onId = -1;
        s.tpIndex = -1;
        s.netIndex = 0x7FFFFFFF;
        s.netType = 3;
        return s;
    }

    @Test
    void epgGetEventNamesTheServiceByItsIdsAndSharesTheNowCache() {
        getAllEvent(4, items("g", 4), 4, items("h", 4));
        Spy.reset();
        Spy.takeLogs();
        byte[] name = ascii("Database event");
        Spy.setOut("Strm::EPG_GetEvent", 2, 0, event(300, name, ascii("")));
        Spy.setOut("Strm::EPG_GetEvent", 3, 0, ext(3, items("db", 3), ascii("db text")));
        Spy.setResult("Strm::EPG_GetEvent", -1);
        Strm.EpgEvent e = new Strm.EpgEvent();
        Strm.ExtEpgEvent x = new Strm.ExtEpgEvent();

        assertEquals(0, strm().EPG_GetEvent(HANDLE, svc(), e, x));
        int call = onlyCall("Strm::EPG_GetEvent");
        assertArrayEquals(new long[] {0, 5, 0, 0}, Spy.args(call));
        ByteBuffer expected = ByteBuffer.allocate(20).order(ByteOrder.LITTLE_ENDIAN);
        expected.putShort(0, (short) 4464).putShort(2, (short) 0x2345).putShort(4, (short) -1);
        assertArrayEquals(expected.array(), Spy.record(call, 0));
        assertEvent(300, name, new byte[0], e);
        assertEquals(Arrays.asList(3, "db text"), Arrays.asList(x.itemCount, x.text));
        assertEquals(Arrays.asList(), strmLogs());

        assertEquals(Arrays.asList("dbd1", "dbt1"), readNow(1));
        assertEquals(Arrays.asList("gd3", "gt3"), readNow(3), "beyond the count: older item");
        assertEquals(Arrays.asList("hd1", "ht1"), readNext(1), "the next cache is not shared");
        Strm.ExtEpgEventItem item = new Strm.ExtEpgEventItem();
        assertEquals(0, strm().EPG_ExtGetEvent(2, item));
        assertEquals(Arrays.asList("dbd2", "dbt2"), Arrays.asList(item.itemDesc, item.type));

        getAllEvent(1, items("q", 1), 0, items("x", 0));
        assertEquals(0, strm().EPG_ExtGetEvent(0, item));
        assertEquals(Arrays.asList("qd0", "qt0"), Arrays.asList(item.itemDesc, item.type));
        assertEquals(0, strm().EPG_ExtGetEvent(1, item));
        assertEquals("dbd1", item.itemDesc);
    }

    @Test
    void epgGetEventCopiesAtMostSixteenItems() {
        Spy.setOut("Strm::EPG_GetEvent", 3, 0, ext(-1, items("z", 16), ascii("")));
        Strm.ExtEpgEvent x = new Strm.ExtEpgEvent();
        strm().EPG_GetEvent(0, svc(), new Strm.EpgEvent(), x);
        assertEquals(16, x.itemCount);
        assertEquals(Arrays.asList("zd15", "zt15"), readNow(15));
        assertEquals(Arrays.asList(), strmLogs());
    }

    @Test
    void serviceListAndCheckReturnZeroWhateverTheModuleSays() {
        for (int result : new int[] {-1, 1}) {
            Spy.reset();
            Spy.setResult("Strm::EpgMd_AddService", result);
            Spy.setResult("Strm::EpgMd_ClearService", result);
            Spy.setResult("Strm::CheckService", result);
            Strm.ServiceCheck c = new Strm.ServiceCheck();
            c.satPosition = -192;
            c.freq = 11778000;
            c.tsid = 0x12345;
            c.sid = -1;
            assertEquals(0, strm().EpgMd_ClearService());
            assertEquals(0, strm().EpgMd_AddService(svc()));
            assertEquals(0, strm().Strm_CheckService(c));
            assertEquals(Arrays.asList("Strm::EpgMd_ClearService", "Strm::EpgMd_AddService",
                    "Strm::CheckService"), ops());
            ByteBuffer expected = ByteBuffer.allocate(20).order(ByteOrder.LITTLE_ENDIAN);
            expected.putShort(0, (short) 4464).putShort(2, (short) 0x2345);
            expected.putShort(4, (short) -1).putInt(8, -1).putInt(12, 0x7FFFFFFF).putInt(16, 3);
            assertArrayEquals(expected.array(), Spy.record(1, 0));
            assertArrayEquals(le32(-192, 11778000, 0x12345, -1), Spy.record(2, 0));
            assertEquals(Arrays.asList(-192, 0x12345, -1),
                    Arrays.asList(c.satPosition, c.tsid, c.sid), "the object is not written");
        }
    }

    // ---- handles, missing modules, null objects ----------------------------------------------

    @Test
    void onlyTheLowHandleBitsReachTheModule() {
        strm().Strm_GetAllEvent(HANDLE, new Strm.EpgEvent(), new Strm.EpgEvent(),
                new Strm.ExtEpgEvent(), new Strm.ExtEpgEvent());
        strm().Strm_GetEvent(HANDLE, new Strm.EpgEvent());
        strm().Strm_GetTime(HANDLE, 0);
        strm().EPG_GetEvent(HANDLE, svc(), new Strm.EpgEvent(), new Strm.ExtEpgEvent());
        assertEquals(Arrays.asList("Strm::GetAllEvent", "Strm::GetEvent", "Strm::GetTime",
                "Strm::EPG_GetEvent"), ops());
        for (int call = 0; call < 3; call++) assertEquals(5, Spy.args(call)[0], Spy.op(call));
        assertEquals(5, Spy.args(3)[1]);
    }

    static final List<ToLongFunction<Strm>> EVERY_METHOD = Arrays.asList(
            s -> s.Strm_GetAllEvent(1, new Strm.EpgEvent(), new Strm.EpgEvent(),
                    new Strm.ExtEpgEvent(), new Strm.ExtEpgEvent()),
            s -> s.Strm_GetEvent(1, new Strm.EpgEvent()),
            s -> s.Strm__GetExtEPGEventNow(0, new Strm.ExtEpgEventItem()),
            s -> s.Strm__GetExtEPGEventNext(0, new Strm.ExtEpgEventItem()),
            s -> s.Strm_GetTime(1, 0),
            s -> s.EPG_GetEvent(1, new Strm.EpgSvc(), new Strm.EpgEvent(), new Strm.ExtEpgEvent()),
            s -> s.EPG_ExtGetEvent(0, new Strm.ExtEpgEventItem()),
            s -> s.EpgMd_AddService(new Strm.EpgSvc()),
            s -> s.EpgMd_ClearService(),
            s -> s.Strm_CheckService(new Strm.ServiceCheck()));

    @Test
    void unboundObjectRaisesIllegalStateSilently() {
        assertEveryMethodFailsWithoutModule(new Strm(0), EVERY_METHOD);
    }

    @Test
    void missingModuleRaisesIllegalStateSilentlyAndKeepsObjectsAndCaches() {
        getAllEvent(1, items("k", 1), 1, items("l", 1));
        dvb.release();
        Spy.reset();
        Spy.omit(new String[] {"Strm"});
        dvb = new DVB();
        Spy.takeLogs();
        Strm missing = strm();
        assertEveryMethodFailsWithoutModule(missing, EVERY_METHOD);
        Strm.EpgEvent e = new Strm.EpgEvent();
        e.evtId = 4;
        assertThrows(IllegalStateException.class, () -> missing.Strm_GetEvent(0, e));
        assertEquals(4, e.evtId);
        dvb.release();
        Spy.omit(new String[0]);
        dvb = new DVB();
        assertEquals(Arrays.asList("kd0", "kt0"), readNow(0));
        assertEquals(Arrays.asList("ld0", "lt0"), readNext(0));
    }

    @Test
    void nullObjectsRaiseNullPointerExceptionWithoutModuleCall() {
        Strm.EpgEvent e = new Strm.EpgEvent();
        Strm.ExtEpgEvent x = new Strm.ExtEpgEvent();
        assertNullsRefused(strm(),
                new NullCase("EpgEvent is null", s -> s.Strm_GetAllEvent(0, e, null, x, x)),
                new NullCase("ExtEpgEvent is null", s -> s.Strm_GetAllEvent(0, e, e, x, null)),
                new NullCase("EpgEvent is null", s -> s.Strm_GetEvent(0, null)),
                new NullCase("ExtEpgEventItem is null", s -> s.Strm__GetExtEPGEventNow(0, null)),
                new NullCase("ExtEpgEventItem is null", s -> s.Strm__GetExtEPGEventNext(0, null)),
                new NullCase("EpgSvc is null", s -> s.EPG_GetEvent(0, null, e, x)),
                new NullCase("EpgEvent is null", s -> s.EPG_GetEvent(0, svc(), null, x)),
                new NullCase("ExtEpgEvent is null", s -> s.EPG_GetEvent(0, svc(), e, null)),
                new NullCase("ExtEpgEventItem is null", s -> s.EPG_ExtGetEvent(0, null)),
                new NullCase("EpgSvc is null", s -> s.EpgMd_AddService(null)),
                new NullCase("ServiceCheck is null", s -> s.Strm_CheckService(null)));
        assertNull(e.name, "no event field was set");
    }
}
