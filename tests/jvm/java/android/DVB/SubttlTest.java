package android.DVB;

import static org.junit.jupiter.api.Assertions.assertArrayEquals;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertNotSame;
import static org.junit.jupiter.api.Assertions.assertSame;
import static org.junit.jupiter.api.Assertions.assertThrows;

import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.Collections;
import java.util.List;
import java.util.function.IntSupplier;
import java.util.function.Supplier;
import java.util.function.ToLongFunction;
import java.util.stream.Stream;
import org.junit.jupiter.api.MethodOrderer;
import org.junit.jupiter.api.Named;
import org.junit.jupiter.api.Order;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.TestMethodOrder;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.Arguments;
import org.junit.jupiter.params.provider.MethodSource;

@TestMethodOrder(MethodOrderer.OrderAnnotation.class)
class SubttlTest extends SpyTestBase {
    // Places in the display-data buffer that the module fills.
    static final int PAGE = 8;
    static final int NUM_REGIONS = 220;
    static final int NUM_CLUTS = 1925224;
    static final int DISPLAY = 1929652;
    static final int DEFAULT_CLUT = 1929684;
    static final int PIXELS = 384000;

    static int region(int r) {
        return 224 + r * 385000;
    }

    static int objectDef(int r, int o) {
        return region(r) + 384040 + o * 60;
    }

    static int clut(int c) {
        return 1925228 + c * 1106;
    }

    static final List<String> FINALIZER_LINES = Arrays.asList(
            "2 DVB android_dvb_DVB_native_finalize was called",
            "2 DVB android_dvb_DVB_release was called",
            "2 DVB setDVB was called",
            "2 DVB setDVB dvb.get() (nil)",
            "2 DVB setDVB dvb obj was set to context (nil)");

    /**
     * No log line since the last look. DVB objects dropped by earlier tests log when the
     * collector finalizes them, which the pixel arrays here provoke at any moment: those
     * sequences are not the subtitle methods' and are left out.
     */
    static void assertNoLogs() {
        List<String> lines = new ArrayList<>(logs());
        int at;
        while ((at = Collections.indexOfSubList(lines, FINALIZER_LINES)) >= 0) {
            lines.subList(at, at + FINALIZER_LINES.size()).clear();
        }
        assertEquals(Collections.emptyList(), lines);
    }

    Subttl subttl() {
        return dvb.getSubttl();
    }

    /** After the next module call, `bytes` stand at `offset` of the display data. */
    static void script(int offset, byte[] bytes) {
        Spy.setOut("Subttl::GetData", 1, offset, bytes);
    }

    Subttl.SUBTTL_Data_t getData(long handle) {
        Subttl.SUBTTL_Data_t d = new Subttl.SUBTTL_Data_t();
        assertEquals(0, subttl().Subttl_GetData(handle, d));
        return d;
    }

    /** Runs first: no Subttl_GetData of this process has filled the buffer yet. */
    @Test
    @Order(1)
    void bufferIsZeroBeforeTheFirstDisplaySet() {
        Subttl.SUBTTL_Clut c = new Subttl.SUBTTL_Clut();
        c.i_id = c.i_version = 5;
        assertEquals(0, subttl().Subttl_GetDefaultClutData(c));
        assertEquals(Arrays.asList(0, 0), Arrays.asList(c.i_id, c.i_version));
        assertArrayEquals(new int[4], c.c_2b);
        assertArrayEquals(new int[16], c.c_4b);
        assertArrayEquals(new int[256], c.c_8b);
        Subttl.SUBTTL_Display d = new Subttl.SUBTTL_Display();
        d.i_width = 5;
        assertEquals(0, subttl().Subttl_GetDisplayData(d));
        assertEquals(0, d.i_width);
        assertEquals(0, Spy.callCount());
    }

    // ---- decoder control -----------------------------------------------------------------

