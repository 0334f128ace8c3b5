package android.DVB;

/** Every record of the service interface, as the interface description lays it out. */
final class Records {
    static final Layout ANT_FRONTEND = new Layout(Cfg.ANT_FrontendParameters.class, 76, "x:fe@0");
    static final Layout ANT_STATUS = new Layout(Cfg.ANT_Status.class, 16,
            "feStatus:i32@0 strength:i32@4 quality:i32@12");
    /** Written through two pointers, the source through the first. */
    static final Layout CA_STATUS = new Layout(Cfg.CA_Status.class, 8, "source:i32@0 lastCwSet:i32@4");
    static final Layout VIDEO_POSITION = new Layout(Cfg.Video_Position.class, 16,
            "x:i32@0 y:i32@4 w:i32@8 h:i32@12");

    static final Layout SCNM_OPEN = new Layout(Scnm.SCNM_OpenSettings.class, 8,
            "frontend:i32@0 demux:i32@4");
    static final Layout SCNM_START = new Layout(Scnm.SCNM_StartSettings.class, 96,
            "x:fe@0 scanType:i32@84 scanNetwrok:i32@88 langCode:eng@92");
    static final Layout SCNM_STATUS = new Layout(Scnm.SCNM_GetStatus.class, 12,
            "feStatus:i32@0 sfStatus:i32@4 result:i32@8");
    static final Layout SERVICE_INFO = new Layout(Scnm.SCNM_ServiceInfo.class, 124,
            "svcType:i32@0 svcId:u16@4 videoPid:u16@6 videoType:u8@8 audioPid:u16@10"
            + " audioType:u8@12 pcrPid:u16@14 pmtPid:u16@16 caSysId0:u16@18 caSysId1:u16@20"
            + " caSysId2:u16@22 svcName:bytes64@36 tsId:u16@100 onId:u16@102 lcn:u32j@104"
            + " content:u8@108");
    static final Layout NETWORK = new Layout(Scnm.SCNMNET_FrontEndSettings.class, 96,
            "type:i32@0 frequency:i32@4 symbolRate:i32@8 fecInner:i32@12 modulation:i32@16"
            + " polarization:i32@20 rolloff:i32@24");
    static final Layout DVB_CONFIG = new Layout(Scnm.DVB_Config.class, 8,
            "displayMode:i32@0 sdkMode:i32@4");

    // Stream module: STRM_Settings (152 bytes) is made of four Java objects.
    static final Layout STRM_OPEN = new Layout(Strm.STRM_OpenSettings.class, 144,
            "frontend:i32@0 demux:i32@4 video:i32@8 audio:i32@12 szPath:path128@16");
    static final Layout STRM_FRONTEND = new Layout(Strm.STRM_FrontEnd.class, 152,
            "x:fe@0 orbital_position:s16@76");
    static final Layout STRM_FRONTEND_SETTINGS = new Layout(Strm.STRM_FrontEnd.class, 152,
            "frequency:i32@4 symbolRate:i32@8 fecInner:i32@12 modulation:i32@16"
            + " polarization:i32@20 rolloff:i32@24 orbital_position:s16@76 "
            + Layout.FE_COMMON);
    static final Layout STRM_SERVICE = new Layout(Strm.STRM_Service.class, 152,
            "svcId:u16@80 videoPid:u16@82 videoType:u8@84 audioPid:u16@86 audioType:u8@88"
            + " pcrPid:u16@90 pmtPid:u16@92 caSysId0:u16@94 caSysId1:u16@96 caSysId2:u16@98"
            + " tsIndex:i32@108");
    static final Layout STRM_LANG = new Layout(Strm.STRM_LangCode.class, 152,
            "langCode0:lang@128 langCode1:lang@132");
    static final Layout STRM_PVR = new Layout(Strm.STRM_PvrSetting.class, 152,
            "playSpeed:i32@140 playSpeedDiv:i32@144 posTime:i32@148");
    static final Layout STRM_STATUS = new Layout(Strm.STRM_GetStatus.class, 96,
            "feStatus:i32@0 feStrength:i32@4 feBer:i32@8 feSnr:i32@12 videoPts:i32@16"
            + " audioPts:i32@20 localPts:i32@24 fpsInteger:i32@28 fpsDecimal:i32@32"
            + " pictureStatus:i32@36 recstate:i32@40 recduration:i32@44 recsize:i64@48"
            + " recevent:i32@56 recstartTime:i32@60 recendTime:i32@64 reccurTime:i32@68"
            + " pbstate:i32@72 pbposition:i32@76 pbevent:i32@80 pbstartTime:i32@84"
            + " pbendTime:i32@88 result:i32@92");
    static final Layout STREAM_INFO = new Layout(Strm.STRM_StreamInfo.class, 1728,
            "videoCount:i32@0 audioCount:i32@68 teletextCount:i32@808 subtitleCount:i32@1484"
            + " pcrPid:u16@1712 caSysId0:u16@1714 caSysId1:u16@1716 caSysId2:u16@1718");
    static final Layout VIDEO = new Layout(Strm.VideoContent.class, 4, "pid:u16@0 type:u8@2");
    static final Layout AUDIO = new Layout(Strm.AudioContent.class, 46,
            "pid:u16@0 isDolbyAC3:u8@2 type:u8@3 langCode0:lang@4 langCode1:lang@8"
            + " componetTag:u8@12 streamName:str33@13");
    static final Layout SUBTITLE = new Layout(Strm.SubtitleContent.class, 14,
            "pid:u16@0 type:u8@2 langCode:lang@3 magazineNumber:u8@7 pageNumber:u8@8"
            + " compositionPageId:u16@10 ancillaryPageId:u16@12");
    static final Layout TELETEXT = new Layout(Strm.TeletextContent.class, 42,
            "pid:u16@0 type:u8@2 langCode:lang@3 magazineNumber:u8@7 pageNumber:u8@8"
            + " componetTag:u8@9 streamName:str32@10");
    static final Layout EVENT = new Layout(Strm.EpgEvent.class, 336,
            "evtId:u16@0 startTime:i32@4 duration:i32@8 runStatus:u8@12 parentalRating:u8@13"
            + " content:u8@14 refSvcId:u16@16 refEvtId:u16@18 name:bytes52@20 text:bytes256@72"
            + " extendedFlag:u8@328");
    static final Layout EXT_EVENT = new Layout(Strm.ExtEpgEvent.class, 3588,
            "itemCount:i32@0 text:str2048@1540");
    static final Layout ITEM = new Layout(Strm.ExtEpgEventItem.class, 96,
            "itemDesc:nstr32@0 type:nstr64@32");
    static final Layout EPG_SVC = new Layout(Strm.EpgSvc.class, 20,
            "svcId:u16@0 tsId:u16@2 onId:u16@4 tpIndex:i32@8 netIndex:i32@12 netType:i32@16");
    static final Layout EPG_SVC_IDS = new Layout(Strm.EpgSvc.class, 20,
            "svcId:u16@0 tsId:u16@2 onId:u16@4");
    static final Layout SERVICE_CHECK = new Layout(Strm.ServiceCheck.class, 16,
            "satPosition:i32@0 freq:i32@4 tsid:i32@8 sid:i32@12");

