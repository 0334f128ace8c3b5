package android.DVB;

import static android.DVB.Records.*;
import static org.junit.jupiter.api.Assertions.*;

import java.util.*;
import java.util.stream.*;
import org.junit.jupiter.api.Named;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.*;

/**
 * Every native method that reaches a module, one row each: the Java call, the operation it
 * must reach with which arguments and record bytes, what it hands back to Java objects, and
 * what it returns. Each row runs with several seeds, so that every front-end type code and
 * every text length (empty, short, the field's width, longer) passes through.
 */
class ContractTest extends SpyTestBase {
    /** What the call returns: the module's result, 0, or the u32 written through the last pointer. */
    enum Ret { MODULE, ZERO, WRITTEN }

    /**
     * A Java argument made from a layout: filled and sent (in), or scripted and read (out),
     * the module writing it through one pointer per `part` bytes from `arg` on.
     */
    record Rec(Layout layout, boolean in, int arg, int record, int part) {}

    record Row(String cls, String method, String op, Ret ret, Object[] args, long... opArgs) {
        @Override
        public String toString() {
            return method + Arrays.toString(args).replaceAll("Rec\\[layout=[^\\]]*\\]", "rec");
        }
    }

    static Rec in(Layout l, int record) {
        return new Rec(l, true, -1, record, l.size);
    }

    static Rec out(Layout l, int arg, int record) {
        return new Rec(l, false, arg, record, l.size);
    }

    static Rec split(Layout l, int arg, int record) {
        return new Rec(l, false, arg, record, 4);
    }

    static Row row(String method, String op, Ret ret, Object[] args, long... opArgs) {
        return new Row(op.split(":")[0], method, op, ret, args, opArgs);
    }

    static Object[] a(Object... args) {
        return args;
    }

    static final long H = HANDLE;
    static final long L = LOW;

