package android.DVB;

import static org.junit.jupiter.api.Assertions.assertArrayEquals;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertThrows;

import java.lang.reflect.Field;
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
import org.junit.jupiter.api.function.Executable;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.ValueSource;

/** Stream control, settings, status and component information. */
class StrmPlaybackTest extends SpyTestBase {
    /** The module sees only the low 32 bits: 5. */
    static final long HANDLE = 0x0000000100000005L;

    Strm strm() {
        return dvb.getStrm();
    }

    /** Released here and dropped, so that finalizeLeftovers() can reach every DVB object. */
    @AfterEach
    void releaseAndDropDvb() {
        if (dvb != null) dvb.release();
        dvb = null;
    }

    /**
     * A finalized DVB object logs. Finalize this class's objects before a later class checks its
     * log lines, which a collection in the middle of that class would otherwise disturb.
     */
    @AfterAll
    @SuppressWarnings({"deprecation", "removal"})
    static void finalizeLeftovers() {
        for (int i = 0; i < 3; i++) {
            System.gc();
            System.runFinalization();
        }
        Spy.takeLogs();
    }

    /**
     * The log lines written since the last call, less the DVB lines of objects that earlier
     * tests left to the finalizer, which may run at any moment.
     */
    static List<String> strmLogs() {
        List<String> out = new ArrayList<>();
        for (String line : logs()) {
            if (!line.startsWith(VERBOSE + " DVB ")) out.add(line);
        }
        return out;
    }

    // ---- the settings record -----------------------------------------------------------------

    /** Every field its own value; tone, ubFreq and orbital_position beyond their widths. */
    static Strm.STRM_FrontEnd frontEnd(int type) {
        Strm.STRM_FrontEnd f = new Strm.STRM_FrontEnd();
        f.type = type;
        f.frequency = -11778000;
        f.symbolRate = 0x22222222;
        f.fecInner = 0x33333333;
        f.modulation = 0x44444444;
        f.polarization = 0x55555555;
        f.rolloff = 0x66666666;
        f.orbital_position = -450;
        f.diseqctype = 0x77777777;
        f.tone = 300;
        f.lnbpower = 0x2CD;
        f.lnbLowLO = 9750000;
        f.lnbHigLO = 10600000;
        f.port = -1;
        f.port16 = 0x123;
        f.posIndex = 0x145;
        f.satPosition = -192;
        f.myLongitude = -7;
        f.myLatitude = 0x7FFFFFFF;
        f.toneBurst = 0x1EF;
        f.ubSlot = 0x301;
        f.ubFreq = 70000;
        f.ubSat = 0x402;
        f.out5v = 0x503;
        f.bandwidth = 8000;
        return f;
    }

    static Strm.STRM_Service service() {
        Strm.STRM_Service s = new Strm.STRM_Service();
        s.svcId = 70000;
        s.videoPid = 0x1FFF;
        s.videoType = 0x11B;
        s.audioPid = 0x101;
        s.audioType = 0x81;
        s.pcrPid = 0x102;
        s.pmtPid = 0x103;
        s.caSysId0 = 0x0B00;
        s.caSysId1 = -1;
        s.caSysId2 = 0x1702;
        s.tsIndex = -3;
        return s;
    }

    static Strm.STRM_LangCode langs(String a, String b) {
        Strm.STRM_LangCode l = new Strm.STRM_LangCode();
        l.langCode0 = a;
        l.langCode1 = b;
        return l;
    }

    static Strm.STRM_PvrSetting pvr(int speed, int div, int pos) {
        Strm.STRM_PvrSetting p = new Strm.STRM_PvrSetting();
        p.playSpeed = speed;
        p.playSpeedDiv = div;
        p.posTime = pos;
        return p;
    }

