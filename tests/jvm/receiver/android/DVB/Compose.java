package android.DVB;

import java.awt.image.BufferedImage;
import java.util.HashMap;
import java.util.Map;

/** A display set as the readers give it, composed on the display as a viewer shows it. */
final class Compose {
    /** The display set that Subttl_GetData just read, its placed regions in their CLUTs' colours. */
    static BufferedImage displaySet(Subttl sub, Subttl.SUBTTL_Data_t data, int width, int height) {
        BufferedImage image = new BufferedImage(width, height, BufferedImage.TYPE_INT_ARGB);
        Subttl.SUBTTL_Page_t page = new Subttl.SUBTTL_Page_t();
        sub.Subttl_GetPageData(0, page);
        Map<Integer, Subttl.SUBTTL_Clut> cluts = new HashMap<>();
        for (int c = 0; c < data.numCluts; c++) {
            Subttl.SUBTTL_Clut clut = new Subttl.SUBTTL_Clut();
            sub.Subttl_GetClutData(c, clut);
            cluts.put(clut.i_id, clut);
        }
        Subttl.SUBTTL_Clut fallback = new Subttl.SUBTTL_Clut();
        sub.Subttl_GetDefaultClutData(fallback);
        for (int d = 0; d < page.i_region_defs; d++) {
            Subttl.SUBTTL_RegionDef def = new Subttl.SUBTTL_RegionDef();
            sub.Subttl_GetRegionDefData(0, d, def);
            for (int r = 0; r < data.numRegions; r++) {
                Subttl.SUBTTL_Region_t region = new Subttl.SUBTTL_Region_t();
                sub.Subttl_GetRegionData(r, region);
                if (region.i_id != def.i_id) continue;
                Subttl.SUBTTL_Clut clut = cluts.getOrDefault(region.i_clut, fallback);
                int[] table = region.i_depth == 1 ? clut.c_2b : region.i_depth == 2 ? clut.c_4b : clut.c_8b;
                for (int y = 0; y < region.i_height; y++) {
                    for (int x = 0; x < region.i_width; x++) {
                        image.setRGB(def.i_x + x, def.i_y + y, table[region.p_pixbuf[y * region.i_width + x] & 0xFF]);
                    }
                }
            }
        }
        return image;
    }

    /**
     * Pixels of `a` and `b` (same size) that differ by more than 1 in a channel: ffmpeg converts
     * Y, Cr, Cb with its own rounding, the CLUT readers truncate. Fully transparent pixels have
     * no colour to compare. -1 when neither shows anything.
     */
    static int differing(BufferedImage a, BufferedImage b) {
        int differ = 0, shown = 0;
        for (int y = 0; y < a.getHeight(); y++) {
            for (int x = 0; x < a.getWidth(); x++) {
                int p = a.getRGB(x, y), q = b.getRGB(x, y);
                if ((p >>> 24) == 0 && (q >>> 24) == 0) continue;
                shown++;
                for (int shift = 0; shift < 32; shift += 8) {
                    if (Math.abs((p >>> shift & 0xFF) - (q >>> shift & 0xFF)) > 1) {
                        differ++;
                        break;
                    }
                }
            }
        }
        return shown == 0 ? -1 : differ;
    }
}
