// The subtitle decoder's output: a display set of the model written into the display-data
// buffer (SUBTTL_Data), within the buffer's room.
#pragma once

#include <Subttl.h>

#include "../broadcast/Broadcast.h"

namespace dvbrx {

// EN 300 743's default CLUT, in the Y/Cr/Cb/T form of the buffer: its 2-, 4- and 8-bit tables,
// computed from the RGB and transparency levels that the standard gives them (BT.601 studio
// range, T 0 opaque .. 255 transparent); id and version 0. Fully transparent entries read
// Y 0, Cr 128, Cb 128, T 255.
const SUBTTL_Clut& defaultClut();

// One colour in the Y/Cr/Cb/T form: BT.601, Y 16..235, rounded to the nearest.
SUBTTL_ClutEntry yccOf(int r, int g, int b, int t);

// Writes `set`, shown with presentation time stamp `pts`, into `data`: the counts, the page
// (with its version), the first kSubttlRegions regions with their placements, pixels and
// objects, the first kSubttlCluts CLUTs, the display definition (720x576 and id 0 where the
// set carries none, id 1 where it does) and the default CLUT. A region larger than its buffer
// keeps the rows that fit, and reports that height. Only the records the counts cover are
// written; the pixels past a region's width x height stay as they are.
void fillSubtitleData(const dvbmodel::DisplaySet& set, uint32_t pts, SUBTTL_Data* data);

}  // namespace dvbrx
