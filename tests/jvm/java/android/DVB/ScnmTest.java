package android.DVB;

import static org.junit.jupiter.api.Assertions.assertArrayEquals;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertFalse;
import static org.junit.jupiter.api.Assertions.assertNotNull;
import static org.junit.jupiter.api.Assertions.assertNull;
import static org.junit.jupiter.api.Assertions.assertThrows;
import static org.junit.jupiter.api.Assertions.assertTimeoutPreemptively;
import static org.junit.jupiter.api.Assertions.assertTrue;

import java.io.File;
import java.io.IOException;
import java.lang.reflect.Field;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.time.Duration;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.List;
import java.util.concurrent.atomic.AtomicInteger;
import java.util.function.ToLongFunction;
import java.util.stream.Stream;
import org.junit.jupiter.api.AfterEach;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.Arguments;
import org.junit.jupiter.params.provider.EnumSource;
import org.junit.jupiter.params.provider.MethodSource;
import org.junit.jupiter.params.provider.ValueSource;

class ScnmTest extends SpyTestBase {
    static final String GETTER = "2 SCNM getScnm was called";
    static final String NO_CONTEXT = "2 SCNM could not get the dvb obj from context";
    static final String CONTROL_FAILED =
            "2 SCNM android_dvb_Scnm_Init,could not get the dvb obj from context";
    static final String RESULT_FAILED =
            "2 SCNM android_dvb_Tuner_StartAVPlay,could not get the dvb obj from context";
    static final String NET_BEGIN = "2 SCNM +++android_dvb_Scnm_GetServiceList";
    static final String NET_END = "2 SCNM ----android_dvb_Scnm_GetServiceList";

    /** High half set, low half negative as an int: only the low half may reach the module. */
    static final long HANDLE = 0x7654321089ABCDEFL;
    static final long LOW = (int) HANDLE;

    static final File EPG_DB = new File(System.getProperty("dvb.epgdb", "/nonexistent/epg.db"));
    static final Duration NO_HANG = Duration.ofMinutes(2); // reached only by a broken wait

    Scnm scnm() {
        return dvb.getScnm();
    }

    /**
     * The SCNM lines written since the last call. Lines of other tags are left out: the
     * finalizers of DVB objects from earlier tests write theirs whenever the GC runs them.
     */
    static List<String> scnmLogs() {
        List<String> out = new ArrayList<>();
        for (String line : logs()) {
            if (line.split(" ", 3)[1].equals("SCNM")) out.add(line);
        }
        return out;
    }

    static void assertScnmLogs(String... expected) {
        assertEquals(Arrays.asList(expected), scnmLogs());
    }

    @AfterEach
    void removeDatabase() {
        EPG_DB.delete();
    }

    // ---- scan control --------------------------------------------------------------------

    /** Front-end fields copied from `f` by name, and the scan's own. */
    static Scnm.SCNM_StartSettings startSettings(Cfg.ANT_FrontendParameters f) {
        Scnm.SCNM_StartSettings s = new Scnm.SCNM_StartSettings();
        try {
            for (Field field : Cfg.ANT_FrontendParameters.class.getFields()) {
                Scnm.SCNM_StartSettings.class.getField(field.getName()).setInt(s, field.getInt(f));
            }
        } catch (ReflectiveOperationException e) {
            throw new AssertionError(e);
        }
        s.scanType = -3;
        s.scanNetwrok = 0x01020304;
        s.langCode = "fra";
        return s;
    }

