// The receiver's subtitle and teletext decoders over the built-in broadcast, on a stopped clock.
#include <gtest/gtest.h>
#include <receiver/Modules.h>
#include <receiver/SubtitleData.h>
#include <receiver/Teletext.h>

#include <cstring>
#include <mutex>
#include <vector>

#include "broadcast/Builtin.h"

using namespace dvbrx;

namespace {

constexpr int64_t kStart = 1709323200000;  // 2024-03-01T20:00:00Z, the start of the loop
using Events = std::vector<std::array<int, 3>>;

// Kanal Eins on the 506 MHz terrestrial multiplex: German subtitles (PID 0x105, page 1) and
// teletext (PID 0x106).
class DecodersTest : public ::testing::Test {
protected:
    DecodersTest() {
        dvbmodel::Broadcast b = dvbmodel::builtinBroadcast(kStart / 1000);
        auto& pages = b.networks[3].transports[0].services[0].teletext;
        // Page 0x150 without links: its navigation comes from the pages present.
        for (auto& p : pages)
            if (p.number == 0x150) p.links = {};
        // Page 0x777 with what the built-in pages do not use: hold, conceal, blast-through.
        dvbmodel::TeletextPage crafted;
        crafted.number = 0x777;
        for (auto& row : crafted.rows) row.fill(' ');
        const uint8_t row1[] = {0x11, 0x7F, 0x1E, 0x03, 0x18, 'A', 0x12, 0x1F, 'a', 'B'};
        std::copy(std::begin(row1), std::end(row1), crafted.rows[1].begin());
        pages.insert(pages.begin(), crafted);
        rx = std::make_shared<Receiver>(std::move(b), Clock::Settings{true, kStart, 0.0, 7},
                                        [this](int msg, int a, int b) {
                                            std::lock_guard<std::mutex> lock(eventLock);
                                            if (msg >= kEvtSubtitle) events.push_back({msg, a, b});
                                        });
        service = &rx->broadcast().networks[3].transports[0].services[0];
        strm = new ReceiverStrm(rx);
        subttl = new ReceiverSubttl(rx);
        teltxt = new ReceiverTeltxt(rx);
        STRM_OpenSettings open{};
        stream = strm->Open(&open);
        STRM_Settings s{};
        s.fe.type = kTerrestrial, s.fe.frequency = 506000, s.svcId = 0x0311;
        EXPECT_EQ(strm->Start(stream, &s), kOk);
        advance(1000);
        SUBTTL_Settings sub{};
        sub.pid = 0x105, sub.compositionPageId = sub.ancillaryPageId = 1;
        sub.hstrm = static_cast<uint32_t>(stream);
        subHandle = subttl->Start(&sub);
        TELTXT_Settings txt{};
        txt.pid = 0x106;
        txtHandle = teltxt->Start(&txt);
        rx->sync();
    }
    void advance(int64_t ms) {
        rx->clock().advance(ms);
        rx->sync();
    }
    Events take() {
        std::lock_guard<std::mutex> lock(eventLock);
        return std::move(events);
    }
    int32_t select(int32_t page, int32_t subpage = 0) {
        nav = {};
        return teltxt->SetData(txtHandle, page, subpage, &nav[0], &nav[1], &nav[2], &nav[3]);
    }
    TeltxtImage image() {
        TeltxtImage i;
        EXPECT_EQ(teltxt->GetData(txtHandle, 0, sizeof i, reinterpret_cast<uint8_t*>(&i)), kOk);
        return i;
    }