    @Test
    void initStartAndStopPassResultsAndHandles() {
        Spy.setResult("Subttl::Init", -5);
        assertEquals(-5, subttl().Subttl_Init());
        Spy.setResult("Subttl::Start", -2);
        assertEquals(-2L, subttl().Subttl_Start(settings("eng")));
        Spy.setResult("Subttl::Start", Integer.MAX_VALUE);
        assertEquals(Integer.MAX_VALUE, subttl().Subttl_Start(settings("eng")));
        Spy.setResult("Subttl::Stop", -1);
        assertEquals(0, subttl().Subttl_Stop(0x1_0000_0009L));
        assertEquals(0, subttl().Subttl_Stop(-1L));
        assertEquals(Arrays.asList("Subttl::Init", "Subttl::Start", "Subttl::Start",
                "Subttl::Stop", "Subttl::Stop"), ops());
        assertArrayEquals(new long[] {9}, Spy.args(3));
        assertArrayEquals(new long[] {-1}, Spy.args(4));
        assertNoLogs();
    }

    @Test
    void startReturnsTheModulesMinusOneWithoutException() {
        Spy.setResult("Subttl::Start", -1);
        assertEquals(-1L, subttl().Subttl_Start(settings("eng")));
        onlyCall("Subttl::Start");
    }

    static Subttl.SUBTTL_Settings settings(String langCode) {
        Subttl.SUBTTL_Settings s = new Subttl.SUBTTL_Settings();
        s.devId = 0x80000001;
        s.pid = 0x1FFF;
        s.type = 0x1FF;
        s.langCode = langCode;
        s.magazineNumber = 0x102;
        s.pageNumber = -1;
        s.compositionPageId = 0x12345;
        s.ancillaryPageId = 0xFFFF;
        s.hstrm = 0x1_0000_0002L;
        return s;
    }

    static Stream<Arguments> languageCodes() {
        return Stream.of(
                Arguments.of("eng", bytes('e', 'n', 'g', 0)),
                Arguments.of("engl", bytes('e', 'n', 'g', 'l')),
                Arguments.of("english", bytes('e', 'n', 'g', 'l')),
                Arguments.of("", bytes(0, 0, 0, 0)),
                Arguments.of("d\u00e9u", bytes('d', 0xC3, 0xA9, 'u')));
    }

    @ParameterizedTest
    @MethodSource("languageCodes")
    void settingsRecordCarriesPidTwiceAndTheCodeInFourBytes(String code, byte[] field) {
        Spy.setResult("Subttl::Start", 0x70000000);
        assertEquals(0x70000000L, subttl().Subttl_Start(settings(code)));
        ByteBuffer b = ByteBuffer.allocate(24).order(ByteOrder.LITTLE_ENDIAN);
        b.putInt(0, 0x80000001).putShort(4, (short) 0x1FFF).put(6, (byte) 0xFF);
        b.position(7);
        b.put(field);
        b.put(11, (byte) 2).put(12, (byte) 0xFF).putShort(14, (short) 0x2345);
        b.putShort(16, (short) 0xFFFF).putShort(18, (short) 0x1FFF).putInt(20, 2);
        assertArrayEquals(b.array(), Spy.record(onlyCall("Subttl::Start"), 0));
    }

    @Test
    void nullSettingsOrLanguageCodeReachNoModule() {
        NullPointerException e = assertThrows(NullPointerException.class,
                () -> subttl().Subttl_Start(null));
        assertEquals("SUBTTL_Settings is null", e.getMessage());
        e = assertThrows(NullPointerException.class,
                () -> subttl().Subttl_Start(settings(null)));
        assertEquals("SUBTTL_Settings.langCode is null", e.getMessage());
        assertEquals(0, Spy.callCount());
    }

    // ---- the display data ----------------------------------------------------------------

    @Test
    void getDataClearsTheBufferAndDeliversTheCounts() {
        script(0, le32(-9, 1));
        script(NUM_REGIONS, le32(2));
        script(NUM_CLUTS, le32(3));
        script(DISPLAY, bytes(7));
        Subttl.SUBTTL_Data_t d = getData(0x1_0000_0005L);
        assertEquals(Arrays.asList(-9, 1, 2, 3), Arrays.asList(d.i_pts, d.numPage, d.numRegions,
                d.numCluts));
        assertArrayEquals(new long[] {5, 0}, Spy.args(onlyCall("Subttl::GetData")));

        // The module now writes nothing: what the last display set left must be gone.
        Spy.reset();
        d = getData(-1L);
        assertEquals(Arrays.asList(0, 0, 0, 0), Arrays.asList(d.i_pts, d.numPage, d.numRegions,
                d.numCluts));
        assertArrayEquals(new long[] {-1, 0}, Spy.args(onlyCall("Subttl::GetData")));
        assertArrayEquals(bytes(1), Spy.record(0, 0), "the buffer was all zero for the module");
        Subttl.SUBTTL_Display disp = new Subttl.SUBTTL_Display();
        assertEquals(0, subttl().Subttl_GetDisplayData(disp));
        assertEquals(0, disp.i_id);
        assertNoLogs();
    }