    @ParameterizedTest
    @ValueSource(ints = {1, 2, 0, 7, -1})
    void startSendsTheFrontendBlockThenTheScansOwnWords(int type) {
        Cfg.ANT_FrontendParameters f = CfgTest.frontend(type);
        f.tone = 257;
        f.ubFreq = 0x12345;
        Spy.setResult("Scnm::Start", -12);
        assertEquals(-12, scnm().Scnm_Start(HANDLE, startSettings(f)));
        int call = onlyCall("Scnm::Start");
        assertEquals(LOW, Spy.args(call)[0]);
        ByteBuffer expected = ByteBuffer.allocate(96).order(ByteOrder.LITTLE_ENDIAN);
        expected.put(CfgTest.expectedBlock(f)).putInt(84, -3).putInt(88, 0x01020304);
        expected.put(92, (byte) 'f').put(93, (byte) 'r').put(94, (byte) 'a');
        assertArrayEquals(expected.array(), Spy.record(call, 0));
        ByteBuffer r = rec(call, 0);
        assertEquals(1, r.get(40));
        assertEquals(0x2345, r.getShort(70));
        if (type == 2) assertZero(r, 12, 36);
        if (type == 7) assertEquals(0x66666666, r.getInt(24));
        assertScnmLogs(GETTER);
    }

    static Stream<Arguments> langCodes() {
        return Stream.of(
                Arguments.of(null, bytes('e', 'n', 'g', 0)),
                Arguments.of("en", bytes('e', 'n', 0, 0)),
                Arguments.of("deu", bytes('d', 'e', 'u', 0)),
                Arguments.of("deut", bytes('d', 'e', 'u', 0)),
                Arguments.of("", bytes(0, 0, 0, 0)),
                Arguments.of("e", bytes('e', 0, 0, 0)),
                Arguments.of("\u00e9", bytes(0xC3, 0xA9, 0, 0)),
                Arguments.of("\u65e5\u672c", bytes(0xE6, 0x97, 0xA5, 0)));
    }

    @ParameterizedTest
    @MethodSource("langCodes")
    void languageCodeKeepsThreeBytesAndDefaultsToEng(String code, byte[] expected) {
        Scnm.SCNM_StartSettings s = startSettings(CfgTest.frontend(0));
        s.langCode = code;
        assertEquals(0, scnm().Scnm_Start(0, s));
        assertBytes(expected, rec(onlyCall("Scnm::Start"), 0), 92);
    }

    @Test
    void controlMethodsPassTheLowHalfOfTheHandleAndTheModuleResult() {
        Spy.setResult("Scnm::Init", -4);
        Spy.setResult("Scnm::Close", 3);
        Spy.setResult("Scnm::Stop", -2);
        assertEquals(-4, scnm().Scnm_Init());
        assertEquals(3, scnm().Scnm_Close(HANDLE));
        assertEquals(-2, scnm().Scnm_Stop(HANDLE));
        assertEquals(Arrays.asList("Scnm::Init", "Scnm::Close", "Scnm::Stop"), ops());
        assertEquals(0, Spy.args(0).length);
        assertArrayEquals(new long[] {LOW}, Spy.args(1));
        assertArrayEquals(new long[] {LOW}, Spy.args(2));
        assertScnmLogs(GETTER, GETTER, GETTER);
    }

    @ParameterizedTest
    @ValueSource(ints = {-5, 0, 7, Integer.MIN_VALUE, Integer.MAX_VALUE})
    void openSignExtendsTheHandle(int handle) {
        Scnm.SCNM_OpenSettings s = new Scnm.SCNM_OpenSettings();
        s.frontend = 2;
        s.demux = -1;
        Spy.setResult("Scnm::Open", handle);
        assertEquals((long) handle, scnm().Scnm_Open(s));
        assertArrayEquals(le32(2, -1), Spy.record(onlyCall("Scnm::Open"), 0));
    }

    @Test
    void getStatusFillsTheObjectAndReturnsZeroWhateverTheModuleSays() {
        Spy.setOut("Scnm::GetStatus", 1, 0, le32(5, -6, -7));
        Spy.setResult("Scnm::GetStatus", -1);
        Scnm.SCNM_GetStatus s = new Scnm.SCNM_GetStatus();
        assertEquals(0, scnm().Scnm_GetStatus(HANDLE, s));
        assertEquals(Arrays.asList(5, -6, -7), Arrays.asList(s.feStatus, s.sfStatus, s.result));
        int call = onlyCall("Scnm::GetStatus");
        assertEquals(LOW, Spy.args(call)[0]);
        assertZero(rec(call, 0), 0, 12);
    }

