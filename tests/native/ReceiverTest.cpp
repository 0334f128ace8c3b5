#include <broadcast/Builtin.h>
#include <broadcast/DvbText.h>
#include <gtest/gtest.h>
#include <receiver/Modules.h>

#include <sys/stat.h>
#include <unistd.h>
#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <fstream>
#include <mutex>
#include <set>
#include <tuple>
#include <vector>

using namespace dvbrx;

namespace {

using Events = std::vector<std::array<int, 3>>;

constexpr int64_t kStart = 1709323200000;  // 2024-03-01T20:00:00Z

ANT_FrontendParameters sat(int32_t khz, int32_t pol, int32_t orbital = 192) {
    ANT_FrontendParameters p{};
    p.type = kSatellite;
    p.frequency = khz;
    p.symbolRate = 22000000;
    p.fecInner = 10;   // auto
    p.modulation = 7;  // auto
    p.polarization = pol;
    p.tone = kToneAuto;
    p.lnbpower = 1;
    p.lnbLowLO = 9750;
    p.lnbHigLO = 10600;
    p.satPosition = orbital;
    return p;
}

ANT_FrontendParameters cable(int32_t khz, int32_t modulation = 6) {
    ANT_FrontendParameters p{};
    p.type = kCable;
    p.frequency = khz;
    p.symbolRate = 6900000;
    p.fecInner = 10;
    p.modulation = modulation;
    return p;
}

ANT_FrontendParameters terrestrial(int32_t khz, int32_t bandwidth = 8000) {
    ANT_FrontendParameters p{};
    p.type = kTerrestrial;
    p.frequency = khz;
    p.bandwidth = bandwidth;
    return p;
}

using P = ANT_FrontendParameters;

template <typename T, typename V>
P with(P p, T P::*field, V value) {
    p.*field = static_cast<T>(value);
    return p;
}

class ReceiverTest : public ::testing::Test {
protected:
    ReceiverTest() { start(fallbackBroadcast(kStart / 1000)); }

    // A receiver process of its own: a second call ends the first.
    void start(dvbmodel::Broadcast broadcast) {
        cfg.clear(), scnm.clear(), strm.clear(), teltxt.clear(), rx.reset();
        Clock::Settings clock{true, kStart, 0.0, 7};
        rx = std::make_shared<Receiver>(std::move(broadcast), clock, [this](int msg, int a, int b) {
            std::lock_guard<std::mutex> lock(eventLock);
            events.push_back({msg, a, b});
        });
        cfg = new ReceiverCfg(rx);
        scnm = new ReceiverScnm(rx);
        strm = new ReceiverStrm(rx);
        teltxt = new ReceiverTeltxt(rx);
    }

    int32_t systemInit(const std::string& path) {
        setenv("DVB_EPG_DB", path.c_str(), 1);
        DVB_Config config{};
        int32_t result = scnm->Dvb_SystemInit(&config);
        unsetenv("DVB_EPG_DB");
        rx->sync();
        return result;
    }
    static void wipe(const std::string& path) {
        for (const char* s : {"", "-wal", "-shm"}) remove((path + s).c_str());
    }
    void advance(int64_t ms) {
        rx->clock().advance(ms);
        rx->sync();
    }
    Events take(int msg) {
        std::lock_guard<std::mutex> lock(eventLock);
        auto taken = std::stable_partition(events.begin(), events.end(),
                                           [msg](const auto& e) { return e[0] != msg; });
        Events out(taken, events.end());
        events.erase(taken, events.end());
        return out;
    }
    int32_t startStream(const P& p, uint16_t svc, int32_t* h) {
        STRM_OpenSettings open{};
        *h = strm->Open(&open);
        STRM_Settings s{};
        s.fe = p;
        s.svcId = svc;
        s.videoPid = static_cast<uint16_t>(svc == 28006 ? 0x201 : 0);
        s.audioPid = static_cast<uint16_t>(svc == 28006 ? 0x202 : 0);
        return strm->Start(*h, &s);
    }
    ANT_Status status() {
        ANT_Status st{};
        cfg->GetStatus(0, &st);
        return st;
    }

