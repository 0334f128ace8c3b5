package android.DVB;

/**
 * DVB subtitle decoding: start and stop a decoder and read each display set
 * (page, regions with pixels, objects, colour tables, display definition).
 * Every native method raises IllegalStateException and returns -1 when no subtitle module is bound.
 */
public class Subttl {
    private int mNativeContext;

    Subttl(int nativeContext) {
        mNativeContext = nativeContext;
    }

    /** Creates a subtitle module object bound to the given DVB object. */
    public Subttl(DVB dvb) {
        this(dvb.nativeContext());
    }

    /** Subtitle stream on which a decoder is started. */
    public static class SUBTTL_Settings {
        public int devId;
        public int pid;
        public int type;
        public String langCode;
        public int magazineNumber;
        public int pageNumber;
        public int compositionPageId;
        public int ancillaryPageId;
        /** Handle of the stream that carries the subtitles. */
        public long hstrm;
    }

    /** Time stamp and counts of the current display set. */
    public static class SUBTTL_Data_t {
        public int i_pts;
        public int numPage;
        public int numRegions;
        public int numCluts;
    }

    /** Page composition of the display set. */
    public static class SUBTTL_Page_t {
        public int i_id;
        public int i_timeout;
        public int i_state;
        public int i_version;
        public int i_region_defs;
    }

    /** Placement of a region on the page. */
    public static class SUBTTL_RegionDef {
        public int i_id;
        public int i_x;
        public int i_y;
    }

    /** Region composition with its pixels (one CLUT index per pixel). */
    public static class SUBTTL_Region_t {
        public int i_id;
        public int i_version;
        public int i_x;
        public int i_y;
        public int i_width;
        public int i_height;
        public int i_level_comp;
        public int i_depth;
        public int i_clut;
        /** Pixels, width times height bytes, row by row. */
        public byte[] p_pixbuf;
        public int i_object_defs;
    }

    /** Placement of an object in a region. */
    public static class SUBTTL_ObjectDef {
        public int i_id;
        public int i_type;
        public int i_x;
        public int i_y;
        public int i_fg_pc;
        public int i_bg_pc;
        /** Character codes of a string object, always 32 bytes. */
        public byte[] psz_text;
        public int i_text_length;
    }

    /** Display definition of the display set. */
    public static class SUBTTL_Display {
        public int i_id;
        public int i_version;
        public int i_width;
        public int i_height;
        public int b_windowed;
        public int i_x;
        public int i_y;
        public int i_max_x;
        public int i_max_y;
    }

    /** Colour look-up table with its 2-, 4- and 8-bit tables as ARGB colours. */
    public static class SUBTTL_Clut {
        public int i_id;
        public int i_version;
        public int[] c_2b;
        public int[] c_4b;
        public int[] c_8b;
    }

    /**
     * Initialises the subtitle module.
     *
     * @return the module's result, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_Init();

    /**
     * Starts a subtitle decoder.
     *
     * @return the decoder handle (negative on module failure), or -1 with IllegalStateException when no module is bound
     */
    public native long Subttl_Start(SUBTTL_Settings settings);

    /**
     * Stops a subtitle decoder.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_Stop(long handle);

    /**
     * Fetches the current display set and fills {@code data} with its counts.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_GetData(long handle, SUBTTL_Data_t data);

    /**
     * Fills {@code page} from page {@code pageIndex} of the current display set.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_GetPageData(int pageIndex, SUBTTL_Page_t page);

    /**
     * Fills {@code def} from region placement {@code defIndex} of page {@code pageIndex}.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_GetRegionDefData(int pageIndex, int defIndex, SUBTTL_RegionDef def);

    /**
     * Fills {@code region} from region {@code regionIndex} of the current display set, pixels included.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_GetRegionData(int regionIndex, SUBTTL_Region_t region);

    /**
     * Fills {@code def} from object {@code objectIndex} of region {@code regionIndex}.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_GetRegionObjectDefData(int regionIndex, int objectIndex, SUBTTL_ObjectDef def);

    /**
     * Fills {@code clut} from colour table {@code clutIndex} of the current display set, as ARGB colours.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_GetClutData(int clutIndex, SUBTTL_Clut clut);

    /**
     * Fills {@code display} with the display definition of the current display set.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_GetDisplayData(SUBTTL_Display display);

    /**
     * Fills {@code clut} with the default colour table of the current display set, as ARGB colours.
     *
     * @return 0, or -1 with IllegalStateException when no module is bound
     */
    public native int Subttl_GetDefaultClutData(SUBTTL_Clut clut);
}
