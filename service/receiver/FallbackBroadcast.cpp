// A small broadcast of the receiver's own: two satellites, a cable and a terrestrial network,
// radio, television and a scrambled service, names in three character tables, two days of
// events. The receiver plays it until the built-in broadcast takes its place
// (defaultBroadcast() in Receiver.cpp).
#include <string>

#include "Receiver.h"

namespace dvbrx {
namespace {

using namespace dvbmodel;

Component video(uint16_t pid) {
    Component c;
    c.kind = Kind::Video;
    c.pid = pid;
    c.streamType = 0x1B;  // H.264
    c.frameRateMilli = 25000;
    c.width = 1920;
    c.height = 1080;
    return c;
}

Component audio(uint16_t pid, const char* language, bool ac3, const char* name) {
    Component c;
    c.kind = Kind::Audio;
    c.pid = pid;
    c.streamType = ac3 ? 0x06 : 0x03;  // PES private data with an AC-3 descriptor; MPEG audio
    c.language = language;
    c.ac3 = ac3;
    c.componentTag = static_cast<uint8_t>(pid & 0xFF);
    c.name = name;
    return c;
}

// Events every 30 to 90 minutes from two hours before `start` for two days.
std::vector<Event> schedule(int64_t start, uint16_t seed) {
    static const struct {
        const char* title;
        uint8_t content;
    } kGenres[] = {{"News", 0x21},     {"Film", 0x10},    {"Documentary", 0x90},
                   {"Football", 0x43}, {"Concert", 0x60}, {"Weather", 0x20}};
    static const uint32_t kMinutes[] = {30, 45, 60, 90};
    std::vector<Event> events;
    int64_t t = start / 3600 * 3600 - 7200;
    for (uint16_t id = 1; t < start + 2 * 86400; ++id) {
        const auto& genre = kGenres[(id + seed) % 6];
        Event e;
        e.id = id;
        e.start = t;
        e.duration = kMinutes[(id * 7 + seed) % 4] * 60;
        e.language = "eng";
        e.name = std::string(genre.title) + " " + std::to_string(id);
        e.text = "Part " + std::to_string(id) + " of the " + genre.title + " series.";
        e.content = genre.content;
        e.parentalRating = genre.content == 0x10 ? 9 : 0;  // a film: 12 years and over
        if (id % 2 == 0) {
            e.extendedText = "With the people who made it, in their own words.";
            e.items = {{"Director", "A. Smith"}, {"Cast", "B. Jones, C. Brown"}};
        }
        t += e.duration;
        events.push_back(std::move(e));
    }
    return events;
}

Service tv(uint16_t id, const std::string& name, uint16_t lcn, uint16_t base, int64_t start) {
    Service s;
    s.id = id;
    s.type = 0x19;  // HD television
    s.provider = "Fallback";
    s.name = name;
    s.lcn = lcn;
    s.pmtPid = base;
    s.pcrPid = static_cast<uint16_t>(base + 1);
    s.components = {video(base + 1), audio(base + 2, "deu", false, "Stereo"),
                    audio(base + 3, "eng", false, "English"),
                    audio(base + 4, "deu", true, "Dolby Digital")};
    Component sub;
    sub.kind = Kind::Subtitle;
    sub.pid = static_cast<uint16_t>(base + 5);
    sub.streamType = 0x06;
    sub.language = "deu";
    sub.compositionPageId = 1;
    sub.ancillaryPageId = 1;
    Component txt;
    txt.kind = Kind::Teletext;
    txt.pid = static_cast<uint16_t>(base + 6);
    txt.streamType = 0x06;
    txt.language = "deu";
    txt.pages = {{1, 1, 0x00}, {2, 1, 0x50}};
    s.components.push_back(sub);
    s.components.push_back(txt);
    s.events = schedule(start, id);
    return s;
}

Service radio(uint16_t id, const std::string& name, uint16_t lcn, uint16_t base, int64_t start) {
    Service s;
    s.id = id;
    s.type = 0x02;
    s.provider = "Fallback";
    s.name = name;
    s.lcn = lcn;
    s.pmtPid = base;
    s.pcrPid = static_cast<uint16_t>(base + 2);
    s.components = {audio(base + 2, "deu", false, "Stereo")};
    s.events = schedule(start, id);
    return s;
}

Tuning satellite(uint32_t khz, Polarization pol, Fec fec, Modulation mod, int16_t orbital) {
    Tuning t;
    t.delivery = Delivery::Satellite;
    t.frequencyKHz = khz;
    t.symbolRate = 22000000;
    t.polarization = pol;
    t.fec = fec;
    t.modulation = mod;
    t.s2 = mod == Modulation::Psk8;
    t.orbitalPosition = orbital;
    return t;
}

}  // namespace

dvbmodel::Broadcast fallbackBroadcast(int64_t start) {
    Broadcast b;
    b.start = start;

    Network astra{1, "ASTRA 19.2E", Delivery::Satellite, {}};
    Transport t1{1051,
                 1,
                 satellite(11493750, Polarization::Horizontal, Fec::F2_3, Modulation::Psk8, 192),
                 {}};
    t1.services = {tv(10301,
                      "\x15"
                      "Das Erste HD",
                      1, 0x100, start),
                   radio(10302,
                         "\x15"
                         "Deutschlandfunk",
                         101, 0x110, start)};
    Transport t2{1079,
                 1,
                 satellite(12551500, Polarization::Vertical, Fec::F5_6, Modulation::Qpsk, 192),
                 {}};
    t2.services = {tv(28006, "ZDF", 2, 0x200, start), tv(28007, "3sat", 3, 0x210, start)};
    Service pay = tv(28008, "Sky Cinema", 4, 0x220, start);
    pay.scrambled = true;
    pay.caSystems = {0x1702, 0x1833};
    t2.services.push_back(pay);
    astra.transports = {t1, t2};

    Network hotbird{2, "Hot Bird 13E", Delivery::Satellite, {}};
    Transport t3{12400,
                 318,
                 satellite(11766000, Polarization::Horizontal, Fec::F2_3, Modulation::Qpsk, 130),
                 {}};
    t3.tuning.symbolRate = 27500000;
    // ISO/IEC 8859-2: "TVP Łódź".
    t3.services = {tv(5001,
                      "\x10\x00\x02TVP \xA3\xF3"
                      "d\xBC",
                      5, 0x300, start),
                   radio(5002, "Rai Radio 1", 102, 0x310, start)};
    hotbird.transports = {t3};

    Network kabel{3, "Kabel", Delivery::Cable, {}};
    Transport c1{1, 61441, {}, {}};
    c1.tuning.delivery = Delivery::Cable;
    c1.tuning.frequencyKHz = 346000;
    c1.tuning.symbolRate = 6900000;
    c1.tuning.modulation = Modulation::Qam256;
    c1.tuning.fec = Fec::None;
    c1.services = {tv(101, "Kabel Eins", 6, 0x400, start), tv(102, "Arte", 7, 0x410, start)};
    Transport c2 = c1;
    c2.tsid = 2;
    c2.tuning.frequencyKHz = 354000;
    c2.tuning.modulation = Modulation::Qam64;
    // ISO/IEC 8859-5: "Первый канал".
    c2.services = {tv(201, "\x01\xBF\xD5\xE0\xD2\xEB\xD9 \xDA\xD0\xDD\xD0\xDB", 8, 0x500, start),
                   radio(202, "Radio Kabel", 103, 0x510, start)};
    kabel.transports = {c1, c2};

    Network tnt{0x3001, "TNT", Delivery::Terrestrial, {}};
    Transport d1{1, 8442, {}, {}};
    d1.tuning.delivery = Delivery::Terrestrial;
    d1.tuning.frequencyKHz = 586000;
    d1.tuning.bandwidthKHz = 8000;
    d1.tuning.modulation = Modulation::Qam64;
    d1.services = {tv(257, "TF1", 9, 0x600, start), tv(258, "France 2", 10, 0x610, start)};
    Transport d2 = d1;
    d2.tsid = 2;
    d2.tuning.frequencyKHz = 650000;
    d2.services = {tv(513, "France 5", 11, 0x700, start),
                   radio(514, "France Inter", 104, 0x710, start)};
    tnt.transports = {d1, d2};

    b.networks = {astra, hotbird, kabel, tnt};
    return b;
}

}  // namespace dvbrx
