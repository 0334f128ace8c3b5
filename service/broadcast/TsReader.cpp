#include "broadcast/TsReader.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <map>
#include <memory>
#include <tuple>

// libdvbpsi's headers are not wrapped for C++, and each needs the ones before it: the core
// first, then the table and descriptor headers.
#include <stdbool.h>
#include <stdint.h>
extern "C" {
#include <dvbpsi/dvbpsi.h>

#include <dvbpsi/descriptor.h>
#include <dvbpsi/psi.h>

#include <dvbpsi/demux.h>
#include <dvbpsi/dr_09.h>
#include <dvbpsi/dr_0a.h>
#include <dvbpsi/dr_40.h>
#include <dvbpsi/dr_43.h>
#include <dvbpsi/dr_44.h>
#include <dvbpsi/dr_48.h>
#include <dvbpsi/dr_4d.h>
#include <dvbpsi/dr_4e.h>
#include <dvbpsi/dr_52.h>
#include <dvbpsi/dr_53.h>
#include <dvbpsi/dr_54.h>
#include <dvbpsi/dr_55.h>
#include <dvbpsi/dr_56.h>
#include <dvbpsi/dr_59.h>
#include <dvbpsi/dr_5a.h>
#include <dvbpsi/dr_83.h>
#include <dvbpsi/eit.h>
#include <dvbpsi/nit.h>
#include <dvbpsi/pat.h>
#include <dvbpsi/pmt.h>
#include <dvbpsi/sdt.h>
#include <dvbpsi/tot.h>
}

#include "broadcast/DvbTeletext.h"
#include "broadcast/DvbText.h"
#include "broadcast/Ts.h"

namespace dvbmodel {

namespace {

constexpr size_t kPacket = 188;
constexpr uint8_t kSync = 0x47;

// PIDs of the DVB service information.
constexpr uint16_t kPidPat = 0x0000, kPidNit = 0x0010, kPidSdt = 0x0011, kPidEit = 0x0012,
                   kPidTdt = 0x0014;

using Key3 = std::tuple<uint16_t, uint16_t, uint16_t>;  // onid, tsid, sid

// A position where the stream locks: a sync byte there and at the next two packets, as far
// as the data goes (at least one whole packet).
size_t findSync(const uint8_t* d, size_t size, size_t from) {
    for (size_t p = from; p + kPacket <= size; ++p) {
        if (d[p] != kSync) continue;
        if (p + kPacket < size && d[p + kPacket] != kSync) continue;
        if (p + 2 * kPacket < size && d[p + 2 * kPacket] != kSync) continue;
        return p;
    }
    return size;
}

// BCD digits of `v` (low `digits` nibbles) as a number, -1 when a nibble is no digit.
int64_t bcd(uint64_t v, int digits) {
    int64_t n = 0;
    for (int i = digits - 1; i >= 0; --i) {
        const unsigned d = (v >> (4 * i)) & 0xF;
        if (d > 9) return -1;
        n = n * 10 + d;
    }
    return n;
}

// 40-bit MJD + BCD hh:mm:ss to UTC seconds; -1 when it is no time.
int64_t mjdUtc(uint64_t t) {
    const int64_t mjd = (t >> 24) & 0xFFFF;
    const int64_t h = bcd(t >> 16 & 0xFF, 2), m = bcd(t >> 8 & 0xFF, 2), s = bcd(t & 0xFF, 2);
    if (h < 0 || m < 0 || s < 0 || h > 23 || m > 59 || s > 60) return -1;
    return (mjd - 40587) * 86400 + h * 3600 + m * 60 + s;
}

int64_t bcdSeconds(uint32_t d) {
    const int64_t h = bcd(d >> 16 & 0xFF, 2), m = bcd(d >> 8 & 0xFF, 2), s = bcd(d & 0xFF, 2);
    if (h < 0 || m < 0 || s < 0 || m > 59 || s > 59) return -1;
    return h * 3600 + m * 60 + s;
}

// Appends a chunk of text that continues `to`; a chunk repeating the selector `to` starts with
// gives its characters only, so the joined text keeps one selector.
void appendText(std::string& to, const uint8_t* p, size_t n) {
    const std::string_view chunk(reinterpret_cast<const char*>(p), n);
    const size_t sel = selectorLength(to);
    to.append(sel != 0 && chunk.substr(0, sel) == std::string_view(to).substr(0, sel)
                      ? chunk.substr(sel)
                      : chunk);
}

std::string bytes(const uint8_t* p, size_t n) {
    return std::string(reinterpret_cast<const char*>(p), n);
}

std::string language(const uint8_t code[3]) {
    if (code[0] == 0 && code[1] == 0 && code[2] == 0) return {};
    return std::string(reinterpret_cast<const char*>(code), 3);
}

template <typename Fn>
void eachDescriptor(dvbpsi_descriptor_t* d, Fn fn) {
    for (; d != nullptr; d = d->p_next) fn(d);
}

// Descriptors whose bytes add up to less than their loop's length: libdvbpsi stops at the first
// one whose length runs past the loop, and leaves it out.
bool loopShort(dvbpsi_descriptor_t* d, uint16_t loopLength) {
    size_t sum = 0;
    eachDescriptor(d, [&](dvbpsi_descriptor_t* x) { sum += 2 + x->i_length; });
    return sum < loopLength;
}

// What a delivery system descriptor says; `usable` is false where a receiver cannot tune it
// (frequency 0, all ones, not a BCD number, or out of the band of its delivery system).
struct DeliveryInfo {
    bool present = false, usable = false;
    Tuning tuning;
};

Fec fecInner(uint8_t code) {
    static constexpr Fec kFec[] = {Fec::Auto, Fec::F1_2, Fec::F2_3, Fec::F3_4, Fec::F5_6,
                                   Fec::F7_8, Fec::F8_9, Fec::F3_5, Fec::F4_5, Fec::F9_10};
    return code < std::size(kFec) ? kFec[code] : code == 15 ? Fec::None : Fec::Auto;
}

DeliveryInfo deliveryOf(dvbpsi_descriptor_t* d, uint32_t& dropped) {
    DeliveryInfo info;
    Tuning& t = info.tuning;
    if (d->i_tag == 0x43) {
        auto* s = dvbpsi_DecodeSatDelivSysDr(d);
        if (s == nullptr) return ++dropped, info;
        info.present = true;
        t.delivery = Delivery::Satellite;
        const int64_t f = bcd(s->i_frequency, 8), sr = bcd(s->i_symbol_rate, 7);
        const int64_t orbit = bcd(s->i_orbital_position, 4);
        t.frequencyKHz = f < 0 ? 0 : uint32_t(f * 10);   // units of 10 kHz
        t.symbolRate = sr < 0 ? 0 : uint32_t(sr * 100);  // units of 100 symbols/s
        t.orbitalPosition = int16_t((orbit < 0 ? 0 : orbit) * (s->i_west_east_flag ? 1 : -1));
        t.polarization = Polarization(s->i_polarization & 3);
        t.s2 = s->i_modulation_system != 0;
        t.rolloff = s->i_roll_off == 1   ? Rolloff::R25
                    : s->i_roll_off == 2 ? Rolloff::R20
                                         : Rolloff::R35;
        t.modulation = s->i_modulation_type == 1   ? Modulation::Qpsk
                       : s->i_modulation_type == 2 ? Modulation::Psk8
                       : s->i_modulation_type == 3 ? Modulation::Qam16
                                                   : Modulation::Auto;
        t.fec = fecInner(s->i_fec_inner);
        // Ku band and C band downlinks.
        info.usable = ((t.frequencyKHz >= 10700000 && t.frequencyKHz <= 12750000) ||
                       (t.frequencyKHz >= 3400000 && t.frequencyKHz <= 4200000)) &&
                      t.symbolRate != 0;
    } else if (d->i_tag == 0x44) {
        auto* c = dvbpsi_DecodeCableDelivSysDr(d);
        if (c == nullptr) return ++dropped, info;
        info.present = true;
        t.delivery = Delivery::Cable;
        const int64_t f = bcd(c->i_frequency, 8), sr = bcd(c->i_symbol_rate, 7);
        t.frequencyKHz = f < 0 ? 0 : uint32_t(f / 10);  // units of 100 Hz
        t.symbolRate = sr < 0 ? 0 : uint32_t(sr * 100);
        t.modulation = c->i_modulation >= 1 && c->i_modulation <= 5
                               ? Modulation(uint8_t(Modulation::Qam16) + c->i_modulation - 1)
                               : Modulation::Auto;
        t.fec = fecInner(c->i_fec_inner);
        info.usable = t.frequencyKHz >= 47000 && t.frequencyKHz <= 1002000 && t.symbolRate != 0;
    } else if (d->i_tag == 0x5A) {
        auto* r = dvbpsi_DecodeTerrDelivSysDr(d);
        if (r == nullptr) return ++dropped, info;
        info.present = true;
        t.delivery = Delivery::Terrestrial;
        // Units of 10 Hz; 0xFFFFFFFF (what some networks send) lands out of band below.
        t.frequencyKHz = r->i_centre_frequency / 100;
        t.bandwidthKHz = r->i_bandwidth <= 3 ? 8000 - 1000 * r->i_bandwidth : 8000;
        t.modulation = r->i_constellation == 0   ? Modulation::Qpsk
                       : r->i_constellation == 1 ? Modulation::Qam16
                       : r->i_constellation == 2 ? Modulation::Qam64
                                                 : Modulation::Auto;
        t.fec = r->i_code_rate_hp_stream <= 4 ? fecInner(r->i_code_rate_hp_stream + 1) : Fec::Auto;
        // VHF band III to the top of UHF.
        info.usable = t.frequencyKHz >= 174000 && t.frequencyKHz <= 862000;
    }
    return info;
}

struct NitTransport {
    uint16_t tsid = 0, onid = 0;
    DeliveryInfo delivery;
};

struct NitNetwork {
    uint16_t id = 0;
    std::string name;
    bool actual = false;
    bool deliveryKnown = false;
    Delivery delivery = Delivery::Terrestrial;
    std::vector<NitTransport> transports;
};

struct Lcn {
    uint16_t number = 0;
    bool visible = true;
};

// The sections of one PID, reassembled from its packets. libdvbpsi 1.3.3 mis-reads a section
// whose 3-byte header straddles two packets (it then reports a bad CRC and loses the section
// and often the next), so sections are assembled and CRC-checked here and handed to libdvbpsi
// one at a time, each starting a packet of its own.
class SectionAssembler {
public:
    // The payload of one packet; `lost` when packets before it are missing or damaged.
    template <typename Fn>
    void feed(const uint8_t* p, size_t n, bool start, bool lost, Fn&& section) {
        if (lost) active_ = false, buf_.clear();
        if (start) {
            if (n == 0) return;
            const size_t pointer = p[0];
            if (pointer + 1 > n) return void(active_ = false);
            if (active_) append(p + 1, pointer, section);
            buf_.clear();
            active_ = true;
            append(p + 1 + pointer, n - 1 - pointer, section);
        } else if (active_) {
            append(p, n, section);
        }
    }

private:
    template <typename Fn>
    void append(const uint8_t* p, size_t n, Fn& section) {
        buf_.insert(buf_.end(), p, p + n);
        size_t at = 0;
        while (active_ && buf_.size() - at >= 3) {
            // Stuffing after the last section of the packet.
            if (buf_[at] == 0xFF) {
                active_ = false;
                break;
            }
            const size_t len = 3 + ((buf_[at + 1] & 0x0F) << 8 | buf_[at + 2]);
            // Sections are at most 4096 bytes long: a longer length is damage.
            if (len > 4096) {
                active_ = false;
                break;
            }
            if (buf_.size() - at < len) break;
            section(buf_.data() + at, len);
            at += len;
        }
        buf_.erase(buf_.begin(), buf_.begin() + std::min(at, buf_.size()));
        if (!active_) buf_.clear();
    }