    @Test
    void getDataReturnsZeroWhenTheModuleFails() {
        Spy.setResult("Subttl::GetData", -1);
        script(4, le32(1));
        assertEquals(1, getData(0).numPage);
    }

    @Test
    void pageAndPlacementsAreReadFromTheRecord() {
        script(PAGE, le32(11, -12, 13, 14, 16));
        script(PAGE + 20, le32(1, 2, 3));
        script(PAGE + 20 + 15 * 12, le32(-4, 0x7FFFFFFF, Integer.MIN_VALUE));
        getData(1);
        Subttl.SUBTTL_Page_t p = new Subttl.SUBTTL_Page_t();
        assertEquals(0, subttl().Subttl_GetPageData(0, p));
        assertEquals(Arrays.asList(11, -12, 13, 14, 16),
                Arrays.asList(p.i_id, p.i_timeout, p.i_state, p.i_version, p.i_region_defs));
        Subttl.SUBTTL_RegionDef d = new Subttl.SUBTTL_RegionDef();
        assertEquals(0, subttl().Subttl_GetRegionDefData(0, 0, d));
        assertEquals(Arrays.asList(1, 2, 3), Arrays.asList(d.i_id, d.i_x, d.i_y));
        assertEquals(0, subttl().Subttl_GetRegionDefData(0, 15, d));
        assertEquals(Arrays.asList(-4, 0x7FFFFFFF, Integer.MIN_VALUE),
                Arrays.asList(d.i_id, d.i_x, d.i_y));
        assertEquals(1, Spy.callCount(), "readers call no module operation");
        assertNoLogs();
    }

    static byte[] pixelPattern() {
        byte[] p = new byte[PIXELS];
        for (int i = 0; i < PIXELS; i++) p[i] = (byte) (i * 7 + 3 + (i >> 9));
        return p;
    }

    static Subttl.SUBTTL_Region_t staleRegion() {
        Subttl.SUBTTL_Region_t r = new Subttl.SUBTTL_Region_t();
        r.i_id = r.i_version = r.i_x = r.i_y = r.i_width = r.i_height = -99;
        r.i_level_comp = r.i_depth = r.i_clut = r.i_object_defs = -99;
        r.p_pixbuf = new byte[] {42};
        return r;
    }

    /** Width, height; then the size Java is told and the pixels it gets (-1: left as it was). */
    static Stream<Arguments> regionSizes() {
        return Stream.of(
                Arguments.of(0, 5, 0, 5, 0),
                Arguments.of(7, 0, 7, 0, 0),
                Arguments.of(600, 640, 600, 640, PIXELS),
                Arguments.of(384000, 1, 384000, 1, PIXELS),
                Arguments.of(601, 640, 601, 638, 601 * 638),
                Arguments.of(384001, 1, 384001, 0, 0),
                Arguments.of(1, 0x7FFFFFFF, 1, PIXELS, PIXELS),
                // The 32-bit product is 0, the real one far above the buffer.
                Arguments.of(0x10000, 0x10000, 0x10000, 5, 5 * 0x10000),
                Arguments.of(-1, -1, -1, -1, 1),
                Arguments.of(-2, -200000, -2, 0, 0),
                Arguments.of(-1, 5, 0, 0, -1),
                Arguments.of(0x10000, 0x8000, 0, 0, -1),
                Arguments.of(Integer.MIN_VALUE, 1, 0, 0, -1),
                // Opposite signs: the real product is negative, the 32-bit one wraps to 400000.
                Arguments.of(2, -2147283648, 2, 192000, PIXELS));
    }

