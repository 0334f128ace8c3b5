package android.DVB;

import static android.DVB.Records.*;
import static org.junit.jupiter.api.Assertions.*;

import java.util.*;
import java.util.function.ToIntFunction;
import java.util.stream.*;
import org.junit.jupiter.api.*;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.*;

/**
 * What a module delivers into the library's exported caches and display buffer, and the
 * readers that hand it to Java one entry at a time. A delivery overwrites only its count of
 * entries; a reader refuses an index outside its room and leaves its object as it was.
 */
@TestMethodOrder(MethodOrderer.OrderAnnotation.class)
class CacheTest extends SpyTestBase {
    static final int DATA = 1930792;

    /** A reader: its indexes' rooms, and where in the records that fill it each entry lies. */
    record Reader(String cls, String method, Layout layout, ToIntFunction<int[]> at, int... rooms) {
        Object read(DVB dvb, int... index) throws Throwable {
            Object[] args = new Object[index.length + 1];
            for (int i = 0; i < index.length; i++) args[i] = index[i];
            args[index.length] = layout.fill(layout.create(), 5);
            assertEquals(0, call(module(dvb, cls), method, args), method);
            return args[index.length];
        }

        /** The entry at `index` read into an object, which must equal what `source` holds. */
        void assertEntry(DVB dvb, byte[] source, int... index) throws Throwable {
            int from = from(index);
            layout.assertJava(Arrays.copyOfRange(source, from, from + layout.size), read(dvb, index),
                    layout.create());
        }

        int from(int... index) {
            return at.applyAsInt(index);
        }

        @Override
        public String toString() {
            return method;
        }
    }

    /** A stream reader of 16 entries, filled from records where the first lies at `first`. */
    static Reader list(String method, Layout l, int first) {
        return new Reader("Strm", method, l, i -> first + i[0] * l.size, 16);
    }

    static Reader display(String method, Layout l, ToIntFunction<int[]> at, int... rooms) {
        return new Reader("Subttl", method, l, at, rooms);
    }

    static final Reader SERVICE = new Reader("Scnm", "Scnm_GetServiceList", SERVICE_INFO, i -> 0, 100);
    static final Reader NET = new Reader("Scnm", "Scnm_GetNetworkList", NETWORK, i -> 0, 200);
    /** The items of an extended-event record. */
    static final Reader NOW = list("Strm__GetExtEPGEventNow", ITEM, 4);
    static final Reader NEXT = list("Strm__GetExtEPGEventNext", ITEM, 4);
    static final Reader DATABASE = list("EPG_ExtGetEvent", ITEM, 4);
    /** The four lists of a component record, each after its count. */
    static final List<Reader> LISTS = List.of(list("Strm_GetVideoStreamInfo", VIDEO, 4),
            list("Strm_GetAudioStreamInfo", AUDIO, 72), list("Strm_GetTeleTextStreamInfo", TELETEXT, 812),
            list("Strm_GetSubTilteStreamInfo", SUBTITLE, 1488));
    static final List<Reader> DISPLAY_READERS = List.of(
            display("Subttl_GetPageData", PAGE, i -> 8, 1),
            display("Subttl_GetRegionDefData", REGION_DEF, i -> 28 + i[1] * 12, 1, 16),
            display("Subttl_GetRegionData", REGION, i -> 224 + i[0] * 385000, 5),
            display("Subttl_GetRegionObjectDefData", OBJECT_DEF, i -> 224 + i[0] * 385000 + 384040 + i[1] * 60, 5, 16),
            display("Subttl_GetClutData", CLUT, i -> 1925228 + i[0] * 1106, 4),
            display("Subttl_GetDefaultClutData", CLUT, i -> 1929684),
            display("Subttl_GetDisplayData", DISPLAY, i -> 1929652));

    static List<Reader> readers() {
        return Stream.of(List.of(SERVICE, NET, NOW, NEXT, DATABASE), LISTS, DISPLAY_READERS)
                .flatMap(List::stream).toList();
    }