    bool active_ = false;
    std::vector<uint8_t> buf_;
};

class Reader;
thread_local Reader* tReader = nullptr;  // the reader whose packets libdvbpsi is decoding

// libdvbpsi's callbacks carry one pointer, which its demultiplexer takes for itself; the
// reader that pushes packets sets tReader around every push instead.
class Reader {
public:
    explicit Reader(TsReadStats& stats) : stats_(stats) {
        for (uint16_t pid : {kPidPat, kPidNit, kPidSdt, kPidEit, kPidTdt}) sectionPid_[pid] = true;
    }
    ~Reader() {
        if (pat_ != nullptr) dvbpsi_pat_detach(pat_), dvbpsi_delete(pat_);
        for (dvbpsi_t* h : {nit_, sdt_, eit_, tdt_}) {
            if (h != nullptr) dvbpsi_DetachDemux(h), dvbpsi_delete(h);
        }
        for (auto& [pid, h] : pmts_) dvbpsi_pmt_detach(h.second), dvbpsi_delete(h.second);
    }

    bool read(const uint8_t* d, size_t size, const std::string& name, TsCapture& out,
              std::string& error);

private:
    static void message(dvbpsi_t*, const dvbpsi_msg_level_t, const char* msg) {
        if (tReader == nullptr) return;
        TsReadStats& s = tReader->stats_;
        if (strstr(msg, "CRC") != nullptr) {
            ++s.crcErrors;
        } else if (strstr(msg, "differs") != nullptr || strstr(msg, "invalid") != nullptr) {
            ++s.tablesDropped;
        }
    }

    dvbpsi_t* demux() {
        dvbpsi_t* h = dvbpsi_new(&Reader::message, DVBPSI_MSG_ERROR);
        if (h != nullptr && !dvbpsi_AttachDemux(h, &Reader::newTable, this)) {
            dvbpsi_delete(h);
            return nullptr;
        }
        return h;
    }

    static void newTable(dvbpsi_t* h, uint8_t table, uint16_t ext, void* data) {
        auto* r = static_cast<Reader*>(data);
        if (table == 0x40 || table == 0x41) {
            dvbpsi_nit_attach(h, table, ext, &Reader::onNit, r);
        } else if (table == 0x42 || table == 0x46) {
            dvbpsi_sdt_attach(h, table, ext, &Reader::onSdt, r);
        } else if (table >= 0x4E && table <= 0x6F) {
            dvbpsi_eit_attach(h, table, ext, &Reader::onEit, r);
        } else if (table == 0x70 || table == 0x73) {
            dvbpsi_tot_attach(h, table, ext, &Reader::onTot, r);
        }
    }

