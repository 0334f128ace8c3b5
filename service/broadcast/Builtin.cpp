// The built-in broadcast: networks, transponders and services, with the schedule, subtitle and
// teletext pieces of BuiltinSchedule.cpp, BuiltinSubtitles.cpp and BuiltinTeletext.cpp.
#include "broadcast/Builtin.h"

#include "broadcast/BuiltinParts.h"

namespace dvbmodel {

namespace {

using builtin::Charset;
using builtin::Language;
using builtin::Profile;

enum Feature : uint8_t {
    kRadio = 1,
    kHd = 2,
    kSubtitles = 4,  // DVB subtitles, with display sets
    kTeletext = 8,   // a teletext magazine, with an initial page and subtitle page 888
    kScrambled = 16,
};

struct ServicePlan {
    uint16_t id;
    uint16_t lcn;
    const char* name;      // UTF-8, encoded in `table`
    const char* provider;  // UTF-8, encoded in `table`
    Charset table;
    Language language;
    Language secondAudio;  // the other language of a television service's audio
    Profile profile;
    uint8_t features;
    const char* teletextTitle;  // UTF-8 header title for kTeletext, at most 10 characters
};

struct TransportPlan {
    uint16_t tsid;
    Tuning tuning;
    std::vector<ServicePlan> services;
};

struct NetworkPlan {
    uint16_t id;  // network id, also the original network id of its transports
    const char* name;
    Delivery delivery;
    std::vector<TransportPlan> transports;
};

Tuning satellite(uint32_t mhz, Polarization polarization, uint32_t ksym, Fec fec, bool s2,
                 int16_t position) {
    Tuning t;
    t.delivery = Delivery::Satellite;
    t.frequencyKHz = mhz * 1000;
    t.symbolRate = ksym * 1000;
    t.polarization = polarization;
    t.fec = fec;
    t.s2 = s2;
    t.modulation = s2 ? Modulation::Psk8 : Modulation::Qpsk;
    t.rolloff = s2 ? Rolloff::R20 : Rolloff::R35;
    t.orbitalPosition = position;
    return t;
}

Tuning cable(uint32_t mhz) {
    Tuning t;
    t.delivery = Delivery::Cable;
    t.frequencyKHz = mhz * 1000;
    t.symbolRate = 6900000;
    t.modulation = Modulation::Qam64;
    t.fec = Fec::None;
    return t;
}

Tuning terrestrial(uint32_t mhz, Modulation modulation) {
    Tuning t;
    t.delivery = Delivery::Terrestrial;
    t.frequencyKHz = mhz * 1000;
    t.bandwidthKHz = 8000;
    t.modulation = modulation;
    t.fec = Fec::F2_3;
    return t;
}

constexpr auto H = Polarization::Horizontal;
constexpr auto V = Polarization::Vertical;
constexpr auto De = Language::German;
constexpr auto En = Language::English;

// Frequencies and transmission parameters are those of Debian's dtv-scan-tables, named at each
// transponder; the services on them are this broadcast's own.
std::vector<NetworkPlan> plan() {
    const char* ard = "Öffentlich-rechtlicher Rundfunk";
    return {
            {0x0001,
             "Astra 19.2°E",
             Delivery::Satellite,
             {
                     // dvb-s/Astra-19.2E: 11362 H 22000 2/3 8PSK DVB-S2
                     {1011,
                      satellite(11362, H, 22000, Fec::F2_3, true, 192),
                      {{0x2801, 1, "Kanal Eins HD", ard, Charset::Latin, De, En, Profile::General,
                        kHd | kSubtitles | kTeletext, "KANAL 1"},
                       {0x2802, 2, "Südwelle HD", ard, Charset::Latin, De, En, Profile::General,
                        kHd | kTeletext, "SÜDWELLE"},
                       {0x2803, 12, "Kinderland", ard, Charset::Latin, De, En, Profile::Kids, 0,
                        nullptr},
                       {0x2804, 101, "Münchner Welle", ard, Charset::Latin, De, De, Profile::Radio,
                        kRadio, nullptr}}},
                     // dvb-s/Astra-1N-19.2E: 11494 H 22000 8PSK DVB-S2 (FEC left to the tuner
                     // there; the transponder carries 2/3)
                     {1093,
                      satellite(11494, H, 22000, Fec::F2_3, true, 192),
                      {{0x2901, 30, "Kino Plus HD", "Abendkino GmbH", Charset::Latin, De, En,
                        Profile::Film, kHd | kScrambled, nullptr},
                       {0x2902, 31, "Sport Arena HD", "Arena Medien", Charset::Latin, De, En,
                        Profile::Sport, kHd, nullptr},
                       {0x2903, 32, "Wissen & Natur", "Arena Medien", Charset::Latin, De, En,
                        Profile::Knowledge, kSubtitles, nullptr},
                       {0x2904, 102, "Radio Klassik", "Arena Medien", Charset::Latin, De, De,
                        Profile::Radio, kRadio, nullptr}}},
             }},
            {0x013E,
             "Hot Bird 13.0°E",
             Delivery::Satellite,
             {
                     // dvb-s/Hotbird-13.0E: 10719 V 27500 3/4 DVB-S
                     {12400,
                      satellite(10719, V, 27500, Fec::F3_4, false, 130),
                      {{0x3101, 40, "Güneş TV", "Güneş Yayıncılık", Charset::Turkish,
                        Language::Turkish, En, Profile::General, 0, nullptr},
                       {0x3102, 41, "Ελλάδα TV", "Ελληνική Ραδιοφωνία", Charset::Greek,
                        Language::Greek, En, Profile::News, 0, nullptr},
                       {0x3103, 42, "Česká Vlna", "Český Přenos", Charset::Central, Language::Czech,
                        En, Profile::Knowledge, 0, nullptr},
                       {0x3104, 140, "Radyo Işık", "Güneş Yayıncılık", Charset::Turkish,
                        Language::Turkish, En, Profile::Radio, kRadio, nullptr}}},
                     // dvb-s/Hotbird-13.0E: 10723 H 29900 3/4 DVB-S
                     {12500,
                      satellite(10723, H, 29900, Fec::F3_4, false, 130),
                      {{0x3201, 50, "World News 24", "Global Broadcast", Charset::Latin, En, De,
                        Profile::News, kSubtitles | kTeletext, "WORLD NEWS"},
                       {0x3202, 51, "Città TV", "Rete Città", Charset::Utf8, Language::Italian, En,
                        Profile::General, 0, nullptr},
                       {0x3203, 52, "Łódź TV", "Telewizja Łódź", Charset::Central, Language::Polish,
                        En, Profile::General, 0, nullptr},
                       {0x3204, 150, "Jazz Radio", "Global Broadcast", Charset::Latin, En, En,
                        Profile::Radio, kRadio, nullptr}}},
             }},
            {0xF001,
             "Kabel Berlin",
             Delivery::Cable,
             {
                     // dvb-c/de-Berlin: 394 MHz 6900 QAM64
                     {1,
                      cable(394),
                      {{0x0101, 1, "Kanal Eins", ard, Charset::Latin, De, En, Profile::General,
                        kTeletext, "KANAL 1"},
                       {0x0102, 20, "Hauptstadt TV", "Spreekanal", Charset::Latin, De, En,
                        Profile::News, 0, nullptr},
                       {0x0103, 120, "Radio Kreuzberg", "Spreekanal", Charset::Latin, De, De,
                        Profile::Radio, kRadio, nullptr}}},
                     // dvb-c/de-Berlin: 466 MHz 6900 QAM64
                     {2,
                      cable(466),
                      {{0x0201, 21, "Spree Kino", "Spreekanal", Charset::Latin, De, En,
                        Profile::Film, 0, nullptr},
                       {0x0202, 22, "Einkaufswelt", "Spreekanal", Charset::Latin, De, En,
                        Profile::Shopping, 0, nullptr}}},
             }},
            {0x2114,
             "Antenne Berlin",
             Delivery::Terrestrial,
             {
                     // dvb-t/de-Berlin: 506 MHz 8 MHz QAM16 2/3
                     {0x0301,
                      terrestrial(506, Modulation::Qam16),
                      {{0x0311, 1, "Kanal Eins", ard, Charset::Latin, De, En, Profile::General,
                        kSubtitles | kTeletext, "KANAL 1"},
                       {0x0312, 3, "Regional Berlin-Brandenburg", ard, Charset::Latin, De, En,
                        Profile::News, 0, nullptr}}},
                     // dvb-t/de-Berlin: 522 MHz 8 MHz QAM16 2/3
                     {0x0302,
                      terrestrial(522, Modulation::Qam16),
                      {{0x0321, 4, "Nachrichten 24", "Stadtfunk", Charset::Latin, De, En,
                        Profile::News, 0, nullptr},
                       {0x0322, 5, "Sport Direkt", "Stadtfunk", Charset::Latin, De, En,
                        Profile::Sport, 0, nullptr}}},
                     // dvb-t/de-Berlin: 570 MHz 8 MHz QAM16 2/3
                     {0x0303,
                      terrestrial(570, Modulation::Qam16),
                      {{0x0331, 6, "Kultur Kanal", "Stadtfunk", Charset::Latin, De, En,
                        Profile::Knowledge, 0, nullptr},
                       {0x0332, 7, "Straßenfeger Radio", "Stadtfunk", Charset::Latin, De, De,
                        Profile::Radio, kRadio, nullptr}}},
             }},
    };
}

// CA systems of the scrambled service, two simulcrypt systems.
const std::vector<uint16_t> kCaSystems = {0x0B00, 0x1702};

// Components of a service whose PIDs start at `base`: the PMT at base, then one PID each.
void addComponents(Service& s, const ServicePlan& p, uint16_t base) {
    const char* lang = builtin::languageCode(p.language);
    s.pmtPid = base;
    uint16_t pid = base + 1;
    uint8_t tag = 1;
    auto add = [&](Kind kind, uint8_t streamType) -> Component& {
        Component c;
        c.kind = kind;
        c.pid = pid++;
        c.streamType = streamType;
        c.componentTag = tag++;
        c.language = lang;
        s.components.push_back(std::move(c));
        return s.components.back();
    };
    if (p.features & kRadio) {
        add(Kind::Audio, 0x03);                   // MPEG-1 audio layer II
        Component& aac = add(Kind::Audio, 0x11);  // HE-AAC in LATM
        aac.name = "AAC";
        s.pcrPid = s.components.front().pid;
        return;
    }
    Component& video = add(Kind::Video, (p.features & kHd) ? 0x1B : 0x02);
    video.language.clear();
    if (p.features & kHd) {
        // 720p50 for the sport channel, 1080i (25 frames) elsewhere.
        const bool progressive = p.profile == Profile::Sport;
        video.width = progressive ? 1280 : 1920;
        video.height = progressive ? 720 : 1080;
        video.frameRateMilli = progressive ? 50000 : 25000;
    } else {
        video.width = 720;
        video.height = 576;
        video.frameRateMilli = 25000;
    }
    s.pcrPid = video.pid;
    add(Kind::Audio, 0x03).name = "Stereo";
    Component& second = add(Kind::Audio, 0x03);
    second.language = builtin::languageCode(p.secondAudio);
    second.name = "Stereo";
    Component& ac3 = add(Kind::Audio, 0x06);
    ac3.ac3 = true;
    ac3.name = "Dolby Digital 5.1";
    if (p.features & kSubtitles) {
        Component& sub = add(Kind::Subtitle, 0x06);
        sub.subtitlingType = (p.features & kHd) ? 0x14 : 0x10;
        sub.compositionPageId = 1;
        sub.ancillaryPageId = 1;
    }
    if (p.features & kTeletext) {
        Component& ttx = add(Kind::Teletext, 0x06);
        ttx.pages = {{1, 1, 0x00}, {2, 8, 0x88}};
    }
}

Service makeService(const ServicePlan& p, uint16_t pidBase, int64_t start, int64_t firstDay) {
    Service s;
    s.id = p.id;
    s.type = (p.features & kRadio) ? 0x02 : (p.features & kHd) ? 0x19 : 0x01;
    s.name = builtin::encodeText(p.table, p.name);
    s.provider = builtin::encodeText(p.table, p.provider);
    s.lcn = p.lcn;
    if (p.features & kScrambled) {
        s.scrambled = true;
        s.caSystems = kCaSystems;
    }
    addComponents(s, p, pidBase);
    s.events = builtin::weekSchedule(p.id, p.profile, p.language, p.table, firstDay);
    if (p.features & kSubtitles) s.subtitles = builtin::subtitleLoop(p.language, 1);
    if (p.features & kTeletext)
        s.teletext = builtin::teletextLoop(p.language, p.teletextTitle, start);
    return s;
}

int64_t floorDay(int64_t t) {
    int64_t day = t / builtin::kDaySeconds;
    if (t % builtin::kDaySeconds < 0) --day;
    return day * builtin::kDaySeconds;
}

}  // namespace

Broadcast builtinBroadcast(int64_t start) {
    Broadcast b;
    b.start = start;
    b.loopMillis = builtin::kLoopMillis;
    const int64_t firstDay = floorDay(start);
    for (const NetworkPlan& np : plan()) {
        Network n;
        n.id = np.id;
        n.name = builtin::encodeText(Charset::Latin, np.name);
        n.delivery = np.delivery;
        for (const TransportPlan& tp : np.transports) {
            Transport t;
            t.tsid = tp.tsid;
            t.onid = np.id;
            t.tuning = tp.tuning;
            uint16_t pidBase = 0x100;
            for (const ServicePlan& sp : tp.services) {
                t.services.push_back(makeService(sp, pidBase, start, firstDay));
                pidBase += 0x100;
            }
            n.transports.push_back(std::move(t));
        }
        b.networks.push_back(std::move(n));
    }
    return b;
}

}  // namespace dvbmodel
