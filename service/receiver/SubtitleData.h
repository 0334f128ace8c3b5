// The subtitle decoder's output: a display set of the model written into the display-data
// buffer (SUBTTL_Data), within the buffer's room.
#pragma once

#include <Subttl.h>

#include "../broadcast/Broadcast.h"

namespace dvbrx {

// The subtitle codec's default CLUT (dvbmodel::defaultClut) in the buffer's form; id and
// version 0.
const SUBTTL_Clut& defaultClut();

// Writes `set`, shown with presentation time stamp `pts`, into `data`: the counts, the page
// (with its version), the first kSubttlRegions regions with their placements, pixels and
// objects, the first kSubttlCluts CLUTs, the display definition (720x576 and id 0 where the
// set carries none, id 1 where it does) and the default CLUT. A region larger than its buffer
// keeps the rows that fit, and reports that height. Only the records the counts cover are
// written; the pixels past a region's width x height stay as they are.
void fillSubtitleData(const dvbmodel::DisplaySet& set, uint32_t pts, SUBTTL_Data* data);

}  // namespace dvbrx
