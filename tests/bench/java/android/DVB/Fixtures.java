package android.DVB;

import java.lang.invoke.MethodHandle;
import java.lang.invoke.MethodHandles;
import java.lang.invoke.MethodType;
import java.util.LinkedHashMap;
import java.util.Map;

/** Bound module objects, filled argument objects, and one call of every native method. */
final class Fixtures {
    final DVB dvb;
    final Scnm scnm;
    final Strm strm;
    final Cfg cfg;
    final Subttl subttl;
    final Teltxt teltxt;

    final Cfg.ANT_FrontendParameters fe = new Cfg.ANT_FrontendParameters();
    final Strm.STRM_FrontEnd strmFe = new Strm.STRM_FrontEnd();
    final Strm.STRM_Service service = new Strm.STRM_Service();
    final Strm.STRM_LangCode lang = new Strm.STRM_LangCode();
    final Strm.STRM_PvrSetting pvr = new Strm.STRM_PvrSetting();

    static final MethodHandle NATIVE_INIT;
    static final MethodHandle NATIVE_SETUP;
    static final MethodHandle NATIVE_RELEASE;
    static final MethodHandle NATIVE_FINALIZE;

    static {
        try {
            MethodHandles.Lookup l = MethodHandles.lookup();
            NATIVE_INIT = handle(l, "native_init", true, MethodType.methodType(void.class));
            NATIVE_SETUP = handle(l, "native_setup", false,
                    MethodType.methodType(void.class, Object.class));
            NATIVE_RELEASE = handle(l, "native_release", false, MethodType.methodType(void.class));
            NATIVE_FINALIZE = handle(l, "native_finalize", false, MethodType.methodType(void.class));
        } catch (ReflectiveOperationException e) {
            throw new ExceptionInInitializerError(e);
        }
    }

    static MethodHandle handle(MethodHandles.Lookup l, String name, boolean isStatic,
            MethodType type) throws ReflectiveOperationException {
        java.lang.reflect.Method m = DVB.class.getDeclaredMethod(name, type.parameterArray());
        m.setAccessible(true);
        return l.unreflect(m);
    }

    Fixtures(DVB dvb) {
        this.dvb = dvb;
        scnm = dvb.getScnm();
        strm = dvb.getStrm();
        cfg = dvb.getCfg();
        subttl = dvb.getSubttl();
        teltxt = dvb.getTeltxt();
        fe.type = 1;
        fe.frequency = 11778000;
        fe.symbolRate = 27500;
        strmFe.type = 1;
        strmFe.frequency = 11778000;
        strmFe.symbolRate = 27500;
        service.svcId = 0x283D;
        service.videoPid = 0x1FF;
        lang.langCode0 = "deu";
        lang.langCode1 = "eng";
    }

    interface Call {
        void run() throws Throwable;
    }

    static Bench.Op op(Call c) {
        return () -> {
            try {
                c.run();
            } catch (Throwable t) {
                throw new AssertionError(t);
            }
            return 0;
        };
    }

