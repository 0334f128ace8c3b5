package android.DVB;

import static org.junit.jupiter.api.Assertions.assertArrayEquals;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertThrows;
import static org.junit.jupiter.api.Assertions.assertTrue;
import static org.junit.jupiter.api.Assumptions.assumeTrue;

import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.util.Arrays;
import java.util.Collections;
import java.util.List;
import java.util.function.ToIntFunction;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.ValueSource;

class CfgTest extends SpyTestBase {

    /** Every field set to a value of its own, so that a value at a wrong offset shows. */
    static Cfg.ANT_FrontendParameters frontend(int type) {
        Cfg.ANT_FrontendParameters p = new Cfg.ANT_FrontendParameters();
        p.type = type;
        p.frequency = -11778000;
        p.symbolRate = 0x22222222;
        p.fecInner = 0x33333333;
        p.modulation = 0x44444444;
        p.polarization = 0x55555555;
        p.rolloff = 0x66666666;
        p.diseqctype = 0x77777777;
        p.tone = 0x1AB;
        p.lnbpower = 0x2CD;
        p.lnbLowLO = 9750000;
        p.lnbHigLO = 10600000;
        p.port = -1;
        p.port16 = 0x123;
        p.posIndex = 0x145;
        p.satPosition = -192;
        p.myLongitude = -7;
        p.myLatitude = 0x7FFFFFFF;
        p.toneBurst = 0x1EF;
        p.ubSlot = 0x301;
        p.ubFreq = 70000;
        p.ubSat = 0x402;
        p.out5v = 0x503;
        p.bandwidth = 8000;
        return p;
    }

    /** The block the library must build, written out independently of its code. */
    static byte[] expectedBlock(Cfg.ANT_FrontendParameters p) {
        ByteBuffer b = ByteBuffer.allocate(76).order(ByteOrder.LITTLE_ENDIAN);
        int code = p.type == 1 ? 1 : p.type == 2 ? 2 : 0;
        b.putInt(0, code).putInt(4, p.frequency);
        if (code == 2) {
            b.putInt(8, p.bandwidth);
        } else {
            b.putInt(8, p.symbolRate).putInt(12, p.fecInner).putInt(16, p.modulation);
            if (code == 0) b.putInt(20, p.polarization).putInt(24, p.rolloff);
        }
        b.putInt(36, p.diseqctype).put(40, (byte) p.tone).put(41, (byte) p.lnbpower);
        b.putInt(44, p.lnbLowLO).putInt(48, p.lnbHigLO);
        b.put(52, (byte) p.port).put(53, (byte) p.port16).put(54, (byte) p.posIndex);
        b.putInt(56, p.satPosition).putInt(60, p.myLongitude).putInt(64, p.myLatitude);
        b.put(68, (byte) p.toneBurst).put(69, (byte) p.ubSlot).putShort(70, (short) p.ubFreq);
        b.put(72, (byte) p.ubSat).put(73, (byte) p.out5v);
        return b.array();
    }

    Cfg cfg() {
        return dvb.getCfg();
    }

    @ParameterizedTest
    @ValueSource(ints = {1, 2, 0, 3, 7, -1})
    void tuneBuildsTheFrontendBlockByTypeCode(int type) {
        Cfg.ANT_FrontendParameters p = frontend(type);
        Spy.setResult("Cfg::TryTune", -7);
        Spy.setResult("Cfg::Tune", 12);
        assertEquals(-7, cfg().Cfg_TryTune(-3, p));
        assertEquals(12, cfg().Cfg_Tune(-3, p));
        assertEquals(Arrays.asList("Cfg::TryTune", "Cfg::Tune"), ops());
        for (int call = 0; call < 2; call++) {
            assertEquals(-3, Spy.args(call)[0]);
            assertArrayEquals(expectedBlock(p), Spy.record(call, 0), "call " + call);
        }
    }

    @Test
    void narrowFieldsKeepTheirLowBits() {
        Cfg.ANT_FrontendParameters p = frontend(0);
        p.ubFreq = 70000;
        p.tone = 256;
        p.port = -1;
        cfg().Cfg_Tune(0, p);
        ByteBuffer r = rec(0, 0);
        assertEquals(4464, r.getShort(70) & 0xFFFF);
        assertEquals(0, r.get(40));
        assertEquals(255, r.get(52) & 0xFF);
        for (int reserved : new int[] {42, 43, 55, 74, 75}) assertEquals(0, r.get(reserved));
    }