    @ParameterizedTest
    @MethodSource("readers")
    void anIndexOutsideItsRoomTouchesNothing(Reader r) throws Throwable {
        for (int p = 0; p < r.rooms.length; p++) for (int bad : new int[] {-1, r.rooms[p], Integer.MIN_VALUE}) {
                Object[] args = new Object[r.rooms.length + 1];
                Arrays.fill(args, 0);
                args[p] = bad;
                args[r.rooms.length] = r.layout.fill(r.layout.create(), 3);
                Throwable e = assertThrows(IndexOutOfBoundsException.class,
                        () -> call(module(dvb, r.cls), r.method, args));
                assertEquals("Index " + bad + " out of bounds for length " + r.rooms[p], e.getMessage());
                assertSameFields(r.layout.fill(r.layout.create(), 3), args[r.rooms.length]);
        }
        List<String> lines = new ArrayList<>();
        for (int i = 0; i < 3 * r.rooms.length; i++) lines.addAll(entryLines(r.cls, r.method));
        assertEquals(lines, logs());
        assertEquals(0, Spy.callCount());
    }

    // ---- scan results ---------------------------------------------------------------------------

    /** A scan list: its create method, exported cache, reader and the offset of its link. */
    record ScanList(String method, String cache, Reader reader, int link) {
        byte[][] nodes(int first, int count) {
            return IntStream.range(first, first + count).mapToObj(reader.layout::pattern).toArray(byte[][]::new);
        }

        int create(DVB dvb, byte[][] nodes) throws Throwable {
            String op = "Scnm::" + method.substring(5);
            Spy.reset();
            Spy.setList(op, nodes);
            Spy.setResult(op, -9);
            int count = (int) call(dvb.getScnm(), method, HANDLE);
            assertArrayEquals(new long[] {LOW, 0}, Spy.args(onlyCall(op)));
            return count;
        }

        /** The cache entry is the whole node, its link as the service wrote it. */
        void assertEntry(DVB dvb, int index, byte[] node, boolean last) throws Throwable {
            byte[] e = Spy.cacheEntry(cache, index, node.length);
            int next = le(e).getInt(link);
            if (last) assertEquals(0, next, "link of the last node");
            if (!last && WIDE) assertEquals(node.length, next, "to the next");
            System.arraycopy(node, link, e, link, 4);
            assertArrayEquals(node, e, cache + "[" + index + "]");
            reader.assertEntry(dvb, node, index);
        }
    }

    static List<ScanList> scanLists() {
        return List.of(new ScanList("Scnm_CreateServiceList", "s_SvcExt", SERVICE, 112),
                new ScanList("Scnm_CreateNetworkList", "s_SvcNet", NET, 84));
    }

    @ParameterizedTest
    @MethodSource("scanLists")
    void aScanListFillsItsCountOfEntriesAndNoMore(ScanList k) throws Throwable {
        byte[][] three = k.nodes(1, 3);
        assertEquals(3, k.create(dvb, three));
        for (int i = 0; i < 3; i++) k.assertEntry(dvb, i, three[i], i == 2);
        assertEquals(1, k.create(dvb, k.nodes(4, 1)));
        k.assertEntry(dvb, 0, k.nodes(4, 1)[0], true);
        k.assertEntry(dvb, 1, three[1], false);
        assertEquals(0, k.create(dvb, new byte[0][]));
        k.assertEntry(dvb, 2, three[2], true);
        int room = k.reader.rooms[0];
        byte[][] many = k.nodes(9, room + 50);
        assertEquals(room, k.create(dvb, many));
        k.assertEntry(dvb, room - 1, many[room - 1], false);
        Spy.reset();
        k.reader.assertEntry(dvb, many[0], 0);
        assertEquals(k.reader == NET ? List.of(NET_BEGIN, GETTER, "2 SCNM ----android_dvb_Scnm_GetServiceList")
                : List.of(GETTER), logs());
        assertEquals(0, Spy.callCount(), "readers call no operation");
    }

    // ---- stream components ----------------------------------------------------------------------

    static byte[] components(int generation, int count) {
        byte[] r = STREAM_INFO.pattern(generation);
        for (Reader l : LISTS) {
            le(r).putInt(l.from(0) - 4, count);
            for (int i = 0; i < 16; i++) {
                System.arraycopy(l.layout.pattern(generation * 16 + i), 0, r, l.from(i), l.layout.size);
            }
        }
        return r;
    }