    static void onPat(void* data, dvbpsi_pat_t* pat);
    static void onPmt(void* data, dvbpsi_pmt_t* pmt);
    static void onSdt(void* data, dvbpsi_sdt_t* sdt);
    static void onEit(void* data, dvbpsi_eit_t* eit);
    static void onNit(void* data, dvbpsi_nit_t* nit);
    static void onTot(void* data, dvbpsi_tot_t* tot);

    void packet(const uint8_t* p);
    // A packet without transport error of a PID that carries no sections and is not the one
    // timing the capture is skipped, unless it may be the first with a PCR (an adaptation
    // field) or a PTS (a payload start) while the capture has none yet: nobody reads its
    // packets, so neither are its counters. The read loop asks this before anything else.
    bool unread(const uint8_t* p) const {
        const uint16_t pid = (p[1] & 0x1F) << 8 | p[2];
        return !(p[1] & 0x80) && !sectionPid_[pid] && pid != pcrPid_ && pid != ptsPid_ &&
               !(pcrPid_ < 0 && (p[3] & 0x20)) &&
               !(ptsPid_ < 0 && (p[1] & 0x40) && notPes_[pid] < kNotPes);
    }
    void push(dvbpsi_t* h, uint16_t pid, const uint8_t* s, size_t n);
    void eitSection(const uint8_t* s, size_t n);
    void timing(const uint8_t* p, uint16_t pid, bool payload, bool start, size_t offset);
    void timedContent(const uint8_t* d, size_t begin, size_t size);
    void build(TsCapture& out);

    TsReadStats& stats_;
    dvbpsi_t *pat_ = nullptr, *nit_ = nullptr, *sdt_ = nullptr, *eit_ = nullptr, *tdt_ = nullptr;
    std::map<uint16_t, std::pair<uint16_t, dvbpsi_t*>> pmts_;  // by PID: program, decoder
    // PIDs whose sections are read (the SI PIDs and every PMT's): the walk over the others
    // stops at this look-up.
    std::array<bool, 8192> sectionPid_{};
    std::array<int8_t, 8192> continuity_{};
    static constexpr uint8_t kNotPes = 8;
    std::array<uint8_t, 8192> notPes_{};  // payload starts without a PES start code, to kNotPes
    std::map<uint16_t, SectionAssembler> sections_;  // of the SI and PMT PIDs
    std::map<uint16_t, uint8_t> pushed_;             // continuity of the packets pushed

    bool havePat_ = false;
    uint16_t patTsid_ = 0;
    std::vector<std::pair<uint16_t, uint16_t>> programs_;  // program, PMT PID
    std::map<uint16_t, Service> pmtServices_;              // by program: components, CA

    bool haveSdtActual_ = false;
    uint16_t sdtOnid_ = 0, sdtTsid_ = 0;
    std::map<std::pair<uint16_t, uint16_t>, std::vector<Service>> sdts_;  // by onid, tsid
    std::vector<NitNetwork> nits_;
    std::map<Key3, Lcn> lcns_;
    std::map<Key3, std::map<uint16_t, Event>> events_;  // by service, by event id
    std::map<uint64_t, uint8_t> eitVersions_;           // by table, service, transport, section
    // The schedule sections as received, by service, by table << 8 | number; and the number
    // and version of the section being decoded (libdvbpsi is handed each as section 0).
    std::map<Key3, std::map<uint16_t, EitSection>> eitSections_;
    uint8_t eitNumber_ = 0, eitVersion_ = 0;