    // ---- scan results --------------------------------------------------------------------

    enum Kind {
        SERVICES("Scnm::CreateServiceList", "s_SvcExt", 124, 112, 100),
        NETWORKS("Scnm::CreateNetworkList", "s_SvcNet", 96, 84, 200);

        final String op;
        final String cache;
        final int size;
        final int next;
        final int room;

        Kind(String op, String cache, int size, int next, int room) {
            this.op = op;
            this.cache = cache;
            this.size = size;
            this.next = next;
            this.room = room;
        }

        int create(Scnm s) {
            return this == SERVICES ? s.Scnm_CreateServiceList(HANDLE)
                                    : s.Scnm_CreateNetworkList(HANDLE);
        }

        /** A node whose every byte depends on `seed`; the spy writes its link. */
        byte[] node(int seed) {
            byte[] b = new byte[size];
            for (int i = 0; i < size; i++) b[i] = (byte) (seed * 31 + i * 7 + 1);
            return b;
        }

        byte[] entry(int index) {
            byte[] e = Spy.cacheEntry(cache, index, size);
            assertNotNull(e, cache + "[" + index + "]");
            return e;
        }

        /** The entry is the whole node; its link is 0 for the last node. */
        void assertEntry(byte[] node, boolean last, int index) {
            byte[] e = entry(index);
            int link = ByteBuffer.wrap(e).order(ByteOrder.LITTLE_ENDIAN).getInt(next);
            if (last) assertEquals(0, link, "link of the last node");
            if (!last && Spy.pointerSize() == 8) assertEquals(size, link, "distance to the next");
            System.arraycopy(node, next, e, next, 4);
            assertArrayEquals(node, e, cache + "[" + index + "]");
        }
    }

    @ParameterizedTest
    @EnumSource(Kind.class)
    void cachesAreExportedWithTheirRoom(Kind k) {
        assertNotNull(Spy.cacheEntry(k.cache, k.room - 1, k.size));
        assertNull(Spy.cacheEntry(k.cache, k.room, k.size));
    }

    @ParameterizedTest
    @EnumSource(Kind.class)
    void aShorterListLeavesLaterEntriesAsTheyWere(Kind k) {
        Spy.setList(k.op, new byte[][] {k.node(1), k.node(2), k.node(3)});
        Spy.setResult(k.op, -9);
        assertEquals(3, k.create(scnm()));
        for (int i = 0; i < 3; i++) k.assertEntry(k.node(i + 1), i == 2, i);
        Spy.setList(k.op, new byte[][] {k.node(4)});
        assertEquals(1, k.create(scnm()));
        k.assertEntry(k.node(4), true, 0);
        k.assertEntry(k.node(2), false, 1);
        k.assertEntry(k.node(3), true, 2);
        assertEquals(Arrays.asList(k.op, k.op), ops());
        assertEquals(LOW, Spy.args(0)[0]);
        assertScnmLogs(GETTER, GETTER);
    }

    @ParameterizedTest
    @EnumSource(Kind.class)
    void anEmptyListChangesNothing(Kind k) {
        Spy.setList(k.op, new byte[][] {k.node(5), k.node(6)});
        k.create(scnm());
        Spy.setList(k.op, new byte[0][]);
        assertEquals(0, k.create(scnm()));
        k.assertEntry(k.node(5), false, 0);
        k.assertEntry(k.node(6), true, 1);
    }

    @ParameterizedTest
    @EnumSource(Kind.class)
    void aListLongerThanTheCacheCopiesWhatFits(Kind k) {
        byte[][] nodes = new byte[k.room + 50][];
        for (int i = 0; i < nodes.length; i++) nodes[i] = k.node(i);
        Spy.setList(k.op, nodes);
        assertEquals(k.room, k.create(scnm()));
        for (int i = 0; i < k.room; i++) k.assertEntry(nodes[i], false, i);
    }