    @ParameterizedTest
    @MethodSource("regionSizes")
    void regionSizeBoundsThePixelCopy(int width, int height, int toldWidth, int toldHeight,
            int pixelCount) {
        byte[] pixels = pixelPattern();
        script(region(2), le32(1, 2, 3, 4, width, height, 7, 8, 9));
        script(region(2) + 36, pixels);
        script(region(2) + 36 + PIXELS, le32(5, 0x55555555));
        getData(0);
        Subttl.SUBTTL_Region_t r = staleRegion();
        byte[] before = r.p_pixbuf;
        assertEquals(0, subttl().Subttl_GetRegionData(2, r));
        assertEquals(Arrays.asList(1, 2, 3, 4, toldWidth, toldHeight, 7, 8, 9),
                Arrays.asList(r.i_id, r.i_version, r.i_x, r.i_y, r.i_width, r.i_height,
                        r.i_level_comp, r.i_depth, r.i_clut));
        if (pixelCount < 0) {
            assertSame(before, r.p_pixbuf);
            assertEquals(-99, r.i_object_defs);
        } else {
            assertArrayEquals(Arrays.copyOf(pixels, pixelCount), r.p_pixbuf);
            assertEquals(5, r.i_object_defs);
        }
        assertNoLogs();
    }

    @Test
    void objectTextIsAlwaysThirtyTwoBytes() {
        byte[] text = new byte[32];
        text[0] = 'a';
        text[1] = 'b';
        text[2] = 'c';
        text[30] = (byte) 0xEE;
        text[31] = 1;
        ByteBuffer b = ByteBuffer.allocate(60).order(ByteOrder.LITTLE_ENDIAN);
        b.putInt(31).putInt(32).putInt(-33).putInt(34).putInt(35).putInt(36).put(text).putInt(3);
        script(objectDef(4, 15), b.array());
        script(objectDef(4, 0), le32(9));
        getData(0);
        Subttl.SUBTTL_ObjectDef o = new Subttl.SUBTTL_ObjectDef();
        assertEquals(0, subttl().Subttl_GetRegionObjectDefData(4, 15, o));
        assertEquals(Arrays.asList(31, 32, -33, 34, 35, 36, 3),
                Arrays.asList(o.i_id, o.i_type, o.i_x, o.i_y, o.i_fg_pc, o.i_bg_pc,
                        o.i_text_length));
        assertArrayEquals(text, o.psz_text);
        assertEquals(0, subttl().Subttl_GetRegionObjectDefData(4, 0, o));
        assertEquals(9, o.i_id);
        assertArrayEquals(new byte[32], o.psz_text);
        assertNoLogs();
    }

    @Test
    void displayZeroExtendsItsBytesAndSkipsTheGaps() {
        script(DISPLAY, bytes(0xFF, 0x80, 0x11, 0x22));
        script(DISPLAY + 4, le32(720, 576));
        script(DISPLAY + 12, bytes(0xFE, 0x33, 0x44, 0x55));
        script(DISPLAY + 16, le32(-1, 2, 719, Integer.MIN_VALUE));
        getData(0);
        Subttl.SUBTTL_Display d = new Subttl.SUBTTL_Display();
        assertEquals(0, subttl().Subttl_GetDisplayData(d));
        assertEquals(Arrays.asList(255, 128, 720, 576, 254, -1, 2, 719, Integer.MIN_VALUE),
                Arrays.asList(d.i_id, d.i_version, d.i_width, d.i_height, d.b_windowed, d.i_x,
                        d.i_y, d.i_max_x, d.i_max_y));
    }

    // ---- colour tables -------------------------------------------------------------------

    /** Y, Cr, Cb, T and the colour Java must get. */
    static final int[][] WORKED = {
        {235, 128, 128, 0, 0xFFFEFEFE},
        {16, 128, 128, 0, 0xFF000000},
        {126, 128, 128, 127, 0x80808080},
        {81, 240, 90, 0, 0xFFFE0000},
        {145, 34, 54, 0, 0xFF00FF00},
        {41, 110, 240, 0, 0xFF0000FF},
        {255, 128, 128, 0, 0xFFFFFFFF},
        {0, 0, 0, 0, 0},
        {0, 200, 100, 50, 0},
        {16, 128, 128, 255, 0},
        {255, 255, 255, 255, 0x00FF7DFF},
    };