    int64_t firstUtc_ = 0, lastUtc_ = 0;
    int pcrPid_ = -1, ptsPid_ = -1;
    uint64_t firstPcr_ = 0, lastPcr_ = 0, pcrSpan_ = 0;  // 90 kHz
    uint64_t firstPts_ = 0;
    int64_t minPts_ = 0, maxPts_ = 0;  // from firstPts_, round the 33-bit wrap
};

void Reader::onPat(void* data, dvbpsi_pat_t* pat) {
    auto* r = static_cast<Reader*>(data);
    r->havePat_ = true;
    r->patTsid_ = pat->i_ts_id;
    r->programs_.clear();
    for (auto* p = pat->p_first_program; p != nullptr; p = p->p_next) {
        // Program 0 names the NIT's PID; a PMT on an SI PID would confuse both.
        if (p->i_number == 0 || p->i_pid < 0x20 || p->i_pid > 0x1FFE) continue;
        r->programs_.push_back({p->i_number, p->i_pid});
        if (r->pmts_.count(p->i_pid) != 0) continue;
        dvbpsi_t* h = dvbpsi_new(&Reader::message, DVBPSI_MSG_ERROR);
        if (h != nullptr && dvbpsi_pmt_attach(h, p->i_number, &Reader::onPmt, r)) {
            r->pmts_[p->i_pid] = {p->i_number, h};
            r->sectionPid_[p->i_pid] = true;
        } else if (h != nullptr) {
            dvbpsi_delete(h);
        }
    }
    dvbpsi_pat_delete(pat);
}

void Reader::onPmt(void* data, dvbpsi_pmt_t* pmt) {
    auto* r = static_cast<Reader*>(data);
    Service& s = r->pmtServices_[pmt->i_program_number];
    s = Service{};
    s.id = pmt->i_program_number;
    s.pcrPid = pmt->i_pcr_pid;
    auto addCa = [&](dvbpsi_descriptor_t* d) {
        if (d->i_tag != 0x09) return;
        auto* ca = dvbpsi_DecodeCADr(d);
        if (ca == nullptr) return void(++r->stats_.descriptorsDropped);
        if (std::find(s.caSystems.begin(), s.caSystems.end(), ca->i_ca_system_id) ==
            s.caSystems.end())
            s.caSystems.push_back(ca->i_ca_system_id);
    };
    eachDescriptor(pmt->p_first_descriptor, addCa);
    for (auto* es = pmt->p_first_es; es != nullptr; es = es->p_next) {
        Component c;
        c.pid = es->i_pid;
        c.streamType = es->i_type;
        switch (es->i_type) {
            case 0x01:
            case 0x02:
            case 0x10:
            case 0x1B:
            case 0x24:
            case 0x42:
            case 0xEA:
                c.kind = Kind::Video;
                break;
            case 0x03:
            case 0x04:
            case 0x0F:
            case 0x11:
            case 0x1C:
                c.kind = Kind::Audio;
                break;
            case 0x81:
                c.kind = Kind::Audio, c.ac3 = true;
                break;
            case 0x87:
                c.kind = Kind::Audio, c.eac3 = true;
                break;
            default:
                c.kind = Kind::Data;
        }
        std::vector<Component> subtitles;
        eachDescriptor(es->p_first_descriptor, [&](dvbpsi_descriptor_t* d) {
            addCa(d);
            switch (d->i_tag) {
                case 0x0A: {
                    auto* l = dvbpsi_DecodeISO639Dr(d);
                    if (l == nullptr) return void(++r->stats_.descriptorsDropped);
                    if (l->i_code_count > 0) c.language = language(l->code[0].iso_639_code);
                    break;
                }
                case 0x52: {
                    auto* t = dvbpsi_DecodeStreamIdentifierDr(d);
                    if (t == nullptr) return void(++r->stats_.descriptorsDropped);
                    c.componentTag = t->i_component_tag;
                    break;
                }
                // AC-3 and enhanced AC-3 (EN 300 468 annex D): libdvbpsi has no decoder for
                // either, and their presence on a private stream is all the model keeps.
                case 0x6A:
                    if (es->i_type == 0x06) c.kind = Kind::Audio, c.ac3 = true;
                    break;
                case 0x7A:
                    if (es->i_type == 0x06) c.kind = Kind::Audio, c.eac3 = true;
                    break;
                case 0x56: {
                    auto* t = dvbpsi_DecodeTeletextDr(d);
                    if (t == nullptr) return void(++r->stats_.descriptorsDropped);
                    if (es->i_type == 0x06) c.kind = Kind::Teletext;
                    for (int i = 0; i < t->i_pages_number; ++i) {
                        const dvbpsi_teletextpage_t& p = t->p_pages[i];
                        if (i == 0) c.language = language(p.i_iso6392_language_code);
                        c.pages.push_back({p.i_teletext_type,
                                           uint8_t(p.i_teletext_magazine_number == 0
                                                           ? 8
                                                           : p.i_teletext_magazine_number),
                                           p.i_teletext_page_number});
                    }
                    break;
                }
                case 0x59: {
                    auto* t = dvbpsi_DecodeSubtitlingDr(d);
                    if (t == nullptr) return void(++r->stats_.descriptorsDropped);
                    for (int i = 0; es->i_type == 0x06 && i < t->i_subtitles_number; ++i) {
                        Component sub;
                        sub.kind = Kind::Subtitle;
                        sub.pid = es->i_pid;
                        sub.streamType = es->i_type;
                        sub.language = language(t->p_subtitle[i].i_iso6392_language_code);
                        sub.subtitlingType = t->p_subtitle[i].i_subtitling_type;
                        sub.compositionPageId = t->p_subtitle[i].i_composition_page_id;
                        sub.ancillaryPageId = t->p_subtitle[i].i_ancillary_page_id;
                        subtitles.push_back(sub);
                    }
                    break;
                }
                default:
                    break;
            }
        });
        // One component per subtitle the PID carries (a language, a page), each tagged alike.
        for (Component& sub : subtitles) sub.componentTag = c.componentTag;
        if (!subtitles.empty()) {
            s.components.insert(s.components.end(), subtitles.begin(), subtitles.end());
        } else {
            s.components.push_back(std::move(c));
        }
    }
    dvbpsi_pmt_delete(pmt);
}

void Reader::onSdt(void* data, dvbpsi_sdt_t* sdt) {
    auto* r = static_cast<Reader*>(data);
    const bool actual = sdt->i_table_id == 0x42;
    if (actual) {
        r->haveSdtActual_ = true;
        r->sdtOnid_ = sdt->i_network_id;
        r->sdtTsid_ = sdt->i_extension;
    }
    std::vector<Service>& list = r->sdts_[{sdt->i_network_id, sdt->i_extension}];
    list.clear();
    for (auto* sv = sdt->p_first_service; sv != nullptr; sv = sv->p_next) {
        Service s;
        s.id = sv->i_service_id;
        s.scrambled = sv->b_free_ca;
        if (loopShort(sv->p_first_descriptor, sv->i_descriptors_length))
            ++r->stats_.descriptorsDropped;
        eachDescriptor(sv->p_first_descriptor, [&](dvbpsi_descriptor_t* d) {
            if (d->i_tag == 0x48) {
                auto* x = dvbpsi_DecodeServiceDr(d);
                if (x == nullptr) return void(++r->stats_.descriptorsDropped);
                s.type = x->i_service_type;
                s.provider = bytes(x->i_service_provider_name, x->i_service_provider_name_length);
                s.name = bytes(x->i_service_name, x->i_service_name_length);
            } else if (d->i_tag == 0x53) {
                // CA identifier, read by hand: libdvbpsi 1.3.3's decoder keeps only the high
                // byte of each 16-bit CA system id.
                if (d->i_length % 2 != 0) return void(++r->stats_.descriptorsDropped);
                for (int i = 0; i + 1 < d->i_length; i += 2) {
                    uint16_t id = uint16_t(d->p_data[i] << 8 | d->p_data[i + 1]);
                    if (std::find(s.caSystems.begin(), s.caSystems.end(), id) == s.caSystems.end())
                        s.caSystems.push_back(id);
                }
            }
        });
        list.push_back(std::move(s));
    }
    dvbpsi_sdt_delete(sdt);
}

void Reader::onEit(void* data, dvbpsi_eit_t* eit) {
    auto* r = static_cast<Reader*>(data);
    auto& events = r->events_[{eit->i_network_id, eit->i_ts_id, eit->i_extension}];
    EitSection* section = nullptr;
    if (eit->i_table_id >= 0x50) {
        section = &r->eitSections_[{eit->i_network_id, eit->i_ts_id, eit->i_extension}]
                                  [eit->i_table_id << 8 | r->eitNumber_];
        *section = {eit->i_table_id, r->eitNumber_, r->eitVersion_, {}};
    }
    for (auto* ev = eit->p_first_event; ev != nullptr; ev = ev->p_next) {
        const int64_t start = mjdUtc(ev->i_start_time), duration = bcdSeconds(ev->i_duration);
        if (start < 0 || duration < 0) {
            ++r->stats_.eventsDropped;
            continue;
        }
        // The table received last describes the event as it is now, p/f or schedule.
        Event e;
        e.id = ev->i_event_id;
        e.start = start;
        e.duration = uint32_t(duration);
        e.runningStatus = ev->i_running_status;
        if (loopShort(ev->p_first_descriptor, ev->i_descriptors_length))
            ++r->stats_.descriptorsDropped;
        bool haveShort = false, haveContent = false, haveRating = false;
        std::vector<std::pair<uint8_t, dvbpsi_extended_event_dr_t*>> extended;
        eachDescriptor(ev->p_first_descriptor, [&](dvbpsi_descriptor_t* d) {
            if (d->i_tag == 0x4D && !haveShort) {
                auto* x = dvbpsi_DecodeShortEventDr(d);
                if (x == nullptr) return void(++r->stats_.descriptorsDropped);
                haveShort = true;
                e.language = language(x->i_iso_639_code);
                e.name = bytes(x->i_event_name, x->i_event_name_length);
                e.text = bytes(x->i_text, x->i_text_length);
            } else if (d->i_tag == 0x4E) {
                auto* x = dvbpsi_DecodeExtendedEventDr(d);
                if (x == nullptr) return void(++r->stats_.descriptorsDropped);
                extended.push_back({x->i_descriptor_number, x});
            } else if (d->i_tag == 0x54 && !haveContent) {
                auto* x = dvbpsi_DecodeContentDr(d);
                if (x == nullptr) return void(++r->stats_.descriptorsDropped);
                haveContent = x->i_contents_number > 0;
                if (haveContent) e.content = x->p_content[0].i_type;
            } else if (d->i_tag == 0x55 && !haveRating) {
                auto* x = dvbpsi_DecodeParentalRatingDr(d);
                if (x == nullptr) return void(++r->stats_.descriptorsDropped);
                haveRating = x->i_ratings_number > 0;
                if (haveRating) e.parentalRating = x->p_parental_rating[0].i_rating;
            }
        });
        // Extended descriptors in their numbering; an item without a description continues
        // the text of the item before it.
        std::stable_sort(extended.begin(), extended.end(),
                         [](const auto& a, const auto& b) { return a.first < b.first; });
        for (const auto& [n, x] : extended) {
            if (e.language.empty()) e.language = language(x->i_iso_639_code);
            for (int i = 0; i < x->i_entry_count; ++i) {
                if (x->i_item_description_length[i] == 0 && !e.items.empty()) {
                    appendText(e.items.back().text, x->i_item[i], x->i_item_length[i]);
                    continue;
                }
                e.items.push_back({bytes(x->i_item_description[i], x->i_item_description_length[i]),
                                   bytes(x->i_item[i], x->i_item_length[i])});
            }
            appendText(e.extendedText, x->i_text, x->i_text_length);
        }
        if (section != nullptr) section->events.push_back(e.id);
        events[e.id] = std::move(e);
    }
    dvbpsi_eit_delete(eit);
}

void Reader::onNit(void* data, dvbpsi_nit_t* nit) {
    auto* r = static_cast<Reader*>(data);
    auto it = std::find_if(r->nits_.begin(), r->nits_.end(),
                           [&](const NitNetwork& n) { return n.id == nit->i_network_id; });
    if (it == r->nits_.end()) it = r->nits_.insert(r->nits_.end(), NitNetwork{});
    NitNetwork& n = *it;
    n = NitNetwork{};
    n.id = nit->i_network_id;
    n.actual = nit->i_table_id == 0x40;
    eachDescriptor(nit->p_first_descriptor, [&](dvbpsi_descriptor_t* d) {
        if (d->i_tag != 0x40) return;
        auto* x = dvbpsi_DecodeNetworkNameDr(d);
        if (x == nullptr) return void(++r->stats_.descriptorsDropped);
        n.name = bytes(x->i_name_byte, x->i_name_length);
    });
    for (auto* ts = nit->p_first_ts; ts != nullptr; ts = ts->p_next) {
        NitTransport t;
        t.tsid = ts->i_ts_id;
        t.onid = ts->i_orig_network_id;
        eachDescriptor(ts->p_first_descriptor, [&](dvbpsi_descriptor_t* d) {
            if (d->i_tag == 0x43 || d->i_tag == 0x44 || d->i_tag == 0x5A) {
                DeliveryInfo info = deliveryOf(d, r->stats_.descriptorsDropped);
                if (info.present && !t.delivery.usable) t.delivery = info;
                if (info.present && !n.deliveryKnown)
                    n.deliveryKnown = true, n.delivery = info.tuning.delivery;
            } else if (d->i_tag == 0x83) {
                // Logical channel numbers in the EACEM/NorDig form, which libdvbpsi decodes;
                // the private data specifier that scopes it varies between countries.
                auto* x = dvbpsi_DecodeLCNDr(d);
                if (x == nullptr) return void(++r->stats_.descriptorsDropped);
                for (int i = 0; i < x->i_number_of_entries; ++i) {
                    const dvbpsi_lcn_entry_t& e = x->p_entries[i];
                    r->lcns_[{t.onid, t.tsid, e.i_service_id}] = {e.i_logical_channel_number,
                                                                  e.b_visible_service_flag != 0};
                }
            }
        });
        n.transports.push_back(t);
    }
    dvbpsi_nit_delete(nit);
}

void Reader::onTot(void* data, dvbpsi_tot_t* tot) {
    auto* r = static_cast<Reader*>(data);
    const int64_t utc = mjdUtc(tot->i_utc_time);
    if (utc < 0) {
        ++r->stats_.tablesDropped;
    } else {
        if (r->firstUtc_ == 0) r->firstUtc_ = utc;
        r->lastUtc_ = std::max(r->lastUtc_, utc);
    }
    dvbpsi_tot_delete(tot);
}

// PCR and PTS of the packet, for the capture's duration and the clock of its timed content.
void Reader::timing(const uint8_t* p, uint16_t pid, bool payload, bool start, size_t offset) {
    if ((p[3] & 0x20) && p[4] >= 7 && (p[5] & 0x10)) {
        const uint64_t pcr = uint64_t(p[6]) << 25 | uint64_t(p[7]) << 17 | uint64_t(p[8]) << 9 |
                             uint64_t(p[9]) << 1 | p[10] >> 7;
        if (pcrPid_ < 0) pcrPid_ = pid, firstPcr_ = lastPcr_ = pcr;
        if (pid == pcrPid_) {
            const uint64_t delta = (pcr - lastPcr_) & (kPtsWrap - 1);
            // A step back, or over ten seconds, is a discontinuity: it adds nothing.
            if (delta < 90000 * 10) pcrSpan_ += delta;
            lastPcr_ = pcr;
        }
    }
    if (!payload || !start || offset + 14 > kPacket) return;
    const uint8_t* pes = p + offset;
    if (pes[0] != 0 || pes[1] != 0 || pes[2] != 1) {
        // A PID carries sections or PES, never both: after a few payload starts without a PES
        // start code (more than a damaged packet or two gives), its packets are no longer
        // looked at for a PTS.
        if (notPes_[pid] < kNotPes) ++notPes_[pid];
        return;
    }
    if ((pes[7] & 0x80) == 0) return;
    const uint64_t pts = readPts(pes + 9);
    if (ptsPid_ < 0) ptsPid_ = pid, firstPts_ = pts;
    if (pid != ptsPid_) return;
    // Counted from the first PTS, either way round the wrap (frames come out of order), so that
    // a capture across the wrap lasts what it holds, not 26 hours.
    int64_t at = ptsDelta(pts, firstPts_);
    minPts_ = std::min(minPts_, at), maxPts_ = std::max(maxPts_, at);
}

// A packet that unread() did not skip.
void Reader::packet(const uint8_t* p) {
    const uint16_t pid = (p[1] & 0x1F) << 8 | p[2];
    if (p[1] & 0x80) {
        ++stats_.transportErrors;
        continuity_[pid] = -1;
        return;
    }
    if (pid == 0x1FFF) return;
    const bool payload = p[3] & 0x10, adaptation = p[3] & 0x20;
    const bool discontinuity = adaptation && p[4] > 0 && (p[5] & 0x80);
    const int cc = p[3] & 0x0F;
    bool lost = continuity_[pid] < 0;
    if (payload) {
        const int last = continuity_[pid] - 1;  // stored + 1, so that 0 means none yet
        if (last >= 0 && cc == last && !discontinuity) return;  // a duplicate packet
        if (last >= 0 && cc != ((last + 1) & 0xF) && !discontinuity) {
            ++stats_.continuityErrors;
            lost = true;
        }
        continuity_[pid] = int8_t(cc + 1);
    }
    const size_t offset = tsPayloadOffset(p);
    if (offset > kPacket) return;
    timing(p, pid, payload, p[1] & 0x40, offset);

    dvbpsi_t* h = pid == kPidPat   ? pat_
                  : pid == kPidNit ? nit_
                  : pid == kPidSdt ? sdt_
                  : pid == kPidEit ? eit_
                  : pid == kPidTdt ? tdt_
                                   : nullptr;
    if (h == nullptr) {
        if (!sectionPid_[pid]) return;
        auto it = pmts_.find(pid);
        if (it == pmts_.end()) return;
        h = it->second.second;
    }
    const bool start = p[1] & 0x40;
    sections_[pid].feed(p + offset, kPacket - offset, start, lost, [&](const uint8_t* s, size_t n) {
        // TOT carries a CRC without the section syntax; TDT carries none.
        if (((s[1] & 0x80) || s[0] == 0x73) && sectionCrc32(s, n) != 0)
            return void(++stats_.crcErrors);
        if (pid == kPidEit) return eitSection(s, n);
        push(h, pid, s, n);
    });
}

// libdvbpsi gives an EIT only once every section of its table arrived, and captures seldom
// hold whole schedule tables: each section goes to it as a table of its own (renumbered as
// section 0 of 0), its decoder dropped after it. Its EIT decoder calls a table complete when
// the first section it received comes again, so the section goes twice. A section whose version was
// applied already is skipped; a new version of it replaces the events it carries.
void Reader::eitSection(const uint8_t* s, size_t n) {
    if (n < 18 || !(s[1] & 0x80) || s[0] < 0x4E || s[0] > 0x6F) return void(++stats_.tablesDropped);
    const uint64_t key = uint64_t(s[0]) << 56 | uint64_t(s[3] << 8 | s[4]) << 40 |
                         uint64_t(s[8] << 8 | s[9]) << 24 | uint64_t(s[10] << 8 | s[11]) << 8 |
                         s[6];
    const uint8_t version = s[5] >> 1 & 0x1F;
    auto [seen, fresh] = eitVersions_.try_emplace(key, version);
    if (!fresh && seen->second == version) return;
    seen->second = version;
    eitNumber_ = s[6];
    eitVersion_ = version;
    uint8_t one[4096];  // a section is at most 4096 bytes, its length field at most 4095 + 3
    memcpy(one, s, n);
    one[6] = one[7] = one[12] = 0;
    one[13] = one[0];
    const uint32_t crc = sectionCrc32(one, n - 4);
    for (int i = 0; i < 4; ++i) one[n - 4 + i] = uint8_t(crc >> (24 - 8 * i));
    push(eit_, kPidEit, one, n);
    push(eit_, kPidEit, one, n);
    dvbpsi_eit_detach(eit_, one[0], uint16_t(s[3] << 8 | s[4]));
}

// One whole section to libdvbpsi as packets of its own: the first with pointer field 0, the
// last stuffed with 0xFF.
void Reader::push(dvbpsi_t* h, uint16_t pid, const uint8_t* s, size_t n) {
    uint8_t& cc = pushed_[pid];
    for (size_t at = 0, first = 1; at < n || first; first = 0) {
        uint8_t packet[kPacket];  // libdvbpsi takes a mutable packet
        memset(packet, 0xFF, kPacket);
        packet[0] = kSync;
        packet[1] = uint8_t((first ? 0x40 : 0) | pid >> 8);
        packet[2] = uint8_t(pid);
        packet[3] = uint8_t(0x10 | (cc++ & 0xF));
        size_t room = kPacket - 4;
        if (first) packet[4] = 0, --room;
        const size_t take = std::min(room, n - at);
        memcpy(packet + kPacket - room, s + at, take);
        at += take;
        dvbpsi_packet_push(h, packet);
    }
}

// What a video PID's PES starts say of its pictures: the frame rate and size of an MPEG video
// sequence header where the stream has one, else the frame rate from the smallest step
// between the decoding times (or presentation times, where a PES gives no decoding time) of
// its first PES. The sequence parameter sets of H.264 and HEVC are not read: their streams get
// the frame rate only.
struct VideoProbe {
    static constexpr int kStarts = 32;  // PES starts looked at
    Component* component;
    int starts = 0;
    uint64_t last = 0;
    uint64_t step = 0;      // the smallest step seen, 90 kHz
    uint32_t sequence = 0;  // the frame rate of a sequence header