    static byte[] serviceNode(byte[] name) {
        ByteBuffer b = ByteBuffer.wrap(Kind.SERVICES.node(9)).order(ByteOrder.LITTLE_ENDIAN);
        b.putInt(0, -2).putShort(4, (short) 0xFFFF).putShort(6, (short) 0x1FFF).put(8, (byte) 0x1B);
        b.putShort(10, (short) 0x8102).put(12, (byte) 0xFF).putShort(14, (short) 0x0100);
        b.putShort(16, (short) 0xFFFE).putShort(18, (short) 0x0B00).putShort(20, (short) 0x1802);
        b.putShort(22, (short) 0xFFFD).putShort(100, (short) 0xFFF0).putShort(102, (short) 1);
        b.putInt(104, 0xFFFFFFFF).put(108, (byte) 0xFE);
        for (int i = 0; i < 64; i++) b.put(36 + i, i < name.length ? name[i] : (byte) 'Z');
        return b.array();
    }

    @Test
    void serviceFieldsAreZeroExtendedAndTheNameIsItsBytes() {
        byte[] named = serviceNode(bytes(0x15, 'A', 'B', 0));
        byte[] full = new byte[64];
        for (int i = 0; i < 64; i++) full[i] = (byte) ('a' + i % 26);
        Spy.setList("Scnm::CreateServiceList", new byte[][] {named, serviceNode(full)});
        assertEquals(2, scnm().Scnm_CreateServiceList(0));
        Spy.takeLogs();

        Scnm.SCNM_ServiceInfo s = new Scnm.SCNM_ServiceInfo();
        assertEquals(0, scnm().Scnm_GetServiceList(0, s));
        List<Object> got = Arrays.asList(s.svcType, s.svcId, s.videoPid, s.videoType, s.audioPid,
                s.audioType, s.pcrPid, s.pmtPid, s.caSysId0, s.caSysId1, s.caSysId2, s.tsId, s.onId,
                s.lcn, s.content);
        assertEquals(Arrays.<Object>asList(-2, 65535, 0x1FFF, 0x1B, 0x8102, 255, 0x0100, 0xFFFE,
                0x0B00, 0x1802, 0xFFFD, 0xFFF0, 1, 4294967295L, 0xFE), got);
        assertArrayEquals(bytes(0x15, 'A', 'B'), s.svcName);
        assertEquals(0, scnm().Scnm_GetServiceList(1, s));
        assertArrayEquals(full, s.svcName, "a name without zero ends at the field's end");
        assertScnmLogs(GETTER, GETTER);
    }

    @Test
    void networkFieldsAndTheLinesAroundTheRead() {
        Spy.setList("Scnm::CreateNetworkList",
                new byte[][] {Kind.NETWORKS.node(1), Kind.NETWORKS.node(2)});
        scnm().Scnm_CreateNetworkList(0);
        Spy.takeLogs();
        Scnm.SCNMNET_FrontEndSettings n = new Scnm.SCNMNET_FrontEndSettings();
        assertEquals(0, scnm().Scnm_GetNetworkList(1, n));
        ByteBuffer node = ByteBuffer.wrap(Kind.NETWORKS.node(2)).order(ByteOrder.LITTLE_ENDIAN);
        assertEquals(Arrays.asList(node.getInt(0), node.getInt(4), node.getInt(8), node.getInt(12),
                             node.getInt(16), node.getInt(20), node.getInt(24)),
                Arrays.asList(n.type, n.frequency, n.symbolRate, n.fecInner, n.modulation,
                        n.polarization, n.rolloff));
        assertScnmLogs(NET_BEGIN, GETTER, NET_END);
    }

    @ParameterizedTest
    @ValueSource(ints = {-1, 100, Integer.MIN_VALUE})
    void aServiceIndexOutsideTheCacheTouchesNothing(int index) {
        Scnm.SCNM_ServiceInfo s = new Scnm.SCNM_ServiceInfo();
        s.svcId = 77;
        IndexOutOfBoundsException e = assertThrows(IndexOutOfBoundsException.class,
                () -> scnm().Scnm_GetServiceList(index, s));
        assertEquals("Index " + index + " out of bounds for length 100", e.getMessage());
        assertEquals(77, s.svcId);
        assertNull(s.svcName);
        assertScnmLogs(GETTER);
    }

