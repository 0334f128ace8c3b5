#include <gtest/gtest.h>
#include <libzvbi.h>

#include <map>
#include <sstream>

#include "Captures.h"
#include "broadcast/Builtin.h"
#include "broadcast/DvbTeletext.h"
#include "receiver/Teletext.h"

using namespace dvbmodel;
using namespace testdata;

namespace {

using Text = std::array<std::string, 25>;

// A page's text with the national option of C12..C14 (C12 the highest bit), the header
// from column 8 on (libzvbi prints its own page number before that).
Text print(const TeletextPage& p) {
    const int c = p.controlBits;
    Text text = dvbrx::teletextText(p.rows, (c >> 10 & 4) | (c >> 12 & 2) | (c >> 14 & 1));
    text[0].erase(0, 8);
    return text;
}

// libzvbi's own decoding of PES packets: each page reception, printed.
struct Zvbi {
    vbi_decoder* vbi = vbi_decoder_new();
    std::vector<std::tuple<int, int, Text>> pages;  // number, subcode, text
    explicit Zvbi(const Packets& pes) {
        vbi_event_handler_register(vbi, VBI_EVENT_TTX_PAGE, &Zvbi::page, this);
        vbi_dvb_demux* dx = vbi_dvb_pes_demux_new(&Zvbi::lines, this);
        for (const auto& p : pes) vbi_dvb_demux_feed(dx, p.data(), p.size());
        vbi_dvb_demux_delete(dx);
        vbi_decoder_delete(vbi);
    }
    static vbi_bool lines(vbi_dvb_demux*, void* z, const vbi_sliced* s, unsigned n, int64_t pts) {
        vbi_decode(static_cast<Zvbi*>(z)->vbi, const_cast<vbi_sliced*>(s), n, pts / 90000.0);
        return true;
    }
    static void page(vbi_event* e, void* user) {
        auto* z = static_cast<Zvbi*>(user);
        vbi_page pg;
        const int no = e->ev.ttx_page.pgno, sub = e->ev.ttx_page.subno;
        const bool fetched =
                vbi_fetch_vt_page(z->vbi, &pg, no, VBI_ANY_SUBNO, VBI_WST_LEVEL_1p5, 25, 1);
        Text text;
        for (int r = 0; r < 25; ++r) {
            text[r].resize(4 * 40);
            text[r].resize(
                    vbi_print_page_region(&pg, text[r].data(), 160, "UTF-8", 0, 1, 0, r, 40, 1));
        }
        text[0].erase(0, 8);
        z->pages.emplace_back(fetched ? no : -1, sub, text);
        vbi_unref_page(&pg);
    }
};

// The pages of one PID of a capture, but those of its last `skipLast` PES packets.
std::vector<TeletextPage> decode(const char* name, uint16_t pid, TeletextDecoder& decoder,
                                 size_t skipLast) {
    const Packets pes = testdata::pes(name, pid);
    std::vector<TeletextPage> pages;
    for (size_t i = 0; i + skipLast < pes.size(); ++i)
        decoder.feed(pes[i].data(), pes[i].size(), 0, pages);
    return pages;
}

// The truth is libzvbi's text at level 1.5, where X/26 packets put diacritical marks on
// capitals (no Latin national option has an accented capital): our level 1 has the base
// letter. libzvbi reads a PES's lines when the next one starts, and reports decimal pages.
TEST(DvbTeletext, DecodesArteAsLibzvbiDid) {
    NEED_CAPTURE("teletext-arte.ts");
    TeletextDecoder decoder;
    const std::vector<TeletextPage> pages = decode("teletext-arte.ts", 0x042C, decoder, 1);
    const auto zvbi = truth("teletext-arte")["teletext"][0];
    std::map<std::string, std::vector<Text>> received;
    for (const TeletextPage& p : pages) {
        char number[8];
        snprintf(number, sizeof number, "%x", p.number);
        if ((p.number & 0xF) < 10 && (p.number & 0xF0) < 0xA0) received[number].push_back(print(p));
    }
    ASSERT_EQ(received.size(), zvbi["distinct_pages"].get<size_t>());
    for (const auto& [number, page] : zvbi["pages"].items())
        EXPECT_EQ(received[number].size(), page["receptions"].get<size_t>()) << number;
    for (const auto& [number, page] : zvbi["page_text"].items()) {
        const Text& text = received[number].at(page["reception_index"]);
        for (int r = 0; r < 25; ++r) {
            std::string want = page["rows"][r], base = "AAAAAAACEEEEIIIIDNOOOOO*OUUUUY";
            for (size_t i = 0; (i = want.find('\xC3', i)) != std::string::npos; ++i)
                if (uint8_t(want[i + 1]) < 0x9E) want.replace(i, 2, 1, base[want[i + 1] & 0x3F]);
            EXPECT_EQ(text[r], want.substr(r ? 0 : 8, want.size() - (r ? 1 : 9)))
                    << number << " " << r;
        }
    }
    const auto& subtitles = zvbi["subtitle_pages"]["889"];
    ASSERT_EQ(received["889"].size(), subtitles.size());
    for (size_t i = 0; i < subtitles.size(); ++i) {
        std::vector<std::string> lines;
        for (int r = 1; r < 25; ++r) {
            const std::string& row = received["889"][i][r];
            size_t from = row.find_first_not_of(' '), to = row.find_last_not_of(' ');
            if (from != std::string::npos) lines.push_back(row.substr(from, to + 1 - from));
        }
        EXPECT_EQ(lines, subtitles[i]["lines"].get<std::vector<std::string>>()) << i;
    }
}

TEST(DvbTeletext, BuiltinPagesTravelToLibzvbiAndBack) {
    for (const Network& n : builtinBroadcast(1767290400).networks)
        for (const Transport& t : n.transports)
            for (const Service& s : t.services) {
                // Every other page with a subcode that has all four digits.
                std::vector<TeletextPage> sent = s.teletext;
                for (size_t i = 1; i < sent.size(); i += 2) sent[i].subcode = 0x2359;
                Packets pes;
                for (const TeletextPage& page : sent) {
                    // A time-filling header of the page's magazine completes it.
                    TeletextPage pair[2] = {page, {}};
                    pair[1].number = (page.number & 0xF00) | 0xFF;
                    pes.push_back(encodeTeletextPes(pair, 2, uint64_t(page.time) * 90));
                }
                // libzvbi passes a frame of lines on when the next one starts.
                TeletextPage end;
                end.number = 0x1FF;
                pes.push_back(encodeTeletextPes(&end, 1, 0));
                TeletextDecoder decoder;
                std::vector<TeletextPage> back;
                for (const auto& p : pes) decoder.feed(p.data(), p.size(), 0, back);
                Zvbi zvbi(pes);
                ASSERT_EQ(back.size(), sent.size());
                ASSERT_EQ(zvbi.pages.size(), sent.size());
                for (size_t i = 0; i < back.size(); ++i) {
                    const TeletextPage &a = sent[i], &b = back[i];
                    EXPECT_EQ(std::tie(a.number, a.subcode, a.controlBits, a.rows, a.links,
                                       a.charset),
                              std::tie(b.number, b.subcode, b.controlBits, b.rows, b.links,
                                       b.charset));
                    EXPECT_EQ(zvbi.pages[i],
                              std::make_tuple(int(a.number), int(a.subcode), print(a)));
                }
            }
}

// A page's data units: 0 its header, 1 its links, 2 its character set, 3.. rows 1..24; in each,
// byte 3 the framing code, 4.. the packet (4, 5 the address, 6.. the page number or the text).
TEST(DvbTeletext, KeepsWhatIsSoundOfDamagedUnits) {
    TeletextPage original = builtinBroadcast(0).networks[0].transports[0].services[0].teletext[0];
    original.charset = 0x15;
    TeletextPage pair[2] = {original, {}};
    pair[1].number = 0x1FF;
    const std::vector<uint8_t> pes = encodeTeletextPes(pair, 2, 0);
    auto unit = [](int u, int at) { return size_t(46 + 46 * u + at); };
    // The byte, the bits flipped; the pages decoded; PES, units and packets dropped, parity errors;
    // what is lost: a row (col -1), a character, the links (row 25) or the character set (26).
    using U = uint32_t;
    const std::tuple<size_t, uint8_t, size_t, U, U, U, U, int, int> cases[] = {
            {unit(0, 4), 0x01, 1, 0, 0, 0, 0, -1, 0},  // one bit: corrected
            {unit(0, 4), 0x03, 0, 0, 0, 1, 0, -1, 0},  // the header's address
            {unit(0, 6), 0x0C, 0, 0, 0, 1, 0, -1, 0},  // its page number
            {unit(7, 5), 0x30, 1, 0, 0, 1, 0, 5, -1},  // row 5's address
            {unit(5, 9), 0x40, 1, 0, 0, 0, 1, 3, 3},   // a character's parity
            {unit(4, 3), 0x10, 1, 0, 1, 0, 0, 2, -1},  // a framing code
            {unit(1, 7), 0x81, 1, 0, 0, 1, 0, 25, 0},  // a link
            {unit(2, 8), 0x41, 1, 0, 0, 1, 0, 26, 0},  // the designation
            {45, 0x30, 0, 1, 0, 0, 0, -1, 0},          // the data identifier
            {3, 0x01, 0, 1, 0, 0, 0, -1, 0},           // the stream id
    };
    for (const auto& [at, mask, count, pesOut, unitsOut, packetsOut, parity, row, col] : cases) {
        SCOPED_TRACE(at);
        std::vector<uint8_t> damaged = pes;
        damaged[at] ^= mask;
        TeletextDecoder decoder;
        std::vector<TeletextPage> pages;
        decoder.feed(damaged.data(), damaged.size(), 0, pages);
        const TeletextStats& st = decoder.stats();
        EXPECT_EQ(std::tie(st.pesDropped, st.unitsDropped, st.packetsDropped, st.parityErrors),
                  std::tie(pesOut, unitsOut, packetsOut, parity));
        ASSERT_EQ(pages.size(), count);
        if (!count) continue;
        TeletextPage want = original;
        if (row == 26) want.charset = kNoCharset;
        if (row == 25) want.links = {};
        if (row >= 0 && row < 25 && col < 0) want.rows[row].fill(' ');
        if (row >= 0 && row < 25 && col >= 0) want.rows[row][col] = ' ';
        EXPECT_EQ(std::tie(pages[0].rows, pages[0].links, pages[0].charset),
                  std::tie(want.rows, want.links, want.charset));
    }
}

// Bit errors everywhere: libzvbi completes no page of it; TSDuck's reading of its one subtitle
// is what another decoder gives, and ours holds it.
TEST(DvbTeletext, SurvivesTheDamagedCapture) {
    NEED_CAPTURE("damaged-subtitles-teletext.ts");
    TeletextDecoder decoder;
    std::string text;
    for (const TeletextPage& p : decode("damaged-subtitles-teletext.ts", 0x3E, decoder, 0))
        for (const std::string& row : print(p)) text += row;
    // The subtitle's text lines follow its number and its times.
    std::istringstream srt(
            truth("damaged-subtitles-teletext")["teletext"][0]["tsduck_reference_srt"]["content"]
                    .get<std::string>());
    int n = 0;
    for (std::string line; std::getline(srt, line);)
        EXPECT_TRUE(++n <= 2 || text.find(line) != std::string::npos) << line;
    EXPECT_GT(n, 3);
    const TeletextStats& st = decoder.stats();
    EXPECT_TRUE(st.pesDropped && st.packetsDropped && st.parityErrors);
}

}  // namespace
