// The broadcast setting: where the receiver's broadcast comes from.
//
//   ""  or "builtin"   the built-in broadcast (builtinBroadcast(start))
//   FILE.ts            one capture: its transport, and every other one its NIT, SDT other and
//                      EIT other describe
//   FOLDER             every *.ts in it, sorted by name, each one transport
//   FILE (other)       a broadcast file: captures with the tuning of the transponder each stands
//                      for, one a line:
//
//     # comments and blank lines are ignored; paths are relative to the broadcast file
//     PATH
//     PATH  terrestrial FREQ_KHZ [BANDWIDTH_KHZ]              (default 8000)
//     PATH  cable       FREQ_KHZ [SYMBOL_RATE] [qam16..qam256] (default 6900000 qam256)
//     PATH  satellite   FREQ_KHZ SYMBOL_RATE h|v|l|r [ORBIT]   (ORBIT like 19.2E, 30.0W;
//                                                               default 19.2E)
//
// Tuning of each transport, first that applies: the broadcast file's line for the capture's own
// transport; the delivery system descriptor of its NIT where usable; else the frequency rule:
// in the order networks and transports were read, each untuned transport takes the lowest free
// frequency of its delivery system (terrestrial: UHF channels from 21 up, 474000 kHz + 8000 kHz
// a channel, 8 MHz; cable: 306000 kHz up in 8000 kHz steps, 6900000 symbols/s, QAM 256;
// satellite: 10714000 kHz up in 20000 kHz steps, 27500000 symbols/s, horizontal, 19.2E).
// A frequency is free when no transport of the same delivery system uses it.
//
// Time: Broadcast.start is the first TDT/TOT UTC of the first capture (in the order read) that
// has one; else the modification time of the first capture's file; else `start`.
// Broadcast.loopMillis is the longest capture's duration (from its PCR, else its PTS, else its
// TDT/TOT; at least to its last display set or teletext page). The same transport read from
// several captures: the capture it is the actual transport of wins over what others tell of it.
#pragma once

#include <cstdint>
#include <string>

#include "broadcast/Broadcast.h"
#include "broadcast/TsReader.h"

namespace dvbmodel {

// Loads the broadcast that `setting` names into `out`. On failure `out` is left empty and
// `error` names the file (and line) at fault. `stats` (may be null) adds up what was dropped.
bool loadBroadcast(const std::string& setting, int64_t start, Broadcast& out, std::string& error,
                   TsReadStats* stats);

// One line of a broadcast file: the capture and the tuning it stands for.
struct BroadcastLine {
    std::string path;  // as written
    bool tuned = false;
    Tuning tuning;
};

// Parses one line (comments and blanks give false with an empty `error`).
bool parseBroadcastLine(const std::string& line, BroadcastLine& out, std::string& error);

}  // namespace dvbmodel