    /** A CLUT record whose entry i is worked value (i + shift) mod its count. */
    static byte[] clutRecord(int id, int version, int shift) {
        ByteBuffer b = ByteBuffer.allocate(1106);
        b.put((byte) id).put((byte) version);
        for (int i = 0; i < 4 + 16 + 256; i++) {
            int[] w = WORKED[(i + shift) % WORKED.length];
            b.put((byte) w[0]).put((byte) w[1]).put((byte) w[2]).put((byte) w[3]);
        }
        return b.array();
    }

    static int[] expectedColours(int from, int count, int shift) {
        int[] c = new int[count];
        for (int i = 0; i < count; i++) c[i] = WORKED[(from + i + shift) % WORKED.length][4];
        return c;
    }

    static void assertClut(int id, int version, int shift, Subttl.SUBTTL_Clut c) {
        assertEquals(id, c.i_id);
        assertEquals(version, c.i_version);
        assertArrayEquals(expectedColours(0, 4, shift), c.c_2b);
        assertArrayEquals(expectedColours(4, 16, shift), c.c_4b);
        assertArrayEquals(expectedColours(20, 256, shift), c.c_8b);
    }

    @Test
    void clutsAreConvertedIntoNewArrays() {
        script(clut(0), clutRecord(1, 2, 0));
        script(clut(3), clutRecord(0xFE, 0x81, 5));
        script(DEFAULT_CLUT, clutRecord(0x80, 0xFF, 3));
        getData(0);
        Subttl.SUBTTL_Clut c = new Subttl.SUBTTL_Clut();
        assertEquals(0, subttl().Subttl_GetClutData(0, c));
        assertClut(1, 2, 0, c);
        int[] first = c.c_8b;
        first[0] = 1;
        assertEquals(0, subttl().Subttl_GetClutData(0, c));
        assertNotSame(first, c.c_8b);
        assertClut(1, 2, 0, c);
        assertEquals(0, subttl().Subttl_GetClutData(3, c));
        assertClut(0xFE, 0x81, 5, c);
        assertEquals(0, subttl().Subttl_GetDefaultClutData(c));
        assertClut(0x80, 0xFF, 3, c);
        assertEquals(1, Spy.callCount());
        assertNoLogs();
    }

    @Test
    void unwrittenClutsAreTablesOfTransparentZeros() {
        script(clut(1), clutRecord(9, 9, 0));
        script(DEFAULT_CLUT, clutRecord(9, 9, 0));
        getData(0);
        Spy.reset();
        getData(0);
        for (int index : new int[] {1, -1}) {
            Subttl.SUBTTL_Clut c = new Subttl.SUBTTL_Clut();
            c.i_id = c.i_version = 5;
            int r = index < 0 ? subttl().Subttl_GetDefaultClutData(c)
                              : subttl().Subttl_GetClutData(index, c);
            assertEquals(0, r);
            assertEquals(0, c.i_id);
            assertEquals(0, c.i_version);
            assertArrayEquals(new int[4], c.c_2b);
            assertArrayEquals(new int[16], c.c_4b);
            assertArrayEquals(new int[256], c.c_8b);
        }
    }

    // ---- indexes -------------------------------------------------------------------------

    /** Region 3 is within the buffer's room but above the two regions delivered. */
    @Test
    void indexAboveTheCountReadsTheRecordAsItIs() {
        script(NUM_REGIONS, le32(2));
        getData(0);
        Subttl.SUBTTL_Region_t r = staleRegion();
        assertEquals(0, subttl().Subttl_GetRegionData(3, r));
        assertEquals(Arrays.asList(0, 0, 0, 0, 0, 0, 0, 0, 0, 0),
                Arrays.asList(r.i_id, r.i_version, r.i_x, r.i_y, r.i_width, r.i_height,
                        r.i_level_comp, r.i_depth, r.i_clut, r.i_object_defs));
        assertEquals(0, r.p_pixbuf.length);

        script(region(3), le32(77, 0, 0, 0, 1, 1));
        getData(0);
        assertEquals(0, subttl().Subttl_GetRegionData(3, r));
        assertEquals(77, r.i_id);
        assertEquals(1, r.p_pixbuf.length);
    }