    @ParameterizedTest
    @ValueSource(ints = {0, 1, 3, 16, 20, -1})
    void aComponentQueryOverwritesOnlyItsCount(int count) throws Throwable {
        byte[] older = components(1, 16), newer = components(2, count);
        Spy.setOut("Strm::CreatStreamInfo", 1, 0, older);
        dvb.getStrm().Strm_CreatStreamInfo(0, new Strm.STRM_StreamInfo());
        Spy.reset();
        Spy.setOut("Strm::CreatStreamInfo", 1, 0, newer);
        Strm.STRM_StreamInfo info = new Strm.STRM_StreamInfo();
        assertEquals(0, dvb.getStrm().Strm_CreatStreamInfo(HANDLE, info));
        for (Reader l : LISTS) le(newer).putInt(l.from(0) - 4, Math.min(count, 16));
        STREAM_INFO.assertJava(newer, info, new Strm.STRM_StreamInfo());
        assertArrayEquals(Arrays.copyOfRange(newer, 1714, 1720), Spy.cacheEntry("caSysId", 0, 6));
        for (Reader r : LISTS) for (int i = 0; i < 16; i++) r.assertEntry(dvb, i < count ? newer : older, i);
        assertEquals(List.of("Strm::CreatStreamInfo"), ops(), "readers call nothing");
    }

    // ---- extended-event items -------------------------------------------------------------------

    /** An extended record of `itemCount` whose 16 item slots all hold items of `generation`. */
    static byte[] ext(int generation, int itemCount) {
        byte[] r = EXT_EVENT.pattern(generation);
        le(r).putInt(0, itemCount);
        for (int k = 0; k < 16; k++) System.arraycopy(ITEM.pattern(generation * 16 + k), 0, r, 4 + 96 * k, 96);
        return r;
    }

    /** The line Strm_GetAllEvent writes for item `k` of `ext`: its text, then its description. */
    static String itemLine(byte[] ext, int k) {
        byte[] item = Arrays.copyOfRange(ext, NOW.from(k), NOW.from(k) + 96);
        return "2 STRM mExtEvtNow item: " + Objects.toString(Layout.javaValue(ITEM.slots.get(1), item), "")
                + " itemDesc : " + Objects.toString(Layout.javaValue(ITEM.slots.get(0), item), "");
    }

    static int bounded(int count) {
        return Integer.compareUnsigned(count, 16) > 0 ? 16 : count;
    }

    /**
     * Present and following items, delivered twice by Strm_GetAllEvent with a line for each
     * item copied, then the database query's items, which replace the present ones silently.
     */
    @ParameterizedTest
    @CsvSource({"16, 0", "8, 5", "16, 16", "16, 20", "3, -1"})
    void anEventDeliveryOverwritesOnlyItsItems(int before, int count) throws Throwable {
        byte[][][] deliveries = {{ext(1, before), ext(2, before)}, {ext(3, count), ext(4, count)}};
        for (byte[][] pair : deliveries) {
            Spy.reset();
            for (int p = 0; p < 2; p++) Spy.setOut("Strm::GetAllEvent", 3 + p, 0, pair[p]);
            Strm.ExtEpgEvent now = new Strm.ExtEpgEvent(), next = new Strm.ExtEpgEvent();
            dvb.getStrm().Strm_GetAllEvent(0, new Strm.EpgEvent(), new Strm.EpgEvent(), now, next);
            int told = bounded(le(pair[0]).getInt(0));
            assertEquals(List.of(told, told), List.of(now.itemCount, next.itemCount));
            List<String> lines = new ArrayList<>();
            for (byte[] e : pair) for (int k = 0; k < told; k++) lines.add(itemLine(e, k));
            assertEquals(lines, logs());
        }
        Spy.setOut("Strm::EPG_GetEvent", 3, 0, ext(5, -count)); // huge when seen unsigned
        Strm.ExtEpgEvent x = new Strm.ExtEpgEvent();
        dvb.getStrm().EPG_GetEvent(0, new Strm.EpgSvc(), new Strm.EpgEvent(), x);
        assertEquals(bounded(-count), x.itemCount);
        assertEquals(List.of(), logs());
        for (int k = 0; k < 16; k++) {
            int from = k < bounded(count) ? 1 : k < before ? 0 : -1;
            byte[] now = k < bounded(-count) ? ext(5, 0) : from < 0 ? null : deliveries[from][0];
            if (now != null) for (Reader r : List.of(NOW, DATABASE)) r.assertEntry(dvb, now, k);
            if (from >= 0) NEXT.assertEntry(dvb, deliveries[from][1], k);
        }
    }

