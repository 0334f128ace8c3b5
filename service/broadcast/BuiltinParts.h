// The pieces the built-in broadcast is assembled from; private to service/broadcast/Builtin*.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "broadcast/Broadcast.h"

namespace dvbmodel::builtin {

// Character tables of EN 300 468 annex A used by the built-in names and texts.
enum class Charset : uint8_t {
    Latin,    // table 00 (ISO/IEC 6937, diacritics before their letter), no selector byte
    Greek,    // ISO/IEC 8859-7, selector 0x03
    Turkish,  // ISO/IEC 8859-9, selector 0x05
    Central,  // ISO/IEC 8859-2, selector 0x10 0x00 0x02
    Utf8,     // selector 0x15
};

// UTF-8 text as broadcast bytes: the table's selector, then the text in that table. A
// character the table lacks becomes '?'.
std::string encodeText(Charset table, std::string_view utf8);

// Language of the texts a service carries: its schedule, subtitles and teletext. Other
// languages than German and English localise the news titles only.
enum class Language : uint8_t { German, English, Turkish, Greek, Czech, Italian, Polish };
const char* languageCode(Language language);  // ISO 639-2

// What a service mostly shows, which steers its schedule.
enum class Profile : uint8_t { General, News, Film, Sport, Kids, Knowledge, Radio, Shopping };

// splitmix64: a small generator whose sequence depends on its seed only.
class Prng {
public:
    explicit Prng(uint64_t seed) : state_(seed) {}
    uint64_t next() {
        uint64_t z = (state_ += 0x9E3779B97F4A7C15ull);
        z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9ull;
        z = (z ^ (z >> 27)) * 0x94D049BB133111EBull;
        return z ^ (z >> 31);
    }
    // Uniform enough in [0, n) for the small n used here; n must not be 0.
    uint32_t below(uint32_t n) { return static_cast<uint32_t>(next() % n); }

private:
    uint64_t state_;
};

constexpr int64_t kDaySeconds = 86400;
constexpr int kScheduleDays = 7;

// Seven days of contiguous events from `firstDay` (a UTC midnight), ids from 1. Their running
// status stays 0 (undefined), as in a schedule table: the receiver's clock tells which runs.
std::vector<Event> weekSchedule(uint16_t serviceId, Profile profile, Language language,
                                Charset table, int64_t firstDay);

// One loop of subtitle display sets for the composition page `pageId`, empty without a font.
std::vector<DisplaySet> subtitleLoop(Language language, uint16_t pageId);

// One loop of teletext transmissions for a service called `title` (UTF-8, at most 10
// characters), with the header clock counted from `start`.
std::vector<TeletextPage> teletextLoop(Language language, std::string_view title, int64_t start);

// The subtitle lines of one loop, shared by the DVB subtitles and teletext page 888: line i is
// shown from i * kCueMillis for kCueShownMillis, then cleared.
constexpr int64_t kCueMillis = 6000;
constexpr int64_t kCueShownMillis = 4500;
constexpr int kCues = 20;
// The timed content (display sets, teletext transmissions) repeats every 2 minutes.
constexpr int64_t kLoopMillis = kCues * kCueMillis;
struct Cue {
    const char* first;
    const char* second;  // empty for a one-line subtitle
    bool otherSpeaker;   // shown in the second speaker's colour
};
// kCues lines in German for Language::German, in English for any other language.
const Cue* subtitleCues(Language language);

}  // namespace dvbmodel::builtin
