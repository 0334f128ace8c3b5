// The built-in broadcast: what a receiver finds on the air when it is given nothing else to
// read. Satellite transponders at 19.2E and 13.0E, cable and terrestrial multiplexes at real
// frequencies, television (SD and HD) and radio services with names in several character
// tables, a scrambled service, a week of schedule per service, DVB subtitles rendered with a
// real font and teletext magazines.
#pragma once

#include <cstdint>

#include "broadcast/Broadcast.h"

namespace dvbmodel {

// The broadcast as seen from `start` (UTC seconds): its schedules cover the 7 days from
// `start` rounded down to midnight UTC, its display sets and teletext transmissions loop every
// `Broadcast::loopMillis` from `start`. The same `start` always gives the same broadcast; a
// day's schedule does not depend on `start`, only on the day. Without the font file the
// services carry no display sets (their subtitle components stay announced).
Broadcast builtinBroadcast(int64_t start);

}  // namespace dvbmodel