    @Test
    void getStatusSkipsTheThirdWordAndReturnsZeroWhateverTheModuleSays() {
        Spy.setOut("Cfg::GetStatus", 1, 0, le32(5, -6, 99, 8));
        Spy.setResult("Cfg::GetStatus", -1);
        Cfg.ANT_Status s = new Cfg.ANT_Status();
        assertEquals(0, cfg().Cfg_GetStatus(4, s));
        assertEquals(Arrays.asList(5, -6, 8), Arrays.asList(s.feStatus, s.strength, s.quality));
        assertEquals(4, Spy.args(onlyCall("Cfg::GetStatus"))[0]);
        assertZero(rec(0, 0), 0, 16); // the record reached the module zeroed
    }

    @Test
    void getStatusWithSilentModuleGivesZeros() {
        Cfg.ANT_Status s = new Cfg.ANT_Status();
        s.feStatus = s.strength = s.quality = 9;
        assertEquals(0, cfg().Cfg_GetStatus(0, s));
        assertEquals(Arrays.asList(0, 0, 0), Arrays.asList(s.feStatus, s.strength, s.quality));
    }

    /** A pass-through: the Java call, the operation it reaches, and the arguments it passes. */
    static final class Pass {
        final String op;
        final ToIntFunction<Cfg> call;
        final long[] args;

        Pass(String op, ToIntFunction<Cfg> call, long... args) {
            this.op = op;
            this.call = call;
            this.args = args;
        }
    }

    static final Pass[] RESULT_RETURNED = {
        new Pass("Cfg::Reset", c -> c.Cfg_Reset(-9), -9),
        new Pass("Cfg::GotoPosition", c -> c.Cfg_GotoPosition(1, 256), 1, 0),
        new Pass("Cfg::GotoPosition", c -> c.Cfg_GotoPosition(1, -1), 1, 255),
        new Pass("Cfg::GotoPosition", c -> c.Cfg_GotoPosition(1, 300), 1, 44),
        new Pass("Cfg::StorePosition", c -> c.Cfg_StorePosition(-2, 511), -2, 255),
        new Pass("Cfg::Recalculate", c -> c.Cfg_Recalculate(3, 257), 3, 1),
        new Pass("Cfg::Drive", c -> c.Cfg_Drive(4, 1, 255, 256), 4, 1, 255, 0),
        new Pass("Cfg::Stop", c -> c.Cfg_Stop(Integer.MIN_VALUE), Integer.MIN_VALUE),
        new Pass("Cfg::SetLimit", c -> c.Cfg_SetLimit(5, -256), 5, 0),
        new Pass("Cfg::DisableLimit", c -> c.Cfg_DisableLimit(6), 6),
        new Pass("Cfg::EnableLimit", c -> c.Cfg_EnableLimit(-6), -6),
        new Pass("Cfg::GotoSatellite", c -> c.Cfg_GotoSatellite(7, 40000, -1, 32768),
                7, -25536, -1, -32768),
        new Pass("Cfg::SetMuteAudio", c -> c.Cfg_SetMuteAudio(8, 256), 8, 0),
        new Pass("Cfg::SetMuteAudio", c -> c.Cfg_SetMuteAudio(8, -1), 8, 255),
        new Pass("Cfg::SetAudioVolume", c -> c.Cfg_SetAudioVolume(-150), -150),
        new Pass("Cfg::SetMuteVideo", c -> c.Cfg_SetMuteVideo(9, 1), 9, 1),
    };

    static final Pass[] ZERO_RETURNED = {
        new Pass("Cfg::CaStandby", c -> c.Cfg_CaStandby(-1), -1),
        new Pass("Cfg::GpioSet", c -> c.Cfg_GpioSet(12, -13), 12, -13),
        new Pass("Cfg::SetWakeup", c -> c.Cfg_SetWakeup(3600), 3600),
        new Pass("Cfg::BlindScanStart", c -> c.Cfg_BlindScanStart(1, -2, 3, -4, 5),
                1, -2, 3, -4, 5),
        new Pass("Cfg::BlindScanStop", c -> c.Cfg_BlindScanStop(-8), -8),
        new Pass("Cfg::TSDumpStop", c -> c.Cfg_TSDumpStop()),
    };