    static final Row[] ROWS = {
        // Tuning, positioner, output, device services: arguments at their widths.
        row("Cfg_TryTune", "Cfg::TryTune", Ret.MODULE, a(-3, in(ANT_FRONTEND, 0)), -3, 0),
        row("Cfg_Tune", "Cfg::Tune", Ret.MODULE, a(7, in(ANT_FRONTEND, 0)), 7, 0),
        row("Cfg_GetStatus", "Cfg::GetStatus", Ret.ZERO, a(4, out(ANT_STATUS, 1, 0)), 4, 0),
        row("Cfg_Reset", "Cfg::Reset", Ret.MODULE, a(-9), -9),
        row("Cfg_GotoPosition", "Cfg::GotoPosition", Ret.MODULE, a(1, 300), 1, 44),
        row("Cfg_GotoPosition", "Cfg::GotoPosition", Ret.MODULE, a(1, -1), 1, 255),
        row("Cfg_StorePosition", "Cfg::StorePosition", Ret.MODULE, a(-2, 511), -2, 255),
        row("Cfg_Recalculate", "Cfg::Recalculate", Ret.MODULE, a(3, 257), 3, 1),
        row("Cfg_Drive", "Cfg::Drive", Ret.MODULE, a(4, 1, 255, 256), 4, 1, 255, 0),
        row("Cfg_Stop", "Cfg::Stop", Ret.MODULE, a(Integer.MIN_VALUE), Integer.MIN_VALUE),
        row("Cfg_SetLimit", "Cfg::SetLimit", Ret.MODULE, a(5, -256), 5, 0),
        row("Cfg_DisableLimit", "Cfg::DisableLimit", Ret.MODULE, a(6), 6),
        row("Cfg_EnableLimit", "Cfg::EnableLimit", Ret.MODULE, a(-6), -6),
        row("Cfg_GotoSatellite", "Cfg::GotoSatellite", Ret.MODULE, a(7, 40000, -1, 32768),
                7, -25536, -1, -32768),
        row("Cfg_SetMuteAudio", "Cfg::SetMuteAudio", Ret.MODULE, a(8, 256), 8, 0),
        row("Cfg_SetAudioVolume", "Cfg::SetAudioVolume", Ret.MODULE, a(-150), -150),
        row("Cfg_SetMuteVideo", "Cfg::SetMuteVideo", Ret.MODULE, a(9, -255), 9, 1),
        row("Cfg_SetVideoPos", "Cfg::SetVideoPos", Ret.MODULE, a(2, in(VIDEO_POSITION, 0)), 2, 0),
        row("Cfg_GetVideoPos", "Cfg::GetVideoPos", Ret.ZERO, a(6, out(VIDEO_POSITION, 1, 0)),
                6, 0),
        row("Cfg_CaGetStatus", "Cfg::CaGetStatus", Ret.ZERO, a(-4, split(CA_STATUS, 1, 0)), -4, 0, 0),
        row("Cfg_CaStandby", "Cfg::CaStandby", Ret.ZERO, a(-1), -1),
        row("Cfg_GpioSet", "Cfg::GpioSet", Ret.ZERO, a(12, -13), 12, -13),
        row("Cfg_SetWakeup", "Cfg::SetWakeup", Ret.ZERO, a(3600), 3600),
        row("Cfg_BlindScanStart", "Cfg::BlindScanStart", Ret.ZERO, a(1, -2, 3, -4, 5),
                1, -2, 3, -4, 5),
        row("Cfg_BlindScanStop", "Cfg::BlindScanStop", Ret.ZERO, a(-8), -8),
        row("Cfg_TSDumpStop", "Cfg::TSDumpStop", Ret.ZERO, a()),
        // Scanning and system start-up.
        row("Scnm_Init", "Scnm::Init", Ret.MODULE, a()),
        row("Scnm_Open", "Scnm::Open", Ret.MODULE, a(in(SCNM_OPEN, 0)), 0),
        row("Scnm_Close", "Scnm::Close", Ret.MODULE, a(H), L),
        row("Scnm_Start", "Scnm::Start", Ret.MODULE, a(H, in(SCNM_START, 0)), L, 0),
        row("Scnm_Stop", "Scnm::Stop", Ret.MODULE, a(H), L),
        row("Scnm_GetStatus", "Scnm::GetStatus", Ret.ZERO, a(H, out(SCNM_STATUS, 1, 0)), L, 0),
        row("Dvb_SystemUnInit", "Scnm::Dvb_SystemUnInit", Ret.ZERO, a(in(DVB_CONFIG, 0)), 0),
        // Streams.
        row("Strm_Init", "Strm::Init", Ret.MODULE, a()),
        row("Strm_Open", "Strm::Open", Ret.MODULE, a(in(STRM_OPEN, 0)), 0),
        row("Strm_Close", "Strm::Close", Ret.ZERO, a(H), L),
        row("Strm_Start", "Strm::Start", Ret.MODULE,
                a(H, in(STRM_SERVICE, 0), in(STRM_LANG, 0), in(STRM_FRONTEND, 0)), L, 0),
        row("Strm_Stop", "Strm::Stop", Ret.MODULE, a(H, true), L, 1),
        row("Strm_Stop", "Strm::Stop", Ret.MODULE, a(H, false), L, 0),
        row("Strm_GetSettings", "Strm::GetSettings", Ret.ZERO, a(H, out(STRM_SERVICE, 1, 0),
                out(STRM_PVR, 1, 0), out(STRM_LANG, 1, 0), out(STRM_FRONTEND_SETTINGS, 1, 0)),
                L, 0),
        row("Strm_SetSettings", "Strm::SetSettings", Ret.ZERO, a(H, in(STRM_SERVICE, 0),
                in(STRM_PVR, 0), in(STRM_LANG, 0), in(STRM_FRONTEND_SETTINGS, 0)), L, 0),
        row("Strm_GetStatus", "Strm::GetStatus", Ret.ZERO, a(H, out(STRM_STATUS, 1, 0)), L, 0),
        row("Strm_CreatStreamInfo", "Strm::CreatStreamInfo", Ret.ZERO,
                a(H, out(STREAM_INFO, 1, 0)), L, 0),
        row("Strm_GetAllEvent", "Strm::GetAllEvent", Ret.ZERO, a(H, out(EVENT, 1, 0),
                out(EVENT, 2, 1), out(EXT_EVENT, 3, 2), out(EXT_EVENT, 4, 3)), L, 0, 0, 0, 0),
        row("Strm_GetTime", "Strm::GetTime", Ret.WRITTEN, a(H, -1L), L, 0),
        row("Strm_GetEvent", "Strm::GetEvent", Ret.ZERO, a(H, out(EVENT, 1, 0)), L, 0),
        row("EPG_GetEvent", "Strm::EPG_GetEvent", Ret.ZERO,
                a(H, in(EPG_SVC_IDS, 0), out(EVENT, 2, 1), out(EXT_EVENT, 3, 2)), 0, L, 0, 0),
        row("EpgMd_AddService", "Strm::EpgMd_AddService", Ret.ZERO, a(in(EPG_SVC, 0)), 0),
        row("EpgMd_ClearService", "Strm::EpgMd_ClearService", Ret.ZERO, a()),
        row("Strm_CheckService", "Strm::CheckService", Ret.ZERO, a(in(SERVICE_CHECK, 0)), 0),
        // Subtitles and teletext.
        row("Subttl_Init", "Subttl::Init", Ret.MODULE, a()),
        row("Subttl_Start", "Subttl::Start", Ret.MODULE, a(in(SUBTTL_SETTINGS, 0)), 0),
        row("Subttl_Stop", "Subttl::Stop", Ret.ZERO, a(H), L),
        row("Teltxt_Start", "Teltxt::Start", Ret.MODULE, a(in(TELTXT_SETTINGS, 0)), 0),
        row("Teltxt_Stop", "Teltxt::Stop", Ret.ZERO, a(H), L),
        row("Teltxt_SetData", "Teltxt::SetData", Ret.MODULE, a(H, -3, 0x10000, split(NAV_PAGES, 3, 0)),
                L, -3, 0x10000, 0, 0, 0, 0),
    };