    /** The 152-byte record for `code`, written out independently of the library. */
    static byte[] settings(int code, Strm.STRM_FrontEnd f, Strm.STRM_Service s, String l0,
            String l1, Strm.STRM_PvrSetting p) {
        ByteBuffer b = ByteBuffer.allocate(152).order(ByteOrder.LITTLE_ENDIAN);
        b.putInt(0, code).putInt(4, f.frequency);
        if (code == 2) {
            b.putInt(8, f.bandwidth);
        } else {
            b.putInt(8, f.symbolRate).putInt(12, f.fecInner).putInt(16, f.modulation);
            if (code == 0) b.putInt(20, f.polarization).putInt(24, f.rolloff);
        }
        b.putInt(36, f.diseqctype).put(40, (byte) f.tone).put(41, (byte) f.lnbpower);
        b.putInt(44, f.lnbLowLO).putInt(48, f.lnbHigLO);
        b.put(52, (byte) f.port).put(53, (byte) f.port16).put(54, (byte) f.posIndex);
        b.putInt(56, f.satPosition).putInt(60, f.myLongitude).putInt(64, f.myLatitude);
        b.put(68, (byte) f.toneBurst).put(69, (byte) f.ubSlot).putShort(70, (short) f.ubFreq);
        b.put(72, (byte) f.ubSat).put(73, (byte) f.out5v);
        b.putShort(76, (short) f.orbital_position);
        b.putShort(80, (short) s.svcId).putShort(82, (short) s.videoPid);
        b.put(84, (byte) s.videoType);
        b.putShort(86, (short) s.audioPid).put(88, (byte) s.audioType);
        b.putShort(90, (short) s.pcrPid).putShort(92, (short) s.pmtPid);
        b.putShort(94, (short) s.caSysId0).putShort(96, (short) s.caSysId1);
        b.putShort(98, (short) s.caSysId2).putInt(108, s.tsIndex);
        byte[] a = l0.getBytes(StandardCharsets.UTF_8);
        byte[] c = l1.getBytes(StandardCharsets.UTF_8);
        b.position(128);
        b.put(a, 0, Math.min(3, a.length));
        b.position(132);
        b.put(c, 0, Math.min(3, c.length));
        if (p != null) {
            b.putInt(140, p.playSpeed).putInt(144, p.playSpeedDiv).putInt(148, p.posTime);
        }
        return b.array();
    }

    @ParameterizedTest
    @ValueSource(ints = {1, 2, 0, 3, -1})
    void startBuildsTheSettingsRecordByTypeCode(int type) {
        Strm.STRM_FrontEnd f = frontEnd(type);
        Spy.setResult("Strm::Start", -9);
        assertEquals(-9, strm().Strm_Start(HANDLE, service(), langs("eng", "fra"), f));
        int call = onlyCall("Strm::Start");
        assertEquals(5, Spy.args(call)[0]);
        int code = type == 1 || type == 2 ? type : 0;
        assertArrayEquals(settings(code, f, service(), "eng", "fra", null), Spy.record(call, 0));
    }

    @Test
    void setSettingsAlwaysSendsCodeZeroWithoutBandwidthAndThePvrBlock() {
        Strm.STRM_FrontEnd f = frontEnd(2);
        Strm.STRM_PvrSetting p = pvr(-2, 1, 123456);
        Spy.setResult("Strm::SetSettings", -1);
        assertEquals(0, strm().Strm_SetSettings(HANDLE, service(), p, langs("deu", "fra"), f));
        int call = onlyCall("Strm::SetSettings");
        assertEquals(5, Spy.args(call)[0]);
        assertArrayEquals(settings(0, f, service(), "deu", "fra", p), Spy.record(call, 0));
    }

    @Test
    void narrowValuesKeepTheirLowBitsBothWays() {
        Strm.STRM_FrontEnd f = frontEnd(0);
        strm().Strm_Start(0, service(), langs("eng", "eng"), f);
        strm().Strm_SetSettings(0, service(), pvr(0, 0, 0), langs("eng", "eng"), f);
        for (int call = 0; call < 2; call++) {
            ByteBuffer r = rec(call, 0);
            assertEquals(44, r.get(40) & 0xFF, "tone 300");
            assertEquals(4464, r.getShort(70) & 0xFFFF, "ubFreq 70000");
            assertEquals(0xFE3E, r.getShort(76) & 0xFFFF, "orbital_position -450");
            assertEquals(4464, r.getShort(80) & 0xFFFF, "svcId 70000");
        }

        Spy.reset();
        ByteBuffer out = ByteBuffer.allocate(152).order(ByteOrder.LITTLE_ENDIAN);
        out.put(40, (byte) 44).putShort(70, (short) 4464).putShort(76, (short) 0xFE3E);
        out.put(41, (byte) 0xFF).putShort(80, (short) 0xFFFF);
        Spy.setOut("Strm::GetSettings", 1, 0, out.array());
        Strm.STRM_FrontEnd got = new Strm.STRM_FrontEnd();
        Strm.STRM_Service svc = new Strm.STRM_Service();
        strm().Strm_GetSettings(0, svc, new Strm.STRM_PvrSetting(), langs("", ""), got);
        assertEquals(Arrays.asList(44, 4464, -450, 255, 65535),
                Arrays.asList(got.tone, got.ubFreq, got.orbital_position, got.lnbpower, svc.svcId));
    }