    /** One representative call of each of the 81 native methods, in table order. */
    Map<String, Bench.Op> everyMethod() {
        Map<String, Bench.Op> m = new LinkedHashMap<>();
        DVB scratch = new DVB();
        scratch.release();
        m.put("native_init", op(() -> {
            NATIVE_INIT.invokeExact();
        }));
        m.put("native_setup + native_release", op(() -> {
            NATIVE_SETUP.invoke(scratch, (Object) scratch);
            NATIVE_RELEASE.invoke(scratch);
        }));
        m.put("native_finalize (unbound)", op(() -> NATIVE_FINALIZE.invoke(scratch)));
        m.put("native_release (unbound)", op(() -> NATIVE_RELEASE.invoke(scratch)));

        Scnm.SCNM_OpenSettings so = new Scnm.SCNM_OpenSettings();
        Scnm.SCNM_StartSettings ss = new Scnm.SCNM_StartSettings();
        ss.langCode = "deu";
        Scnm.SCNM_GetStatus sst = new Scnm.SCNM_GetStatus();
        Scnm.SCNM_ServiceInfo si = new Scnm.SCNM_ServiceInfo();
        Scnm.SCNMNET_FrontEndSettings sn = new Scnm.SCNMNET_FrontEndSettings();
        Scnm.DVB_Config dc = new Scnm.DVB_Config();
        m.put("Scnm_Init", () -> scnm.Scnm_Init());
        m.put("Scnm_Open", () -> scnm.Scnm_Open(so));
        m.put("Scnm_Close", () -> scnm.Scnm_Close(1));
        m.put("Scnm_Start", () -> scnm.Scnm_Start(1, ss));
        m.put("Scnm_Stop", () -> scnm.Scnm_Stop(1));
        m.put("Scnm_GetStatus", () -> scnm.Scnm_GetStatus(1, sst));
        m.put("Scnm_CreateServiceList", () -> scnm.Scnm_CreateServiceList(1));
        m.put("Scnm_GetServiceList", () -> scnm.Scnm_GetServiceList(0, si));
        m.put("Scnm_CreateNetworkList", () -> scnm.Scnm_CreateNetworkList(1));
        m.put("Scnm_GetNetworkList", () -> scnm.Scnm_GetNetworkList(0, sn));
        m.put("Dvb_SystemInit", () -> scnm.Dvb_SystemInit(dc));
        m.put("Dvb_SystemUnInit", () -> scnm.Dvb_SystemUnInit(dc));

        Strm.STRM_OpenSettings open = new Strm.STRM_OpenSettings();
        open.szPath = "/dev/dvb/adapter0/dvr0";
        Strm.STRM_GetStatus st = new Strm.STRM_GetStatus();
        Strm.STRM_StreamInfo info = new Strm.STRM_StreamInfo();
        Strm.VideoContent vc = new Strm.VideoContent();
        Strm.AudioContent ac = new Strm.AudioContent();
        Strm.SubtitleContent sc = new Strm.SubtitleContent();
        Strm.TeletextContent tc = new Strm.TeletextContent();
        Strm.EpgEvent present = new Strm.EpgEvent();
        Strm.EpgEvent following = new Strm.EpgEvent();
        Strm.ExtEpgEvent presentExt = new Strm.ExtEpgEvent();
        Strm.ExtEpgEvent followingExt = new Strm.ExtEpgEvent();
        Strm.ExtEpgEventItem item = new Strm.ExtEpgEventItem();
        Strm.EpgSvc svc = new Strm.EpgSvc();
        Strm.ServiceCheck check = new Strm.ServiceCheck();
        m.put("Strm_Init", () -> strm.Strm_Init());
        m.put("Strm_Open", () -> strm.Strm_Open(open));
        m.put("Strm_Close", () -> strm.Strm_Close(1));
        m.put("Strm_Start", () -> strm.Strm_Start(1, service, lang, strmFe));
        m.put("Strm_Stop", () -> strm.Strm_Stop(1, true));
        m.put("Strm_GetSettings", () -> strm.Strm_GetSettings(1, service, pvr, lang, strmFe));
        m.put("Strm_SetSettings", () -> strm.Strm_SetSettings(1, service, pvr, lang, strmFe));
        m.put("Strm_GetStatus", () -> strm.Strm_GetStatus(1, st));
        m.put("Strm_CreatStreamInfo", () -> strm.Strm_CreatStreamInfo(1, info));
        m.put("Strm_GetVideoStreamInfo", () -> strm.Strm_GetVideoStreamInfo(0, vc));
        m.put("Strm_GetAudioStreamInfo", () -> strm.Strm_GetAudioStreamInfo(0, ac));
        m.put("Strm_GetSubTilteStreamInfo", () -> strm.Strm_GetSubTilteStreamInfo(0, sc));
        m.put("Strm_GetTeleTextStreamInfo", () -> strm.Strm_GetTeleTextStreamInfo(0, tc));
        m.put("Strm_GetAllEvent",
                () -> strm.Strm_GetAllEvent(1, present, following, presentExt, followingExt));
        m.put("Strm_GetEvent", () -> strm.Strm_GetEvent(1, present));
        m.put("Strm__GetExtEPGEventNow", () -> strm.Strm__GetExtEPGEventNow(0, item));
        m.put("Strm__GetExtEPGEventNext", () -> strm.Strm__GetExtEPGEventNext(0, item));
        m.put("Strm_GetTime", () -> strm.Strm_GetTime(1, 0));
        m.put("EPG_GetEvent", () -> strm.EPG_GetEvent(1, svc, present, presentExt));
        m.put("EPG_ExtGetEvent", () -> strm.EPG_ExtGetEvent(0, item));
        m.put("EpgMd_AddService", () -> strm.EpgMd_AddService(svc));
        m.put("EpgMd_ClearService", () -> strm.EpgMd_ClearService());
        m.put("Strm_CheckService", () -> strm.Strm_CheckService(check));

        Cfg.ANT_Status as = new Cfg.ANT_Status();
        Cfg.Video_Position vp = new Cfg.Video_Position();
        Cfg.CA_Status ca = new Cfg.CA_Status();
        m.put("Cfg_Reset", () -> cfg.Cfg_Reset(0));
        m.put("Cfg_GotoPosition", () -> cfg.Cfg_GotoPosition(0, 1));
        m.put("Cfg_StorePosition", () -> cfg.Cfg_StorePosition(0, 1));
        m.put("Cfg_Recalculate", () -> cfg.Cfg_Recalculate(0, 1));
        m.put("Cfg_Drive", () -> cfg.Cfg_Drive(0, 1, 2, 3));
        m.put("Cfg_Stop", () -> cfg.Cfg_Stop(0));
        m.put("Cfg_SetLimit", () -> cfg.Cfg_SetLimit(0, 1));
        m.put("Cfg_DisableLimit", () -> cfg.Cfg_DisableLimit(0));
        m.put("Cfg_EnableLimit", () -> cfg.Cfg_EnableLimit(0));
        m.put("Cfg_GotoSatellite", () -> cfg.Cfg_GotoSatellite(0, 192, 70, 510));
        m.put("Cfg_TryTune", () -> cfg.Cfg_TryTune(0, fe));
        m.put("Cfg_Tune", () -> cfg.Cfg_Tune(0, fe));
        m.put("Cfg_GetStatus", () -> cfg.Cfg_GetStatus(0, as));
        m.put("Cfg_SetMuteAudio", () -> cfg.Cfg_SetMuteAudio(0, 1));
        m.put("Cfg_SetAudioVolume", () -> cfg.Cfg_SetAudioVolume(50));
        m.put("Cfg_SetMuteVideo", () -> cfg.Cfg_SetMuteVideo(0, 1));
        m.put("Cfg_SetVideoPos", () -> cfg.Cfg_SetVideoPos(0, vp));
        m.put("Cfg_GetVideoPos", () -> cfg.Cfg_GetVideoPos(0, vp));
        m.put("Cfg_CaGetStatus", () -> cfg.Cfg_CaGetStatus(0, ca));
        m.put("Cfg_CaStandby", () -> cfg.Cfg_CaStandby(0));
        m.put("Cfg_GpioGet", () -> cfg.Cfg_GpioGet(0));
        m.put("Cfg_GpioSet", () -> cfg.Cfg_GpioSet(0, 1));
        m.put("Cfg_SetWakeup", () -> cfg.Cfg_SetWakeup(0));
        m.put("Cfg_BlindScanStart", () -> cfg.Cfg_BlindScanStart(0, 1, 2, 3, 4));
        m.put("Cfg_BlindScanStop", () -> cfg.Cfg_BlindScanStop(0));
        m.put("Cfg_TSDumpStart", () -> cfg.Cfg_TSDumpStart(0, 1, 2, "/tmp/dump.ts"));
        m.put("Cfg_TSDumpStop", () -> cfg.Cfg_TSDumpStop());

        Subttl.SUBTTL_Settings sset = new Subttl.SUBTTL_Settings();
        sset.langCode = "deu";
        Subttl.SUBTTL_Data_t sd = new Subttl.SUBTTL_Data_t();
        Subttl.SUBTTL_Page_t page = new Subttl.SUBTTL_Page_t();
        Subttl.SUBTTL_RegionDef rd = new Subttl.SUBTTL_RegionDef();
        Subttl.SUBTTL_Region_t region = new Subttl.SUBTTL_Region_t();
        Subttl.SUBTTL_ObjectDef od = new Subttl.SUBTTL_ObjectDef();
        Subttl.SUBTTL_Clut clut = new Subttl.SUBTTL_Clut();
        Subttl.SUBTTL_Display disp = new Subttl.SUBTTL_Display();
        m.put("Subttl_Init", () -> subttl.Subttl_Init());
        m.put("Subttl_Start", () -> subttl.Subttl_Start(sset));
        m.put("Subttl_Stop", () -> subttl.Subttl_Stop(1));
        m.put("Subttl_GetData", () -> subttl.Subttl_GetData(1, sd));
        m.put("Subttl_GetPageData", () -> subttl.Subttl_GetPageData(0, page));
        m.put("Subttl_GetRegionDefData", () -> subttl.Subttl_GetRegionDefData(0, 0, rd));
        m.put("Subttl_GetRegionData", () -> subttl.Subttl_GetRegionData(0, region));
        m.put("Subttl_GetRegionObjectDefData", () -> subttl.Subttl_GetRegionObjectDefData(0, 0, od));
        m.put("Subttl_GetClutData", () -> subttl.Subttl_GetClutData(0, clut));
        m.put("Subttl_GetDisplayData", () -> subttl.Subttl_GetDisplayData(disp));
        m.put("Subttl_GetDefaultClutData", () -> subttl.Subttl_GetDefaultClutData(clut));

        Teltxt.TELTXT_Settings ts = new Teltxt.TELTXT_Settings();
        ts.langCode = "deu";
        ts.streamName = "Videotext";
        Teltxt.TELTXT_NavPages nav = new Teltxt.TELTXT_NavPages();
        byte[] page1k = new byte[1024];
        m.put("Teltxt_Start", () -> teltxt.Teltxt_Start(ts));
        m.put("Teltxt_Stop", () -> teltxt.Teltxt_Stop(1));
        m.put("Teltxt_SetData", () -> teltxt.Teltxt_SetData(1, 100, 0, nav));
        m.put("Teltxt_GetData", () -> teltxt.Teltxt_GetData(1, 0, 1024, page1k));
        return m;
    }