    std::shared_ptr<Receiver> rx;
    const dvbmodel::Service* service;
    android::sp<ReceiverStrm> strm;
    android::sp<ReceiverSubttl> subttl;
    android::sp<ReceiverTeltxt> teltxt;
    int32_t stream = 0, subHandle = 0, txtHandle = 0;
    std::array<int32_t, 4> nav{};
    std::mutex eventLock;
    Events events;
};

TEST_F(DecodersTest, SubtitleBufferHoldsTheModelsDisplaySetWithTheStreamsPts) {
    // Filled with a pattern, and longer than the buffer, to see what is written.
    std::vector<uint8_t> bytes(sizeof(SUBTTL_Data) + 64, 0xAA);
    auto* data = reinterpret_cast<SUBTTL_Data*>(bytes.data());
    ASSERT_EQ(subttl->GetData(subHandle, data), kOk);
    const dvbmodel::DisplaySet& set = service->subtitles[0];
    STRM_GetStatus st{};
    strm->GetStatus(stream, &st);
    // Shown at the loop's start, 1000 ms ago.
    EXPECT_EQ(static_cast<uint32_t>(st.localPts - data->i_pts), 90000u);
    EXPECT_EQ(std::vector<int32_t>({data->numPage, data->page[0].i_id, data->page[0].i_timeout,
                                    data->page[0].i_state, data->page[0].i_version}),
              std::vector<int32_t>({1, 1, set.timeout, set.state, set.version}));
    ASSERT_EQ(data->page[0].i_region_defs, static_cast<int32_t>(set.placements.size()));
    ASSERT_EQ(data->numRegions, static_cast<int32_t>(set.regions.size()));
    for (size_t r = 0; r < set.regions.size(); ++r) {
        const SUBTTL_Region_t& out = data->regions[r];
        const dvbmodel::Region& in = set.regions[r];
        EXPECT_EQ(data->page[0].region_defs[r].i_y, set.placements[r].y);
        EXPECT_EQ(std::vector<int32_t>({out.i_id, out.i_x, out.i_y, out.i_width, out.i_height,
                                        out.i_depth, out.i_clut, out.i_object_defs}),
                  std::vector<int32_t>({in.id, set.placements[r].x, set.placements[r].y, in.width,
                                        in.height, in.depth, in.clutId, 1}));
        EXPECT_EQ(memcmp(out.p_pixbuf, in.pixels.data(), in.pixels.size()), 0);
        EXPECT_EQ(out.object_defs[0].i_fg_pc, in.objects[0].foreground);
    }
    EXPECT_EQ(data->regions[set.regions.size()].i_id, static_cast<int32_t>(0xAAAAAAAA));
    ASSERT_EQ(data->numCluts, 1);
    EXPECT_EQ(data->cluts[0].i_id, set.cluts[0].id);
    EXPECT_EQ(memcmp(data->cluts[0].c_8b, set.cluts[0].c8.data(), 1024), 0);
    EXPECT_EQ(std::vector<int32_t>({data->display.i_id, data->display.i_width,
                                    data->display.i_height, data->display.b_windowed}),
              std::vector<int32_t>({1, 720, 576, 0}));
    EXPECT_EQ(memcmp(&data->defaultClut, &defaultClut(), sizeof(SUBTTL_Clut)), 0);
    EXPECT_EQ(bytes.back(), 0xAA);

    EXPECT_EQ(subttl->GetData(subHandle, nullptr), kErrBadParameter);
    EXPECT_EQ(subttl->Stop(subHandle), kOk);
    EXPECT_EQ(subttl->GetData(subHandle, data), kErrBadHandle);
}

TEST(SubtitleData, StaysWithinTheBuffersRoom) {
    dvbmodel::DisplaySet set;
    dvbmodel::Region big;
    big.width = 700, big.height = 600, big.pixels.assign(700 * 600, 5), big.objects.resize(20);
    set.regions.assign(7, big), set.placements.resize(20), set.cluts.resize(6);
    std::vector<uint8_t> bytes(sizeof(SUBTTL_Data) + 64, 0xAA);
    auto* data = reinterpret_cast<SUBTTL_Data*>(bytes.data());
    fillSubtitleData(set, 7, data);
    EXPECT_EQ(std::vector<int32_t>({data->numRegions, data->page[0].i_region_defs, data->numCluts,
                                    data->regions[4].i_object_defs, data->regions[4].i_height}),
              std::vector<int32_t>({5, 16, 4, 16, 384000 / 700}));
    EXPECT_EQ(data->regions[4].p_pixbuf[548 * 700 - 1], 5);
    EXPECT_EQ(data->regions[4].p_pixbuf[548 * 700], 0xAA);
    EXPECT_EQ(std::count(bytes.end() - 64, bytes.end(), 0xAA), 64);
}

TEST(SubtitleData, DefaultClutHasTheStandardsColours) {
    const SUBTTL_Clut& c = defaultClut();
    const struct {
        const SUBTTL_ClutEntry& entry;
        std::array<int, 4> ycrcbt;
    } cases[] = {
            {c.c_2b[0], {0, 128, 128, 255}},   {c.c_2b[1], {235, 128, 128, 0}},
            {c.c_2b[2], {16, 128, 128, 0}},    {c.c_2b[3], {126, 128, 128, 0}},
            {c.c_4b[4], {41, 110, 240, 0}},    {c.c_4b[9], {49, 184, 109, 0}},
            {c.c_8b[0], {0, 128, 128, 255}},   {c.c_8b[0x01], {81, 240, 90, 191}},
            {c.c_8b[0x10], {60, 203, 103, 0}}, {c.c_8b[0x4C], {41, 110, 240, 128}},
            {c.c_8b[0x88], {16, 128, 128, 0}}, {c.c_8b[0xD6], {181, 141, 159, 0}},
    };
    for (const auto& k : cases)
        EXPECT_EQ((std::array<int, 4>{k.entry.y, k.entry.cr, k.entry.cb, k.entry.t}), k.ycrcbt);
}

TEST_F(DecodersTest, NewDisplaySetsAndPageSendingsRaiseTheirEvents) {
    auto regions = [&](size_t set) {
        return static_cast<int>(service->subtitles[set].regions.size());
    };
    EXPECT_EQ(take(), (Events{{kEvtSubtitle, subHandle, regions(0)},
                              {kEvtTeletext, txtHandle, 0x1000000}}));
    EXPECT_EQ(select(0x101), kOk);
    advance(3499);
    EXPECT_EQ(take(), Events{});
    advance(1);  // 4500: the cue is cleared
    EXPECT_EQ(take(), (Events{{kEvtSubtitle, subHandle, 0}}));
    // 20000: the fourth cue, and the second story of the news.
    advance(15500);
    EXPECT_EQ(take(), (Events{{kEvtSubtitle, subHandle, regions(6)},
                              {kEvtTeletext, txtHandle, 0x1010002}}));
    EXPECT_EQ(image().subcode, 2);
    // Story 3 was last sent in the loop before; it is sent again at 40000.
    EXPECT_EQ(select(0x101, 3), kOk);
    EXPECT_EQ(image().subcode, 3);
    EXPECT_EQ(image().subpages, 3);
    advance(20000);
    EXPECT_EQ(take(), (Events{{kEvtSubtitle, subHandle, regions(12)},
                              {kEvtTeletext, txtHandle, 0x1010003}}));
}

TEST_F(DecodersTest, TeletextPageImageShowsCharactersWithTheirAttributes) {
    constexpr uint16_t DH = kCellDoubleHeight, Lower = kCellLowerHalf, Mosaic = kCellMosaic;
    const struct {
        int32_t page;
        int row, col;
        char32_t ch;
        uint8_t fg, bg;
        uint16_t flags;
    } cases[] = {
            {0x100, 0, 1, U'P', kTtxWhite, kTtxBlack, 0},
            {0x100, 0, 39, U'1', kTtxWhite, kTtxBlack, 0},  // the clock: 20:00:01
            {0x100, 1, 1, U' ', kTtxBlue, kTtxBlue, 0},     // new background, set at
            {0x100, 1, 3, U' ', kTtxWhite, kTtxBlue, 0},    // double height, set after
            {0x100, 1, 5, U'K', kTtxWhite, kTtxBlue, DH},
            {0x100, 2, 5, U'K', kTtxWhite, kTtxBlue, Lower},
            {0x100, 2, 0, U' ', kTtxWhite, kTtxBlack, 0},
            {0x100, 3, 1, U'\U0001FB0E', kTtxYellow, kTtxBlack, Mosaic},
            {0x100, 4, 2, U'\U0001FB17', kTtxRed, kTtxBlack, Mosaic | kCellSeparated},
            {0x100, 20, 9, U'ä', kTtxGreen, kTtxBlack, 0},
            {0x101, 22, 2, U'W', kTtxWhite, kTtxBlack, kCellFlash},
            {0x150, 20, 4, U' ', kTtxYellow, kTtxBlack, DH | kCellBoxed},
            {0x150, 21, 5, U'E', kTtxYellow, kTtxBlack, Lower | kCellBoxed},
            {0x777, 1, 0, U' ', kTtxWhite, kTtxBlack, 0},
            {0x777, 1, 1, U'█', kTtxRed, kTtxBlack, Mosaic},
            {0x777, 1, 2, U'█', kTtxRed, kTtxBlack, Mosaic},  // hold, set at
            {0x777, 1, 3, U'█', kTtxRed, kTtxBlack, Mosaic},  // held, then alphanumerics
            {0x777, 1, 5, U'A', kTtxYellow, kTtxBlack, kCellConceal},
            {0x777, 1, 7, U' ', kTtxGreen, kTtxBlack, 0},  // nothing held since the change
            {0x777, 1, 8, U'\U0001FB1F', kTtxGreen, kTtxBlack, Mosaic},
            {0x777, 1, 9, U'B', kTtxGreen, kTtxBlack, 0},
    };
    for (const auto& k : cases) {
        ASSERT_EQ(select(k.page), kOk);
        const TeltxtImage i = image();
        const TeltxtCellRecord& c = i.cells[k.row][k.col];
        EXPECT_EQ(std::vector<uint32_t>({c.ch, c.foreground, c.background, c.flags}),
                  std::vector<uint32_t>({k.ch, k.fg, k.bg, k.flags}))
                << std::hex << k.page << std::dec << " row " << k.row << " col " << k.col;
    }
    select(0x150);
    const TeltxtImage i = image();
    EXPECT_EQ(std::vector<uint32_t>({i.page, i.subcode, i.controlBits, i.nationalOption, i.status,
                                     i.time, i.subpages}),
              std::vector<uint32_t>({0x150, 0, 0x40A0, 1, kTtxShown, kStart / 1000 + 1, 1}));
    // Beyond the image: zeros.
    uint8_t tail[16];
    memset(tail, 0xAA, sizeof tail);
    EXPECT_EQ(teltxt->GetData(txtHandle, sizeof i - 8, sizeof tail, tail), kOk);
    EXPECT_EQ(std::count(tail + 8, tail + 16, 0), 8);
}

TEST_F(DecodersTest, NavigationFollowsTheLinksOrThePagesPresent) {
    const struct {
        int32_t page;
        int32_t result;
        std::array<int32_t, 4> nav;
    } cases[] = {
            {0x200, kOk, {0x101, 0x200, 0x300, 0x150}},  // red, green, yellow, cyan
            {0x150, kOk, {0x888, 0x100, 0x200, 0x200}},
            {0x555, kErrNoData, {0x300, 0x300, 0x777, 0x777}},
            {0x900, kErrBadParameter, {0, 0, 0, 0}},
    };
    for (const auto& k : cases) {
        EXPECT_EQ(select(k.page), k.result) << std::hex << k.page;
        EXPECT_EQ(nav, k.nav) << std::hex << k.page;
    }
}

}  // namespace
