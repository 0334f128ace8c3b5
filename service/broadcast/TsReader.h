// Reading MPEG transport streams (captures of real broadcasts) into the broadcast model.
//
// The service information is decoded with libdvbpsi (PAT, PMT, NIT, SDT, EIT, TDT/TOT and
// their descriptors); subtitle PIDs go through the DVB subtitle decoder, teletext PIDs to the
// teletext decoder where it is built in. Broadcast input is damaged as a rule: what is sound
// is kept, what is not is dropped and counted in TsReadStats; nothing is read outside the
// capture.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "broadcast/Broadcast.h"
#include "broadcast/DvbSubtitle.h"

namespace dvbmodel {

// What a read dropped, summed over every capture it read.
struct TsReadStats {
    uint64_t packets = 0;             // 188-byte packets walked
    uint32_t syncLosses = 0;          // places where the sync byte was lost and searched again
    uint32_t continuityErrors = 0;    // packets missing before this one on its PID
    uint32_t transportErrors = 0;     // packets flagged with the transport error indicator
    uint32_t crcErrors = 0;           // sections dropped for their CRC_32
    uint32_t tablesDropped = 0;       // contradicting an earlier section, or undecodable
    uint32_t descriptorsDropped = 0;  // length past their loop, or a body that does not parse
    uint32_t eventsDropped = 0;       // EIT events whose start or duration is no valid time
    uint32_t pesDropped = 0;          // subtitle/teletext PES broken by a lost packet
    DvbSubtitleStats subtitles;       // of every subtitle decoder
    uint32_t teletextPesDropped = 0, teletextUnitsDropped = 0, teletextPacketsDropped = 0;
    uint32_t teletextPages = 0;
};

// The counts as one line a person reads, e.g. for a log or a demo's output.
std::string formatTsReadStats(const TsReadStats& stats);

// What one capture tells of the broadcast.
struct TsCapture {
    // The networks its NIT actual and other describe (the actual one first), each with the
    // transports they list, in NIT order. The actual transport is among the actual network's
    // (appended when the NIT does not list it, or under network id = its onid when there is
    // no NIT) with its services; other transports carry what SDT other and EIT other give.
    std::vector<Network> networks;
    size_t actualNetwork = 0, actualTransport = 0;
    bool hasActual = false;  // a PAT or an SDT actual named the capture's transport
    // Per network and transport: the tuning came from a usable delivery system descriptor.
    std::vector<std::vector<bool>> tuned;
    // Per network: its delivery system was named by a delivery system descriptor.
    std::vector<bool> deliveryKnown;
    int64_t firstUtc = 0;    // first TDT or TOT, UTC seconds; 0 when the capture has none
    int64_t durationMs = 0;  // from the PCR, else the PTS, else the TDT/TOT; 0 if none
    int64_t pcrDurationMs = 0, ptsDurationMs = 0, tdtDurationMs = 0;
};

// Reads one capture held in memory. Returns false (with `error` naming `name`) only when the
// data is not a transport stream at all; damage inside one is counted, not an error.
bool readTransportStream(const uint8_t* data, size_t size, const std::string& name, TsCapture& out,
                         std::string& error, TsReadStats& stats);

// Reads the capture file at `path` (mapped, not copied).
bool readTransportStreamFile(const std::string& path, TsCapture& out, std::string& error,
                             TsReadStats& stats);

}  // namespace dvbmodel
