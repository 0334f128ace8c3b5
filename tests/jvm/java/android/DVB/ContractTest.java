package android.DVB;

import static android.DVB.ContractTest.Ret.*;
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

    record Row(String cls, String method, String op, Ret ret, Object[] args, long... opArgs) {}

    /** Every in-record of a call is the first it hands over, several Java objects making one. */
    static Rec in(Layout l) {
        return new Rec(l, true, -1, 0, l.size);
    }

    static Rec out(Layout l, int arg, int record) {
        return new Rec(l, false, arg, record, l.size);
    }

    /** A row of `op` ("Cls::Name"), reached from the method Cls_Name, or Name if it has a prefix. */
    static Row row(String op, Ret ret, Object[] args, long... opArgs) {
        String[] p = op.split("::");
        return new Row(p[0], p[1].contains("_") ? p[1] : p[0] + "_" + p[1], op, ret, args, opArgs);
    }

    static Object[] a(Object... args) {
        return args;
    }

    static final long H = HANDLE, L = LOW;

    static final Row[] ROWS = {
        // Tuning, positioner, output, device services: arguments at their widths.
        row("Cfg::TryTune", MODULE, a(-3, in(ANT_FRONTEND)), -3, 0),
        row("Cfg::Tune", MODULE, a(7, in(ANT_FRONTEND)), 7, 0),
        row("Cfg::GetStatus", ZERO, a(4, out(ANT_STATUS, 1, 0)), 4, 0),
        row("Cfg::Reset", MODULE, a(-9), -9),
        row("Cfg::GotoPosition", MODULE, a(1, 300), 1, 44),
        row("Cfg::GotoPosition", MODULE, a(1, -1), 1, 255),
        row("Cfg::StorePosition", MODULE, a(-2, 511), -2, 255),
        row("Cfg::Recalculate", MODULE, a(3, 257), 3, 1),
        row("Cfg::Drive", MODULE, a(4, 1, 255, 256), 4, 1, 255, 0),
        row("Cfg::Stop", MODULE, a(Integer.MIN_VALUE), Integer.MIN_VALUE),
        row("Cfg::SetLimit", MODULE, a(5, -256), 5, 0),
        row("Cfg::DisableLimit", MODULE, a(6), 6),
        row("Cfg::EnableLimit", MODULE, a(-6), -6),
        row("Cfg::GotoSatellite", MODULE, a(7, 40000, -1, 32768), 7, -25536, -1, -32768),
        row("Cfg::SetMuteAudio", MODULE, a(8, 256), 8, 0),
        row("Cfg::SetAudioVolume", MODULE, a(-150), -150),
        row("Cfg::SetMuteVideo", MODULE, a(9, -255), 9, 1),
        row("Cfg::SetVideoPos", MODULE, a(2, in(VIDEO_POSITION)), 2, 0),
        row("Cfg::GetVideoPos", ZERO, a(6, out(VIDEO_POSITION, 1, 0)), 6, 0),
        row("Cfg::CaGetStatus", ZERO, a(-4, new Rec(CA_STATUS, false, 1, 0, 4)), -4, 0, 0),
        row("Cfg::CaStandby", ZERO, a(-1), -1),
        row("Cfg::GpioSet", ZERO, a(12, -13), 12, -13),
        row("Cfg::SetWakeup", ZERO, a(3600), 3600),
        row("Cfg::BlindScanStart", ZERO, a(1, -2, 3, -4, 5), 1, -2, 3, -4, 5),
        row("Cfg::BlindScanStop", ZERO, a(-8), -8),
        row("Cfg::TSDumpStop", ZERO, a()),
        // Scanning and system start-up.
        row("Scnm::Init", MODULE, a()),
        row("Scnm::Open", MODULE, a(in(SCNM_OPEN)), 0),
        row("Scnm::Close", MODULE, a(H), L),
        row("Scnm::Start", MODULE, a(H, in(SCNM_START)), L, 0),
        row("Scnm::Stop", MODULE, a(H), L),
        row("Scnm::GetStatus", ZERO, a(H, out(SCNM_STATUS, 1, 0)), L, 0),
        row("Scnm::Dvb_SystemUnInit", ZERO, a(in(DVB_CONFIG)), 0),
        // Streams.
        row("Strm::Init", MODULE, a()),
        row("Strm::Open", MODULE, a(in(STRM_OPEN)), 0),
        row("Strm::Close", ZERO, a(H), L),
        row("Strm::Start", MODULE, a(H, in(STRM_SERVICE), in(STRM_LANG), in(STRM_FRONTEND)), L, 0),
        row("Strm::Stop", MODULE, a(H, true), L, 1),
        row("Strm::Stop", MODULE, a(H, false), L, 0),
        row("Strm::GetSettings", ZERO, a(H, out(STRM_SERVICE, 1, 0),
                out(STRM_PVR, 1, 0), out(STRM_LANG, 1, 0), out(STRM_FRONTEND_SETTINGS, 1, 0)),
                L, 0),
        row("Strm::SetSettings", ZERO, a(H, in(STRM_SERVICE),
                in(STRM_PVR), in(STRM_LANG), in(STRM_FRONTEND_SETTINGS)), L, 0),
        row("Strm::GetStatus", ZERO, a(H, out(STRM_STATUS, 1, 0)), L, 0),
        row("Strm::CreatStreamInfo", ZERO, a(H, out(STREAM_INFO, 1, 0)), L, 0),
        row("Strm::GetAllEvent", ZERO, a(H, out(EVENT, 1, 0),
                out(EVENT, 2, 1), out(EXT_EVENT, 3, 2), out(EXT_EVENT, 4, 3)), L, 0, 0, 0, 0),
        row("Strm::GetTime", WRITTEN, a(H, -1L), L, 0),
        row("Strm::GetEvent", ZERO, a(H, out(EVENT, 1, 0)), L, 0),
        row("Strm::EPG_GetEvent", ZERO,
                a(H, in(EPG_SVC_IDS), out(EVENT, 2, 1), out(EXT_EVENT, 3, 2)), 0, L, 0, 0),
        row("Strm::EpgMd_AddService", ZERO, a(in(EPG_SVC)), 0),
        row("Strm::EpgMd_ClearService", ZERO, a()),
        row("Strm::CheckService", ZERO, a(in(SERVICE_CHECK)), 0),
        // Subtitles and teletext.
        row("Subttl::Init", MODULE, a()),
        row("Subttl::Start", MODULE, a(in(SUBTTL_SETTINGS)), 0),
        row("Subttl::Stop", ZERO, a(H), L),
        row("Teltxt::Start", MODULE, a(in(TELTXT_SETTINGS)), 0),
        row("Teltxt::Stop", ZERO, a(H), L),
        row("Teltxt::SetData", MODULE, a(H, -3, 0x10000, new Rec(NAV_PAGES, false, 3, 0, 4)), L, -3, 0x10000, 0, 0, 0, 0),
    };

    static Stream<Arguments> cases() {
        return Arrays.stream(ROWS).flatMap(r -> IntStream.range(0, r.args.length == 0 ? 1 : 6)
                .mapToObj(seed -> Arguments.of(Named.of(r.method + Arrays.toString(r.args)
                        .replaceAll("Rec\\[layout=[^\\]]*\\]", "rec") + " seed " + seed, r), seed)));
    }

    /**
     * The bytes the module writes into one out-record, shaped by every layout read from it.
     * Counts stay within the caches (their bounds have tests of their own) and no extended
     * item is delivered, so that no item line is logged.
     */
    static byte[] scriptFor(Row r, Rec rec, int seed) {
        List<Layout> shaping = new ArrayList<>();
        for (Object o : r.args) if (o instanceof Rec x && !x.in && x.arg == rec.arg) shaping.add(x.layout);
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
        byte[][] sent = new byte[8][], scripted = new byte[8][], whole = new byte[8][]; // whole: by operation argument
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
        if (r.ret == WRITTEN) Spy.setOut(r.op, r.opArgs.length - 1, 0, scripted[0] = le32(result));
        Object got = call(module(dvb, r.cls), r.method, javaArgs);

        assertArrayEquals(r.opArgs, Spy.args(onlyCall(r.op)), "operation arguments");
        for (int k = 0; k < 8; k++) {
            if (sent[k] != null) assertArrayEquals(sent[k], Spy.record(0, k), "record " + k);
            if (scripted[k] != null) assertArrayEquals(new byte[scripted[k].length], Spy.record(0, k), "zeroed " + k);
        }
        for (int i = 0; i < r.args.length; i++) {
            if (r.args[i] instanceof Rec rec && !rec.in) rec.layout.assertJava(whole[rec.arg], javaArgs[i], kept[i]);
        }
        long want = r.ret == ZERO ? 0 : r.ret == WRITTEN ? result & 0xFFFFFFFFL : result;
        assertEquals(want, ((Number) got).longValue(), "result");
        assertEquals(entryLines(r.cls, r.method), logs());
    }
}
