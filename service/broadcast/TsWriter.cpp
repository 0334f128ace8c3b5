// Writing the broadcast model as a transport stream; see TsWriter.h.
#include "broadcast/TsWriter.h"

// clang-format off
#include <dvbpsi/dvbpsi.h>
#include <dvbpsi/psi.h>
#include <dvbpsi/descriptor.h>
#include <dvbpsi/pat.h>
#include <dvbpsi/pmt.h>
#include <dvbpsi/sdt.h>
#include <dvbpsi/nit.h>
#include <dvbpsi/eit.h>
#include <dvbpsi/tot.h>
#include <dvbpsi/dr.h>
// clang-format on

#include <algorithm>
#include <cstring>
#include <memory>

#include "broadcast/DvbSubtitle.h"

#include "broadcast/DvbTeletext.h"
#include "broadcast/Ts.h"

namespace dvbmodel {
namespace {

constexpr uint16_t kPatPid = 0x0000, kNitPid = 0x0010, kSdtPid = 0x0011, kEitPid = 0x0012,
                   kTdtPid = 0x0014;
constexpr int64_t kAudioFrameMs = 24;
// A silent MPEG-1 layer II frame: 192 kbit/s at 48 kHz is 576 bytes every 24 ms; with every
// bit allocation zero the frame decodes to silence.
constexpr size_t kAudioFrameBytes = 576;
constexpr int64_t kHourMs = 3600000, kDayMs = 24 * kHourMs;
// EIT schedule: 8 days from midnight in segments of 3 hours, 8 sections each, 32 segments per
// table id.
constexpr int kScheduleSegments = 64, kSegmentsPerTable = 32, kSectionsPerSegment = 8;

enum Send : uint16_t {
    kPat,
    kPmt,
    kSdt,
    kSdtOther,
    kNit,
    kEitPf,
    kEitPfOther,
    kEitSchedule,
    kEitScheduleOther,
    kTdt,
    kTot,
    kPcr,
    kVideo,
    kAudio,
    kSubtitle,
    kTeletext,
};

struct Periodic {
    Send kind;
    int64_t period, phase;
};
// Phases spread the tables over their periods instead of sending them all at once.
constexpr Periodic kTables[] = {
        {kPat, 100, 0},
        {kSdt, 2000, 50},
        {kSdtOther, 2000, 1050},
        {kNit, 2000, 70},
        {kEitPf, 2000, 90},
        {kEitPfOther, 2000, 1090},
        {kEitSchedule, 10000, 130},
        {kEitScheduleOther, 10000, 5130},
        {kTdt, 5000, 30},
        {kTot, 5000, 2530},
};

uint8_t bcd(int v) {
    return static_cast<uint8_t>((v / 10) << 4 | v % 10);
}

// `digits` decimal digits of `v`, four bits each.
uint32_t bcdDigits(uint64_t v, int digits) {
    uint32_t out = 0;
    for (int i = 0; i < digits; ++i, v /= 10) out |= static_cast<uint32_t>(v % 10) << (4 * i);
    return out;
}

// EN 300 468 annex C: modified Julian date and BCD time, 40 bits.
uint64_t utcTime(int64_t seconds) {
    int64_t days = seconds >= 0 ? seconds / 86400 : (seconds - 86399) / 86400;
    int64_t rest = seconds - days * 86400;
    uint64_t mjd = static_cast<uint64_t>(days + 40587) & 0xFFFF;
    return mjd << 24 | uint64_t{bcd(static_cast<int>(rest / 3600))} << 16 |
           uint64_t{bcd(static_cast<int>(rest / 60 % 60))} << 8 | bcd(static_cast<int>(rest % 60));
}

uint32_t bcdDuration(uint32_t seconds) {
    // Durations of 100 hours and more do not fit the six digits.
    seconds = std::min<uint32_t>(seconds, 99 * 3600 + 59 * 60 + 59);
    return uint32_t{bcd(static_cast<int>(seconds / 3600))} << 16 |
           uint32_t{bcd(static_cast<int>(seconds / 60 % 60))} << 8 |
           bcd(static_cast<int>(seconds % 60));
}

// Copies at most `room` bytes of `s` into `dst`; returns the count.
template <typename T>
T copyBytes(uint8_t* dst, const std::string& s, size_t room) {
    size_t n = std::min(s.size(), room);
    memcpy(dst, s.data(), n);
    return static_cast<T>(n);
}

void copyLanguage(uint8_t* dst, const std::string& language) {
    const char* code = language.size() >= 3 ? language.data() : "und";
    memcpy(dst, code, 3);
}

// Hands a generated descriptor to a table's adder (which copies it) and frees it.
template <typename Add>
void put(dvbpsi_descriptor_t* d, Add add) {
    if (d == nullptr) return;
    add(d->i_tag, d->i_length, d->p_data);
    dvbpsi_DeleteDescriptors(d);
}

struct SectionsDeleter {
    void operator()(dvbpsi_psi_section_t* s) const { dvbpsi_DeletePSISections(s); }
};
using Sections = std::unique_ptr<dvbpsi_psi_section_t, SectionsDeleter>;

uint32_t fnv(uint32_t h, const uint8_t* p, size_t n) {
    for (size_t i = 0; i < n; ++i) h = (h ^ p[i]) * 16777619u;
    return h;
}

// A section's bytes: a TOT ends with a CRC_32 as the long sections do.
size_t sectionSize(const dvbpsi_psi_section_t* s) {
    bool crc = s->b_syntax_indicator || s->i_table_id == 0x73;
    return static_cast<size_t>(s->p_payload_end - s->p_data) + (crc ? 4 : 0);
}

// Fills one transport packet's header and returns where its payload goes.
uint8_t* packetHeader(std::vector<uint8_t>& out, uint16_t pid, bool start, uint8_t control,
                      uint8_t continuity) {
    out.resize(out.size() + 188);
    uint8_t* p = out.data() + out.size() - 188;
    p[0] = 0x47;
    p[1] = static_cast<uint8_t>((start ? 0x40 : 0) | (pid >> 8 & 0x1F));
    p[2] = static_cast<uint8_t>(pid);
    p[3] = static_cast<uint8_t>(control << 4 | (continuity & 15));
    return p + 4;
}

// A start code after zero bits up to the next byte.
void startCode(BitWriter& w, uint8_t code) {
    w.align();
    for (uint8_t byte : {0x00, 0x00, 0x01}) w.put(byte, 8);
    w.put(code, 8);
}

// An MPEG-2 intra picture (Main profile, 4:2:0, progressive) of flat 16x16 macroblocks, each
// block coded by its DC alone: 75% colour bars over the top two thirds, a band in a colour of
// `hue` (the PID's), a grey ramp at the bottom. The sequence header is the caller's; this writes
// the sequence extension, a closed GOP, the picture and its slices (ISO/IEC 13818-2).
void writeTestCard(std::vector<uint8_t>& out, uint16_t width, uint16_t height, uint16_t hue) {
    // Y, Cb, Cr of white, yellow, cyan, green, magenta, red, blue, black (ITU-R BT.601).
    static constexpr uint8_t kBars[8][3] = {{180, 128, 128}, {162, 44, 142}, {131, 156, 44},
                                            {112, 72, 58},   {84, 184, 198}, {65, 100, 212},
                                            {35, 212, 114},  {16, 128, 128}};
    // dct_dc_size_luminance and _chrominance codes for sizes 0 to 8: code, length.
    static constexpr uint8_t kLuma[9][2] = {{4, 3},  {0, 2},  {1, 2},  {5, 3},  {6, 3},
                                            {14, 4}, {30, 5}, {62, 6}, {126, 7}};
    static constexpr uint8_t kChroma[9][2] = {{0, 2},  {1, 2},  {2, 2},   {6, 3},  {14, 4},
                                              {30, 5}, {62, 6}, {126, 7}, {254, 8}};
    BitWriter w(out);
    startCode(w, 0xB5);  // sequence extension: Main@Main, progressive, 4:2:0, low delay
    w.put(0x1, 4), w.put(0x48, 8), w.put(1, 1), w.put(1, 2), w.put(0, 4), w.put(0, 12);
    w.put(1, 1), w.put(0, 8), w.put(1, 1), w.put(0, 7);
    startCode(w, 0xB8);  // GOP: time code 0 (its marker bit set), closed
    w.put(0, 12), w.put(1, 1), w.put(0, 12), w.put(1, 1), w.put(0, 1);
    startCode(w, 0x00);  // picture: temporal reference 0, intra, vbv_delay unknown
    w.put(0, 10), w.put(1, 3), w.put(0xFFFF, 16), w.put(0, 1);
    startCode(w, 0xB5);  // picture coding extension: frame, DC precision 8 bits, progressive
    w.put(0x8, 4), w.put(0xFFFF, 16), w.put(0, 2), w.put(3, 2), w.put(0, 1), w.put(1, 1);
    w.put(0, 5), w.put(1, 1), w.put(1, 1), w.put(0, 1);
    const int columns = (width + 15) / 16, rows = (height + 15) / 16;
    for (int row = 0; row < rows; ++row) {
        startCode(w, static_cast<uint8_t>(row + 1));
        w.put(8, 5), w.put(0, 1);  // quantiser scale (DC does not use it), no extra
        int predictor[3] = {128, 128, 128};
        for (int column = 0; column < columns; ++column) {
            uint8_t ycc[3];
            if (row * 3 < rows * 2) {
                memcpy(ycc, kBars[column * 8 / columns], 3);
            } else if (row * 6 < rows * 5) {
                ycc[0] = 128, ycc[1] = uint8_t(64 + hue * 37 % 128);
                ycc[2] = uint8_t(64 + hue * 91 % 128);
            } else {
                ycc[0] = uint8_t(16 + column * 219 / std::max(1, columns - 1)), ycc[1] = 128,
                ycc[2] = 128;
            }
            w.put(1, 1), w.put(1, 1);  // the next macroblock, intra
            for (int block = 0; block < 6; ++block) {
                const int c = block < 4 ? 0 : block - 3;
                const int diff = ycc[c] - predictor[c];
                predictor[c] = ycc[c];
                int size = 0;
                while ((std::abs(diff) >> size) != 0) ++size;
                const uint8_t* code = c == 0 ? kLuma[size] : kChroma[size];
                w.put(code[0], code[1]);
                if (size > 0)
                    w.put(static_cast<uint32_t>(diff > 0 ? diff : diff + (1 << size) - 1), size);
                w.put(2, 2);  // end of block
            }
        }
    }
    w.align();
}

int64_t frameTicks(const Component& c) {
    return c.frameRateMilli > 0 ? int64_t{90000} * 1000 / c.frameRateMilli : 3600;
}

}  // namespace

uint64_t tsClockAt(int64_t utcMs) {
    int64_t t = (utcMs * 90) % kPtsWrap;
    return static_cast<uint64_t>(t < 0 ? t + kPtsWrap : t);
}

TsWriterState::TsWriterState() : psi_(dvbpsi_new(nullptr, DVBPSI_MSG_NONE)) {}

TsWriterState::~TsWriterState() {
    if (psi_ != nullptr) dvbpsi_delete(psi_);
}

// One span of one transport.
class TsWriter {
public:
    TsWriter(const Broadcast& b, const Network& n, const Transport& t, std::vector<uint8_t>& out,
             TsWriterState& st, const TsWriterOptions& o)
        : b_(b), net_(n), tp_(t), out_(out), st_(st), opt_(o) {}

