package dvbdemo;

import android.DVB.Subttl;
import java.awt.image.BufferedImage;
import java.util.LinkedHashMap;
import java.util.Map;

/**
 * A subtitle display set as the Subttl readers give it, composed on the display as a viewer
 * shows it: each placed region at its place, its pixels in its CLUT's ARGB colours (the default
 * CLUT where the display set defines none of that id). The end-to-end tests compare it with
 * ffmpeg's rendering.
 */
public final class DisplaySetImage {
    private DisplaySetImage() {}

    /** The display set that Subttl_GetData just read, on a display of the size it defines. */
    public static BufferedImage compose(Subttl sub, Subttl.SUBTTL_Data_t data) {
        Subttl.SUBTTL_Display display = new Subttl.SUBTTL_Display();
        sub.Subttl_GetDisplayData(display);
        int width = display.i_width > 0 ? display.i_width : 720;
        int height = display.i_height > 0 ? display.i_height : 576;
        BufferedImage image = new BufferedImage(width, height, BufferedImage.TYPE_INT_ARGB);
        Subttl.SUBTTL_Page_t pg = new Subttl.SUBTTL_Page_t();
        sub.Subttl_GetPageData(0, pg);
        Map<Integer, Subttl.SUBTTL_Clut> cluts = new LinkedHashMap<>();
        for (int c = 0; c < data.numCluts && c < 4; c++) {
            Subttl.SUBTTL_Clut clut = new Subttl.SUBTTL_Clut();
            sub.Subttl_GetClutData(c, clut);
            cluts.put(clut.i_id, clut);
        }
        Subttl.SUBTTL_Clut fallback = new Subttl.SUBTTL_Clut();
        sub.Subttl_GetDefaultClutData(fallback);
        for (int d = 0; d < pg.i_region_defs && d < 16; d++) {
            Subttl.SUBTTL_RegionDef def = new Subttl.SUBTTL_RegionDef();
            sub.Subttl_GetRegionDefData(0, d, def);
            for (int r = 0; r < data.numRegions && r < 5; r++) {
                Subttl.SUBTTL_Region_t region = new Subttl.SUBTTL_Region_t();
                sub.Subttl_GetRegionData(r, region);
                if (region.i_id != def.i_id) continue;
                Subttl.SUBTTL_Clut clut = cluts.getOrDefault(region.i_clut, fallback);
                int[] table = region.i_depth == 1 ? clut.c_2b : region.i_depth == 2 ? clut.c_4b : clut.c_8b;
                for (int y = 0; y < region.i_height; y++) {
                    for (int x = 0; x < region.i_width; x++) {
                        int px = def.i_x + x;
                        int py = def.i_y + y;
                        int index = region.p_pixbuf[y * region.i_width + x] & 0xFF;
                        if (px < width && py < height && index < table.length) image.setRGB(px, py, table[index]);
                    }
                }
            }
        }
        return image;
    }
}