    @ParameterizedTest
    @ValueSource(strings = {"eng", "english", "en", "", "\u00e9t\u00e9"})
    void languageCodesKeepTheirFirstThreeBytes(String code) {
        byte[] utf8 = code.getBytes(StandardCharsets.UTF_8);
        byte[] expected = new byte[4];
        System.arraycopy(utf8, 0, expected, 0, Math.min(3, utf8.length));
        strm().Strm_Start(0, service(), langs(code, "fra"), frontEnd(0));
        strm().Strm_SetSettings(0, service(), pvr(0, 0, 0), langs("fra", code), frontEnd(0));
        assertBytes(expected, rec(0, 0), 128);
        assertBytes(bytes(0x66, 0x72, 0x61, 0), rec(0, 0), 132);
        assertBytes(bytes(0x66, 0x72, 0x61, 0), rec(1, 0), 128);
        assertBytes(expected, rec(1, 0), 132);
    }

    /** Values within their widths, so that they must come back exactly. */
    static byte[] moduleSettings(
            Strm.STRM_FrontEnd f, Strm.STRM_Service s, Strm.STRM_PvrSetting p) {
        f.tone = 255;
        f.lnbpower = 0x80;
        f.port = 0xFE;
        f.port16 = 1;
        f.posIndex = 0x90;
        f.toneBurst = 0xA0;
        f.ubSlot = 2;
        f.ubFreq = 0xFFFF;
        f.ubSat = 0xC0;
        f.out5v = 1;
        s.svcId = 0xFFFF;
        s.videoType = 0xFF;
        s.caSysId1 = 0x8000;
        // The module stores code 2 with its bandwidth at 8, which reads back as symbolRate.
        f.symbolRate = f.bandwidth;
        byte[] r = settings(0, f, s, "deu", "fra", p);
        r[0] = 2;
        return r;
    }

    static void assertSameInts(Object expected, Object actual, List<String> skip) throws Exception {
        for (Field field : expected.getClass().getFields()) {
            if (skip.contains(field.getName()) || field.getType() != int.class) continue;
            assertEquals(field.getInt(expected), field.getInt(actual), field.getName());
        }
    }

    @Test
    void getSettingsReadsEveryExchangedFieldAndLeavesTypeAndBandwidth() throws Exception {
        Strm.STRM_FrontEnd f = frontEnd(0);
        Strm.STRM_Service s = service();
        Strm.STRM_PvrSetting p = pvr(-2, 3, -4);
        Spy.setOut("Strm::GetSettings", 1, 0, moduleSettings(f, s, p));
        Spy.setResult("Strm::GetSettings", -1);

        Strm.STRM_FrontEnd gotF = new Strm.STRM_FrontEnd();
        gotF.type = 7;
        gotF.bandwidth = 99;
        Strm.STRM_Service gotS = new Strm.STRM_Service();
        Strm.STRM_PvrSetting gotP = new Strm.STRM_PvrSetting();
        Strm.STRM_LangCode gotL = new Strm.STRM_LangCode();
        assertEquals(0, strm().Strm_GetSettings(HANDLE, gotS, gotP, gotL, gotF));
        int call = onlyCall("Strm::GetSettings");
        assertEquals(5, Spy.args(call)[0]);
        assertZero(rec(call, 0), 0, 152);

        assertSameInts(f, gotF, Arrays.asList("type", "bandwidth"));
        assertEquals(8000, gotF.symbolRate);
        assertEquals(7, gotF.type);
        assertEquals(99, gotF.bandwidth);
        assertSameInts(s, gotS, Arrays.asList());
        assertSameInts(p, gotP, Arrays.asList());
        assertEquals(Arrays.asList("deu", "fra"), Arrays.asList(gotL.langCode0, gotL.langCode1));
    }

    @Test
    void getSettingsFromSilentModuleGivesZerosAndEmptyLanguageStrings() throws Exception {
        Strm.STRM_FrontEnd f = frontEnd(0);
        Strm.STRM_Service s = service();
        Strm.STRM_PvrSetting p = pvr(1, 2, 3);
        Strm.STRM_LangCode l = langs(null, "x");
        assertEquals(0, strm().Strm_GetSettings(0, s, p, l, f));
        assertSameInts(new Strm.STRM_FrontEnd(), f, Arrays.asList("type", "bandwidth"));
        assertSameInts(new Strm.STRM_Service(), s, Arrays.asList());
        assertSameInts(new Strm.STRM_PvrSetting(), p, Arrays.asList());
        assertEquals(Arrays.asList("", ""), Arrays.asList(l.langCode0, l.langCode1));
    }

