// The broadcast model: what a receiver can find on the air, as plain data with value
// semantics. It does not care where the broadcast comes from (the built-in broadcast, or
// transport-stream captures read back into it); sources build it and the receiver reads it.
// No threads, no clock, no I/O.
//
// Text is kept as broadcast: bytes that start with their character-table selector where the
// broadcast has one (EN 300 468 annex A), never decoded here.
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

namespace dvbmodel {

enum class Delivery : uint8_t { Satellite, Cable, Terrestrial };

// Codes as the receiver documents them for the API's front-end words (README "Receiver codes").
enum class Polarization : uint8_t { Horizontal = 0, Vertical = 1, Left = 2, Right = 3 };
enum class Modulation : uint8_t {
    Qpsk = 0,
    Psk8 = 1,
    Qam16 = 2,
    Qam32 = 3,
    Qam64 = 4,
    Qam128 = 5,
    Qam256 = 6,
    Auto = 7
};
enum class Fec : uint8_t {
    F1_2 = 0,
    F2_3 = 1,
    F3_4 = 2,
    F5_6 = 3,
    F7_8 = 4,
    F3_5 = 5,
    F4_5 = 6,
    F8_9 = 7,
    F9_10 = 8,
    None = 9,
    Auto = 10
};
enum class Rolloff : uint8_t { R35 = 0, R25 = 1, R20 = 2 };

// How a transponder or multiplex is tuned.
struct Tuning {
    Delivery delivery = Delivery::Terrestrial;
    uint32_t frequencyKHz = 0;  // satellite: the downlink frequency; others: the centre frequency
    uint32_t symbolRate = 0;    // symbols per second (satellite, cable)
    Modulation modulation = Modulation::Auto;
    Fec fec = Fec::Auto;
    Polarization polarization = Polarization::Horizontal;  // satellite
    Rolloff rolloff = Rolloff::R35;                        // satellite
    bool s2 = false;                                       // satellite: DVB-S2
    uint32_t bandwidthKHz = 0;                             // terrestrial: 6000, 7000, 8000
    int16_t orbitalPosition = 0;  // satellite: tenths of a degree, east positive (192 = 19.2E)
};

// One teletext page that a teletext descriptor announces (EN 300 468 6.2.43).
struct TeletextRef {
    uint8_t type = 1;      // 1 initial page, 2 subtitle page, 5 hearing-impaired subtitles
    uint8_t magazine = 1;  // 1..8
    uint8_t page = 0;      // two BCD digits
};

enum class Kind : uint8_t { Video, Audio, Subtitle, Teletext, Data };

// One elementary stream of a service, with what its PMT descriptors say of it.
struct Component {
    Kind kind = Kind::Video;
    uint16_t pid = 0x1FFF;
    uint8_t streamType = 0;  // ISO/IEC 13818-1 table 2-34
    uint8_t componentTag = 0;
    std::string language;            // ISO 639-2 code, three letters, or empty
    bool ac3 = false;                // audio: AC-3 descriptor
    bool eac3 = false;               // audio: enhanced AC-3 descriptor
    uint32_t frameRateMilli = 0;     // video: frames per 1000 seconds (25000 = 25 Hz)
    uint16_t width = 0, height = 0;  // video
    uint8_t subtitlingType = 0x10;   // subtitle: EN 300 468 table 26
    uint16_t compositionPageId = 0, ancillaryPageId = 0;  // subtitle
    std::vector<TeletextRef> pages;                       // teletext
    std::string name;                                     // a name for the track, if it has one
};

// An item of an extended event description: description and text, as broadcast bytes.
struct Item {
    std::string description;
    std::string text;
};

struct Event {
    uint16_t id = 0;
    int64_t start = 0;          // UTC, seconds since 1970
    uint32_t duration = 0;      // seconds
    uint8_t runningStatus = 0;  // EN 300 468 table 6 (4 running, 1 not running)
    std::string language;       // of the descriptors below
    std::string name;           // short event descriptor
    std::string text;
    std::string extendedText;  // extended event descriptors, joined
    std::vector<Item> items;
    uint8_t content = 0;         // first content descriptor nibbles: level 1 << 4 | level 2
    uint8_t parentalRating = 0;  // EN 300 468 rating byte: minimum age - 3, 0 undefined
};

// One CLUT entry as a subtitle stream carries it.
struct ClutEntry {
    uint8_t y = 0, cr = 0, cb = 0, t = 0;
};

struct Clut {
    uint8_t id = 0, version = 0;
    std::array<ClutEntry, 4> c2{};
    std::array<ClutEntry, 16> c4{};
    std::array<ClutEntry, 256> c8{};
};

struct ObjectRef {
    uint16_t id = 0;
    uint8_t type = 0;  // 0 bitmap, 1 character, 2 string of characters
    uint16_t x = 0, y = 0;
    uint8_t foreground = 0, background = 0;
    std::vector<uint16_t> text;  // character objects: the codes their object data carried
};

struct Region {
    uint8_t id = 0, version = 0;
    uint16_t width = 0, height = 0;
    uint8_t levelOfCompatibility = 1, depth = 2;  // EN 300 743 codes: depth 1 = 2 bit, 2 = 4, 3 = 8
    uint8_t clutId = 0;
    bool fill = false;  // filled with the background code of its depth when composed
    uint8_t background8 = 0, background4 = 0, background2 = 0;
    std::vector<uint8_t> pixels;  // width * height CLUT indexes, row by row
    std::vector<ObjectRef> objects;
};

struct RegionRef {
    uint8_t id = 0;
    uint16_t x = 0, y = 0;
};

// A complete subtitle display set as a decoder holds it after its end-of-display-set segment.
struct DisplaySet {
    int64_t time = 0;     // milliseconds from the start of the broadcast's loop
    uint64_t pts = 0;     // 90 kHz presentation time stamp (33 bits) where a stream gave one
    uint16_t pageId = 0;  // composition page id
    // Page composition: time-out in seconds, version, state (0 normal case, 1 acquisition
    // point, 2 mode change).
    uint8_t timeout = 0, version = 0, state = 0;
    std::vector<RegionRef> placements;
    std::vector<Region> regions;  // every region of the epoch, placed on the page or not
    std::vector<Clut> cluts;      // the CLUTs that the epoch defined (others: the default CLUT)
    bool hasDisplay = false;
    uint8_t displayVersion = 0;
    uint16_t displayWidth = 720, displayHeight = 576;
    bool windowed = false;
    uint16_t windowX = 0, windowY = 0, windowMaxX = 0, windowMaxY = 0;
};

// One teletext page (a subpage of it) at level 1: 25 rows of 40 characters as transmitted
// (7 bits, parity removed; spacing attributes as their control codes), row 0 the header:
// columns 0..7 blank where the header packet carries its address (a decoder shows the page
// number there), columns 8..39 the 32 characters it carries, ending with the clock "hh:mm:ss"
// as of the transmission (a receiver stamps its own clock there, as a broadcaster does).
// The page list is a sequence of transmissions: a transmission stays the current version of its
// number and subcode until a later one of the same number and subcode; a decoder that shows a
// number shows the subpage transmitted last. Rotating subpages are so many transmissions.
// TeletextPage::charset where the broadcast designates no character set.
constexpr uint8_t kNoCharset = 0xFF;

struct TeletextPage {
    int64_t time = 0;  // milliseconds from the start of the broadcast's loop: when it is sent
    uint16_t number = 0x100;  // magazine * 0x100 + page, in BCD: 0x100 .. 0x8FF
    uint16_t subcode = 0;
    uint16_t controlBits = 0;  // C4 .. C14 as bits 4 .. 14 (C11 serial, C12..C14 national option)
    std::array<std::array<uint8_t, 40>, 25> rows{};
    std::array<uint16_t, 6> links{};  // FLOF links: red, green, yellow, cyan, next, index (0: none)
    // Default G0/G2 character set designation of the page's X/28/0 or its magazine's M/29/0
    // (7 bits: character set group, then C12..C14's national option), where one is sent.
    uint8_t charset = kNoCharset;
};

// An EIT schedule section as a broadcast carried it for a service: its table (0x50..0x6F),
// number and version, and the events it listed, by id (Service::events holds them).
struct EitSection {
    uint8_t tableId = 0x50, number = 0, version = 0;
    std::vector<uint16_t> events;
};

// The frame rates of an MPEG video sequence header's frame_rate_code 1 to 8 (ISO/IEC 13818-2),
// in frames per 1000 seconds as Component::frameRateMilli holds them.
inline constexpr uint32_t kMpegFrameRates[9] = {0,     23976, 24000, 25000, 29970,
                                                30000, 50000, 59940, 60000};

// What the rows and control bits of a TeletextPage hold, at level 1.
namespace ttx {
// Spacing attributes: alphanumeric colours 0x01..0x07, mosaic colours 0x11..0x17, and these.
enum : uint8_t {
    kRed = 0x01,
    kGreen = 0x02,
    kYellow = 0x03,
    kBlue = 0x04,
    kMagenta = 0x05,
    kCyan = 0x06,
    kWhite = 0x07,
    kFlash = 0x08,
    kSteady = 0x09,
    kEndBox = 0x0A,
    kStartBox = 0x0B,
    kNormalSize = 0x0C,
    kDoubleHeight = 0x0D,
    kMosaicRed = 0x11,
    kMosaicGreen = 0x12,
    kMosaicYellow = 0x13,
    kMosaicBlue = 0x14,
    kMosaicCyan = 0x16,
    kMosaicWhite = 0x17,
    kConceal = 0x18,
    kContiguous = 0x19,
    kSeparated = 0x1A,
    kBlackBackground = 0x1C,
    kNewBackground = 0x1D,
    kHold = 0x1E,
    kRelease = 0x1F,
};
// Control bits C4..C7 and C11 as TeletextPage::controlBits holds them.
constexpr uint16_t kErasePage = 1 << 4, kNewsflash = 1 << 5, kSubtitle = 1 << 6,
                   kSuppressHeader = 1 << 7, kSerial = 1 << 11;
}  // namespace ttx

struct Service {
    uint16_t id = 0;
    uint8_t type = 1;  // EN 300 468 table 87: 1 television, 2 radio, 0x19 HD television ...
    std::string provider, name;
    uint16_t lcn = 0;  // logical channel number, 0 if none
    bool visible = true;
    bool scrambled = false;           // free_CA_mode
    std::vector<uint16_t> caSystems;  // CA system ids
    uint16_t pmtPid = 0, pcrPid = 0x1FFF;
    std::vector<Component> components;
    std::vector<Event> events;            // by start time; the clock tells present and following
    std::vector<EitSection> eitSections;  // as received, where a capture carried a schedule
    std::vector<DisplaySet> subtitles;    // of its subtitle components, in time order
    std::vector<TeletextPage> teletext;   // of its teletext component, in time order
};

struct Transport {
    uint16_t tsid = 0, onid = 0;
    Tuning tuning;
    std::vector<Service> services;
};

struct Network {
    uint16_t id = 0;
    std::string name;  // network name descriptor
    Delivery delivery = Delivery::Terrestrial;
    std::vector<Transport> transports;
};

// The event of `service` running at UTC `seconds` (the first listed that covers it), and the
// one that starts next after `seconds`; null where there is none.
inline const Event* eventAt(const Service& service, int64_t seconds) {
    for (const auto& e : service.events) {
        if (e.start <= seconds && seconds < e.start + static_cast<int64_t>(e.duration)) return &e;
    }
    return nullptr;
}
inline const Event* eventAfter(const Service& service, int64_t seconds) {
    const Event* next = nullptr;
    for (const auto& e : service.events) {
        if (e.start > seconds && (next == nullptr || e.start < next->start)) next = &e;
    }
    return next;
}

struct Broadcast {
    std::vector<Network> networks;
    int64_t start = 0;  // UTC at the start of the broadcast's loop
    // Length of one loop of the timed content (display sets, teletext transmissions), which
    // repeats from the start of the loop; 0 for no loop. Events keep their absolute times.
    int64_t loopMillis = 0;
};

}  // namespace dvbmodel