    @ParameterizedTest
    @ValueSource(ints = {-1, 200, Integer.MIN_VALUE})
    void aNetworkIndexOutsideTheCacheTouchesNothingAndSkipsTheClosingLine(int index) {
        Scnm.SCNMNET_FrontEndSettings n = new Scnm.SCNMNET_FrontEndSettings();
        n.type = 77;
        IndexOutOfBoundsException e = assertThrows(IndexOutOfBoundsException.class,
                () -> scnm().Scnm_GetNetworkList(index, n));
        assertEquals("Index " + index + " out of bounds for length 200", e.getMessage());
        assertEquals(77, n.type);
        assertScnmLogs(NET_BEGIN, GETTER);
    }

    @Test
    void theLastEntriesAreReadable() {
        assertEquals(0, scnm().Scnm_GetServiceList(99, new Scnm.SCNM_ServiceInfo()));
        assertEquals(0, scnm().Scnm_GetNetworkList(199, new Scnm.SCNMNET_FrontEndSettings()));
        assertEquals(0, Spy.callCount());
    }

    // ---- system start-up and shut-down ----------------------------------------------------

    static Scnm.DVB_Config config() {
        Scnm.DVB_Config c = new Scnm.DVB_Config();
        c.displayMode = 1080;
        c.sdkMode = -2;
        return c;
    }

    @Test
    void systemInitReturnsAtOnceWhenTheDatabaseExists() throws IOException {
        assertTrue(EPG_DB.createNewFile() || EPG_DB.exists());
        Spy.setResult("Scnm::Dvb_SystemInit", -3);
        int result = assertTimeoutPreemptively(NO_HANG, () -> scnm().Dvb_SystemInit(config()));
        assertEquals(0, result);
        assertArrayEquals(le32(1080, -2), Spy.record(onlyCall("Scnm::Dvb_SystemInit"), 0));
        assertScnmLogs(GETTER);
    }

    @Test
    void systemInitWaitsUntilTheDatabaseAppears() throws Exception {
        EPG_DB.delete();
        Scnm s = scnm();
        AtomicInteger result = new AtomicInteger(99);
        Thread caller = new Thread(() -> result.set(s.Dvb_SystemInit(config())));
        caller.start();
        while (Spy.callCount() == 0 && caller.isAlive()) Thread.sleep(5);
        Thread.sleep(600); // gives a call that does not wait time to return
        assertTrue(caller.isAlive(), "returned before the database existed");
        assertTrue(EPG_DB.createNewFile());
        caller.join(NO_HANG.toMillis());
        assertFalse(caller.isAlive(), "still waiting although the database exists");
        assertEquals(0, result.get());
        assertEquals(Arrays.asList("Scnm::Dvb_SystemInit"), ops());
    }

    @Test
    void systemUnInitNeverWaits() {
        EPG_DB.delete();
        Spy.setResult("Scnm::Dvb_SystemUnInit", -3);
        int result = assertTimeoutPreemptively(NO_HANG, () -> scnm().Dvb_SystemUnInit(config()));
        assertEquals(0, result);
        assertArrayEquals(le32(1080, -2), Spy.record(onlyCall("Scnm::Dvb_SystemUnInit"), 0));
        assertFalse(EPG_DB.exists());
    }

    // ---- failures ------------------------------------------------------------------------

    /** A call, and the text it must fail with. */
    static final class Call {
        final ToLongFunction<Scnm> call;
        final String text;

        Call(ToLongFunction<Scnm> call, String text) {
            this.call = call;
            this.text = text;
        }
    }