    @Test
    void fullLanguageFieldsEndAtTheirFieldsEnd() {
        ByteBuffer out = ByteBuffer.allocate(152);
        out.position(128);
        out.put("abcdxyzw".getBytes(StandardCharsets.US_ASCII)).put((byte) 0xFF);
        Spy.setOut("Strm::GetSettings", 1, 0, out.array());
        Strm.STRM_LangCode l = new Strm.STRM_LangCode();
        strm().Strm_GetSettings(0, new Strm.STRM_Service(), new Strm.STRM_PvrSetting(), l,
                new Strm.STRM_FrontEnd());
        assertEquals(Arrays.asList("abcd", "xyzw"), Arrays.asList(l.langCode0, l.langCode1));
    }

    // ---- open, close, init, stop --------------------------------------------------------------

    static Strm.STRM_OpenSettings open(String path) {
        Strm.STRM_OpenSettings o = new Strm.STRM_OpenSettings();
        o.frontend = 1;
        o.demux = -2;
        o.video = 3;
        o.audio = 0x7FFFFFFF;
        o.szPath = path;
        return o;
    }

    static String path(int length) {
        char[] c = new char[length];
        for (int i = 0; i < length; i++) c[i] = (char) ('a' + i % 26);
        return new String(c);
    }

    @ParameterizedTest
    @ValueSource(ints = {0, 17, 127})
    void openSendsTheRecordWithThePathZeroEnded(int length) {
        String p = path(length);
        assertEquals(0, strm().Strm_Open(open(p)));
        ByteBuffer r = rec(onlyCall("Strm::Open"), 0);
        assertEquals(144, r.capacity());
        assertBytes(le32(1, -2, 3, 0x7FFFFFFF), r, 0);
        assertBytes(p.getBytes(StandardCharsets.US_ASCII), r, 16);
        assertZero(r, 16 + length, 144);
    }

    @ParameterizedTest
    @ValueSource(ints = {128, 300})
    void openRefusesAPathThatDoesNotFit(int length) {
        IllegalArgumentException e = assertThrows(IllegalArgumentException.class,
                () -> strm().Strm_Open(open(path(length))));
        assertEquals("STRM_OpenSettings.szPath is " + length + " bytes; at most 127 fit",
                e.getMessage());
        assertEquals(0, Spy.callCount());
    }

    @Test
    void openCountsThePathInBytesNotCharacters() {
        String twoByteChars = "\u00e9".repeat(64); // 128 bytes
        IllegalArgumentException e = assertThrows(IllegalArgumentException.class,
                () -> strm().Strm_Open(open(twoByteChars)));
        assertEquals("STRM_OpenSettings.szPath is 128 bytes; at most 127 fit", e.getMessage());
        assertEquals(0, Spy.callCount());
    }

    @ParameterizedTest
    @ValueSource(ints = {-2, 0x7FFFFFFF, 0x80000000})
    void openReturnsTheModuleHandleSignExtended(int handle) {
        Spy.setResult("Strm::Open", handle);
        assertEquals((long) handle, strm().Strm_Open(open("x")));
    }

    @Test
    void initStopAndCloseResults() {
        Spy.setResult("Strm::Init", 42);
        Spy.setResult("Strm::Stop", -6);
        Spy.setResult("Strm::Close", -1);
        assertEquals(42, strm().Strm_Init());
        assertEquals(-6, strm().Strm_Stop(HANDLE, true));
        assertEquals(-6, strm().Strm_Stop(HANDLE, false));
        assertEquals(0, strm().Strm_Close(HANDLE));
        assertEquals(Arrays.asList("Strm::Init", "Strm::Stop", "Strm::Stop", "Strm::Close"), ops());
        assertArrayEquals(new long[] {5, 1}, Spy.args(1));
        assertArrayEquals(new long[] {5, 0}, Spy.args(2));
        assertArrayEquals(new long[] {5}, Spy.args(3));
    }

    // ---- status ---------------------------------------------------------------------------------