    void start(const uint8_t* p) {
        const size_t offset = tsPayloadOffset(p);
        if (offset + 19 > kPacket) return;
        const uint8_t* pes = p + offset;
        if (pes[0] != 0 || pes[1] != 0 || pes[2] != 1 || (pes[3] & 0xF0) != 0xE0 ||
            !(pes[7] & 0x80))
            return;
        const uint64_t t = readPts(pes + ((pes[7] & 0xC0) == 0xC0 ? 14 : 9));
        const uint64_t delta = (t - last) & (kPtsWrap - 1);
        // A step of a second or more, or none, is a discontinuity or a repeated time.
        if (starts++ > 0 && delta > 0 && delta < 90000 && (step == 0 || delta < step)) step = delta;
        last = t;
        // A sequence header at the start of the payload, in this packet.
        for (size_t at = 9 + size_t{pes[8]}; offset + at + 8 <= kPacket; ++at) {
            const uint8_t* h = pes + at;
            if (h[0] != 0 || h[1] != 0 || h[2] != 1) continue;
            if (h[3] != 0xB3) break;
            const uint16_t width = uint16_t(h[4] << 4 | h[5] >> 4);
            const uint16_t height = uint16_t((h[5] & 0x0F) << 8 | h[6]);
            const uint8_t code = h[7] & 0x0F;
            if (width == 0 || height == 0 || code == 0 || code > 8) break;
            component->width = width, component->height = height;
            sequence = kMpegFrameRates[code];
            break;
        }
    }