    @Test
    void positionerAndOutputPassNarrowedArgumentsAndReturnTheModuleResult() {
        for (Pass p : RESULT_RETURNED) {
            Spy.reset();
            Spy.setResult(p.op, -77);
            assertEquals(-77, p.call.applyAsInt(cfg()), p.op);
            assertArrayEquals(p.args, Spy.args(onlyCall(p.op)), p.op);
        }
    }

    @Test
    void deviceServicesReturnZeroEvenWhenTheModuleFails() {
        for (Pass p : ZERO_RETURNED) {
            Spy.reset();
            Spy.setResult(p.op, -1);
            assertEquals(0, p.call.applyAsInt(cfg()), p.op);
            assertArrayEquals(p.args, Spy.args(onlyCall(p.op)), p.op);
        }
    }

    @Test
    void gpioGetCallsNothing() {
        assertEquals(0, cfg().Cfg_GpioGet(5));
        assertEquals(0, Spy.callCount());
    }

    @Test
    void videoPositionBothWays() {
        Cfg.Video_Position pos = new Cfg.Video_Position();
        pos.x = -10;
        pos.y = 0;
        pos.w = 1920;
        pos.h = 1080;
        Spy.setResult("Cfg::SetVideoPos", 3);
        assertEquals(3, cfg().Cfg_SetVideoPos(2, pos));
        assertArrayEquals(le32(-10, 0, 1920, 1080), Spy.record(onlyCall("Cfg::SetVideoPos"), 0));

        Spy.reset();
        Spy.setOut("Cfg::GetVideoPos", 1, 0, le32(1, -2, 3, 4));
        Spy.setResult("Cfg::GetVideoPos", -1);
        Cfg.Video_Position got = new Cfg.Video_Position();
        assertEquals(0, cfg().Cfg_GetVideoPos(6, got));
        assertEquals(Arrays.asList(1, -2, 3, 4), Arrays.asList(got.x, got.y, got.w, got.h));
        assertEquals(6, Spy.args(onlyCall("Cfg::GetVideoPos"))[0]);

        Spy.reset();
        assertEquals(0, cfg().Cfg_GetVideoPos(6, got));
        assertEquals(Arrays.asList(0, 0, 0, 0), Arrays.asList(got.x, got.y, got.w, got.h));
    }

    @Test
    void caStatusTakesSourceFromTheFirstAddress() {
        Spy.setOut("Cfg::CaGetStatus", 1, 0, le32(3));
        Spy.setOut("Cfg::CaGetStatus", 2, 0, le32(7));
        Spy.setResult("Cfg::CaGetStatus", -1);
        Cfg.CA_Status s = new Cfg.CA_Status();
        assertEquals(0, cfg().Cfg_CaGetStatus(1, s));
        assertEquals(3, s.source);
        assertEquals(7, s.lastCwSet);
        assertArrayEquals(le32(0), Spy.record(onlyCall("Cfg::CaGetStatus"), 0), "zeroed first");
    }

    @ParameterizedTest
    @ValueSource(ints = {0, 1, 255, 256, 300})
    void dumpPathIsCutAfter255BytesAndZeroEnded(int length) {
        char[] chars = new char[length];
        for (int i = 0; i < length; i++) chars[i] = (char) ('a' + i % 26);
        String path = new String(chars);
        assertEquals(0, cfg().Cfg_TSDumpStart(1, 2, 3, path));
        int call = onlyCall("Cfg::TSDumpStart");
        assertArrayEquals(new long[] {1, 2, 3, 0}, Spy.args(call));
        byte[] buffer = Spy.record(call, 0);
        assertEquals(256, buffer.length);
        int kept = Math.min(length, 255);
        for (int i = 0; i < 256; i++) {
            assertEquals(i < kept ? (byte) chars[i] : 0, buffer[i], "byte " + i);
        }
    }

    @Test
    void nullArgumentsRaiseNullPointerExceptionWithoutModuleCall() {
        NullPointerException e = assertThrows(NullPointerException.class,
                () -> cfg().Cfg_Tune(0, null));
        assertEquals("ANT_FrontendParameters is null", e.getMessage());
        assertThrows(NullPointerException.class, () -> cfg().Cfg_GetStatus(0, null));
        assertThrows(NullPointerException.class, () -> cfg().Cfg_SetVideoPos(0, null));
        assertThrows(NullPointerException.class, () -> cfg().Cfg_GetVideoPos(0, null));
        assertThrows(NullPointerException.class, () -> cfg().Cfg_CaGetStatus(0, null));
        e = assertThrows(NullPointerException.class, () -> cfg().Cfg_TSDumpStart(0, 0, 0, null));
        assertEquals("path is null", e.getMessage());
        assertEquals(0, Spy.callCount());
        assertEquals(Collections.emptyList(), logs());
    }