    @Test
    void statusFieldsAreMappedByName() {
        ByteBuffer r = ByteBuffer.allocate(96).order(ByteOrder.LITTLE_ENDIAN);
        for (int off = 0; off < 96; off += 4) r.putInt(off, 1000 + off);
        r.putInt(4, -1);                 // feStrength
        r.putLong(48, 1L << 32);         // recsize
        r.putInt(64, 100).putInt(68, 200); // end time, then current time
        r.putInt(80, 7).putInt(84, 8).putInt(88, 9); // event, start, end
        Spy.setOut("Strm::GetStatus", 1, 0, r.array());
        Spy.setResult("Strm::GetStatus", -1);
        Strm.STRM_GetStatus s = new Strm.STRM_GetStatus();
        assertEquals(0, strm().Strm_GetStatus(HANDLE, s));
        int call = onlyCall("Strm::GetStatus");
        assertEquals(5, Spy.args(call)[0]);
        assertZero(rec(call, 0), 0, 96);
        assertEquals(Arrays.asList(1000, -1, 1008, 1012, 1016, 1020, 1024, 1028, 1032, 1036, 1040,
                        1044),
                Arrays.asList(s.feStatus, s.feStrength, s.feBer, s.feSnr, s.videoPts, s.audioPts,
                        s.localPts, s.fpsInteger, s.fpsDecimal, s.pictureStatus, s.recstate,
                        s.recduration));
        assertEquals(4294967296L, s.recsize);
        assertEquals(Arrays.asList(1056, 1060, 200, 100, 1072, 1076, 8, 9, 7, 1092),
                Arrays.asList(s.recevent, s.recstartTime, s.reccurTime, s.recendTime, s.pbstate,
                        s.pbposition, s.pbstartTime, s.pbendTime, s.pbevent, s.result));
    }

    @Test
    void statusFromSilentModuleIsAllZero() throws Exception {
        Strm.STRM_GetStatus s = new Strm.STRM_GetStatus();
        for (Field f : s.getClass().getFields()) {
            if (f.getType() == int.class) f.setInt(s, 9);
        }
        s.recsize = 9;
        assertEquals(0, strm().Strm_GetStatus(0, s));
        assertSameInts(new Strm.STRM_GetStatus(), s, Arrays.asList());
        assertEquals(0, s.recsize);
    }

    // ---- components -----------------------------------------------------------------------------

    /** A component-list record whose entries all carry generation `g`; counts as given. */
    static byte[] streamInfo(int g, int count) {
        ByteBuffer b = ByteBuffer.allocate(1728).order(ByteOrder.LITTLE_ENDIAN);
        b.putInt(0, count).putInt(68, count).putInt(808, count).putInt(1484, count);
        for (int i = 0; i < 16; i++) {
            int v = 4 + 4 * i;
            b.putShort(v, (short) (g * 0x100 + i)).put(v + 2, (byte) (0x80 + i));
            int a = 72 + 46 * i;
            b.putShort(a, (short) (g * 0x100 + i)).put(a + 2, (byte) (i & 1));
            b.put(a + 3, (byte) (0x81 + g));
            put(b, a + 4, "e" + (char) ('a' + i) + g);
            put(b, a + 8, "f" + g);
            b.put(a + 12, (byte) (0xF0 + i));
            put(b, a + 13, "audio " + g + "/" + i);
            int t = 812 + 42 * i;
            b.putShort(t, (short) (g * 0x100 + i)).put(t + 2, (byte) (0x90 + g));
            put(b, t + 3, "t" + (char) ('a' + i) + g);
            b.put(t + 7, (byte) g).put(t + 8, (byte) (0xA0 + i)).put(t + 9, (byte) 0xFF);
            put(b, t + 10, "teletext " + g + "/" + i);
            int s = 1488 + 14 * i;
            b.putShort(s, (short) (g * 0x100 + i)).put(s + 2, (byte) (0x10 + g));
            put(b, s + 3, "s" + (char) ('a' + i) + g);
            b.put(s + 7, (byte) (g + 1)).put(s + 8, (byte) i);
            b.putShort(s + 10, (short) (0x1234 + i)).putShort(s + 12, (short) (0xFFF0 + i));
        }
        b.putShort(1712, (short) 0x1FFF).putShort(1714, (short) 0xFFFF);
        b.putShort(1716, (short) 0x0B00).putShort(1718, (short) g);
        return b.array();
    }

    static void put(ByteBuffer b, int offset, String ascii) {
        byte[] s = ascii.getBytes(StandardCharsets.US_ASCII);
        for (int i = 0; i < s.length; i++) b.put(offset + i, s[i]);
    }