    // The rate of the smallest step, taken as the nearest common rate within half a percent.
    void finish() {
        if (sequence != 0) return void(component->frameRateMilli = sequence);
        if (step == 0) return;
        const uint32_t milli = uint32_t((uint64_t{90000000} + step / 2) / step);
        component->frameRateMilli = milli;
        uint32_t nearest = UINT32_MAX;  // 29.97 Hz is within half a percent of 30 Hz too
        for (uint32_t common : kMpegFrameRates) {
            const uint32_t off = milli > common ? milli - common : common - milli;
            if (common != 0 && off * 200 <= common && off < nearest)
                nearest = off, component->frameRateMilli = common;
        }
    }
};

// Second pass: the PES of subtitle and teletext PIDs of the PMTs, decoded into the services,
// and the video PIDs probed for their pictures.
void Reader::timedContent(const uint8_t* d, size_t begin, size_t size) {
    // Times count from the capture's first PCR, else its first PTS.
    const bool haveRef = pcrPid_ >= 0 || ptsPid_ >= 0;
    const uint64_t ref = pcrPid_ >= 0 ? firstPcr_ : firstPts_;
    auto msOf = [&](uint64_t pts) -> int64_t {
        if (!haveRef) return 0;
        return std::max<int64_t>(0, ptsDelta(pts, ref) / 90);
    };
    struct Stream {
        Stream(uint16_t p, Service* s) : pid(p), service(s), assembler(p) {}
        uint16_t pid;
        Service* service;
        PesAssembler assembler;
        std::unique_ptr<DvbSubtitleDecoder> subtitles;
        std::unique_ptr<TeletextDecoder> teletext;
        bool inPes = false;
    };
    std::vector<Stream> streams;
    std::vector<VideoProbe> videos;
    for (auto& [program, s] : pmtServices_) {
        for (Component& c : s.components) {
            if (c.kind == Kind::Video) videos.push_back({&c});
            if (c.kind == Kind::Subtitle) {
                Stream& st = streams.emplace_back(c.pid, &s);
                st.subtitles = std::make_unique<DvbSubtitleDecoder>(c.compositionPageId,
                                                                    c.ancillaryPageId);
            }
            // The teletext PES of a service go to the teletext decoder here, and only here.
            if (c.kind == Kind::Teletext) {
                streams.emplace_back(c.pid, &s).teletext = std::make_unique<TeletextDecoder>();
            }
        }
    }
    if (streams.empty() && videos.empty()) return;
    std::vector<std::vector<uint8_t>> pes;
    auto deliver = [&](Stream& st) {
        for (const std::vector<uint8_t>& one : pes) {
            int64_t ms = 0;
            if (one.size() >= 14 && (one[7] & 0x80)) ms = msOf(readPts(one.data() + 9));
            if (st.subtitles) {
                const size_t from = st.service->subtitles.size();
                st.subtitles->feed(one.data(), one.size(), st.service->subtitles);
                for (size_t k = from; k < st.service->subtitles.size(); ++k) {
                    DisplaySet& set = st.service->subtitles[k];
                    set.time = msOf(set.pts);
                }
            }
            if (st.teletext) st.teletext->feed(one.data(), one.size(), ms, st.service->teletext);
        }
        pes.clear();
    };
    std::array<int8_t, 8192> cc{};
    size_t probing = videos.size();
    for (size_t pos = begin; pos + kPacket <= size;) {
        if (d[pos] != kSync) {
            pos = findSync(d, size, pos + 1);
            continue;
        }
        const uint8_t* p = d + pos;
        pos += kPacket;
        const uint16_t pid = (p[1] & 0x1F) << 8 | p[2];
        const bool payload = p[3] & 0x10;
        const int last = cc[pid] - 1, now = p[3] & 0x0F;
        const bool broken =
                (p[1] & 0x80) || (payload && last >= 0 && now != last && now != ((last + 1) & 0xF));
        if (payload && !(p[1] & 0x80)) cc[pid] = int8_t(now + 1);
        // Payload starts without transport error, in the clear (a scrambled one hides its PES).
        if (payload && (p[1] & 0xC0) == 0x40 && (p[3] & 0xC0) == 0 && probing > 0) {
            for (VideoProbe& v : videos) {
                if (v.component->pid == pid && v.starts < VideoProbe::kStarts) {
                    v.start(p);
                    probing -= v.starts == VideoProbe::kStarts;
                }
            }
            // A capture with no subtitles or teletext is walked no further.
            if (probing == 0 && streams.empty()) break;
        }
        for (Stream& st : streams) {
            if (st.pid != pid) continue;
            if (broken && st.inPes) ++stats_.pesDropped, st.inPes = false;
            if (payload && (p[1] & 0x40)) st.inPes = true;
            st.assembler.feed(p, kPacket, pes);
            if (!pes.empty()) st.inPes = (p[1] & 0x40) != 0;
            deliver(st);
        }
    }
    for (VideoProbe& v : videos) v.finish();
    for (Stream& st : streams) {
        st.assembler.flush(pes);
        deliver(st);
        if (st.subtitles) {
            const DvbSubtitleStats& s = st.subtitles->stats();
            DvbSubtitleStats& t = stats_.subtitles;
            t.pes += s.pes, t.pesDropped += s.pesDropped, t.segments += s.segments;
            t.segmentsDropped += s.segmentsDropped, t.objectsDropped += s.objectsDropped;
            t.regionsDropped += s.regionsDropped, t.runsClipped += s.runsClipped;
            t.stringsDropped += s.stringsDropped, t.missingCluts += s.missingCluts;
            t.displaySets += s.displaySets;
        }
        if (st.teletext) {
            st.teletext->flush(st.service->teletext);
            const TeletextStats& s = st.teletext->stats();
            stats_.teletextPesDropped += s.pesDropped;
            stats_.teletextUnitsDropped += s.unitsDropped;
            stats_.teletextPacketsDropped += s.packetsDropped;
            stats_.teletextPages += s.pages;
        }
    }
    for (auto& [program, s] : pmtServices_) {
        std::stable_sort(s.subtitles.begin(), s.subtitles.end(),
                         [](const DisplaySet& a, const DisplaySet& b) { return a.time < b.time; });
        std::stable_sort(
                s.teletext.begin(), s.teletext.end(),
                [](const TeletextPage& a, const TeletextPage& b) { return a.time < b.time; });
    }
}

void Reader::build(TsCapture& out) {
    out = TsCapture{};
    // The capture's own transport: the SDT actual names it, else the PAT (its onid unknown).
    const bool haveActual = haveSdtActual_ || havePat_;
    const uint16_t onid = haveSdtActual_ ? sdtOnid_ : 0;
    const uint16_t tsid = haveSdtActual_ ? sdtTsid_ : patTsid_;
    out.hasActual = haveActual;

    // Networks in NIT order, the actual one first.
    std::stable_partition(nits_.begin(), nits_.end(), [](const NitNetwork& n) { return n.actual; });
    if (haveActual && (nits_.empty() || !nits_[0].actual)) {
        NitNetwork n;
        n.id = onid, n.actual = true;
        nits_.insert(nits_.begin(), n);
    }
    std::map<std::pair<uint16_t, uint16_t>, bool> placed;  // transports given a network
    for (const NitNetwork& n : nits_) {
        Network net;
        net.id = n.id, net.name = n.name;
        net.delivery = n.deliveryKnown ? n.delivery : Delivery::Terrestrial;
        std::vector<bool> tuned;
        for (const NitTransport& t : n.transports) {
            if (placed[{t.onid, t.tsid}]) continue;  // listed twice: the first place holds
            placed[{t.onid, t.tsid}] = true;
            Transport tr;
            tr.tsid = t.tsid, tr.onid = t.onid;
            tr.tuning = t.delivery.present ? t.delivery.tuning : Tuning{};
            if (!t.delivery.present) tr.tuning.delivery = net.delivery;
            net.transports.push_back(tr);
            tuned.push_back(t.delivery.usable);
        }
        out.networks.push_back(std::move(net));
        out.tuned.push_back(std::move(tuned));
        out.deliveryKnown.push_back(n.deliveryKnown);
    }
    if (haveActual) {
        Network& net = out.networks[0];
        auto it =
                std::find_if(net.transports.begin(), net.transports.end(), [&](const Transport& t) {
                    return t.tsid == tsid && (t.onid == onid || !haveSdtActual_);
                });
        if (it == net.transports.end()) {
            Transport tr;
            tr.tsid = tsid, tr.onid = onid;
            tr.tuning.delivery = net.delivery;
            it = net.transports.insert(net.transports.end(), tr);
            out.tuned[0].push_back(false);
            placed[{onid, tsid}] = true;
        }
        out.actualNetwork = 0;
        out.actualTransport = size_t(it - net.transports.begin());
    }
    // Transports that only an SDT other names join the actual network: they are on the air as
    // the capture tells, under no network of their own.
    for (const auto& [key, list] : sdts_) {
        if (placed[key] || out.networks.empty()) continue;
        placed[key] = true;
        Transport tr;
        tr.onid = key.first, tr.tsid = key.second;
        tr.tuning.delivery = out.networks[0].delivery;
        out.networks[0].transports.push_back(tr);
        out.tuned[0].push_back(false);
    }

    for (size_t ni = 0; ni < out.networks.size(); ++ni) {
        for (size_t ti = 0; ti < out.networks[ni].transports.size(); ++ti) {
            Transport& tr = out.networks[ni].transports[ti];
            const bool actual = haveActual && ni == out.actualNetwork && ti == out.actualTransport;
            auto sdt = sdts_.find({haveSdtActual_ || !actual ? tr.onid : uint16_t(0), tr.tsid});
            if (sdt != sdts_.end()) tr.services = sdt->second;
            if (actual) {
                // Services of the PAT that the SDT does not list, then every PMT's streams.
                for (const auto& entry : programs_) {
                    const uint16_t program = entry.first, pid = entry.second;
                    auto has = std::find_if(tr.services.begin(), tr.services.end(),
                                            [&](const Service& s) { return s.id == program; });
                    if (has == tr.services.end()) {
                        Service s;
                        s.id = program;
                        tr.services.push_back(s);
                        has = tr.services.end() - 1;
                    }
                    has->pmtPid = pid;
                    auto pmt = pmtServices_.find(program);
                    if (pmt == pmtServices_.end()) continue;
                    has->pcrPid = pmt->second.pcrPid;
                    has->components = std::move(pmt->second.components);
                    has->subtitles = std::move(pmt->second.subtitles);
                    has->teletext = std::move(pmt->second.teletext);
                    for (uint16_t ca : pmt->second.caSystems) {
                        if (std::find(has->caSystems.begin(), has->caSystems.end(), ca) ==
                            has->caSystems.end())
                            has->caSystems.push_back(ca);
                    }
                }
            }
            for (Service& s : tr.services) {
                auto lcn = lcns_.find({tr.onid, tr.tsid, s.id});
                if (lcn != lcns_.end()) s.lcn = lcn->second.number, s.visible = lcn->second.visible;
                auto sections = eitSections_.find({tr.onid, tr.tsid, s.id});
                if (sections != eitSections_.end()) {
                    for (auto& [at, section] : sections->second)
                        s.eitSections.push_back(std::move(section));
                }
                auto ev = events_.find({tr.onid, tr.tsid, s.id});
                if (ev == events_.end()) continue;
                for (auto& [id, e] : ev->second) s.events.push_back(std::move(e));
                std::stable_sort(s.events.begin(), s.events.end(),
                                 [](const Event& a, const Event& b) { return a.start < b.start; });
            }
        }
    }
    out.firstUtc = firstUtc_;
    out.pcrDurationMs = pcrPid_ >= 0 ? int64_t(pcrSpan_ / 90) : 0;
    out.ptsDurationMs = ptsPid_ >= 0 ? int64_t((maxPts_ - minPts_) / 90) : 0;
    out.tdtDurationMs = firstUtc_ != 0 ? (lastUtc_ - firstUtc_) * 1000 : 0;
    out.durationMs = out.pcrDurationMs > 0   ? out.pcrDurationMs
                     : out.ptsDurationMs > 0 ? out.ptsDurationMs
                                             : out.tdtDurationMs;
    // A PTS runs ahead of the PCR by the decoder's delay: the loop holds the last display set
    // or teletext transmission too.
    for (const Network& n : out.networks) {
        for (const Transport& t : n.transports) {
            for (const Service& s : t.services) {
                if (!s.subtitles.empty())
                    out.durationMs = std::max(out.durationMs, s.subtitles.back().time + 1);
                if (!s.teletext.empty())
                    out.durationMs = std::max(out.durationMs, s.teletext.back().time + 1);
            }
        }
    }
}

bool Reader::read(const uint8_t* d, size_t size, const std::string& name, TsCapture& out,
                  std::string& error) {
    const size_t begin = findSync(d, size, 0);
    if (begin >= size) {
        error = name + ": not an MPEG transport stream (no 188-byte packets with sync byte 0x47)";
        return false;
    }
    tReader = this;
    pat_ = dvbpsi_new(&Reader::message, DVBPSI_MSG_ERROR);
    if (pat_ != nullptr && !dvbpsi_pat_attach(pat_, &Reader::onPat, this)) {
        dvbpsi_delete(pat_);
        pat_ = nullptr;
    }
    nit_ = demux(), sdt_ = demux(), eit_ = demux(), tdt_ = demux();
    uint64_t packets = 0;
    constexpr size_t kAhead = 15 * kPacket;
    for (size_t pos = begin; pos + kPacket <= size;) {
        const uint8_t* p = d + pos;
        if (p[0] != kSync) {
            ++stats_.syncLosses;
            pos = findSync(d, size, pos + 1);
            continue;
        }
        pos += kPacket;
        ++packets;
        // The walk waits on memory, not on its few tests: ask for the packets ahead early.
        if (pos + kAhead < size) __builtin_prefetch(d + pos + kAhead);
        if (!unread(p)) packet(p);
    }
    stats_.packets += packets;
    timedContent(d, begin, size);
    build(out);
    tReader = nullptr;
    return true;
}

}  // namespace

std::string formatTsReadStats(const TsReadStats& s) {
    char line[512];
    snprintf(line, sizeof line,
             "%llu packets; dropped: %u sync losses, %u continuity errors, %u transport errors, "
             "%u bad CRC sections, %u tables, %u descriptors, %u events, %u PES; subtitles: %u "
             "display sets, %u PES and %u segments dropped; teletext: %u pages, %u PES, %u data "
             "units and %u packets dropped",
             static_cast<unsigned long long>(s.packets), s.syncLosses, s.continuityErrors,
             s.transportErrors, s.crcErrors, s.tablesDropped, s.descriptorsDropped, s.eventsDropped,
             s.pesDropped, s.subtitles.displaySets, s.subtitles.pesDropped,
             s.subtitles.segmentsDropped, s.teletextPages, s.teletextPesDropped,
             s.teletextUnitsDropped, s.teletextPacketsDropped);
    return line;
}

bool readTransportStream(const uint8_t* data, size_t size, const std::string& name, TsCapture& out,
                         std::string& error, TsReadStats& stats) {
    Reader reader(stats);
    return reader.read(data, size, name, out, error);
}

bool readTransportStreamFile(const std::string& path, TsCapture& out, std::string& error,
                             TsReadStats& stats) {
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    struct stat st {};
    if (fd < 0 || fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
        error = path + ": cannot read: " + strerror(errno);
        if (fd >= 0) close(fd);
        return false;
    }
    const size_t size = size_t(st.st_size);
    if (size == 0) {
        close(fd);
        error = path + ": not an MPEG transport stream (empty file)";
        return false;
    }
    void* map = mmap(nullptr, size, PROT_READ, MAP_PRIVATE, fd, 0);
    close(fd);
    if (map == MAP_FAILED) {
        error = path + ": cannot map: " + strerror(errno);
        return false;
    }
    const bool ok =
            readTransportStream(static_cast<const uint8_t*>(map), size, path, out, error, stats);
    munmap(map, size);
    return ok;
}

}  // namespace dvbmodel