    void write(int64_t from, int64_t millis);

private:
    void plan(int64_t from, int64_t to);
    void every(Send kind, uint16_t service, uint16_t item, int64_t period, int64_t phase,
               int64_t from, int64_t to);
    void send(const TsWriterState::Due& d);

    bool included(const Service& s) const { return opt_.only == nullptr || opt_.only == &s; }
    // Sends a table's sections on `pid`, each starting a packet, with the version that its
    // content has under `key` (a new content takes the next version).
    void sendSections(uint16_t pid, dvbpsi_psi_section_t* first, uint64_t key,
                      bool rebuild = false);
    void pat();
    void pmt(const Service& s);
    void sdt(bool actual);
    void nit();
    void eitPf(bool actual, int64_t at);
    void eitSchedule(bool actual, int64_t at);
    void time(bool offset, int64_t at);
    void pcr(uint16_t pid, int64_t at);
    void pes(uint16_t pid, uint8_t streamId, uint64_t pts, size_t payload, const Component& c);
    // One PES packet as transport packets of `pid`, with the PID's counter (see packetizePes).
    void packetize(uint16_t pid, const uint8_t* head, size_t headLen, size_t n, uint8_t fill = 0,
                   uint8_t last = 0);
    void subtitle(const Service& s, uint32_t index, int64_t at);
    void teletext(const Service& s, uint32_t index, int64_t at);
    void addEventDescriptors(dvbpsi_eit_event_t* e, const Event& ev);
    // The EIT sections of `count` events of one service, with that running status.
    Sections eitSections(uint8_t tableId, const Transport& tp, const Service& s,
                         const Event* const* events, size_t count, uint8_t running);