    /** What the four getters deliver for entry i of generation g, as text. */
    static List<String> expectedEntry(int g, int i) {
        return Arrays.asList(
                (g * 0x100 + i) + " " + (0x80 + i),
                (g * 0x100 + i) + " " + (i & 1) + " " + (0x81 + g) + " e" + (char) ('a' + i) + g
                        + " f" + g + " " + (0xF0 + i) + " audio " + g + "/" + i,
                (g * 0x100 + i) + " " + (0x10 + g) + " s" + (char) ('a' + i) + g + " " + (g + 1)
                        + " " + i + " " + (0x1234 + i) + " " + (0xFFF0 + i),
                (g * 0x100 + i) + " " + (0x90 + g) + " t" + (char) ('a' + i) + g + " " + g + " "
                        + (0xA0 + i) + " 255 teletext " + g + "/" + i);
    }

    List<String> readEntry(int i) {
        Strm s = strm();
        Strm.VideoContent v = new Strm.VideoContent();
        Strm.AudioContent a = new Strm.AudioContent();
        Strm.SubtitleContent sub = new Strm.SubtitleContent();
        Strm.TeletextContent t = new Strm.TeletextContent();
        assertEquals(0, s.Strm_GetVideoStreamInfo(i, v));
        assertEquals(0, s.Strm_GetAudioStreamInfo(i, a));
        assertEquals(0, s.Strm_GetSubTilteStreamInfo(i, sub));
        assertEquals(0, s.Strm_GetTeleTextStreamInfo(i, t));
        return Arrays.asList(
                v.pid + " " + v.type,
                a.pid + " " + a.isDolbyAC3 + " " + a.type + " " + a.langCode0 + " " + a.langCode1
                        + " " + a.componetTag + " " + a.streamName,
                sub.pid + " " + sub.type + " " + sub.langCode + " " + sub.magazineNumber + " "
                        + sub.pageNumber + " " + sub.compositionPageId + " " + sub.ancillaryPageId,
                t.pid + " " + t.type + " " + t.langCode + " " + t.magazineNumber + " "
                        + t.pageNumber + " " + t.componetTag + " " + t.streamName);
    }

    Strm.STRM_StreamInfo query(int g, int count) {
        Spy.reset();
        Spy.setOut("Strm::CreatStreamInfo", 1, 0, streamInfo(g, count));
        Spy.setResult("Strm::CreatStreamInfo", -1);
        Strm.STRM_StreamInfo info = new Strm.STRM_StreamInfo();
        assertEquals(0, strm().Strm_CreatStreamInfo(HANDLE, info));
        assertEquals(5, Spy.args(onlyCall("Strm::CreatStreamInfo"))[0]);
        return info;
    }

    @ParameterizedTest
    @ValueSource(ints = {0, 1, 3, 16, 20, -1})
    void componentQueryOverwritesOnlyItsCountOfCacheEntries(int count) {
        query(1, 16);
        Strm.STRM_StreamInfo info = query(2, count);
        int told = Math.min(count, 16);
        assertEquals(Arrays.asList(told, told, told, told, 8191, 65535, 0x0B00, 2),
                Arrays.asList(info.videoCount, info.audioCount, info.teletextCount,
                        info.subtitleCount, info.pcrPid, info.caSysId0, info.caSysId1,
                        info.caSysId2));
        for (int i = 0; i < 16; i++) {
            assertEquals(expectedEntry(i < count ? 2 : 1, i), readEntry(i), "entry " + i);
        }
        assertEquals(Arrays.asList("Strm::CreatStreamInfo"), ops(), "getters call nothing");
    }

    @Test
    void componentStringsEndAtTheirFieldsEndAndBadBytesBecomeReplacementCharacters() {
        byte[] r = streamInfo(3, 2);
        Arrays.fill(r, 72 + 4, 72 + 12, (byte) 'L');      // both language codes, no zero byte
        Arrays.fill(r, 72 + 13, 72 + 46, (byte) 'n');     // streamName, 33 bytes
        Arrays.fill(r, 812 + 10, 812 + 42, (byte) 'x');   // teletext streamName, 32 bytes
        Arrays.fill(r, 1488 + 3, 1488 + 7, (byte) 's');   // subtitle language code
        byte[] bad = {'a', (byte) 0xFF, 'b', (byte) 0xC3, 0};
        System.arraycopy(bad, 0, r, 72 + 46 + 13, bad.length); // entry 1's streamName
        Spy.setOut("Strm::CreatStreamInfo", 1, 0, r);
        strm().Strm_CreatStreamInfo(0, new Strm.STRM_StreamInfo());

        Strm.AudioContent a = new Strm.AudioContent();
        strm().Strm_GetAudioStreamInfo(0, a);
        assertEquals(Arrays.asList("LLLL", "LLLL", "n".repeat(33)),
                Arrays.asList(a.langCode0, a.langCode1, a.streamName));
        strm().Strm_GetAudioStreamInfo(1, a);
        assertEquals("a\uFFFDb\uFFFD", a.streamName);
        Strm.TeletextContent t = new Strm.TeletextContent();
        strm().Strm_GetTeleTextStreamInfo(0, t);
        assertEquals("x".repeat(32), t.streamName);
        Strm.SubtitleContent s = new Strm.SubtitleContent();
        strm().Strm_GetSubTilteStreamInfo(0, s);
        assertEquals("ssss", s.langCode);
    }

