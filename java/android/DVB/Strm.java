package android.DVB;

/**
 * Stream playback and event information: open, start and stop services, read their settings,
 * status and components, and query present, following and database events.
 * Every native method raises IllegalStateException and returns -1 when no stream module is bound.
 */
public class Strm {
    private int mNativeContext;

    Strm(int nativeContext) {
        mNativeContext = nativeContext;
    }

    /** Creates a stream module object bound to the given DVB object. */
    public Strm(DVB dvb) {
        this(dvb.nativeContext());
    }

    /** Front end, demultiplexer, decoders and optional file path of a stream to open. */
    public static class STRM_OpenSettings {
        public int frontend;
        public int demux;
        public int video;
        public int audio;
        public String szPath;
    }

    /** Front-end (tuning and antenna) settings of a stream. */
    public static class STRM_FrontEnd {
        public int type;
        public int frequency;
        public int symbolRate;
        public int fecInner;
        public int modulation;
        public int polarization;
        public int rolloff;
        public int orbital_position;
        public int diseqctype;
        public int tone;
        public int lnbpower;
        public int lnbLowLO;
        public int lnbHigLO;
        public int port;
        public int port16;
        public int posIndex;
        public int satPosition;
        public int myLongitude;
        public int myLatitude;
        public int toneBurst;
        public int ubSlot;
        public int ubFreq;
        public int ubSat;
        public int out5v;
        public int bandwidth;
    }

    /** Service played by a stream: PIDs, stream types, CA system ids and transport-stream index. */
    public static class STRM_Service {
        public int svcId;
        public int videoPid;
        public int videoType;
        public int audioPid;
        public int audioType;
        public int pcrPid;
        public int pmtPid;
        public int caSysId0;
        public int caSysId1;
        public int caSysId2;
        public int tsIndex;
    }

    /** Two three-letter language codes of a stream. */
    public static class STRM_LangCode {
        public String langCode0;
        public String langCode1;
    }

    /** Playback settings of recorded material: speed as a fraction and position time. */
    public static class STRM_PvrSetting {
        public int playSpeed;
        public int playSpeedDiv;
        public int posTime;
    }

    /** Front-end, decoder, recording and playback status of a stream. */
    public static class STRM_GetStatus {
        public int feStatus;
        public int feStrength;
        public int feBer;
        public int feSnr;
        public int videoPts;
        public int audioPts;
        public int localPts;
        public int fpsInteger;
        public int fpsDecimal;
        public int pictureStatus;
        public int recstate;
        public int recduration;
        public long recsize;
        public int recevent;
        public int recstartTime;
        public int reccurTime;
        public int recendTime;
        public int pbstate;
        public int pbposition;
        public int pbstartTime;
        public int pbendTime;
        public int pbevent;
        public int result;
    }

    /** Component counts, PCR PID and CA system ids of a stream. */
    public static class STRM_StreamInfo {
        public int videoCount;
        public int audioCount;
        public int teletextCount;
        public int subtitleCount;
        public int pcrPid;
        public int caSysId0;
        public int caSysId1;
        public int caSysId2;
    }

    /** One video component of a stream. */
    public static class VideoContent {
        public int pid;
        public int type;
    }

    /** One audio component of a stream. */
    public static class AudioContent {
        public int pid;
        public int isDolbyAC3;
        public int type;
        public String langCode0;
        public String langCode1;
        public int componetTag;
        public String streamName;
    }

    /** One DVB subtitle component of a stream. */
    public static class SubtitleContent {
        public int pid;
        public int type;
        public String langCode;
        public int magazineNumber;
        public int pageNumber;
        public int compositionPageId;
        public int ancillaryPageId;
    }

    /** One teletext component of a stream. */
    public static class TeletextContent {
        public int pid;
        public int type;
        public String langCode;
        public int magazineNumber;
        public int pageNumber;
        public int componetTag;
        public String streamName;
    }

    /** One broadcast event (programme). */
    public static class EpgEvent {
        public int evtId;
        public int startTime;
        public int duration;
        public int runStatus;
        public int parentalRating;
        public int content;
        public int refSvcId;
        public int refEvtId;
        /**
         * Event name as raw broadcast bytes, without terminator. DVB text uses its own
         * character tables (selected by a leading byte); the app decodes the bytes itself.
         */
        public byte[] name;
        /**
         * Short event text as raw broadcast bytes, without terminator. DVB text uses its own
         * character tables (selected by a leading byte); the app decodes the bytes itself.
         */
        public byte[] text;
        public int extendedFlag;
    }

