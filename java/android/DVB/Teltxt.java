package android.DVB;

/**
 * Teletext decoding: start and stop a decoder, navigate pages and fetch page data.
 * Every native method raises IllegalStateException and returns -1 when no teletext module is bound.
 */
public class Teltxt {
    private int mNativeContext;

    Teltxt(int nativeContext) {
        mNativeContext = nativeContext;
    }

    /** Creates a teletext module object bound to the given DVB object. */
    public Teltxt(DVB dvb) {
        this(dvb.nativeContext());
    }

    /** Teletext stream on which a decoder is started. */
    public static class TELTXT_Settings {
        public int devId;
        public int pid;
        public int type;
        public String langCode;
        public int magazineNumber;
        public int pageNumber;
        public int componetTag;
        public String streamName;
    }

    /** Navigation targets reported by the decoder. */
    public static class TELTXT_NavPages {
        public int prev100;
        public int prev10;
        public int next10;
        public int next100;
    }

    /**
     * Starts a teletext decoder.
     *
     * @return the decoder handle (negative on module failure), or -1 with IllegalStateException when no module is bound
     */
    public native long Teltxt_Start(TELTXT_Settings settings);

    /**
     * Stops a teletext decoder.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Teltxt_Stop(long handle);

    /**
     * Passes two values to the decoder and fills {@code nav} with its navigation values.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Teltxt_SetData(long handle, int arg1, int arg2, TELTXT_NavPages nav);

    /**
     * Copies {@code count} bytes of decoder data, from its start, into {@code buffer} at {@code offset}.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Teltxt_GetData(long handle, int offset, int count, byte[] buffer);
}