    /**
     * A reader call on an object whose i_id is -7 and whose array, if it has one, is null.
     * It tells what came back: the result or the exception's message, then the object's i_id
     * and its array.
     */
    interface Reader {
        String read(Subttl s);
    }

    static String outcome(IntSupplier call, IntSupplier id, Supplier<Object> array) {
        String result;
        try {
            result = Integer.toString(call.getAsInt());
        } catch (IndexOutOfBoundsException e) {
            result = e.getMessage();
        }
        Object a = array.get();
        return result + " | " + id.getAsInt() + " | " + (a == null ? "null" : "array");
    }

    static Reader page(int p) {
        return s -> {
            Subttl.SUBTTL_Page_t o = new Subttl.SUBTTL_Page_t();
            o.i_id = -7;
            return outcome(() -> s.Subttl_GetPageData(p, o), () -> o.i_id, () -> null);
        };
    }

    static Reader regionDef(int p, int d) {
        return s -> {
            Subttl.SUBTTL_RegionDef o = new Subttl.SUBTTL_RegionDef();
            o.i_id = -7;
            return outcome(() -> s.Subttl_GetRegionDefData(p, d, o), () -> o.i_id, () -> null);
        };
    }

    static Reader regionAt(int r) {
        return s -> {
            Subttl.SUBTTL_Region_t o = new Subttl.SUBTTL_Region_t();
            o.i_id = -7;
            return outcome(() -> s.Subttl_GetRegionData(r, o), () -> o.i_id, () -> o.p_pixbuf);
        };
    }

    static Reader objectAt(int r, int d) {
        return s -> {
            Subttl.SUBTTL_ObjectDef o = new Subttl.SUBTTL_ObjectDef();
            o.i_id = -7;
            return outcome(() -> s.Subttl_GetRegionObjectDefData(r, d, o), () -> o.i_id,
                    () -> o.psz_text);
        };
    }

    static Reader clutAt(int c) {
        return s -> {
            Subttl.SUBTTL_Clut o = new Subttl.SUBTTL_Clut();
            o.i_id = -7;
            return outcome(() -> s.Subttl_GetClutData(c, o), () -> o.i_id, () -> o.c_2b);
        };
    }

    /** A reader with its indexes, and the message of its first index outside the room. */
    /** A reader whose first index outside the room is `index` of a room of `length`. */
    static Arguments outside(String name, Reader reader, int index, int length) {
        return Arguments.of(Named.of(name, reader),
                "Index " + index + " out of bounds for length " + length);
    }

    static Stream<Arguments> indexesOutsideTheRoom() {
        int min = Integer.MIN_VALUE;
        return Stream.of(
                outside("page 1", page(1), 1, 1),
                outside("page -1", page(-1), -1, 1),
                outside("placement 0 of page 1", regionDef(1, 0), 1, 1),
                outside("placement 16 of page 1", regionDef(1, 16), 1, 1),
                outside("placement 16", regionDef(0, 16), 16, 16),
                outside("placement -1", regionDef(0, -1), -1, 16),
                outside("region 5", regionAt(5), 5, 5),
                outside("region MIN_VALUE", regionAt(min), min, 5),
                outside("object 0 of region 5", objectAt(5, 0), 5, 5),
                outside("object 0 of region -1", objectAt(-1, 0), -1, 5),
                outside("object 16", objectAt(4, 16), 16, 16),
                outside("object -1", objectAt(0, -1), -1, 16),
                outside("CLUT 4", clutAt(4), 4, 4),
                outside("CLUT -1", clutAt(-1), -1, 4));
    }

    @ParameterizedTest
    @MethodSource("indexesOutsideTheRoom")
    void indexOutsideTheRoomRaisesAndTouchesNothing(Reader reader, String message) {
        script(0, le32(0, 1));
        getData(0);
        assertEquals(message + " | -7 | null", reader.read(subttl()));
        assertEquals(1, Spy.callCount());
        assertNoLogs();
    }

    @Test
    void lastIndexOfEachRoomIsRead() {
        script(PAGE, le32(1));
        script(PAGE + 20 + 15 * 12, le32(2));
        script(region(4), le32(3));
        script(objectDef(4, 15), le32(4));
        script(clut(3), bytes(5));
        getData(0);
        assertEquals("0 | 1 | null", page(0).read(subttl()));
        assertEquals("0 | 2 | null", regionDef(0, 15).read(subttl()));
        assertEquals("0 | 3 | array", regionAt(4).read(subttl()));
        assertEquals("0 | 4 | array", objectAt(4, 15).read(subttl()));
        assertEquals("0 | 5 | array", clutAt(3).read(subttl()));
    }

