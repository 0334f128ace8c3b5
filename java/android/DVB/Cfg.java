package android.DVB;

/**
 * Front end and device configuration: tuning and front-end status, dish positioner,
 * audio and video output, and device services.
 * Every native method raises IllegalStateException and returns -1 when no configuration module is bound.
 */
public class Cfg {
    private int mNativeContext;

    Cfg(int nativeContext) {
        mNativeContext = nativeContext;
    }

    /** Creates a configuration module object bound to the given DVB object. */
    public Cfg(DVB dvb) {
        this(dvb.nativeContext());
    }

    /** Tuning and antenna parameters of a front end. */
    public static class ANT_FrontendParameters {
        public int type;
        public int frequency;
        public int symbolRate;
        public int fecInner;
        public int modulation;
        public int polarization;
        public int rolloff;
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

    /** Lock status, signal strength and quality of a front end. */
    public static class ANT_Status {
        public int feStatus;
        public int strength;
        public int quality;
    }

    /** Position and size of the video window. */
    public static class Video_Position {
        public int x;
        public int y;
        public int w;
        public int h;
    }

    /** Status of the conditional-access module. */
    public static class CA_Status {
        public int lastCwSet;
        public int source;
    }

    /**
     * Resets the dish positioner.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_Reset(int id);

    /**
     * Drives the dish to a stored position (0 to 255).
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_GotoPosition(int id, int position);

    /**
     * Stores the current dish position under a number (0 to 255).
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_StorePosition(int id, int position);

    /**
     * Recalculates the stored positions from a reference position (0 to 255).
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_Recalculate(int id, int position);

    /**
     * Drives the dish (each of the three values 0 to 255).
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_Drive(int id, int arg1, int arg2, int arg3);

    /**
     * Stops the dish motor.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_Stop(int id);

    /**
     * Sets a movement limit of the dish (0 to 255).
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_SetLimit(int id, int limit);

    /**
     * Disables the movement limits of the dish.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_DisableLimit(int id);

    /**
     * Enables the movement limits of the dish.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_EnableLimit(int id);

    /**
     * Points the dish at a satellite (each of the three values -32768 to 32767).
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_GotoSatellite(int id, int arg1, int arg2, int arg3);

    /**
     * Tries to tune a front end.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_TryTune(int frontend, ANT_FrontendParameters params);

    /**
     * Tunes a front end.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_Tune(int frontend, ANT_FrontendParameters params);

    /**
     * Fills {@code status} with the status of a front end.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_GetStatus(int frontend, ANT_Status status);

    /**
     * Mutes or unmutes audio (0 to 255).
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_SetMuteAudio(int id, int mute);

    /**
     * Sets the audio volume.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_SetAudioVolume(int volume);

    /**
     * Mutes or unmutes video (0 to 255).
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_SetMuteVideo(int id, int mute);

    /**
     * Sets the position and size of the video window.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_SetVideoPos(int id, Video_Position position);

    /**
     * Fills {@code position} with the position and size of the video window.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_GetVideoPos(int id, Video_Position position);

    /**
     * Fills {@code status} with the status of the conditional-access module.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_CaGetStatus(int id, CA_Status status);

    /**
     * Puts the conditional-access module into standby.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_CaStandby(int id);

    /**
     * Reads a general-purpose I/O line; currently does nothing.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_GpioGet(int gpio);

    /**
     * Sets a general-purpose I/O line.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_GpioSet(int gpio, int value);

    /**
     * Sets the wake-up setting.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_SetWakeup(int value);

    /**
     * Starts a blind scan of a front end.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_BlindScanStart(int frontend, int arg1, int arg2, int arg3, int arg4);

    /**
     * Stops a blind scan.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_BlindScanStop(int frontend);

    /**
     * Starts dumping a transport stream to a file (path cut to 255 bytes).
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_TSDumpStart(int arg1, int arg2, int arg3, String path);

    /**
     * Stops the transport-stream dump.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Cfg_TSDumpStop();
}