    static final List<ToIntFunction<Cfg>> EVERY_METHOD = Arrays.asList(
            c -> c.Cfg_Reset(0),
            c -> c.Cfg_GotoPosition(0, 0),
            c -> c.Cfg_StorePosition(0, 0),
            c -> c.Cfg_Recalculate(0, 0),
            c -> c.Cfg_Drive(0, 0, 0, 0),
            c -> c.Cfg_Stop(0),
            c -> c.Cfg_SetLimit(0, 0),
            c -> c.Cfg_DisableLimit(0),
            c -> c.Cfg_EnableLimit(0),
            c -> c.Cfg_GotoSatellite(0, 0, 0, 0),
            c -> c.Cfg_TryTune(0, new Cfg.ANT_FrontendParameters()),
            c -> c.Cfg_Tune(0, new Cfg.ANT_FrontendParameters()),
            c -> c.Cfg_GetStatus(0, new Cfg.ANT_Status()),
            c -> c.Cfg_SetMuteAudio(0, 0),
            c -> c.Cfg_SetAudioVolume(0),
            c -> c.Cfg_SetMuteVideo(0, 0),
            c -> c.Cfg_SetVideoPos(0, new Cfg.Video_Position()),
            c -> c.Cfg_GetVideoPos(0, new Cfg.Video_Position()),
            c -> c.Cfg_CaGetStatus(0, new Cfg.CA_Status()),
            c -> c.Cfg_CaStandby(0),
            c -> c.Cfg_GpioGet(0),
            c -> c.Cfg_GpioSet(0, 0),
            c -> c.Cfg_SetWakeup(0),
            c -> c.Cfg_BlindScanStart(0, 0, 0, 0, 0),
            c -> c.Cfg_BlindScanStop(0),
            c -> c.Cfg_TSDumpStart(0, 0, 0, "x"),
            c -> c.Cfg_TSDumpStop());

    @Test
    void unboundObjectRaisesIllegalStateAfterTheDebugLine() {
        Cfg unbound = new Cfg(0);
        for (int i = 0; i < EVERY_METHOD.size(); i++) {
            ToIntFunction<Cfg> m = EVERY_METHOD.get(i);
            IllegalStateException e =
                    assertThrows(IllegalStateException.class, () -> m.applyAsInt(unbound));
            assertEquals(null, e.getMessage());
            if (i == 0) {
                assertLogs("2 CFG android_dvb_Cfg_Reset was called",
                        "3 CFG could not get the dvb obj from context");
            } else {
                assertLogs("3 CFG could not get the dvb obj from context");
            }
        }
        assertEquals(0, Spy.callCount());
    }

    @Test
    void missingModuleRaisesIllegalStateWithoutTheDebugLine() {
        dvb.release();
        Spy.omit(new String[] {"Cfg"});
        dvb = new DVB();
        Spy.takeLogs();
        for (int i = 0; i < EVERY_METHOD.size(); i++) {
            ToIntFunction<Cfg> m = EVERY_METHOD.get(i);
            Cfg cfg = cfg();
            assertThrows(IllegalStateException.class, () -> m.applyAsInt(cfg));
            if (i == 0) assertLogs("2 CFG android_dvb_Cfg_Reset was called");
            else assertLogs();
        }
        assertEquals(0, Spy.callCount());
    }

    @Test
    void aReleasedContextNoLongerReachesItsObject() {
        // A 32-bit context is the object's address, which the next object may well reuse.
        assumeTrue(Spy.pointerSize() == 8);
        Cfg stale = cfg();
        dvb.release();
        dvb = new DVB();
        assertThrows(IllegalStateException.class, () -> stale.Cfg_Stop(0));
        assertEquals(0, Spy.callCount());
    }

    @Test
    void calledModuleBelongsToTheBoundObject() {
        DVB other = new DVB();
        try {
            other.getCfg().Cfg_Stop(1);
            dvb.getCfg().Cfg_Stop(2);
            long[] live = Spy.liveDvbs();
            assertEquals(2, live.length);
            assertEquals(live[1], Spy.owner(0));
            assertEquals(live[0], Spy.owner(1));
            assertTrue(Spy.owner(0) != Spy.owner(1));
        } finally {
            other.release();
        }
    }
}