    @Test
    void emptyComponentStringsAreEmptyNotNull() {
        Spy.setOut("Strm::CreatStreamInfo", 1, 68, le32(1));
        strm().Strm_CreatStreamInfo(0, new Strm.STRM_StreamInfo());
        Strm.AudioContent a = new Strm.AudioContent();
        strm().Strm_GetAudioStreamInfo(0, a);
        assertEquals(Arrays.asList("", "", ""),
                Arrays.asList(a.langCode0, a.langCode1, a.streamName));
    }

    @ParameterizedTest
    @ValueSource(ints = {-1, 16, Integer.MIN_VALUE})
    void gettersRefuseIndexesOutsideTheCacheAndLeaveTheObject(int i) {
        Strm.VideoContent v = new Strm.VideoContent();
        v.pid = 77;
        assertIndexRefused(i, () -> strm().Strm_GetVideoStreamInfo(i, v));
        Strm.AudioContent a = new Strm.AudioContent();
        a.streamName = "keep";
        assertIndexRefused(i, () -> strm().Strm_GetAudioStreamInfo(i, a));
        Strm.SubtitleContent s = new Strm.SubtitleContent();
        s.pid = 78;
        assertIndexRefused(i, () -> strm().Strm_GetSubTilteStreamInfo(i, s));
        Strm.TeletextContent t = new Strm.TeletextContent();
        t.langCode = "also";
        assertIndexRefused(i, () -> strm().Strm_GetTeleTextStreamInfo(i, t));
        assertEquals(Arrays.asList(77, "keep", 78, "also"),
                Arrays.asList(v.pid, a.streamName, s.pid, t.langCode));
    }

    static void assertIndexRefused(int index, Executable call) {
        IndexOutOfBoundsException e = assertThrows(IndexOutOfBoundsException.class, call);
        assertEquals("Index " + index + " out of bounds for length 16", e.getMessage());
    }

    // ---- handles, missing modules, null objects ----------------------------------------------

    @Test
    void onlyTheLowHandleBitsReachTheModule() {
        strm().Strm_Close(HANDLE);
        strm().Strm_Start(HANDLE, service(), langs("a", "b"), frontEnd(0));
        strm().Strm_Stop(HANDLE, true);
        strm().Strm_GetSettings(HANDLE, service(), pvr(0, 0, 0), langs("", ""), frontEnd(0));
        strm().Strm_SetSettings(HANDLE, service(), pvr(0, 0, 0), langs("", ""), frontEnd(0));
        strm().Strm_GetStatus(HANDLE, new Strm.STRM_GetStatus());
        strm().Strm_CreatStreamInfo(HANDLE, new Strm.STRM_StreamInfo());
        strm().Strm_Close(0xFFFFFFFF80000000L);
        assertEquals(Arrays.asList("Strm::Close", "Strm::Start", "Strm::Stop", "Strm::GetSettings",
                "Strm::SetSettings", "Strm::GetStatus", "Strm::CreatStreamInfo", "Strm::Close"),
                ops());
        for (int call = 0; call < 7; call++) assertEquals(5, Spy.args(call)[0], Spy.op(call));
        assertEquals(Integer.MIN_VALUE, Spy.args(7)[0]);
    }

    static final List<ToLongFunction<Strm>> EVERY_METHOD = Arrays.asList(
            s -> s.Strm_Init(),
            s -> s.Strm_Open(open("x")),
            s -> s.Strm_Close(1),
            s -> s.Strm_Start(1, service(), langs("a", "b"), frontEnd(0)),
            s -> s.Strm_Stop(1, true),
            s -> s.Strm_GetSettings(1, service(), pvr(0, 0, 0), langs("", ""), frontEnd(0)),
            s -> s.Strm_SetSettings(1, service(), pvr(0, 0, 0), langs("", ""), frontEnd(0)),
            s -> s.Strm_GetStatus(1, new Strm.STRM_GetStatus()),
            s -> s.Strm_CreatStreamInfo(1, new Strm.STRM_StreamInfo()),
            s -> s.Strm_GetVideoStreamInfo(0, new Strm.VideoContent()),
            s -> s.Strm_GetAudioStreamInfo(0, new Strm.AudioContent()),
            s -> s.Strm_GetSubTilteStreamInfo(0, new Strm.SubtitleContent()),
            s -> s.Strm_GetTeleTextStreamInfo(0, new Strm.TeletextContent()));