    /** Extended description of an event: item count and extended text. */
    public static class ExtEpgEvent {
        public int itemCount;
        public String text;
    }

    /** One item of an extended event description. */
    public static class ExtEpgEventItem {
        /** Item description, or null when empty. */
        public String itemDesc;
        /** Item text, or null when empty. */
        public String type;
    }

    /** A service whose events are collected or queried. */
    public static class EpgSvc {
        public int svcId;
        public int tsId;
        public int onId;
        public int tpIndex;
        public int netIndex;
        public int netType;
    }

    /** A service to check, by satellite position, frequency, transport stream id and service id. */
    public static class ServiceCheck {
        public int satPosition;
        public int freq;
        public int tsid;
        public int sid;
    }

    /**
     * Initialises the stream module.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_Init();

    /**
     * Opens a stream.
     *
     * @return the stream handle (negative on module failure), or -1 with IllegalStateException when no module is bound
     */
    public native long Strm_Open(STRM_OpenSettings settings);

    /**
     * Closes a stream.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_Close(long handle);

    /**
     * Starts playing a service on a stream.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_Start(long handle, STRM_Service service, STRM_LangCode langCode, STRM_FrontEnd frontEnd);

    /**
     * Stops the service playing on a stream.
     *
     * @param flag stop option passed to the module
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_Stop(long handle, boolean flag);

    /**
     * Reads the settings of a stream into the four objects.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_GetSettings(long handle, STRM_Service service, STRM_PvrSetting pvr,
            STRM_LangCode langCode, STRM_FrontEnd frontEnd);

    /**
     * Changes the settings of a stream from the four objects.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_SetSettings(long handle, STRM_Service service, STRM_PvrSetting pvr,
            STRM_LangCode langCode, STRM_FrontEnd frontEnd);

    /**
     * Fills {@code status} with the status of a stream.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_GetStatus(long handle, STRM_GetStatus status);

    /**
     * Queries the components of a stream; fills the counts and caches the component lists.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_CreatStreamInfo(long handle, STRM_StreamInfo info);

    /**
     * Fills {@code content} from video component {@code index} of the last component query.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_GetVideoStreamInfo(int index, VideoContent content);

    /**
     * Fills {@code content} from audio component {@code index} of the last component query.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_GetAudioStreamInfo(int index, AudioContent content);

    /**
     * Fills {@code content} from subtitle component {@code index} of the last component query.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_GetSubTilteStreamInfo(int index, SubtitleContent content);

    /**
     * Fills {@code content} from teletext component {@code index} of the last component query.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_GetTeleTextStreamInfo(int index, TeletextContent content);

    /**
     * Fills the present and following events of a stream and their extended descriptions;
     * caches the extended items for {@link #Strm__GetExtEPGEventNow} and {@link #Strm__GetExtEPGEventNext}.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_GetAllEvent(long handle, EpgEvent present, EpgEvent following,
            ExtEpgEvent presentExt, ExtEpgEvent followingExt);

    /**
     * Fills {@code event} with an event of the stream chosen by the module.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_GetEvent(long handle, EpgEvent event);

    /**
     * Fills {@code item} from extended item {@code index} of the present event.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm__GetExtEPGEventNow(int index, ExtEpgEventItem item);

    /**
     * Fills {@code item} from extended item {@code index} of the following event.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm__GetExtEPGEventNext(int index, ExtEpgEventItem item);

    /**
     * Reads the current time of a stream.
     *
     * @param unused not read
     * @return the time, 0 to 4294967295, or -1 with IllegalStateException when no module is bound
     */
    public native long Strm_GetTime(long handle, long unused);

    /**
     * Queries the event database for an event of {@code service} with its extended description;
     * caches the extended items for {@link #EPG_ExtGetEvent}.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int EPG_GetEvent(long handle, EpgSvc service, EpgEvent event, ExtEpgEvent ext);

    /**
     * Fills {@code item} from extended item {@code index} of the last database query.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int EPG_ExtGetEvent(int index, ExtEpgEventItem item);

    /**
     * Adds a service to the list of services whose events are collected.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int EpgMd_AddService(EpgSvc service);

    /**
     * Empties the list of services whose events are collected.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int EpgMd_ClearService();

    /**
     * Asks the module to check a service; the outcome is not returned.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Strm_CheckService(ServiceCheck check);
}
