#include <gtest/gtest.h>
#include <libzvbi.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "broadcast/Builtin.h"
#include "broadcast/DvbSubtitle.h"
#include "broadcast/DvbTeletext.h"
#include "receiver/Teletext.h"

using namespace dvbmodel;

namespace {

using Packets = std::vector<std::vector<uint8_t>>;
using Rows = std::vector<std::string>;  // 25 rows of UTF-8, as libzvbi prints them

Packets capture(const std::string& name, uint16_t pid) {
    std::ifstream in(std::string(DVB_TESTDATA_DIR) + "/" + name, std::ios::binary);
    std::vector<uint8_t> ts{std::istreambuf_iterator<char>(in), {}};
    Packets pes;
    PesAssembler assembler(pid);
    assembler.feed(ts.data(), ts.size(), pes);
    return pes;
}

uint64_t ptsOf(const std::vector<uint8_t>& p) {
    return uint64_t{p[9] & 0x0Eu} << 29 | p[10] << 22 | (p[11] >> 1) << 15 | p[12] << 7 |
           p[13] >> 1;
}

void utf8(std::string& s, char32_t u) {
    if (u < 0x80)
        s += char(u);
    else if (u < 0x800)
        s += {char(0xC0 | u >> 6), char(0x80 | (u & 0x3F))};
    else
        s += {char(0xE0 | u >> 12), char(0x80 | (u >> 6 & 0x3F)), char(0x80 | (u & 0x3F))};
}

// Our page as libzvbi prints it at level 1.5: G0 characters with the national option of
// C12..C14 (C12 the highest bit), spacing attributes and mosaics as spaces (0x00 and 0x10
// switch to alphanumerics and mosaics, as they do from level 1.5), a row under a
// double-height row as that row, 41 columns, the header from column 8 on (libzvbi prints its
// own page number before that).
Rows print(const TeletextPage& page) {
    const int c = page.controlBits, option = (c >> 10 & 4) | (c >> 12 & 2) | (c >> 14 & 1);
    Rows rows;
    bool below = false;
    for (int r = 0; r < 25; ++r) {
        if (below) {
            rows.push_back(rows.back());
            below = false;
            continue;
        }
        std::string s;
        bool mosaic = false, doubleHeight = false;
        for (int col = r ? 0 : 8; col < 40; ++col) {
            uint8_t b = page.rows[r][col];
            mosaic = b < 0x08 ? false : b >= 0x10 && b < 0x18 ? true : mosaic;
            doubleHeight |= b == 0x0D && r && r < 23;
            utf8(s, b < 0x20 || (mosaic && (b & 0x20)) ? U' ' : dvbrx::teletextG0(b, option));
        }
        rows.push_back(s + " ");
        below = doubleHeight;
    }
    return rows;
}

// libzvbi's own decoding of PES packets: every page reception, printed.
struct Zvbi {
    vbi_decoder* vbi = vbi_decoder_new();
    std::vector<std::pair<int, Rows>> pages;
    explicit Zvbi(const Packets& pes) {
        vbi_event_handler_register(vbi, VBI_EVENT_TTX_PAGE, &Zvbi::page, this);
        vbi_dvb_demux* dx = vbi_dvb_pes_demux_new(&Zvbi::lines, this);
        for (const auto& p : pes) vbi_dvb_demux_feed(dx, p.data(), p.size());
        vbi_dvb_demux_delete(dx);
    }
    ~Zvbi() { vbi_decoder_delete(vbi); }
    static vbi_bool lines(vbi_dvb_demux*, void* z, const vbi_sliced* s, unsigned n, int64_t pts) {
        vbi_decode(static_cast<Zvbi*>(z)->vbi, const_cast<vbi_sliced*>(s), n, pts / 90000.0);
        return true;
    }
    static void page(vbi_event* e, void* user) {
        auto* z = static_cast<Zvbi*>(user);
        vbi_page pg;
        int no = e->ev.ttx_page.pgno;
        if (!vbi_fetch_vt_page(z->vbi, &pg, no, e->ev.ttx_page.subno, VBI_WST_LEVEL_1p5, 25, 1))
            return;
        Rows rows(25, std::string(4 * 41, '\0'));
        for (int r = 0; r < 25; ++r)
            rows[r].resize(vbi_print_page_region(&pg, rows[r].data(), rows[r].size(), "UTF-8",
                                                 false, true, 0, r, 41, 1));
        rows[0].erase(0, 8);
        z->pages.emplace_back(no, rows);
        vbi_unref_page(&pg);
    }
};

}  // namespace