    static Stream<Arguments> cases() {
        return Arrays.stream(ROWS).flatMap(r -> IntStream.range(0, r.args.length == 0 ? 1 : 6)
                .mapToObj(seed -> Arguments.of(Named.of(r + " seed " + seed, r), seed)));
    }

    /**
     * The bytes the module writes into one out-record, shaped by every layout read from it.
     * Counts stay within the caches (their bounds have tests of their own) and no extended
     * item is delivered, so that no item line is logged.
     */
    static byte[] scriptFor(Row r, Rec rec, int seed) {
        List<Layout> shaping = new ArrayList<>();
        for (Object o : r.args) {
            if (o instanceof Rec x && !x.in && x.arg == rec.arg) shaping.add(x.layout);
        }
        byte[] p = rec.layout.pattern(seed + 31 * rec.arg, shaping);
        if (rec.layout == EXT_EVENT) le(p).putInt(0, 0);
        if (rec.layout == STREAM_INFO) {
            int[] at = {0, 68, 808, 1484};
            for (int i = 0; i < 4; i++) le(p).putInt(at[i], (seed + 4 * i + 1) % 17); // all differ
        }
        return p;
    }

    @ParameterizedTest
    @MethodSource("cases")
    void rowReachesItsOperationAndMapsEveryField(Row r, int seed) throws Throwable {
        int result = Layout.hash(seed, 77);
        Spy.setResult(r.op, result);
        Object[] javaArgs = r.args.clone();
        Object[] kept = new Object[r.args.length];
        byte[][] sent = new byte[8][];
        byte[][] scripted = new byte[8][];
        byte[][] whole = new byte[8][]; // by operation argument
        for (int i = 0; i < r.args.length; i++) {
            if (!(r.args[i] instanceof Rec rec)) continue;
            javaArgs[i] = rec.layout.fill(rec.layout.create(), seed + 100 * i);
            kept[i] = rec.layout.fill(rec.layout.create(), seed + 100 * i);
            if (rec.in) {
                if (sent[rec.record] == null) sent[rec.record] = new byte[rec.layout.size];
                rec.layout.toRecord(javaArgs[i], sent[rec.record]);
            } else if (whole[rec.arg] == null) {
                byte[] w = whole[rec.arg] = scriptFor(r, rec, seed);
                for (int k = 0; k * rec.part < w.length; k++) {
                    scripted[rec.record + k] = Arrays.copyOfRange(w, k * rec.part, (k + 1) * rec.part);
                    Spy.setOut(r.op, rec.arg + k, 0, scripted[rec.record + k]);
                }
            }
        }
        if (r.ret == Ret.WRITTEN) {
            scripted[0] = le32(result);
            Spy.setOut(r.op, r.opArgs.length - 1, 0, scripted[0]);
        }
        Object got = call(module(dvb, r.cls), r.method, javaArgs);

        assertArrayEquals(r.opArgs, Spy.args(onlyCall(r.op)), "operation arguments");
        for (int k = 0; k < 8; k++) {
            if (sent[k] != null) assertArrayEquals(sent[k], Spy.record(0, k), "record " + k);
            if (scripted[k] != null) {
                assertArrayEquals(new byte[scripted[k].length], Spy.record(0, k), "zeroed " + k);
            }
        }
        for (int i = 0; i < r.args.length; i++) {
            if (r.args[i] instanceof Rec rec && !rec.in) {
                rec.layout.assertJava(whole[rec.arg], javaArgs[i], kept[i]);
            }
        }
        long want = r.ret == Ret.ZERO ? 0 : r.ret == Ret.WRITTEN ? result & 0xFFFFFFFFL : result;
        assertEquals(want, ((Number) got).longValue(), "result");
        assertEquals(entryLines(r.cls, r.method), logs());
    }
}