    // ---- the subtitle display set ---------------------------------------------------------------

    static Subttl.SUBTTL_Data_t getData(DVB dvb, long handle) {
        Subttl.SUBTTL_Data_t d = new Subttl.SUBTTL_Data_t();
        assertEquals(0, dvb.getSubttl().Subttl_GetData(handle, d));
        return d;
    }

    /** Every reader at the first and the last index of its room sees what `data` holds. */
    void assertReadersSee(byte[] data) throws Throwable {
        for (Reader r : DISPLAY_READERS) {
            r.assertEntry(dvb, data, new int[r.rooms.length]);
            r.assertEntry(dvb, data, Arrays.stream(r.rooms).map(room -> room - 1).toArray());
        }
    }

    /** Runs first: no Subttl_GetData of this process has filled the buffer yet. */
    @Test
    @Order(1)
    void theDisplayDataIsZeroBeforeTheFirstDisplaySet() throws Throwable {
        assertReadersSee(new byte[DATA]);
    }

    @Test
    void aDisplaySetReplacesTheWholeBufferAndEveryReaderSeesIt() throws Throwable {
        byte[] data = new byte[DATA];
        for (int at = 0; at < DATA; at++) data[at] = (byte) (at * 7 + (at >> 9));
        for (int at : new int[] {224 + 16, 224 + 20, 224 + 4 * 385000 + 16, 224 + 4 * 385000 + 20}) {
            le(data).putInt(at, 3); // regions of 3 by 3 pixels
        }
        Spy.setOut("Subttl::GetData", 1, 0, data);
        Spy.setResult("Subttl::GetData", -1);
        SUBTTL_DATA.assertJava(data, getData(dvb, HANDLE), new Subttl.SUBTTL_Data_t());
        assertArrayEquals(new long[] {LOW, 0}, Spy.args(onlyCall("Subttl::GetData")));
        assertReadersSee(data);
        Spy.reset();
        SUBTTL_DATA.assertJava(new byte[DATA], getData(dvb, 0), new Subttl.SUBTTL_Data_t());
        assertArrayEquals(bytes(1), Spy.record(0, 0), "the module was handed a cleared buffer");
        assertReadersSee(new byte[DATA]);
        assertEquals(1, Spy.callCount(), "readers call no operation");
        assertEquals(List.of(), logs());
    }

    /** Width, height; the size Java is told, and the pixels it gets (-1: the old array stays). */
    @ParameterizedTest
    @CsvSource({"0, 5, 0, 5, 0", "7, 0, 7, 0, 0", "600, 640, 600, 640, 384000",
        "384000, 1, 384000, 1, 384000", "601, 640, 601, 638, 383438", "384001, 1, 384001, 0, 0",
        "1, 2147483647, 1, 384000, 384000", "65536, 65536, 65536, 5, 327680", "-1, -1, -1, -1, 1",
        "-2, -200000, -2, 0, 0", "-1, 5, 0, 0, -1", "65536, 32768, 0, 0, -1",
        "-2147483648, 1, 0, 0, -1", "2, -2147283648, 2, 192000, 384000"})
    void aRegionDeliversTheRowsThatFitItsBuffer(int width, int height, int toldWidth,
            int toldHeight, int pixels) throws Throwable {
        byte[] data = new byte[385000];
        for (int i = 0; i < data.length; i++) data[i] = (byte) Layout.hash(1, i);
        le(data).putInt(16, width).putInt(20, height);
        Spy.setOut("Subttl::GetData", 1, 224 + 2 * 385000, data);
        getData(dvb, 0);
        Subttl.SUBTTL_Region_t r = new Subttl.SUBTTL_Region_t();
        byte[] before = r.p_pixbuf = new byte[] {42};
        r.i_object_defs = -99;
        assertEquals(0, dvb.getSubttl().Subttl_GetRegionData(2, r));
        le(data).putInt(16, toldWidth).putInt(20, toldHeight);
        new Layout(Subttl.SUBTTL_Region_t.class, 36, REGION_HEAD).assertJava(data, r, r);
        assertEquals(pixels < 0 ? -99 : le(data).getInt(384036), r.i_object_defs);
        if (pixels < 0) assertSame(before, r.p_pixbuf);
        else assertArrayEquals(Arrays.copyOfRange(data, 36, 36 + pixels), r.p_pixbuf);
    }
}