    // Subtitle module: the readers' records, at their places in the display-data buffer.
    static final Layout SUBTTL_SETTINGS = new Layout(Subttl.SUBTTL_Settings.class, 24,
            "devId:i32@0 pid:u16@4 type:u8@6 langCode:str4@7 magazineNumber:u8@11"
            + " pageNumber:u8@12 compositionPageId:u16@14 ancillaryPageId:u16@16 pid:u16@18"
            + " hstrm:u32j@20");
    static final Layout SUBTTL_DATA = new Layout(Subttl.SUBTTL_Data_t.class, 1930792,
            "i_pts:i32@0 numPage:i32@4 numRegions:i32@220 numCluts:i32@1925224");
    static final Layout PAGE = new Layout(Subttl.SUBTTL_Page_t.class, 212,
            "i_id:i32@0 i_timeout:i32@4 i_state:i32@8 i_version:i32@12 i_region_defs:i32@16");
    static final Layout REGION_DEF = new Layout(Subttl.SUBTTL_RegionDef.class, 12,
            "i_id:i32@0 i_x:i32@4 i_y:i32@8");
    static final String REGION_HEAD = "i_id:i32@0 i_version:i32@4 i_x:i32@8 i_y:i32@12"
            + " i_width:i32@16 i_height:i32@20 i_level_comp:i32@24 i_depth:i32@28 i_clut:i32@32";
    static final Layout REGION = new Layout(Subttl.SUBTTL_Region_t.class, 385000,
            REGION_HEAD + " p_pixbuf:pix384000@36 i_object_defs:i32@384036");
    static final Layout OBJECT_DEF = new Layout(Subttl.SUBTTL_ObjectDef.class, 60,
            "i_id:i32@0 i_type:i32@4 i_x:i32@8 i_y:i32@12 i_fg_pc:i32@16 i_bg_pc:i32@20"
            + " psz_text:all32@24 i_text_length:i32@56");
    static final Layout DISPLAY = new Layout(Subttl.SUBTTL_Display.class, 32,
            "i_id:u8@0 i_version:u8@1 i_width:i32@4 i_height:i32@8 b_windowed:u8@12 i_x:i32@16"
            + " i_y:i32@20 i_max_x:i32@24 i_max_y:i32@28");
    static final Layout CLUT = new Layout(Subttl.SUBTTL_Clut.class, 1106,
            "i_id:u8@0 i_version:u8@1 c_2b:ycc4@2 c_4b:ycc16@18 c_8b:ycc256@82");

    /** Written through four pointers, in this order. */
    static final Layout NAV_PAGES = new Layout(Teltxt.TELTXT_NavPages.class, 16,
            "prev100:i32@0 prev10:i32@4 next10:i32@8 next100:i32@12");
    static final Layout TELTXT_SETTINGS = new Layout(Teltxt.TELTXT_Settings.class, 48,
            "devId:i32@0 pid:u16@4 type:u8@6 langCode:str4@7 magazineNumber:u8@11"
            + " pageNumber:u8@12 componetTag:u8@13 streamName:str32@14 pid:u16@46");
}