// libzvbi's text without what level 1.5's X/26 packets add: a capital with a diacritical mark
// (no Latin national option has one) as its base letter.
std::string level1(const std::string& s) {
    static const std::string base = "AAAAAAACEEEEIIIIDNOOOOO*OUUUUY";
    std::string out;
    for (size_t i = 0; i < s.size(); ++i) {
        unsigned u =
                uint8_t(s[i]) == 0xC3 && i + 1 < s.size() ? 0xC0 + (uint8_t(s[i + 1]) & 0x3F) : 0;
        out += u && u < 0xDE && u != 0xD7 ? base[u - 0xC0] : s[i];
        i += u && u < 0xDE && u != 0xD7;
    }
    return out;
}

#define NEED_TESTDATA(name)                                                   \
    if (!std::filesystem::exists(std::string(DVB_TESTDATA_DIR) + "/" + name)) \
    GTEST_SKIP() << "capture " << name << " absent: " DVB_TESTDATA_DIR " is not there"

std::vector<TeletextPage> decode(const Packets& pes, TeletextDecoder& decoder,
                                 size_t skipLast = 0) {
    std::vector<TeletextPage> pages;
    for (size_t i = 0; i + skipLast < pes.size(); ++i)
        decoder.feed(pes[i].data(), pes[i].size(), int64_t(ptsOf(pes[i]) / 90), pages);
    return pages;
}

// libzvbi decodes the lines of a PES when the next one starts: the last one stays unread.
TEST(DvbTeletext, DecodesArteAsLibzvbiDid) {
    NEED_TESTDATA("teletext-arte.ts");
    TeletextDecoder decoder;
    std::vector<TeletextPage> pages = decode(capture("teletext-arte.ts", 0x042C), decoder, 1);
    std::ifstream in(DVB_TESTDATA_DIR "/truth/teletext-arte.json");
    const auto truth = nlohmann::json::parse(in)["teletext"][0];
    std::map<std::string, std::vector<const TeletextPage*>> received;
    for (const TeletextPage& p : pages) {
        char number[8];
        snprintf(number, sizeof number, "%x", p.number);
        // libzvbi reports the pages that a viewer can select: decimal numbers.
        if ((p.number & 0xF) < 10 && (p.number & 0xF0) < 0xA0) received[number].push_back(&p);
    }
    ASSERT_EQ(received.size(), truth["distinct_pages"].get<size_t>());
    for (const auto& [number, page] : truth["pages"].items())
        EXPECT_EQ(received[number].size(), page["receptions"].get<size_t>()) << number;
    for (const auto& [number, text] : truth["page_text"].items()) {
        Rows rows = print(*received[number].at(text["reception_index"].get<size_t>()));
        for (int r = 0; r < 25; ++r) {
            std::string want = level1(text["rows"][r]);
            EXPECT_EQ(rows[r], r ? want : want.substr(8)) << number << " row " << r;
        }
    }
    const auto& subtitles = truth["subtitle_pages"]["889"];
    ASSERT_EQ(received["889"].size(), subtitles.size());
    for (size_t i = 0; i < subtitles.size(); ++i) {
        std::vector<std::string> lines;
        Rows rows = print(*received["889"][i]);
        for (int r = 1; r < 25; ++r) {
            size_t from = rows[r].find_first_not_of(' '), to = rows[r].find_last_not_of(' ');
            if (from != std::string::npos) lines.push_back(rows[r].substr(from, to + 1 - from));
        }
        EXPECT_EQ(lines, subtitles[i]["lines"].get<std::vector<std::string>>()) << i;
    }
}

TEST(DvbTeletext, BuiltinPagesTravelToLibzvbiAndBack) {
    const Broadcast broadcast = builtinBroadcast(1767290400);
    size_t checked = 0;
    for (const Network& n : broadcast.networks)
        for (const Transport& t : n.transports)
            for (const Service& s : t.services) {
                if (s.teletext.empty()) continue;
                Packets pes;
                for (const TeletextPage& page : s.teletext) {
                    // A time-filling header of the page's magazine completes it.
                    TeletextPage pair[2] = {page, {}};
                    pair[1].number = (page.number & 0xF00) | 0xFF;
                    pes.push_back(encodeTeletextPes(pair, 2, uint64_t(page.time) * 90));
                }
                // libzvbi passes on a frame of lines when the next one starts.
                TeletextPage end;
                end.number = 0x1FF;
                pes.push_back(encodeTeletextPes(&end, 1, 0));
                TeletextDecoder decoder;
                std::vector<TeletextPage> back = decode(pes, decoder);
                Zvbi zvbi(pes);
                ASSERT_EQ(back.size(), s.teletext.size());
                ASSERT_EQ(zvbi.pages.size(), s.teletext.size());
                for (size_t i = 0; i < back.size(); ++i, ++checked) {
                    const TeletextPage &a = s.teletext[i], &b = back[i];
                    EXPECT_EQ(std::tie(a.number, a.subcode, a.controlBits, a.rows, a.links,
                                       a.charset, a.time),
                              std::tie(b.number, b.subcode, b.controlBits, b.rows, b.links,
                                       b.charset, b.time));
                    EXPECT_EQ(zvbi.pages[i].first, a.number);
                    EXPECT_EQ(zvbi.pages[i].second, print(a)) << std::hex << a.number;
                }
            }
    EXPECT_GT(checked, 0u);
}