    /** The twins of the representative set, with the same arguments as everyMethod(). */
    Map<String, Bench.Op> twins() {
        Map<String, Bench.Op> m = new LinkedHashMap<>();
        Cfg.ANT_Status as = new Cfg.ANT_Status();
        Strm.STRM_GetStatus st = new Strm.STRM_GetStatus();
        Strm.AudioContent ac = new Strm.AudioContent();
        Scnm.SCNM_ServiceInfo si = new Scnm.SCNM_ServiceInfo();
        Subttl.SUBTTL_Clut clut = new Subttl.SUBTTL_Clut();
        Subttl.SUBTTL_Region_t region = new Subttl.SUBTTL_Region_t();
        byte[] page1k = new byte[1024];
        m.put("Cfg_Tune", () -> Bench.twinCfgTune(cfg, 0, fe));
        m.put("Cfg_GetStatus", () -> Bench.twinCfgGetStatus(cfg, 0, as));
        m.put("Strm_Start", () -> Bench.twinStrmStart(strm, 1, service, lang, strmFe));
        m.put("Strm_GetStatus", () -> Bench.twinStrmGetStatus(strm, 1, st));
        m.put("Strm_GetAudioStreamInfo", () -> Bench.twinStrmGetAudioStreamInfo(strm, 0, ac));
        m.put("Scnm_GetServiceList", () -> Bench.twinScnmGetServiceList(scnm, 0, si));
        m.put("Subttl_GetClutData", () -> Bench.twinSubttlGetClutData(subttl, 0, clut));
        m.put("Subttl_GetRegionData", () -> Bench.twinSubttlGetRegionData(subttl, 0, region));
        m.put("Teltxt_GetData", () -> Bench.twinTeltxtGetData(teltxt, 1, 0, 1024, page1k));
        return m;
    }
}