    static void assertEveryMethodFailsWithoutModule(Strm s, List<ToLongFunction<Strm>> methods) {
        for (int i = 0; i < methods.size(); i++) {
            ToLongFunction<Strm> m = methods.get(i);
            IllegalStateException e = assertThrows(IllegalStateException.class,
                    () -> m.applyAsLong(s), "method " + i);
            assertEquals(null, e.getMessage(), "method " + i);
        }
        assertEquals(0, Spy.callCount());
        assertEquals(Arrays.asList(), strmLogs());
    }

    @Test
    void unboundObjectRaisesIllegalStateSilently() {
        assertEveryMethodFailsWithoutModule(new Strm(0), EVERY_METHOD);
    }

    @Test
    void missingModuleRaisesIllegalStateSilently() {
        dvb.release();
        Spy.omit(new String[] {"Strm"});
        dvb = new DVB();
        Spy.takeLogs();
        assertEveryMethodFailsWithoutModule(strm(), EVERY_METHOD);
    }

    @Test
    void withoutModuleTheStatusObjectKeepsItsValues() {
        Strm.STRM_GetStatus s = new Strm.STRM_GetStatus();
        s.feStatus = 4;
        assertThrows(IllegalStateException.class, () -> new Strm(0).Strm_GetStatus(0, s));
        assertEquals(4, s.feStatus);
    }

    /** A call with a null object or string, and the message it must raise. */
    record NullCase(String message, ToLongFunction<Strm> call) {}

    static void assertNullsRefused(Strm strm, NullCase... cases) {
        for (NullCase c : cases) {
            NullPointerException e = assertThrows(NullPointerException.class,
                    () -> c.call().applyAsLong(strm));
            assertEquals(c.message(), e.getMessage());
        }
        assertEquals(0, Spy.callCount());
        assertEquals(Arrays.asList(), strmLogs());
    }

    @Test
    void nullObjectsAndStringsRaiseNullPointerExceptionWithoutModuleCall() {
        Strm.STRM_Service svc = service();
        Strm.STRM_PvrSetting p = pvr(0, 0, 0);
        Strm.STRM_FrontEnd f = frontEnd(0);
        assertNullsRefused(strm(),
                new NullCase("STRM_OpenSettings is null", s -> s.Strm_Open(null)),
                new NullCase("STRM_OpenSettings.szPath is null", s -> s.Strm_Open(open(null))),
                new NullCase("STRM_FrontEnd is null",
                        s -> s.Strm_Start(0, svc, langs("a", "b"), null)),
                new NullCase("STRM_Service is null",
                        s -> s.Strm_Start(0, null, langs("a", "b"), f)),
                new NullCase("STRM_LangCode is null", s -> s.Strm_Start(0, svc, null, f)),
                new NullCase("STRM_LangCode.langCode1 is null",
                        s -> s.Strm_Start(0, svc, langs("a", null), f)),
                new NullCase("STRM_PvrSetting is null",
                        s -> s.Strm_SetSettings(0, svc, null, langs("a", "b"), f)),
                new NullCase("STRM_LangCode.langCode0 is null",
                        s -> s.Strm_SetSettings(0, svc, p, langs(null, "b"), f)),
                new NullCase("STRM_LangCode is null", s -> s.Strm_GetSettings(0, svc, p, null, f)),
                new NullCase("STRM_Service is null",
                        s -> s.Strm_GetSettings(0, null, p, langs("", ""), f)),
                new NullCase("STRM_GetStatus is null", s -> s.Strm_GetStatus(0, null)),
                new NullCase("STRM_StreamInfo is null", s -> s.Strm_CreatStreamInfo(0, null)),
                new NullCase("VideoContent is null", s -> s.Strm_GetVideoStreamInfo(0, null)),
                new NullCase("AudioContent is null", s -> s.Strm_GetAudioStreamInfo(0, null)),
                new NullCase("SubtitleContent is null", s -> s.Strm_GetSubTilteStreamInfo(0, null)),
                new NullCase("TeletextContent is null",
                        s -> s.Strm_GetTeleTextStreamInfo(0, null)));
    }
}
