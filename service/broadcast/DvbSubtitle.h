// DVB subtitles (EN 300 743) in both directions: a decoder that turns the PES packets of one
// subtitle PID into complete display sets of the broadcast model, and an encoder that writes a
// display set back as one PES packet.
//
// Broadcast data is damaged as a rule: the decoder keeps every segment that parses, drops
// what does not (and counts it in DvbSubtitleStats), and never reads or writes outside the
// buffer it is given or the region it draws into.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "broadcast/Broadcast.h"

namespace dvbmodel {

// What the decoder kept and dropped since it was made.
struct DvbSubtitleStats {
    uint32_t pes = 0;              // PES packets fed
    uint32_t pesDropped = 0;       // not a subtitle PES, or a header that does not parse
    uint32_t segments = 0;         // segments of the decoder's pages that were applied
    uint32_t segmentsDropped = 0;  // truncated, broken sync, unknown type, body out of bounds
    uint32_t objectsDropped = 0;   // object data whose field blocks do not fit their segment
    uint32_t regionsDropped = 0;   // regions larger than the decoder keeps
    uint32_t runsClipped = 0;      // pixel runs cut at the edge of their region
    uint32_t stringsDropped = 0;   // pixel strings deeper than their region
    uint32_t missingCluts = 0;     // placed regions shown with the default CLUT: theirs is absent
    uint32_t displaySets = 0;      // display sets emitted
};

// The CLUT that a region uses when its own was never defined, and the start of every CLUT
// of an epoch: the default contents of the 4-, 16- and 256-entry tables, computed from the RGB
// and transparency levels that EN 300 743 gives them (T 0 opaque .. 255 transparent). Fully
// transparent entries read Y 0, Cr 128, Cb 128, T 255.
const Clut& defaultClut();

// Decodes the PES packets of one subtitle PID for one composition page and its ancillary
// page. Segments of other pages are skipped.
//
// Epochs: a page composition in the state mode change or acquisition point starts a new
// epoch (regions, CLUTs, objects and versions forgotten); a normal case updates the epoch,
// also before any epoch started. A page, region, CLUT, object or display definition whose
// version equals the one applied is not applied again.
//
// A display set is emitted (with the PTS of the PES that carried its page composition, and
// `time` that PTS in milliseconds) at its end-of-display-set segment, or when the next page
// composition arrives first. It holds every region of the epoch with its pixels composed
// (background fill, then the objects drawn at their positions) and the CLUTs the epoch
// defined. Page time-out: the decoder has no clock; it reports the page's time-out in the
// display set, and the receiver removes the page when `timeout` seconds have passed after
// its presentation without a newer display set.
class DvbSubtitleDecoder {
public:
    DvbSubtitleDecoder(uint16_t compositionPageId, uint16_t ancillaryPageId);

    // One PES packet, header included. Display sets completed by it are appended to `out`.
    void feed(const uint8_t* pes, size_t size, std::vector<DisplaySet>& out);

    const DvbSubtitleStats& stats() const { return stats_; }

private:
    struct ObjectVersion {
        uint16_t id;
        uint8_t version;
    };

    void segment(uint8_t type, const uint8_t* p, size_t n, std::vector<DisplaySet>& out);
    bool pageComposition(const uint8_t* p, size_t n, std::vector<DisplaySet>& out);
    bool regionComposition(const uint8_t* p, size_t n);
    bool clutDefinition(const uint8_t* p, size_t n);
    bool objectData(const uint8_t* p, size_t n);
    bool displayDefinition(const uint8_t* p, size_t n);
    void drawObject(Region& r, const ObjectRef& o, const uint8_t* top, size_t topSize,
                    const uint8_t* bottom, size_t bottomSize, bool nonModifying);
    void drawField(Region& r, int x0, int y0, const uint8_t* p, size_t n, bool nonModifying);
    void emit(std::vector<DisplaySet>& out);
    void newEpoch();

    uint16_t composition_, ancillary_;
    bool pending_ = false;   // a page composition came, its display set is not emitted yet
    bool havePage_ = false;  // a page composition of the epoch was applied
    uint64_t pts_ = 0;       // of the PES being fed
    DisplaySet set_;         // the epoch as composed so far
    std::vector<ObjectVersion> objects_;
    size_t pixelsHeld_ = 0;
    DvbSubtitleStats stats_;
};

// One display set as a PES packet (header with `pts`, then data identifier 0x20, subtitle
// stream 0: display definition, page composition, region compositions, CLUT definitions,
// object data, end of display set, and the end-of-data marker 0xFF), every segment on page
// `pageId`. The page state, versions and time-out are the display set's own.
//
// Regions travel as their pixels: each region's pixels go as one bitmap object placed at
// (0, 0) and covering it, run-length coded in the region's depth, both fields. That object
// takes the id of a bitmap object the region places at (0, 0), or else 0xFF00 + the region
// id; the region's other object placements are not written (their pixels are in the
// region's). A CLUT's tables that its regions use are written whole, of its other tables the
// entries that differ from the default CLUT; each entry in the reduced range where that keeps
// its value exactly, in the full range otherwise. A display set that does not fit (a segment
// or the PES over 65535 bytes) gives an empty result.
std::vector<uint8_t> encodeDisplaySet(const DisplaySet& set, uint16_t pageId, uint64_t pts);

}  // namespace dvbmodel
