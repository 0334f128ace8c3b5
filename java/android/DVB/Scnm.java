package android.DVB;

/**
 * Channel search: scan control, scan results and start-up and shut-down of the DVB system.
 * Every native method raises IllegalStateException and returns -1 when no scan module is bound.
 */
public class Scnm {
    private int mNativeContext;

    Scnm(int nativeContext) {
        mNativeContext = nativeContext;
    }

    /** Creates a scan module object bound to the given DVB object. */
    public Scnm(DVB dvb) {
        this(dvb.nativeContext());
    }

    /** Front end and demultiplexer on which a scan is opened. */
    public static class SCNM_OpenSettings {
        public int frontend;
        public int demux;
    }

    /** Tuning, antenna and search parameters of a scan. */
    public static class SCNM_StartSettings {
        public int type;
        public int frequency;
        public int symbolRate;
        public int modulation;
        public int polarization;
        public int rolloff;
        public int fecInner;
        public int scanType;
        public int scanNetwrok;
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
        /** Three-letter language code; null means "eng". */
        public String langCode;
        public int bandwidth;
    }

    /** Progress of a running scan. */
    public static class SCNM_GetStatus {
        public int feStatus;
        public int sfStatus;
        public int result;
    }

    /** One service found by a scan. */
    public static class SCNM_ServiceInfo {
        public int svcType;
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
        /** Service name as raw broadcast bytes, without terminator. */
        public byte[] svcName;
        public int tsId;
        public int onId;
        /** Logical channel number, 0 to 4294967295. */
        public long lcn;
        public int content;
    }

    /** Front-end settings of one network (transponder) found by a scan. */
    public static class SCNMNET_FrontEndSettings {
        public int type;
        public int frequency;
        public int symbolRate;
        public int fecInner;
        public int modulation;
        public int polarization;
        public int rolloff;
    }

    /** Configuration for system start-up and shut-down. */
    public static class DVB_Config {
        public int displayMode;
        public int sdkMode;
    }

    /**
     * Initialises the scan module.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Scnm_Init();

    /**
     * Opens a scan on a front end and demultiplexer.
     *
     * @return the scan handle (negative on module failure), or -1 with IllegalStateException when no module is bound
     */
    public native long Scnm_Open(SCNM_OpenSettings settings);

    /**
     * Closes a scan handle.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Scnm_Close(long handle);

    /**
     * Starts a search with the given tuning and search parameters.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Scnm_Start(long handle, SCNM_StartSettings settings);

    /**
     * Stops a running search.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Scnm_Stop(long handle);

    /**
     * Fills {@code status} with the progress of the search.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Scnm_GetStatus(long handle, SCNM_GetStatus status);

    /**
     * Fetches the services found by the search into the service cache.
     *
     * @return the number of services, or -1 with IllegalStateException when no module is bound
     */
    public native int Scnm_CreateServiceList(long handle);

    /**
     * Fills {@code info} from entry {@code index} of the service cache.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Scnm_GetServiceList(int index, SCNM_ServiceInfo info);

    /**
     * Fetches the networks found by the search into the network cache.
     *
     * @return the number of networks, or -1 with IllegalStateException when no module is bound
     */
    public native int Scnm_CreateNetworkList(long handle);

    /**
     * Fills {@code settings} from entry {@code index} of the network cache.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Scnm_GetNetworkList(int index, SCNMNET_FrontEndSettings settings);

    /**
     * Starts the DVB system; blocks until its event database exists.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Dvb_SystemInit(DVB_Config config);

    /**
     * Shuts the DVB system down.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Dvb_SystemUnInit(DVB_Config config);
}