// The data units of one page: 0 its header, 1 its links, 2.. rows 1..24; in each, byte 3 the
// framing code, bytes 4.. the packet (4, 5 the address, 6.. the page number or the text).
TEST(DvbTeletext, KeepsWhatIsSoundOfDamagedUnits) {
    const TeletextPage original =
            builtinBroadcast(1767290400).networks[0].transports[0].services[0].teletext[0];
    TeletextPage pair[2] = {original, {}};
    pair[1].number = 0x1FF;
    const std::vector<uint8_t> pes = encodeTeletextPes(pair, 2, 0);
    auto unit = [](int u, int at) { return size_t(46 + 46 * u + at); };
    struct Case {
        size_t offset;
        uint8_t mask;
        size_t pages;
        uint32_t pesDropped, unitsDropped, packetsDropped, parityErrors;
        int row, col;  // what turns blank: a row (col -1), a character, or the links (row 25)
    } cases[] = {
            {unit(0, 4), 0x01, 1, 0, 0, 0, 0, -1, 0},  // one bit: corrected
            {unit(0, 4), 0x03, 0, 0, 0, 1, 0, -1, 0},  // the header's address
            {unit(0, 6), 0x0C, 0, 0, 0, 1, 0, -1, 0},  // its page number
            {unit(6, 5), 0x30, 1, 0, 0, 1, 0, 5, -1},  // row 5's address
            {unit(4, 9), 0x40, 1, 0, 0, 0, 1, 3, 3},   // a character's parity
            {unit(3, 3), 0x10, 1, 0, 1, 0, 0, 2, -1},  // a framing code
            {unit(1, 7), 0x81, 1, 0, 0, 1, 0, 25, 0},  // a link
            {45, 0x80, 0, 1, 0, 0, 0, -1, 0},          // the data identifier
            {3, 0x01, 0, 1, 0, 0, 0, -1, 0},           // the stream id
    };
    for (const Case& c : cases) {
        std::vector<uint8_t> damaged = pes;
        damaged[c.offset] ^= c.mask;
        TeletextDecoder decoder;
        std::vector<TeletextPage> pages;
        decoder.feed(damaged.data(), damaged.size(), 0, pages);
        const TeletextStats& st = decoder.stats();
        EXPECT_EQ(std::tie(st.pesDropped, st.unitsDropped, st.packetsDropped, st.parityErrors),
                  std::tie(c.pesDropped, c.unitsDropped, c.packetsDropped, c.parityErrors))
                << c.offset;
        ASSERT_EQ(pages.size(), c.pages) << c.offset;
        if (!c.pages) continue;
        TeletextPage want = original;
        if (c.row == 25)
            want.links = {};
        else if (c.row >= 0 && c.col < 0)
            want.rows[c.row].fill(' ');
        else if (c.row >= 0)
            want.rows[c.row][c.col] = ' ';
        EXPECT_EQ(std::tie(pages[0].rows, pages[0].links), std::tie(want.rows, want.links))
                << c.offset;
    }
}

// Bit errors everywhere; TSDuck's reading of its subtitle is all that another decoder gives.
TEST(DvbTeletext, SurvivesTheDamagedCapture) {
    NEED_TESTDATA("damaged-subtitles-teletext.ts");
    TeletextDecoder decoder;
    std::vector<TeletextPage> pages =
            decode(capture("damaged-subtitles-teletext.ts", 0x3E), decoder);
    std::ifstream in(DVB_TESTDATA_DIR "/truth/damaged-subtitles-teletext.json");
    std::string srt = nlohmann::json::parse(in)["teletext"][0]["tsduck_reference_srt"]["content"];
    std::string text;
    for (const TeletextPage& p : pages)
        for (const std::string& row : print(p)) text += row;
    for (const char* line : {"Han berättade", "att hon var ute på en af ärsresa."}) {
        EXPECT_NE(srt.find(line), std::string::npos) << line;
        EXPECT_NE(text.find(line), std::string::npos) << line;
    }
    EXPECT_GE(decoder.stats().pesDropped, 1u);
    EXPECT_GE(decoder.stats().packetsDropped, 1u);
    EXPECT_GE(decoder.stats().parityErrors, 1u);
}
