// The broadcast model written as an MPEG transport stream (ISO/IEC 13818-1): one transport of a
// Broadcast over a span of emulated time, with its service information generated through
// libdvbpsi's table and descriptor generators, a PCR on every PCR PID, PES packets with PTS
// on every video and audio PID, the model's subtitle display sets and teletext pages at their
// times. Consecutive spans written with the same state join into one seamless stream.
//
// What goes out, and how often (every table at a fixed phase of UTC, so that where a span
// ends does not change the stream):
//   PAT, PMT of each service      every 100 ms
//   SDT actual / other            every 2 s (other: the network's other transports)
//   NIT actual                    every 2 s (network name; per transport its delivery system,
//                                 service list and logical channel numbers)
//   EIT p/f actual / other        every 2 s
//   EIT schedule actual / other   every 10 s
//   TDT, TOT                      every 5 s
//   PCR                           every 40 ms on each PCR PID
//   video                         one PES per frame at the component's frame rate
//   audio                         one PES per 24 ms frame
//   subtitles, teletext           when the model sends them, within its loop
// Payloads of video and audio are not real pictures or sound: MPEG-2 video frames carry a
// sequence header, H.264 ones an access unit delimiter and a filler unit, MPEG audio frames
// are valid silent layer II frames, others are zeros. Each span's EIT schedule is 8 days from
// the UTC midnight of when it is sent. A state serves the transports of one Broadcast.
#pragma once

#include <array>
#include <cstdint>
#include <vector>

#include "broadcast/Broadcast.h"

struct dvbpsi_s;

namespace dvbmodel {

// What the writer could not put in the stream, since the state was made.
struct TsWriterStats {
    uint32_t sections = 0;            // PSI/SI sections written
    uint32_t sectionsDropped = 0;     // tables the generator refused, schedule sections past 8
    uint32_t displaySetsDropped = 0;  // display sets too large for one PES
    uint32_t itemsDropped = 0;        // event items or text past what the descriptors hold
};

struct TsWriterOptions {
    // A recording of one service of the transport: its PIDs only, with a PAT, an SDT actual
    // of that one program, its PMT, its EIT present/following, the TDT and the TOT; no other
    // table. Null: the whole transport.
    const Service* only = nullptr;
    // Bits per second of each video component's PES payload; at 2 Mbit/s an SD MPEG video
    // frame carries the writer's test card.
    uint32_t videoBitRate = 2000000;
};

// What joins consecutive spans: the continuity counter of every PID and the version of every
// table (a table whose content changes takes the next version).
class TsWriterState {
public:
    TsWriterState();
    ~TsWriterState();
    TsWriterState(const TsWriterState&) = delete;
    TsWriterState& operator=(const TsWriterState&) = delete;

    const TsWriterStats& stats() const { return stats_; }

private:
    friend class TsWriter;
    struct Version {
        uint64_t key;
        uint32_t fingerprint;
        uint8_t version;
    };
    struct Due {
        int64_t at;
        uint16_t kind, service, item;
        uint32_t index;
    };

    dvbpsi_s* psi_;
    std::array<uint8_t, 8192> continuity_{};
    std::vector<Version> versions_;
    std::vector<Due> due_;  // scratch: what a span sends, in time order
    // The test card of each MPEG video PID: PES header room, sequence header, intra picture.
    std::vector<std::pair<uint16_t, std::vector<uint8_t>>> pictures_;
    TsWriterStats stats_;
};

// Appends to `out` the packets of `transport` (of `network`) from UTC `fromUtcMs` for `millis`
// milliseconds. Timed content (display sets, teletext) repeats every `broadcast.loopMillis` from
// `broadcast.start` (seconds); events keep their absolute times.
void writeTransport(const Broadcast& broadcast, const Network& network, const Transport& transport,
                    int64_t fromUtcMs, int64_t millis, std::vector<uint8_t>& out,
                    TsWriterState& state, const TsWriterOptions& options = {});

// The 33-bit 90 kHz system clock of written streams at UTC `utcMs`: the PCR base, and the
// PTS of what is sent at that time less the decoding delay below.
uint64_t tsClockAt(int64_t utcMs);
// How far ahead of the PCR a written PES's PTS lies, in milliseconds.
constexpr int64_t kTsDecodeDelayMs = 300;

}  // namespace dvbmodel