    // ---- bad objects and missing modules -------------------------------------------------

    static final List<ToLongFunction<Subttl>> EVERY_METHOD = Arrays.asList(
            s -> s.Subttl_Init(),
            s -> s.Subttl_Start(settings("eng")),
            s -> s.Subttl_Stop(1),
            s -> s.Subttl_GetData(1, new Subttl.SUBTTL_Data_t()),
            s -> s.Subttl_GetPageData(0, new Subttl.SUBTTL_Page_t()),
            s -> s.Subttl_GetRegionDefData(0, 0, new Subttl.SUBTTL_RegionDef()),
            s -> s.Subttl_GetRegionData(0, new Subttl.SUBTTL_Region_t()),
            s -> s.Subttl_GetRegionObjectDefData(0, 0, new Subttl.SUBTTL_ObjectDef()),
            s -> s.Subttl_GetClutData(0, new Subttl.SUBTTL_Clut()),
            s -> s.Subttl_GetDisplayData(new Subttl.SUBTTL_Display()),
            s -> s.Subttl_GetDefaultClutData(new Subttl.SUBTTL_Clut()));

    /** Display data that a failed call must leave as it is: page 0 with i_id 0x5EED. */
    void scriptSeed() {
        script(PAGE, le32(0x5EED));
        getData(0);
        Spy.reset();
        Spy.takeLogs();
    }

    void assertSeedKept() {
        assertEquals("0 | 24301 | null", page(0).read(subttl()));
    }

    void assertFailsEveryMethodOn(Subttl s) {
        scriptSeed();
        for (int i = 0; i < EVERY_METHOD.size(); i++) {
            ToLongFunction<Subttl> m = EVERY_METHOD.get(i);
            IllegalStateException e = assertThrows(IllegalStateException.class,
                    () -> m.applyAsLong(s), "method " + i);
            assertEquals(null, e.getMessage());
        }
        assertEquals(0, Spy.callCount());
        assertNoLogs();
        assertSeedKept();
    }

    @Test
    void unboundObjectRaisesIllegalStateSilently() {
        assertFailsEveryMethodOn(new Subttl(0));
    }

    @Test
    void missingModuleRaisesIllegalStateSilently() {
        Spy.omit(new String[] {"Subttl"});
        DVB without = new DVB();
        try {
            assertFailsEveryMethodOn(without.getSubttl());
        } finally {
            without.release();
        }
    }

    static Arguments nullCase(String name, ToLongFunction<Subttl> call) {
        return Arguments.of(name, call);
    }

    static Stream<Arguments> nullObjects() {
        return Stream.of(
                nullCase("SUBTTL_Data_t", s -> s.Subttl_GetData(1, null)),
                nullCase("SUBTTL_Page_t", s -> s.Subttl_GetPageData(0, null)),
                nullCase("SUBTTL_RegionDef", s -> s.Subttl_GetRegionDefData(0, 0, null)),
                nullCase("SUBTTL_Region_t", s -> s.Subttl_GetRegionData(0, null)),
                nullCase("SUBTTL_ObjectDef", s -> s.Subttl_GetRegionObjectDefData(0, 0, null)),
                nullCase("SUBTTL_Clut", s -> s.Subttl_GetClutData(0, null)),
                nullCase("SUBTTL_Display", s -> s.Subttl_GetDisplayData(null)),
                nullCase("SUBTTL_Clut", s -> s.Subttl_GetDefaultClutData(null)));
    }

    @ParameterizedTest(name = "{0}")
    @MethodSource("nullObjects")
    void nullObjectRaisesNullPointerWithoutModuleCall(String name, ToLongFunction<Subttl> m) {
        scriptSeed();
        NullPointerException e = assertThrows(NullPointerException.class,
                () -> m.applyAsLong(subttl()));
        assertEquals(name + " is null", e.getMessage());
        assertEquals(0, Spy.callCount());
        assertNoLogs();
        assertSeedKept();
    }
}