    static final Call[] NULL_CALLS = {
        new Call(c -> c.Scnm_Open(null), "SCNM_OpenSettings is null"),
        new Call(c -> c.Scnm_Start(0, null), "SCNM_StartSettings is null"),
        new Call(c -> c.Scnm_GetStatus(0, null), "SCNM_GetStatus is null"),
        new Call(c -> c.Scnm_GetServiceList(0, null), "SCNM_ServiceInfo is null"),
        new Call(c -> c.Scnm_GetNetworkList(0, null), "SCNMNET_FrontEndSettings is null"),
        new Call(c -> c.Dvb_SystemInit(null), "DVB_Config is null"),
        new Call(c -> c.Dvb_SystemUnInit(null), "DVB_Config is null"),
    };

    @Test
    void nullArgumentsRaiseNullPointerExceptionWithoutModuleCallOrWait() {
        EPG_DB.delete();
        for (Call n : NULL_CALLS) {
            NullPointerException e = assertThrows(NullPointerException.class,
                    () -> assertTimeoutPreemptively(NO_HANG, () -> n.call.applyAsLong(scnm())));
            assertEquals(n.text, e.getMessage());
            if (n.text.startsWith("SCNMNET")) assertScnmLogs(NET_BEGIN, GETTER);
            else assertScnmLogs(GETTER);
        }
        assertEquals(0, Spy.callCount());
    }

    /** Every method, with its line when the module is out of reach (null: GetNetworkList's). */
    static final Call[] EVERY_METHOD = {
        new Call(c -> c.Scnm_Init(), CONTROL_FAILED),
        new Call(c -> c.Scnm_Open(new Scnm.SCNM_OpenSettings()), CONTROL_FAILED),
        new Call(c -> c.Scnm_Close(1), CONTROL_FAILED),
        new Call(c -> c.Scnm_Start(1, startSettings(CfgTest.frontend(0))), CONTROL_FAILED),
        new Call(c -> c.Scnm_Stop(1), CONTROL_FAILED),
        new Call(c -> c.Scnm_GetStatus(1, new Scnm.SCNM_GetStatus()), CONTROL_FAILED),
        new Call(c -> c.Scnm_CreateServiceList(1), RESULT_FAILED),
        new Call(c -> c.Scnm_GetServiceList(0, new Scnm.SCNM_ServiceInfo()), RESULT_FAILED),
        new Call(c -> c.Scnm_CreateNetworkList(1), RESULT_FAILED),
        new Call(c -> c.Scnm_GetNetworkList(0, new Scnm.SCNMNET_FrontEndSettings()), null),
        new Call(c -> c.Dvb_SystemInit(config()), RESULT_FAILED),
        new Call(c -> c.Dvb_SystemUnInit(config()), RESULT_FAILED),
    };

    /** The lines of one failed call: GetNetworkList's opening line comes before the frame. */
    static void assertFailure(Scnm target, Call m, String... getterLines) {
        IllegalStateException e = assertThrows(IllegalStateException.class,
                () -> assertTimeoutPreemptively(NO_HANG, () -> m.call.applyAsLong(target)));
        assertNull(e.getMessage());
        List<String> expected = new ArrayList<>();
        if (m.text == null) expected.add(NET_BEGIN);
        expected.addAll(Arrays.asList(getterLines));
        expected.add(m.text == null ? RESULT_FAILED : m.text);
        assertEquals(expected, scnmLogs());
    }

    @Test
    void unboundObjectLogsBothGetterLinesAndTheMethodsLine() {
        EPG_DB.delete();
        Scnm unbound = new Scnm(0);
        for (Call m : EVERY_METHOD) assertFailure(unbound, m, GETTER, NO_CONTEXT);
        assertEquals(0, Spy.callCount());
    }

    @Test
    void missingModuleLogsTheGetterAndTheMethodsLine() {
        EPG_DB.delete();
        dvb.release();
        Spy.omit(new String[] {"Scnm"});
        dvb = new DVB();
        Spy.takeLogs();
        for (Call m : EVERY_METHOD) assertFailure(scnm(), m, GETTER);
        assertEquals(0, Spy.callCount());
    }
}