    std::mutex eventLock;
    Events events;
    std::shared_ptr<Receiver> rx;
    android::sp<ReceiverCfg> cfg;
    android::sp<ReceiverScnm> scnm;
    android::sp<ReceiverStrm> strm;
    android::sp<ReceiverTeltxt> teltxt;
};

TEST_F(ReceiverTest, TuneLocksOnlyWhereTheModelHasATransponder) {
    const struct {
        const char* what;
        ANT_FrontendParameters p;
        int32_t result;
    } cases[] = {
            {"satellite", sat(11493750, 0), kOk},
            {"1.25 MHz off", sat(11495000, 0), kOk},
            {"3.25 MHz off", sat(11497000, 0), kErrNoSignal},
            {"other polarisation", sat(11493750, 1), kErrNoSignal},
            {"left circular is 18 V", sat(11493750, 2), kOk},
            {"high band, tone on", with(sat(12551500, 1), &P::tone, kToneOn), kOk},
            {"high band, tone off", with(sat(12551500, 1), &P::tone, kToneOff), kErrNoSignal},
            {"low band, tone on", with(sat(11493750, 0), &P::tone, kToneOn), kErrNoSignal},
            {"dish at 13.0E", sat(11493750, 0, 130), kErrNoSignal},
            {"13.0E transponder", with(sat(11766000, 0, 130), &P::symbolRate, 27500000), kOk},
            {"LNB unpowered", with(sat(11493750, 0), &P::lnbpower, 0), kErrNoSignal},
            {"symbol rate", with(sat(11493750, 0), &P::symbolRate, 27500000), kErrNoSignal},
            {"modulation QPSK on 8PSK", with(sat(11493750, 0), &P::modulation, 0), kErrNoSignal},
            {"FEC 2/3", with(sat(11493750, 0), &P::fecInner, 1), kOk},
            {"FEC 3/4", with(sat(11493750, 0), &P::fecInner, 2), kErrNoSignal},
            {"cable", cable(346000), kOk},
            {"cable 150 kHz off", cable(346150), kOk},
            {"cable 300 kHz off", cable(346300), kErrNoSignal},
            {"cable QAM64 on QAM256", cable(346000, 4), kErrNoSignal},
            {"terrestrial", terrestrial(586000), kOk},
            {"terrestrial, any bandwidth", terrestrial(650000, 0), kOk},
            {"terrestrial 7 MHz", terrestrial(586000, 7000), kErrNoSignal},
            {"terrestrial 200 kHz off", terrestrial(586200), kErrNoSignal},
            {"unknown type", with(cable(346000), &P::type, 5), kErrBadParameter},
            {"frequency out of band", sat(100, 0), kErrBadParameter},
            {"negative frequency", terrestrial(-586000), kErrBadParameter},
    };
    for (const auto& c : cases) EXPECT_EQ(cfg->TryTune(0, &c.p), c.result) << c.what;
    ANT_FrontendParameters p = cable(346000);
    EXPECT_EQ(cfg->TryTune(2, &p), kErrBadParameter);
    EXPECT_EQ(cfg->Tune(-1, &p), kErrBadParameter);
    EXPECT_EQ(cfg->Tune(0, nullptr), kErrBadParameter);
}

TEST_F(ReceiverTest, LockIsAcquiredLostAndRegained) {
    P good = sat(11493750, 0), bad = sat(11493750, 1);
    ASSERT_EQ(cfg->Tune(0, &good), kOk);
    EXPECT_EQ(std::make_tuple(status().feStatus, status().quality),
              std::make_tuple(kFeSignal | kFeCarrier, 0));
    advance(200);
    EXPECT_EQ(status().feStatus, kFeSignal | kFeCarrier | kFeViterbi);
    advance(200);
    ANT_Status st = status();
    EXPECT_EQ(st.feStatus, 0x1F);
    EXPECT_TRUE(st.strength >= 40 && st.strength <= 90 && st.quality > 30) << st.strength;
    EXPECT_EQ(st.extStatus, st.quality * 3 / 2);

    ASSERT_EQ(cfg->Tune(0, &bad), kOk);
    advance(999);
    EXPECT_EQ(status().feStatus, 0);
    advance(1);
    EXPECT_EQ(status().feStatus, kFeTimedOut);
    ASSERT_EQ(cfg->Tune(0, &good), kOk);
    advance(400);
    // The same tuning again keeps the lock.
    ASSERT_EQ(cfg->Tune(0, &good), kOk);
    advance(100);
    EXPECT_EQ(take(kEvtLock), (Events{{kEvtLock, 0, 1}, {kEvtLock, 0, 0}, {kEvtLock, 0, 1}}));

    // A receiver with the same seed and clock reports the same signal.
    Receiver twin(fallbackBroadcast(kStart / 1000), {true, rx->clock().nowMillis(), 0.0, 7},
                  [](int, int, int) {});
    Signal a = rx->signal(good, 0, rx->clock().nowMillis());
    Signal b = twin.signal(good, 0, twin.clock().nowMillis());
    EXPECT_EQ(std::tie(a.strength, a.quality), std::tie(b.strength, b.quality));
}

TEST_F(ReceiverTest, PositionerMovesAtMotorSpeedWithinItsLimits) {
    P usals = with(with(sat(11493750, 0), &P::diseqctype, kUsals), &P::myLatitude, 515);
    double angle = usalsAngle(19.2, {0.0, 51.5});
    EXPECT_NEAR(angle, 21.15, 0.01);
    int64_t travel = std::llround(angle / kMotorDegreesPerSecond * 1000);
    ASSERT_EQ(cfg->GotoSatellite(0, 192, 0, 515), kOk);
    EXPECT_EQ(cfg->TryTune(0, &usals), kErrNoSignal);
    // 0.45 degrees short of the satellite, then there.
    advance(travel - 300);
    EXPECT_EQ(cfg->TryTune(0, &usals), kErrNoSignal);
    advance(300);
    EXPECT_EQ(cfg->TryTune(0, &usals), kOk);
    EXPECT_EQ(take(kEvtPositioner), (Events{{kEvtPositioner, 0, int(std::lround(angle * 10))}}));

    // Each step: the operation, its result, then how long the motor runs and where it stops.
    const struct {
        const char* what;
        std::function<int32_t()> op;
        int32_t result;
        int64_t runs;
        int tenths;
    } steps[] = {
            {"reset to the reference", [&] { return cfg->Reset(0); }, kOk, travel, 0},
            {"50 steps east", [&] { return cfg->Drive(0, 0, 2, 50); }, kOk, 3333, 50},
            {"east limit here", [&] { return cfg->SetLimit(0, 0); }, kOk, 0, -1},
            {"store as 7", [&] { return cfg->StorePosition(0, 7); }, kOk, 0, -1},
            {"east, until the limit", [&] { return cfg->Drive(0, 0, 0, 0); }, kOk, 0, 50},
            {"west for 2 s", [&] { return cfg->Drive(0, 1, 1, 2); }, kOk, 2000, 20},
            {"back to 7", [&] { return cfg->GotoPosition(0, 7); }, kOk, 2000, 50},
            {"limits off, 2 s east", [&] { return cfg->DisableLimit(0) | cfg->Drive(0, 0, 1, 2); },
             kOk, 2000, 80},
            {"recalculate: 7 is here", [&] { return cfg->Recalculate(0, 7); }, kOk, 0, -1},
            {"reset, back to 7", [&] { return cfg->Reset(0) | cfg->GotoPosition(0, 7); }, kOk, 5334,
             80},
            {"unknown position", [&] { return cfg->GotoPosition(0, 9); }, kErrBadParameter, 0, -1},
            {"store over the reference", [&] { return cfg->StorePosition(0, 0); }, kErrBadParameter,
             0, -1},
            {"bad direction", [&] { return cfg->Drive(0, 2, 0, 0); }, kErrBadParameter, 0, -1},
            {"below the horizon", [&] { return cfg->GotoSatellite(0, 1800, 0, 515); },
             kErrBadParameter, 0, -1},
    };
    for (const auto& s : steps) {
        EXPECT_EQ(s.op(), s.result) << s.what;
        advance(s.runs);
        auto moves = take(kEvtPositioner);
        if (s.tenths < 0) {
            EXPECT_TRUE(moves.empty()) << s.what;
        } else {
            ASSERT_FALSE(moves.empty()) << s.what;
            EXPECT_EQ(moves.back()[2], s.tenths) << s.what;
        }
    }
}

TEST_F(ReceiverTest, EachKindOfScanFindsItsServicesInItsTime) {
    const struct {
        const char* what;
        int32_t type;
        P fe;
        std::set<int> services;
        size_t transponders;
        int64_t millis;
    } cases[] = {
            {"one transponder", kScanSingle, sat(12551500, 1), {28006, 28007, 28008}, 1, 1900},
            {"network",
             kScanNetwork,
             sat(11493750, 0),
             {10301, 10302, 28006, 28007, 28008},
             2,
             4300},
            {"nothing there", kScanSingle, sat(11000000, 0), {}, 0, 1000},
            {"terrestrial band", kScanFullBand, terrestrial(0), {257, 258, 513, 514}, 2, 15400},
            {"cable band", kScanFullBand, cable(0), {101, 102, 201, 202}, 2, 18800},
            {"satellite at 13.0E", kScanFullBand, sat(0, 0, 130), {5001, 5002}, 1, 13900},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        SCNM_OpenSettings open{0, 0};
        int32_t h = scnm->Open(&open);
        ASSERT_GT(h, 0);
        SCNM_StartSettings start{};
        start.fe = c.fe;
        start.scanType = c.type;
        ASSERT_EQ(scnm->Start(h, &start), kOk);
        advance(c.millis - 1);
        SCNM_GetStatus st{};
        scnm->GetStatus(h, &st);
        EXPECT_EQ(st.result, kScanRunning);
        EXPECT_LT(st.sfStatus, 100);
        EXPECT_EQ(take(kEvtScanComplete), Events{});
        advance(1);
        scnm->GetStatus(h, &st);
        EXPECT_EQ(std::make_tuple(st.result, st.sfStatus), std::make_tuple(kScanDone, 100));
        auto progress = take(kEvtScanProgress);
        ASSERT_FALSE(progress.empty());
        EXPECT_EQ(progress.back(), (std::array<int, 3>{kEvtScanProgress, h, 100}));
        EXPECT_TRUE(std::is_sorted(progress.begin(), progress.end()));
        EXPECT_EQ(take(kEvtScanComplete), (Events{{kEvtScanComplete, h, int(c.services.size())}}));

        SCNM_ServiceInfo* svc = nullptr;
        EXPECT_EQ(scnm->CreateServiceList(h, &svc), static_cast<int32_t>(c.services.size()));
        std::set<int> found;
        for (; svc != nullptr; svc = const_cast<SCNM_ServiceInfo*>(dvbListNext(svc))) {
            found.insert(svc->svcId);
            EXPECT_NE(svc->svcName[0], 0);
        }
        EXPECT_EQ(found, c.services);
        SCNMNET_FrontEndSettings* net = nullptr;
        size_t nets = 0;
        scnm->CreateNetworkList(h, &net);
        for (; net != nullptr; net = const_cast<SCNMNET_FrontEndSettings*>(dvbListNext(net))) {
            EXPECT_EQ(net->type, c.fe.type);
            ++nets;
        }
        EXPECT_EQ(nets, c.transponders);
        EXPECT_EQ(scnm->Close(h), kOk);
    }
}

TEST_F(ReceiverTest, AStoppedScanKeepsWhatItFound) {
    SCNM_OpenSettings open{0, 0};
    int32_t h = scnm->Open(&open);
    SCNM_StartSettings start{};
    start.fe = sat(11493750, 0);
    start.scanType = kScanNetwork;
    ASSERT_EQ(scnm->Start(h, &start), kOk);
    EXPECT_EQ(scnm->Start(h, &start), kErrBusy);
    advance(3000);
    EXPECT_EQ(scnm->Stop(h), kOk);
    advance(5000);
    SCNM_GetStatus st{};
    scnm->GetStatus(h, &st);
    SCNM_ServiceInfo* svc = nullptr;
    EXPECT_EQ(std::make_tuple(st.result, st.sfStatus, scnm->CreateServiceList(h, &svc)),
              std::make_tuple(kScanStopped, 50, 2));
    EXPECT_EQ(take(kEvtScanComplete), Events{});
}

TEST_F(ReceiverTest, AStreamPlaysWhatTheTransponderCarries) {
    int32_t h;
    EXPECT_EQ(startStream(sat(12551500, 1), 10301, &h), kErrNoService);
    EXPECT_EQ(startStream(sat(12600000, 1), 28006, &h), kErrNoSignal);
    ASSERT_EQ(startStream(sat(12551500, 1), 28006, &h), kOk);
    STRM_GetStatus st{};
    strm->GetStatus(h, &st);
    EXPECT_EQ(st.pictureStatus, kNoPicture);
    advance(400);
    strm->GetStatus(h, &st);
    EXPECT_EQ(std::make_tuple(st.feStatus, st.pictureStatus, st.fpsInteger, st.fpsDecimal),
              std::make_tuple(0x1F, kDecoding, 25, 0));
    // Presented frames: the last video frame (40 ms) and audio frame (24 ms) begun by now.
    EXPECT_LT(static_cast<uint32_t>(st.localPts - st.videoPts), 3600u);
    EXPECT_LT(static_cast<uint32_t>(st.localPts - st.audioPts), 2160u);
    int32_t before = st.localPts;
    advance(1000);
    strm->GetStatus(h, &st);
    EXPECT_EQ(static_cast<uint32_t>(st.localPts - before), 90000u);

    STRM_StreamInfo info{};
    ASSERT_EQ(strm->CreatStreamInfo(h, &info), kOk);
    EXPECT_EQ(std::vector<int>({info.videoCount, info.video[0].pid, info.audioCount,
                                info.audio[0].isDolbyAC3, info.audio[1].isDolbyAC3,
                                info.audio[2].isDolbyAC3, info.subtitleCount,
                                info.subtitle[0].compositionPageId, info.teletextCount,
                                info.teletext[1].type, info.pcrPid}),
              std::vector<int>({1, 0x201, 3, 0, 0, 1, 1, 1, 2, 2, 0x201}));
    EXPECT_STREQ(info.audio[1].langCode0, "eng");

    EpgEvent present{}, following{};
    ExtEpgEvent presentExt{}, followingExt{};
    ASSERT_EQ(strm->GetAllEvent(h, &present, &following, &presentExt, &followingExt), kOk);
    int64_t now = rx->clock().nowSeconds();
    const int64_t end = present.startTime + present.duration;
    EXPECT_TRUE(present.startTime <= now && end > now) << present.startTime;
    // Every other event has items.
    EXPECT_EQ(std::make_tuple(int64_t{following.startTime}, present.runStatus, following.runStatus,
                              presentExt.itemCount + followingExt.itemCount),
              std::make_tuple(end, 4, 1, 2u));
    uint32_t t = 0;
    EXPECT_EQ(strm->GetTime(h, &t), kOk);
    EXPECT_EQ(t, static_cast<uint32_t>(now));
    EXPECT_EQ(take(kEvtPresent), (Events{{kEvtPresent, h, present.evtId}}));
    advance((end - now) * 1000);
    EXPECT_EQ(take(kEvtPresent), (Events{{kEvtPresent, h, following.evtId}}));

    // Time shift: recording from now, paused 5 s into it.
    STRM_Settings s{};
    strm->GetSettings(h, &s);
    EXPECT_EQ(s.svcId, 28006);
    s.playSpeed = 0, s.playSpeedDiv = 1, s.posTime = 5;
    ASSERT_EQ(strm->SetSettings(h, &s), kOk);
    advance(10000);
    s.posTime = 5;
    ASSERT_EQ(strm->SetSettings(h, &s), kOk);
    advance(10000);
    strm->GetStatus(h, &st);
    EXPECT_EQ(std::make_tuple(st.recstate, st.recduration, st.pbstate, st.pbposition),
              std::make_tuple(kPvrActive, 20, kPvrPaused, 5));
}

TEST_F(ReceiverTest, BadInputGetsItsResult) {
    int32_t h;
    ASSERT_EQ(startStream(sat(12551500, 1), 28006, &h), kOk);
    SCNM_OpenSettings scanOpen{0, 0};
    int32_t scan = scnm->Open(&scanOpen);
    ASSERT_EQ(scnm->Close(scan), kOk);
    STRM_GetStatus st{};
    SCNM_GetStatus sst{};
    SCNM_ServiceInfo* list = nullptr;
    SCNMNET_FrontEndSettings* nets = nullptr;
    uint8_t buf[8];
    int32_t nav[4];
    uint32_t t;
    STRM_OpenSettings badOpen{};
    badOpen.frontend = 3;
    TELTXT_Settings txt{};
    txt.pid = 0x206;
    int32_t tt = teltxt->Start(&txt);
    ASSERT_GT(tt, 0);
    const struct {
        const char* what;
        std::function<int32_t()> op;
        int32_t result;
    } cases[] = {
            {"scan used after close", [&] { return scnm->GetStatus(scan, &sst); }, kErrBadHandle},
            {"scan list after close", [&] { return scnm->CreateServiceList(scan, &list); },
             kErrBadHandle},
            {"networks after close", [&] { return scnm->CreateNetworkList(scan, &nets); },
             kErrBadHandle},
            {"unknown stream", [&] { return strm->GetStatus(12345, &st); }, kErrBadHandle},
            {"stream on no front end", [&] { return strm->Open(&badOpen); }, kErrBadParameter},
            {"time of no stream", [&] { return strm->GetTime(-7, &t); }, kErrBadHandle},
            {"negative count", [&] { return teltxt->GetData(tt, 0, -1, buf); }, kErrBadParameter},
            {"page 99",
             [&] { return teltxt->SetData(tt, 99, 0, &nav[0], &nav[1], &nav[2], &nav[3]); },
             kErrBadParameter},
            {"dump to no folder",
             [&] { return cfg->TSDumpStart(0, 0, 0, "/nonexistent/dir/dump.ts"); }, kErrPath},
            {"volume 101", [&] { return cfg->SetAudioVolume(101); }, kErrBadParameter},
            {"stream closed", [&] { return strm->Close(h) | strm->GetStatus(h, &st); },
             kErrBadHandle},
            {"teletext ended with its stream", [&] { return teltxt->Stop(tt); }, kErrBadHandle},
    };
    for (const auto& c : cases) EXPECT_EQ(c.op(), c.result) << c.what;
    EXPECT_EQ(sst.result, kErrBadHandle);
    EXPECT_TRUE(list == nullptr && nets == nullptr);
}

TEST_F(ReceiverTest, SystemInitOpensTheDatabaseFromTheServiceThreadOrSaysWhyNot) {
    std::string path = ::testing::TempDir() + "receiver-epg.db";
    std::string folder = path + ".d", text = path + ".txt";
    wipe(path);
    mkdir(folder.c_str(), 0755);
    std::ofstream(text) << "not a database\n";
    const struct {
        std::string path;
        int32_t result;
        Events ready;
    } cases[] = {{"/nonexistent/dir/epg.db", kErrPath, {}},
                 {folder, kOk, {{kEvtSystemReady, kErrDatabase, 0}}},
                 {text, kOk, {{kEvtSystemReady, kErrDatabase, 0}}},
                 {path, kOk, {{kEvtSystemReady, 0, 0}}}};
    for (const auto& c : cases) {
        EXPECT_EQ(systemInit(c.path), c.result) << c.path;
        EXPECT_EQ(take(kEvtSystemReady), c.ready) << c.path;
    }
    EXPECT_EQ(access(path.c_str(), F_OK), 0);
    rmdir(folder.c_str());
    remove(text.c_str());
}

// A service of each satellite: 158 and 156 events in the week, 21 and 24 on its first day.
const EpgSvc kKanal{0x2801, 1011, 1, {}, 0, 0, 0}, kGunes{0x3101, 12400, 318, {}, 0, 0, 0};

TEST_F(ReceiverTest, CollectedServicesFillTheEventDatabaseOnceAndSurviveARestart) {
    std::string path = ::testing::TempDir() + "receiver-epg-fill.db";
    wipe(path);
    start(dvbmodel::builtinBroadcast(kStart / 1000));
    STRM_OpenSettings open{};
    int32_t h = strm->Open(&open);
    EpgEvent ev{};
    ExtEpgEvent ext{};
    auto get = [&](const EpgSvc& svc) { return strm->EPG_GetEvent(&svc, h, &ev, &ext); };
    EXPECT_EQ(get(kKanal), kErrNotStarted);
    EpgSvc unknown{0x2899, 1011, 1, {}, 0, 0, 0};
    EXPECT_EQ(strm->EpgMd_AddService(&unknown), kErrNoService);
    ASSERT_EQ(strm->EpgMd_AddService(&kKanal), kOk);  // kept for the database to come
    ASSERT_EQ(systemInit(path), kOk);
    ASSERT_EQ(strm->EpgMd_AddService(&kGunes), kOk);
    ASSERT_EQ(strm->EpgMd_AddService(&kKanal), kOk);  // again: nothing new to store
    rx->sync();
    EXPECT_EQ(take(kEvtEpgUpdate),
              (Events{{kEvtEpgUpdate, 0x2801, 158}, {kEvtEpgUpdate, 0x3101, 156}}));
    EXPECT_EQ(rx->epg->eventCount(), 314u);

    // The event running now, then on each call the next one of the same service.
    ASSERT_EQ(get(kKanal), kOk);
    EXPECT_EQ(std::tie(ev.evtId, ev.startTime, ev.duration, ev.runStatus, ev.parentalRating,
                       ev.content, ev.extendedFlag, ext.itemCount),
              std::make_tuple(18, 1709322900, 6600, 4, 9, 0x13, 1, 3u));
    EXPECT_STREQ(ev.name, "Der letzte Zug nach S\xC8uden");
    EXPECT_STREQ(ev.text, "Drama, zwei Fremde auf einer langen Reise.");
    EXPECT_STREQ(ext.items[1].itemText, "Felix Wagner, Anna Berger");
    EXPECT_STREQ(ext.text,  // a string in Java: decoded
                 "Ein Winterabend, ein verspäteter Zug und eine Begegnung, die alles ändert. Ein "
                 "Film von Sofia Marino.");
    ASSERT_EQ(get(kKanal), kOk);
    EXPECT_EQ(std::tie(ev.evtId, ev.startTime, ev.runStatus), std::make_tuple(19, 1709329500, 1));
    ASSERT_EQ(get(kGunes), kOk);  // another service starts at now
    int walked = 1;
    int64_t end = 1709326200;
    for (; walked < 200 && get(kGunes) == kOk; ++walked) {
        EXPECT_EQ(ev.startTime, end);
        end = int64_t{ev.startTime} + ev.duration;
    }
    EXPECT_EQ(walked, 156 - 19);
    EXPECT_EQ(end, 1709856000);   // the end of the week's schedule
    ASSERT_EQ(get(kGunes), kOk);  // after the end, from now again
    EXPECT_EQ(ev.evtId, 20);

    ServiceCheck collected{192, 11362000, 1011, 0x2801}, notCollected{192, 11362000, 1011, 0x2802},
            elsewhere{130, 11362000, 1011, 0x2801};
    EXPECT_EQ(strm->CheckService(&collected), kOk);
    EXPECT_EQ(strm->CheckService(&notCollected), kErrNoData);  // on the air there
    EXPECT_EQ(strm->CheckService(&elsewhere), kErrNoService);

    start(dvbmodel::builtinBroadcast(kStart / 1000));
    ASSERT_EQ(systemInit(path), kOk);
    EXPECT_EQ(take(kEvtEpgUpdate), Events{});  // the list is back, nothing new
    EXPECT_EQ(rx->epg->services().size(), 2u);
    // A new day moves every section by a day: the past day's events go.
    advance(4 * 3600 * 1000);
    EXPECT_EQ(take(kEvtEpgUpdate),
              (Events{{kEvtEpgUpdate, 0x2801, 137}, {kEvtEpgUpdate, 0x3101, 132}}));
    EXPECT_EQ(rx->epg->eventCount(), 269u);
    ASSERT_EQ(strm->EpgMd_ClearService(), kOk);
    rx->sync();
    EXPECT_EQ(rx->epg->services().size(), 0u);
    EXPECT_EQ(rx->epg->eventCount(), 269u);  // clearing the list keeps the events
    wipe(path);
}

}  // namespace