    const Broadcast& b_;
    const Network& net_;
    const Transport& tp_;
    std::vector<uint8_t>& out_;
    TsWriterState& st_;
    const TsWriterOptions& opt_;
};

void TsWriter::every(Send kind, uint16_t service, uint16_t item, int64_t period, int64_t phase,
                     int64_t from, int64_t to) {
    int64_t first = from + ((phase - from) % period + period) % period;
    for (int64_t t = first; t < to; t += period) st_.due_.push_back({t, kind, service, item, 0});
}

void TsWriter::plan(int64_t from, int64_t to) {
    auto& due = st_.due_;
    due.clear();
    // A recording of one service keeps what tells of it: its program, its name, its present
    // and following events and the time.
    bool whole = opt_.only == nullptr;
    for (const auto& table : kTables) {
        if (whole || table.kind == kPat || table.kind == kSdt || table.kind == kEitPf ||
            table.kind == kTdt || table.kind == kTot)
            every(table.kind, 0, 0, table.period, table.phase, from, to);
    }
    for (uint16_t si = 0; si < tp_.services.size(); ++si) {
        const Service& s = tp_.services[si];
        if (!included(s)) continue;
        every(kPmt, si, 0, 100, 10 + 3 * si % 90, from, to);
        if (s.pcrPid < 0x1FFF) every(kPcr, si, 0, 40, 7 * si % 40, from, to);
        for (uint16_t ci = 0; ci < s.components.size(); ++ci) {
            const Component& c = s.components[ci];
            if (c.kind == Kind::Audio) every(kAudio, si, ci, kAudioFrameMs, 5 * ci % 24, from, to);
            if (c.kind != Kind::Video) continue;
            // Frame k at UTC k * frame length exactly, in 90 kHz ticks: the ticks past the
            // millisecond go in `index`, so that 29.97 Hz frames keep their 3003-tick steps.
            int64_t ticks = frameTicks(c);
            for (int64_t k = (from * 90 + ticks - 1) / ticks; k * ticks < to * 90; ++k)
                due.push_back({k * ticks / 90, kVideo, si, ci, uint32_t(k * ticks % 90)});
        }
        // Timed content: sent at start + n * loop + time, n = 0, 1, ... (once without a loop).
        int64_t start = b_.start * 1000, loop = b_.loopMillis;
        auto timed = [&](Send kind, int64_t time, uint32_t index) {
            int64_t t = start + time;
            if (loop > 0 && t < from) t += (from - t + loop - 1) / loop * loop;
            for (; t < to; t += loop) {
                if (t >= from) due.push_back({t, kind, si, 0, index});
                if (loop <= 0) break;
            }
        };
        for (uint32_t i = 0; i < s.subtitles.size(); ++i) timed(kSubtitle, s.subtitles[i].time, i);
        for (uint32_t i = 0; i < s.teletext.size(); ++i) {
            // Pages sent at one moment travel in one PES: the first of them stands for all.
            if (i == 0 || s.teletext[i - 1].time != s.teletext[i].time)
                timed(kTeletext, s.teletext[i].time, i);
        }
    }
    std::stable_sort(due.begin(), due.end(),
                     [](const auto& a, const auto& b) { return a.at < b.at; });
}

void TsWriter::write(int64_t from, int64_t millis) {
    // Without a libdvbpsi handle (no memory) there are no tables: nothing goes out.
    if (millis <= 0 || st_.psi_ == nullptr) return;
    plan(from, from + millis);
    for (const auto& d : st_.due_) send(d);
}

void TsWriter::send(const TsWriterState::Due& d) {
    const Service* s = d.kind >= kPcr || d.kind == kPmt ? &tp_.services[d.service] : nullptr;
    switch (d.kind) {
        case kPat:
            return pat();
        case kPmt:
            return pmt(*s);
        case kSdt:
            return sdt(true);
        case kSdtOther:
            return sdt(false);
        case kNit:
            return nit();
        case kEitPf:
            return eitPf(true, d.at);
        case kEitPfOther:
            return eitPf(false, d.at);
        case kEitSchedule:
            return eitSchedule(true, d.at);
        case kEitScheduleOther:
            return eitSchedule(false, d.at);
        case kTdt:
            return time(false, d.at);
        case kTot:
            return time(true, d.at);
        case kPcr:
            return pcr(s->pcrPid, d.at);
        case kVideo: {
            const Component& c = s->components[d.item];
            size_t bytes =
                    static_cast<size_t>(int64_t{opt_.videoBitRate} * frameTicks(c) / 90000 / 8);
            return pes(c.pid, 0xE0, (tsClockAt(d.at + kTsDecodeDelayMs) + d.index) % kPtsWrap,
                       bytes, c);
        }
        case kAudio: {
            const Component& c = s->components[d.item];
            bool mpeg = c.streamType == 0x03 || c.streamType == 0x04;
            return pes(c.pid, mpeg ? 0xC0 : 0xBD, tsClockAt(d.at + kTsDecodeDelayMs),
                       kAudioFrameBytes, c);
        }
        case kSubtitle:
            return subtitle(*s, d.index, d.at);
        case kTeletext:
            return teletext(*s, d.index, d.at);
    }
}

void TsWriter::sendSections(uint16_t pid, dvbpsi_psi_section_t* first, uint64_t key, bool rebuild) {
    if (first == nullptr) {
        ++st_.stats_.sectionsDropped;
        return;
    }
    // The content's fingerprint leaves out the version bits and the CRC.
    uint32_t h = 2166136261u;
    for (auto* s = first; s != nullptr; s = s->p_next) {
        h = fnv(h, s->p_data, 5);
        h = fnv(h, s->p_data + 6, static_cast<size_t>(s->p_payload_end - s->p_data) - 6);
    }
    auto& versions = st_.versions_;
    auto it = std::find_if(versions.begin(), versions.end(),
                           [key](const auto& v) { return v.key == key; });
    if (it == versions.end()) {
        versions.push_back({key, h, 0});
        it = versions.end() - 1;
    } else if (it->fingerprint != h) {
        it->fingerprint = h;
        it->version = (it->version + 1) & 31;
    }
    uint8_t& cc = st_.continuity_[pid];
    for (auto* s = first; s != nullptr; s = s->p_next) {
        if (s->b_syntax_indicator && (rebuild || s->i_version != it->version)) {
            s->i_version = it->version;
            dvbpsi_BuildPSISection(st_.psi_, s);
        }
        const uint8_t* data = s->p_data;
        size_t n = sectionSize(s), off = 0;
        for (bool start = true; start || off < n; start = false) {
            uint8_t* p = packetHeader(out_, pid, start, 1, cc);
            cc = (cc + 1) & 15;
            size_t room = 184;
            if (start) *p++ = 0, --room;  // pointer field: the section starts right after it
            size_t take = std::min(room, n - off);
            memcpy(p, data + off, take);
            memset(p + take, 0xFF, room - take);
            off += take;
        }
        ++st_.stats_.sections;
    }
}

void TsWriter::pat() {
    dvbpsi_pat_t pat;
    dvbpsi_pat_init(&pat, tp_.tsid, 0, true);
    if (opt_.only == nullptr) dvbpsi_pat_program_add(&pat, 0, kNitPid);
    for (const auto& s : tp_.services) {
        if (included(s)) dvbpsi_pat_program_add(&pat, s.id, s.pmtPid);
    }
    Sections sections(dvbpsi_pat_sections_generate(st_.psi_, &pat, 253));
    dvbpsi_pat_empty(&pat);
    sendSections(kPatPid, sections.get(), uint64_t{0x00} << 48 | (opt_.only ? opt_.only->id : 0));
}

void TsWriter::pmt(const Service& s) {
    dvbpsi_pmt_t pmt;
    dvbpsi_pmt_init(&pmt, s.id, 0, true, s.pcrPid);
    for (uint16_t ca : s.caSystems) {
        dvbpsi_ca_dr_t d{};
        d.i_ca_system_id = ca;
        // The stream carries no ECMs: the CA descriptor points at the null PID.
        d.i_ca_pid = 0x1FFF;
        put(dvbpsi_GenCADr(&d, false),
            [&](uint8_t t, uint8_t l, uint8_t* p) { dvbpsi_pmt_descriptor_add(&pmt, t, l, p); });
    }
    for (const auto& c : s.components) {
        dvbpsi_pmt_es_t* es = dvbpsi_pmt_es_add(&pmt, c.streamType, c.pid);
        if (es == nullptr) continue;
        auto add = [es](uint8_t t, uint8_t l, uint8_t* p) {
            dvbpsi_pmt_es_descriptor_add(es, t, l, p);
        };
        if (c.componentTag != 0) {
            dvbpsi_stream_identifier_dr_t d{c.componentTag};
            put(dvbpsi_GenStreamIdentifierDr(&d, false), add);
        }
        switch (c.kind) {
            case Kind::Audio: {
                if (!c.language.empty()) {
                    dvbpsi_iso639_dr_t d{};
                    d.i_code_count = 1;
                    copyLanguage(d.code[0].iso_639_code, c.language);
                    put(dvbpsi_GenISO639Dr(&d, false), add);
                }
                // libdvbpsi has no generator for the AC-3 (0x6A) and enhanced AC-3 (0x7A)
                // descriptors: their flags byte 0 announces none of the optional fields.
                uint8_t flags = 0;
                if (c.ac3) add(0x6A, 1, &flags);
                if (c.eac3) add(0x7A, 1, &flags);
                break;
            }
            case Kind::Subtitle: {
                dvbpsi_subtitling_dr_t d{};
                d.i_subtitles_number = 1;
                copyLanguage(d.p_subtitle[0].i_iso6392_language_code, c.language);
                d.p_subtitle[0].i_subtitling_type = c.subtitlingType;
                d.p_subtitle[0].i_composition_page_id = c.compositionPageId;
                d.p_subtitle[0].i_ancillary_page_id = c.ancillaryPageId;
                put(dvbpsi_GenSubtitlingDr(&d, false), add);
                break;
            }
            case Kind::Teletext: {
                dvbpsi_teletext_dr_t d{};
                // A component that announces no page gets the initial page of magazine 1.
                const TeletextRef initial{};
                const TeletextRef* refs = c.pages.empty() ? &initial : c.pages.data();
                size_t count = c.pages.empty() ? 1 : c.pages.size();
                for (size_t i = 0; i < count && d.i_pages_number < DVBPSI_TELETEXT_DR_MAX; ++i) {
                    const TeletextRef& ref = refs[i];
                    auto& page = d.p_pages[d.i_pages_number++];
                    copyLanguage(page.i_iso6392_language_code, c.language);
                    page.i_teletext_type = ref.type;
                    // Magazine 8 travels as 0.
                    page.i_teletext_magazine_number = ref.magazine & 7;
                    page.i_teletext_page_number = ref.page;
                }
                put(dvbpsi_GenTeletextDr(&d, false), add);
                break;
            }
            case Kind::Video:
            case Kind::Data:
                break;
        }
    }
    Sections sections(dvbpsi_pmt_sections_generate(st_.psi_, &pmt));
    dvbpsi_pmt_empty(&pmt);
    sendSections(s.pmtPid, sections.get(), uint64_t{0x02} << 48 | s.id);
}

void TsWriter::sdt(bool actual) {
    for (const auto& tp : net_.transports) {
        if ((&tp == &tp_) != actual) continue;
        dvbpsi_sdt_t sdt;
        dvbpsi_sdt_init(&sdt, actual ? 0x42 : 0x46, tp.tsid, 0, true, tp.onid);
        for (const auto& s : tp.services) {
            if (!included(s)) continue;
            dvbpsi_sdt_service_t* entry = dvbpsi_sdt_service_add(&sdt, s.id, !s.events.empty(),
                                                                 !s.events.empty(), 4, s.scrambled);
            if (entry == nullptr) continue;
            auto add = [entry](uint8_t t, uint8_t l, uint8_t* p) {
                dvbpsi_sdt_service_descriptor_add(entry, t, l, p);
            };
            dvbpsi_service_dr_t service{};
            auto* d = &service;
            d->i_service_type = s.type;
            // Provider and name share the descriptor's 255 bytes with its 3 bytes of lengths.
            d->i_service_provider_name_length =
                    copyBytes<uint8_t>(d->i_service_provider_name, s.provider, 126);
            d->i_service_name_length = copyBytes<uint8_t>(d->i_service_name, s.name, 126);
            put(dvbpsi_GenServiceDr(d, false), add);
            if (!s.caSystems.empty()) {
                dvbpsi_ca_identifier_dr_t ca{};
                for (uint16_t id : s.caSystems) {
                    if (ca.i_number < DVBPSI_CA_SYSTEM_ID_DR_MAX)
                        ca.p_system[ca.i_number++].i_ca_system_id = id;
                }
                put(dvbpsi_GenCAIdentifierDr(&ca, false), add);
            }
        }
        Sections sections(dvbpsi_sdt_sections_generate(st_.psi_, &sdt));
        dvbpsi_sdt_empty(&sdt);
        // libdvbpsi writes every SDT as 0x42: the other transports' take their own id.
        for (auto* sec = sections.get(); sec != nullptr; sec = sec->p_next)
            sec->i_table_id = sdt.i_table_id;
        sendSections(kSdtPid, sections.get(), uint64_t{sdt.i_table_id} << 48 | tp.tsid, !actual);
    }
}

void TsWriter::nit() {
    dvbpsi_nit_t nit;
    dvbpsi_nit_init(&nit, 0x40, net_.id, net_.id, 0, true);
    {
        dvbpsi_network_name_dr_t d{};
        d.i_name_length = copyBytes<uint8_t>(d.i_name_byte, net_.name, 255);
        put(dvbpsi_GenNetworkNameDr(&d, false),
            [&](uint8_t t, uint8_t l, uint8_t* p) { dvbpsi_nit_descriptor_add(&nit, t, l, p); });
    }
    for (const auto& tp : net_.transports) {
        dvbpsi_nit_ts_t* ts = dvbpsi_nit_ts_add(&nit, tp.tsid, tp.onid);
        if (ts == nullptr) continue;
        auto add = [ts](uint8_t t, uint8_t l, uint8_t* p) {
            dvbpsi_nit_ts_descriptor_add(ts, t, l, p);
        };
        const Tuning& tu = tp.tuning;
        // Inner FEC codes of EN 300 468 table 35, in the order of the model's Fec.
        static constexpr uint8_t kFecCode[] = {1, 2, 3, 4, 5, 7, 8, 6, 9, 15, 0};
        uint8_t fec = kFecCode[std::min<size_t>(static_cast<size_t>(tu.fec), 10)];
        switch (tu.delivery) {
            case Delivery::Satellite: {
                dvbpsi_sat_deliv_sys_dr_t d{};
                // Frequency in 10 kHz and symbol rate in 100 symbols/s, as BCD digits.
                d.i_frequency = bcdDigits(tu.frequencyKHz / 10, 8);
                int pos = std::abs(tu.orbitalPosition);
                d.i_orbital_position =
                        static_cast<uint16_t>(bcdDigits(static_cast<uint64_t>(pos), 4));
                d.i_west_east_flag = tu.orbitalPosition >= 0 ? 1 : 0;
                d.i_polarization = static_cast<uint8_t>(tu.polarization);
                d.i_roll_off = static_cast<uint8_t>(tu.rolloff);
                d.i_modulation_system = tu.s2 ? 1 : 0;
                d.i_modulation_type = tu.modulation == Modulation::Qpsk    ? 1
                                      : tu.modulation == Modulation::Psk8  ? 2
                                      : tu.modulation == Modulation::Qam16 ? 3
                                                                           : 0;
                d.i_symbol_rate = bcdDigits(tu.symbolRate / 100, 7);
                d.i_fec_inner = fec;
                put(dvbpsi_GenSatDelivSysDr(&d, false), add);
                break;
            }
            case Delivery::Cable: {
                dvbpsi_cable_deliv_sys_dr_t d{};
                // Frequency in 100 Hz as BCD digits; QAM 16..256 are codes 1..5.
                d.i_frequency = bcdDigits(uint64_t{tu.frequencyKHz} * 10, 8);
                int m = static_cast<int>(tu.modulation);
                d.i_modulation = m >= 2 && m <= 6 ? static_cast<uint8_t>(m - 1) : 0;
                d.i_symbol_rate = bcdDigits(tu.symbolRate / 100, 7);
                d.i_fec_outer = 2;  // RS(204/188)
                d.i_fec_inner = fec;
                put(dvbpsi_GenCableDelivSysDr(&d, false), add);
                break;
            }
            case Delivery::Terrestrial: {
                dvbpsi_terr_deliv_sys_dr_t d{};
                d.i_centre_frequency = tu.frequencyKHz * 100;  // in 10 Hz
                d.i_bandwidth = tu.bandwidthKHz == 7000   ? 1
                                : tu.bandwidthKHz == 6000 ? 2
                                : tu.bandwidthKHz == 5000 ? 3
                                                          : 0;
                d.i_priority = 1;
                d.i_time_slice_indicator = 1;  // not used
                d.i_mpe_fec_indicator = 1;     // not used
                d.i_constellation = tu.modulation == Modulation::Qpsk    ? 0
                                    : tu.modulation == Modulation::Qam16 ? 1
                                                                         : 2;
                // Code rates 1/2, 2/3, 3/4, 5/6, 7/8 are 0..4.
                d.i_code_rate_hp_stream = tu.fec <= Fec::F7_8 ? static_cast<uint8_t>(tu.fec) : 2;
                d.i_transmission_mode = 1;  // 8k
                put(dvbpsi_GenTerrDelivSysDr(&d, false), add);
                break;
            }
        }
        dvbpsi_service_list_dr_t services{};
        dvbpsi_lcn_dr_t channels{};
        auto* list = &services;
        auto* lcn = &channels;
        for (const auto& s : tp.services) {
            if (list->i_service_count < 84) {
                list->i_service[list->i_service_count].i_service_id = s.id;
                list->i_service[list->i_service_count++].i_service_type = s.type;
            }
            if (s.lcn != 0 && lcn->i_number_of_entries < 64) {
                auto& e = lcn->p_entries[lcn->i_number_of_entries++];
                e.i_service_id = s.id;
                e.b_visible_service_flag = s.visible;
                e.i_logical_channel_number = s.lcn & 0x3FF;
            }
        }
        // libdvbpsi 1.3 gives its service list descriptor the tag 0x83: it is 0x41.
        dvbpsi_descriptor_t* serviceList = dvbpsi_GenServiceListDr(list, false);
        if (serviceList != nullptr) serviceList->i_tag = 0x41;
        put(serviceList, add);
        if (lcn->i_number_of_entries > 0) put(dvbpsi_GenLCNDr(lcn, false), add);
    }
    Sections sections(dvbpsi_nit_sections_generate(st_.psi_, &nit, 0x40));
    dvbpsi_nit_empty(&nit);
    sendSections(kNitPid, sections.get(), uint64_t{0x40} << 48 | net_.id);
}

void TsWriter::addEventDescriptors(dvbpsi_eit_event_t* e, const Event& ev) {
    auto add = [e](uint8_t t, uint8_t l, uint8_t* p) {
        dvbpsi_eit_event_descriptor_add(e, t, l, p);
    };
    dvbpsi_short_event_dr_t shortDr{};
    auto* shortEvent = &shortDr;
    copyLanguage(shortEvent->i_iso_639_code, ev.language);
    // Name and text share the descriptor's 255 bytes with 5 bytes of language and lengths.
    shortEvent->i_event_name_length = copyBytes<int>(shortEvent->i_event_name, ev.name, 125);
    shortEvent->i_text_length = copyBytes<int>(shortEvent->i_text, ev.text, 125);
    put(dvbpsi_GenShortEventDr(shortEvent, false), add);

    // Extended event descriptors: the items first, then the text, each descriptor within its
    // 255 bytes (6 of them the number, language and lengths); at most 16 descriptors. Written
    // by hand: libdvbpsi 1.3's generator leaves out the length_of_items byte.
    constexpr size_t kRoom = 255 - 6;
    size_t item = 0, text = 0;
    std::array<std::array<uint8_t, 255>, 16> parts;
    std::array<uint8_t, 16> sizes{};
    size_t count = 0;
    while ((item < ev.items.size() || text < ev.extendedText.size()) && count < parts.size()) {
        uint8_t* d = parts[count].data();
        copyLanguage(d + 1, ev.language);
        size_t used = 0;
        for (; item < ev.items.size(); ++item) {
            const Item& it = ev.items[item];
            size_t dl = std::min<size_t>(it.description.size(), 60);
            size_t tl = std::min<size_t>(it.text.size(), 120);
            if (used + 2 + dl + tl > kRoom) break;
            if (dl < it.description.size() || tl < it.text.size()) ++st_.stats_.itemsDropped;
            d[5 + used] = static_cast<uint8_t>(dl);
            memcpy(d + 6 + used, it.description.data(), dl);
            d[6 + used + dl] = static_cast<uint8_t>(tl);
            memcpy(d + 7 + used + dl, it.text.data(), tl);
            used += 2 + dl + tl;
        }
        d[4] = static_cast<uint8_t>(used);
        size_t n =
                item >= ev.items.size() ? std::min(kRoom - used, ev.extendedText.size() - text) : 0;
        d[5 + used] = static_cast<uint8_t>(n);
        memcpy(d + 6 + used, ev.extendedText.data() + text, n);
        text += n;
        sizes[count++] = static_cast<uint8_t>(6 + used + n);
    }
    if (item < ev.items.size() || text < ev.extendedText.size()) ++st_.stats_.itemsDropped;
    for (size_t i = 0; i < count; ++i) {
        parts[i][0] = static_cast<uint8_t>(i << 4 | (count - 1));
        add(0x4E, sizes[i], parts[i].data());
    }

    if (ev.content != 0) {
        dvbpsi_content_dr_t d{};
        d.i_contents_number = 1;
        d.p_content[0].i_type = ev.content;
        put(dvbpsi_GenContentDr(&d, false), add);
    }
    if (ev.parentalRating != 0) {
        dvbpsi_parental_rating_dr_t d{};
        d.i_ratings_number = 1;
        // The model keeps the rating without its country: written for the user-assigned
        // ISO 3166 code "ZZZ".
        d.p_parental_rating[0].i_country_code = 'Z' << 16 | 'Z' << 8 | 'Z';
        d.p_parental_rating[0].i_rating = ev.parentalRating;
        put(dvbpsi_GenParentalRatingDr(&d, false), add);
    }
}

Sections TsWriter::eitSections(uint8_t tableId, const Transport& tp, const Service& s,
                               const Event* const* events, size_t count, uint8_t running) {
    dvbpsi_eit_t eit;
    dvbpsi_eit_init(&eit, tableId, s.id, 0, true, tp.tsid, tp.onid, 0, tableId);
    for (size_t i = 0; i < count; ++i) {
        const Event& ev = *events[i];
        dvbpsi_eit_event_t* e = dvbpsi_eit_event_add(
                &eit, ev.id, utcTime(ev.start), bcdDuration(ev.duration), running, s.scrambled, 0);
        if (e != nullptr) addEventDescriptors(e, ev);
    }
    Sections sections(dvbpsi_eit_sections_generate(st_.psi_, &eit, tableId));
    dvbpsi_eit_empty(&eit);
    return sections;
}

// Renumbers a section group (libdvbpsi numbers each table from 0) and sets the EIT's
// segment_last_section_number and last_table_id; sendSections then rebuilds header and CRC.
static void numberEit(dvbpsi_psi_section_t* s, uint8_t first, uint8_t last, uint8_t segmentLast,
                      uint8_t lastTable) {
    for (uint8_t n = first; s != nullptr; s = s->p_next, ++n) {
        s->i_number = n;
        s->i_last_number = last;
        s->p_data[12] = segmentLast;
        s->p_data[13] = lastTable;
    }
}

static size_t countSections(const dvbpsi_psi_section_t* s) {
    size_t n = 0;
    for (; s != nullptr; s = s->p_next) ++n;
    return n;
}

static uint64_t eitKey(uint8_t tableId, const Transport& tp, const Service& s, int segment) {
    return uint64_t{tableId} << 48 | uint64_t{tp.tsid} << 32 | uint64_t{s.id} << 16 |
           static_cast<uint16_t>(segment);
}

void TsWriter::eitPf(bool actual, int64_t at) {
    int64_t seconds = at / 1000;
    uint8_t tableId = actual ? 0x4E : 0x4F;
    for (const auto& tp : net_.transports) {
        if ((&tp == &tp_) != actual) continue;
        for (const auto& s : tp.services) {
            if (s.events.empty() || !included(s)) continue;
            // Section 0 the present event, section 1 the following; empty where there is none.
            const Event* present = eventAt(s, seconds);
            const Event* following = eventAfter(s, seconds);
            Sections first = eitSections(tableId, tp, s, &present, present ? 1 : 0, 4);
            Sections second = eitSections(tableId, tp, s, &following, following ? 1 : 0, 1);
            if (!first || !second || countSections(first.get()) != 1 ||
                countSections(second.get()) != 1) {
                ++st_.stats_.sectionsDropped;
                continue;
            }
            numberEit(first.get(), 0, 1, 1, tableId);
            numberEit(second.get(), 1, 1, 1, tableId);
            first->p_next = second.release();
            sendSections(kEitPid, first.get(), eitKey(tableId, tp, s, 0xFFFF), true);
        }
    }
}

void TsWriter::eitSchedule(bool actual, int64_t at) {
    int64_t day = at >= 0 ? at / kDayMs : (at - kDayMs + 1) / kDayMs;
    int64_t today = day * kDayMs / 1000;
    uint8_t base = actual ? 0x50 : 0x60;
    struct Group {
        int segment;
        Sections sections;
    };
    std::vector<Group> groups, filled;
    std::vector<const Event*> events;
    for (const auto& tp : net_.transports) {
        if ((&tp == &tp_) != actual) continue;
        for (const auto& s : tp.services) {
            groups.clear();
            for (size_t i = 0; i < s.events.size();) {
                int64_t offset = s.events[i].start - today;
                if (offset < 0 || offset >= int64_t{kScheduleSegments} * 3 * 3600) {
                    ++i;
                    continue;
                }
                int segment = static_cast<int>(offset / (3 * 3600));
                events.clear();
                for (; i < s.events.size() && (s.events[i].start - today) / (3 * 3600) == segment &&
                       s.events[i].start >= today;
                     ++i)
                    events.push_back(&s.events[i]);
                uint8_t tableId = static_cast<uint8_t>(base + segment / kSegmentsPerTable);
                Sections sections = eitSections(tableId, tp, s, events.data(), events.size(), 0);
                if (!sections) {
                    ++st_.stats_.sectionsDropped;
                    continue;
                }
                // A segment holds 8 sections: what the generator made beyond is not sent.
                dvbpsi_psi_section_t* last = sections.get();
                for (int n = 1; n < kSectionsPerSegment && last->p_next != nullptr; ++n)
                    last = last->p_next;
                if (last->p_next != nullptr) {
                    st_.stats_.sectionsDropped +=
                            static_cast<uint32_t>(countSections(last->p_next));
                    dvbpsi_DeletePSISections(last->p_next);
                    last->p_next = nullptr;
                }
                groups.push_back({segment, std::move(sections)});
            }
            if (groups.empty()) continue;
            // A segment without events goes out as one empty section, up to the last segment
            // of its table: a decoder completes a table once every segment below it came.
            filled.clear();
            for (size_t next = 0, seg = 0; next < groups.size(); ++seg) {
                if (groups[next].segment == static_cast<int>(seg)) {
                    filled.push_back(std::move(groups[next++]));
                } else if (groups[next].segment / kSegmentsPerTable ==
                           static_cast<int>(seg) / kSegmentsPerTable) {
                    uint8_t tableId = static_cast<uint8_t>(base + seg / kSegmentsPerTable);
                    Sections empty = eitSections(tableId, tp, s, nullptr, 0, 0);
                    if (empty) filled.push_back({static_cast<int>(seg), std::move(empty)});
                }
            }
            groups.swap(filled);
            // last_section_number of each table: the last section of its last segment.
            std::array<uint8_t, 2> lastNumber{};
            for (const auto& g : groups) {
                lastNumber[g.segment / kSegmentsPerTable] =
                        static_cast<uint8_t>(g.segment % kSegmentsPerTable * kSectionsPerSegment +
                                             countSections(g.sections.get()) - 1);
            }
            uint8_t lastTable =
                    static_cast<uint8_t>(base + groups.back().segment / kSegmentsPerTable);
            for (auto& g : groups) {
                uint8_t tableId = static_cast<uint8_t>(base + g.segment / kSegmentsPerTable);
                auto first =
                        static_cast<uint8_t>(g.segment % kSegmentsPerTable * kSectionsPerSegment);
                numberEit(g.sections.get(), first, lastNumber[g.segment / kSegmentsPerTable],
                          static_cast<uint8_t>(first + countSections(g.sections.get()) - 1),
                          lastTable);
                sendSections(kEitPid, g.sections.get(), eitKey(tableId, tp, s, g.segment), true);
            }
        }
    }
}

void TsWriter::time(bool offset, int64_t at) {
    dvbpsi_tot_t tot;
    dvbpsi_tot_init(&tot, offset ? 0x73 : 0x70, 0, 0, true, utcTime(at / 1000));
    if (offset) {
        // The model's clock is UTC and it knows no region: one offset of 0 for the
        // user-assigned ISO 3166 code "ZZZ" (libdvbpsi makes a TDT of a TOT without one).
        dvbpsi_local_time_offset_dr_t d{};
        d.i_local_time_offsets_number = 1;
        memcpy(d.p_local_time_offset[0].i_country_code, "ZZZ", 3);
        d.p_local_time_offset[0].i_time_of_change = utcTime(0);
        put(dvbpsi_GenLocalTimeOffsetDr(&d, false),
            [&](uint8_t t, uint8_t l, uint8_t* p) { dvbpsi_tot_descriptor_add(&tot, t, l, p); });
    }
    Sections sections(dvbpsi_tot_sections_generate(st_.psi_, &tot));
    dvbpsi_tot_empty(&tot);
    // A TOT ends with a CRC_32 though it has no long section syntax; libdvbpsi 1.3.3 writes
    // neither the CRC nor its 4 bytes in the section length. The buffer has room for them.
    for (auto* s = sections.get(); s != nullptr && offset; s = s->p_next) {
        size_t n = sectionSize(s);
        s->p_data[1] = uint8_t((s->p_data[1] & 0xF0) | (n - 3) >> 8);
        s->p_data[2] = uint8_t(n - 3);
        uint32_t crc = sectionCrc32(s->p_data, n - 4);
        for (int k = 0; k < 4; ++k) s->p_data[n - 4 + k] = uint8_t(crc >> (24 - 8 * k));
    }
    sendSections(kTdtPid, sections.get(), uint64_t{tot.i_table_id} << 48);
}

void TsWriter::pcr(uint16_t pid, int64_t at) {
    // An adaptation field without payload: the continuity counter stays where it is.
    uint8_t* p = packetHeader(out_, pid, false, 2, (st_.continuity_[pid] + 15) & 15);
    uint64_t base = tsClockAt(at);
    p[0] = 183;
    p[1] = 0x10;  // PCR flag
    p[2] = static_cast<uint8_t>(base >> 25);
    p[3] = static_cast<uint8_t>(base >> 17);
    p[4] = static_cast<uint8_t>(base >> 9);
    p[5] = static_cast<uint8_t>(base >> 1);
    p[6] = static_cast<uint8_t>((base & 1) << 7 | 0x7E);  // 6 reserved bits, extension 0
    p[7] = 0;
    memset(p + 8, 0xFF, 184 - 8);
}

void TsWriter::pes(uint16_t pid, uint8_t streamId, uint64_t pts, size_t payload,
                   const Component& c) {
    // The PES header with its PTS, then what the payload starts with; the rest of the payload
    // is one filler byte, written straight into the packets.
    uint8_t head[32] = {0x00, 0x00, 0x01, streamId, 0, 0, 0x84, 0x80, 5};
    writePts(head + 9, pts);
    size_t length = 8 + payload, headLen = 14;
    // Video PES longer than the length field holds say 0: unbounded.
    if (length <= 0xFFFF)
        head[4] = static_cast<uint8_t>(length >> 8), head[5] = static_cast<uint8_t>(length);
    uint8_t fill = 0x00, last = 0x00;
    if (c.kind == Kind::Video && (c.streamType == 0x01 || c.streamType == 0x02) && payload >= 12) {
        // Sequence header: size, aspect ratio 16:9, frame rate code, bit rate in 400 bit/s.
        uint8_t rate = 3;  // 25 Hz unless the component has another rate the header can say
        for (uint8_t code = 1; code < 9; ++code) {
            if (c.frameRateMilli == kMpegFrameRates[code]) rate = code;
        }
        uint32_t w = c.width ? c.width : 720, h = c.height ? c.height : 576;
        uint32_t bits = opt_.videoBitRate / 400;
        const uint8_t seq[12] = {0x00,
                                 0x00,
                                 0x01,
                                 0xB3,
                                 static_cast<uint8_t>(w >> 4),
                                 static_cast<uint8_t>((w & 15) << 4 | (h >> 8 & 15)),
                                 static_cast<uint8_t>(h),
                                 static_cast<uint8_t>(0x30 | rate),
                                 static_cast<uint8_t>(bits >> 10),
                                 static_cast<uint8_t>(bits >> 2),
                                 static_cast<uint8_t>((bits & 3) << 6 | 0x20 | 112 >> 5),
                                 static_cast<uint8_t>((112 & 31) << 3)};  // VBV 112 x 16 kbit
        // Every frame a test card where the bit rate carries one (the PES header goes in front
        // of the card kept for the PID, so that the card is written without a copy of its own).
        auto card = std::find_if(st_.pictures_.begin(), st_.pictures_.end(),
                                 [pid](const auto& p) { return p.first == pid; });
        if (card == st_.pictures_.end() && h <= 2800) {
            std::vector<uint8_t> bytes(14 + sizeof seq);
            memcpy(bytes.data() + 14, seq, sizeof seq);
            writeTestCard(bytes, static_cast<uint16_t>(w), static_cast<uint16_t>(h), c.pid);
            st_.pictures_.emplace_back(pid, std::move(bytes));
            card = st_.pictures_.end() - 1;
        }
        if (card != st_.pictures_.end() && card->second.size() <= 14 + payload) {
            memcpy(card->second.data(), head, 14);
            return packetize(pid, card->second.data(), card->second.size(), 14 + payload);
        }
        memcpy(head + headLen, seq, sizeof seq);
        headLen += sizeof seq;
    } else if (c.kind == Kind::Video && c.streamType == 0x1B && payload >= 12) {
        // An access unit delimiter, then a filler data unit over the rest (0xFF bytes ending
        // with the stop bit): an access unit that a parser walks but that shows nothing.
        const uint8_t aud[] = {0x00, 0x00, 0x00, 0x01, 0x09, 0xF0, 0x00, 0x00, 0x01, 0x0C};
        memcpy(head + headLen, aud, sizeof aud);
        headLen += sizeof aud;
        fill = 0xFF, last = 0x80;
    } else if (c.kind == Kind::Audio && (c.streamType == 0x03 || c.streamType == 0x04) &&
               payload >= 4) {
        // MPEG-1 layer II, no CRC, 192 kbit/s, 48 kHz, stereo.
        const uint8_t mpa[] = {0xFF, 0xFD, 0xA4, 0x00};
        memcpy(head + headLen, mpa, sizeof mpa);
        headLen += sizeof mpa;
    }
    packetize(pid, head, headLen, 14 + payload, fill, last);
}

void TsWriter::packetize(uint16_t pid, const uint8_t* head, size_t headLen, size_t n, uint8_t fill,
                         uint8_t last) {
    packetizePes(pid, head, headLen, n, st_.continuity_[pid], out_, fill, last);
}

void TsWriter::subtitle(const Service& s, uint32_t index, int64_t at) {
    const DisplaySet& set = s.subtitles[index];
    std::vector<uint8_t> pes;  // the same PES for every component of the page: made once
    bool made = false;
    for (const auto& c : s.components) {
        if (c.kind != Kind::Subtitle || c.compositionPageId != set.pageId) continue;
        if (!made) pes = encodeDisplaySet(set, set.pageId, tsClockAt(at + kTsDecodeDelayMs));
        made = true;
        if (pes.empty()) {
            ++st_.stats_.displaySetsDropped;
            continue;
        }
        packetize(c.pid, pes.data(), pes.size(), pes.size());
    }
}

void TsWriter::teletext(const Service& s, uint32_t index, int64_t at) {
    // The pages sent at this moment: from `index` while their time is the same.
    size_t count = 1;
    while (index + count < s.teletext.size() &&
           s.teletext[index + count].time == s.teletext[index].time)
        ++count;
    std::vector<uint8_t> pes;  // the same PES for every teletext component: made once
    bool made = false;
    for (const auto& c : s.components) {
        if (c.kind != Kind::Teletext) continue;
        if (!made)
            pes = encodeTeletextPes(&s.teletext[index], count, tsClockAt(at + kTsDecodeDelayMs));
        made = true;
        if (!pes.empty()) packetize(c.pid, pes.data(), pes.size(), pes.size());
    }
}

void writeTransport(const Broadcast& broadcast, const Network& network, const Transport& transport,
                    int64_t fromUtcMs, int64_t millis, std::vector<uint8_t>& out,
                    TsWriterState& state, const TsWriterOptions& options) {
    TsWriter(broadcast, network, transport, out, state, options).write(fromUtcMs, millis);
}

}  // namespace dvbmodel
