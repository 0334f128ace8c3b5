// The emulated receiver through its modules, on a stopped clock that only the tests move: tuning,
// the positioner, scans, streams, the event database, and the subtitle and teletext decoders.
#include <broadcast/Builtin.h>
#include <gtest/gtest.h>
#include <receiver/Modules.h>
#include <receiver/SubtitleData.h>
#include <receiver/Teletext.h>
#include "Captures.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <future>
#include <mutex>
#include <set>
#include <thread>
#include <tuple>
#include <vector>

using namespace dvbrx;

namespace {

using Events = std::vector<std::array<int, 3>>;

constexpr int64_t kStart = 1709323200000;  // 2024-03-01T20:00:00Z, the start of the loop

ANT_FrontendParameters sat(int32_t khz, int32_t pol, int32_t orbital = 192) {
    ANT_FrontendParameters p{};
    p.type = kSatellite, p.frequency = khz, p.symbolRate = 22000000, p.polarization = pol;
    p.fecInner = 10, p.modulation = 7, p.tone = kToneAuto;  // auto, auto, auto
    p.lnbpower = 1, p.lnbLowLO = 9750, p.lnbHigLO = 10600, p.satPosition = orbital;
    return p;
}

ANT_FrontendParameters cable(int32_t khz, int32_t modulation = 6) {
    ANT_FrontendParameters p{};
    p.type = kCable, p.frequency = khz, p.symbolRate = 6900000, p.fecInner = 10;
    p.modulation = modulation;
    return p;
}

ANT_FrontendParameters terrestrial(int32_t khz, int32_t bandwidth = 8000) {
    ANT_FrontendParameters p{};
    p.type = kTerrestrial, p.frequency = khz, p.bandwidth = bandwidth;
    return p;
}

using P = ANT_FrontendParameters;

template <typename T, typename V>
P with(P p, T P::*field, V value) {
    p.*field = static_cast<T>(value);
    return p;
}

// A receiver of the test's own and its modules; the events it raises wait for take().
class Harness : public ::testing::Test {
protected:
    // A receiver process of its own: a second call ends the first.
    void start(dvbmodel::Broadcast broadcast) {
        cfg.clear(), scnm.clear(), strm.clear(), subttl.clear(), teltxt.clear(), rx.reset();
        Clock::Settings clock{true, kStart, 0.0, 7};
        rx = std::make_shared<Receiver>(std::move(broadcast), clock, [this](int msg, int a, int b) {
            std::lock_guard<std::mutex> lock(eventLock);
            events.push_back({msg, a, b});
        });
        cfg = new ReceiverCfg(rx), scnm = new ReceiverScnm(rx), strm = new ReceiverStrm(rx);
        subttl = new ReceiverSubttl(rx), teltxt = new ReceiverTeltxt(rx);
    }
    void advance(int64_t ms) { rx->clock().advance(ms), rx->sync(); }
    int32_t startStream(const P& p, uint16_t svc, int32_t* h) {
        STRM_OpenSettings open{};
        *h = strm->Open(&open);
        STRM_Settings s{};
        s.fe = p, s.svcId = svc, s.videoPid = svc == 28006 ? 0x201 : 0;
        s.audioPid = svc == 28006 ? 0x202 : 0;
        return strm->Start(*h, &s);
    }
    STRM_GetStatus streamStatus(int32_t h) {
        STRM_GetStatus st{};
        return strm->GetStatus(h, &st), st;
    }
    // The settings of stream `h` that time-shift it at `speed` into the scratch folder.
    STRM_Settings shifted(int32_t h, int32_t speed) {
        rx->recordDir = dir.path;
        STRM_Settings s{};
        strm->GetSettings(h, &s);
        s.playSpeed = speed, s.playSpeedDiv = 1;
        return s;
    }
    int32_t startSubtitles(uint16_t pid, uint32_t stream) {
        SUBTTL_Settings sub{};
        sub.pid = pid, sub.compositionPageId = sub.ancillaryPageId = 1, sub.hstrm = stream;
        return subttl->Start(&sub);
    }
    // The events with a code in [from, to] in the order raised; the others stay.
    Events take(int from, int to = 0) {
        std::lock_guard<std::mutex> lock(eventLock);
        auto taken = std::stable_partition(events.begin(), events.end(), [&](const auto& e) {
            return e[0] < from || e[0] > std::max(from, to);
        });
        Events out(taken, events.end());
        events.erase(taken, events.end());
        return out;
    }

    testdata::TempDir dir;  // first: it goes after the receiver and its event database
    std::mutex eventLock;
    Events events;
    std::shared_ptr<Receiver> rx;
    android::sp<ReceiverCfg> cfg;
    android::sp<ReceiverScnm> scnm;
    android::sp<ReceiverStrm> strm;
    android::sp<ReceiverSubttl> subttl;
    android::sp<ReceiverTeltxt> teltxt;
};

class ReceiverTest : public Harness {
protected:
    ReceiverTest() { start(fallbackBroadcast(kStart / 1000)); }

    int32_t systemInit(const std::string& path) {
        setenv("DVB_EPG_DB", path.c_str(), 1);
        DVB_Config config{};
        int32_t result = scnm->Dvb_SystemInit(&config);
        unsetenv("DVB_EPG_DB");
        rx->sync();
        return result;
    }
    ANT_Status status() {
        ANT_Status st{};
        cfg->GetStatus(0, &st);
        return st;
    }
};

TEST_F(ReceiverTest, TuneLocksOnlyWhereTheModelHasATransponder) {
    const std::tuple<const char*, P, int32_t> cases[] = {
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
    for (const auto& [what, p, result] : cases) EXPECT_EQ(cfg->TryTune(0, &p), result) << what;
    ANT_FrontendParameters p = cable(346000);  // a front end of none, or no parameters
    EXPECT_EQ(std::vector<int32_t>({cfg->TryTune(2, &p), cfg->Tune(-1, &p), cfg->Tune(0, nullptr)}),
              std::vector<int32_t>(3, kErrBadParameter));
}

TEST_F(ReceiverTest, LockIsAcquiredLostAndRegained) {
    P good = sat(11493750, 0), bad = sat(11493750, 1);
    auto after = [&](int64_t ms) { return advance(ms), status().feStatus; };
    ASSERT_EQ(cfg->Tune(0, &good), kOk);
    EXPECT_EQ(std::make_tuple(status().feStatus, status().quality),
              std::make_tuple(kFeSignal | kFeCarrier, 0));
    EXPECT_EQ(after(200), kFeSignal | kFeCarrier | kFeViterbi);
    EXPECT_EQ(after(200), 0x1F);
    ANT_Status st = status();
    EXPECT_TRUE(st.strength >= 40 && st.strength <= 90 && st.quality > 30) << st.strength;
    EXPECT_EQ(st.extStatus, st.quality * 3 / 2);

    ASSERT_EQ(cfg->Tune(0, &bad), kOk);
    EXPECT_EQ(after(999), 0);
    EXPECT_EQ(after(1), kFeTimedOut);
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
    auto tune = [&] { return cfg->TryTune(0, &usals); };
    // Each step: the operation, its result, then how long the motor runs and where it stops.
    constexpr int32_t kBad = kErrBadParameter;
    const std::tuple<const char*, std::function<int32_t()>, int32_t, int64_t, int> steps[] = {
            {"to 19.2E", [&] { return cfg->GotoSatellite(0, 192, 0, 515) | tune(); }, kErrNoSignal,
             travel - 300, -1},
            {"0.45 degrees short", tune, kErrNoSignal, 300, int(std::lround(angle * 10))},
            {"there", tune, kOk, 0, -1},
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
            {"reset, to 7", [&] { return cfg->Reset(0) | cfg->GotoPosition(0, 7); }, kOk, 5334, 80},
            {"unknown position", [&] { return cfg->GotoPosition(0, 9); }, kBad, 0, -1},
            {"store over the reference", [&] { return cfg->StorePosition(0, 0); }, kBad, 0, -1},
            {"bad direction", [&] { return cfg->Drive(0, 2, 0, 0); }, kBad, 0, -1},
            {"below the horizon", [&] { return cfg->GotoSatellite(0, 1800, 0, 515); }, kBad, 0, -1},
    };
    for (const auto& [what, op, result, runs, tenths] : steps) {
        EXPECT_EQ(op(), result) << what;
        advance(runs);
        auto moves = take(kEvtPositioner);
        ASSERT_EQ(moves.empty(), tenths < 0) << what;
        EXPECT_EQ(moves.empty() ? tenths : moves.back()[2], tenths) << what;
    }
}

// A scan stopped midway (stopAt > 0) keeps what it found and reports no completion.
TEST_F(ReceiverTest, EachKindOfScanFindsItsServicesInItsTime) {
    const P astra = sat(11493750, 0);
    // What, the scan and where, the services and transponders found, when it ends, when stopped.
    const std::tuple<const char*, int32_t, P, std::set<int>, size_t, int64_t, int64_t> cases[] = {
            {"one transponder", kScanSingle, sat(12551500, 1), {28006, 28007, 28008}, 1, 1900, 0},
            {"NIT", kScanNetwork, astra, {10301, 10302, 28006, 28007, 28008}, 2, 4300, 0},
            {"NIT, stopped", kScanNetwork, astra, {10301, 10302}, 1, 5000, 3000},
            {"nothing there", kScanSingle, sat(11000000, 0), {}, 0, 1000, 0},
            {"terrestrial band", kScanFullBand, terrestrial(0), {257, 258, 513, 514}, 2, 15400, 0},
            {"cable band", kScanFullBand, cable(0), {101, 102, 201, 202}, 2, 18800, 0},
            {"satellite at 13.0E", kScanFullBand, sat(0, 0, 130), {5001, 5002}, 1, 13900, 0},
    };
    for (const auto& [what, type, fe, services, transponders, millis, stopAt] : cases) {
        SCOPED_TRACE(what);
        SCNM_OpenSettings open{0, 0};
        int32_t h = scnm->Open(&open);
        ASSERT_GT(h, 0);
        SCNM_StartSettings start{};
        start.fe = fe, start.scanType = type;
        ASSERT_EQ(scnm->Start(h, &start), kOk);
        EXPECT_EQ(scnm->Start(h, &start), kErrBusy);
        const bool stopped = stopAt > 0;
        advance(stopAt);
        EXPECT_EQ(stopped ? scnm->Stop(h) : kOk, kOk);
        advance(millis - stopAt - 1);
        SCNM_GetStatus st{};
        scnm->GetStatus(h, &st);
        EXPECT_EQ(st.result, stopped ? kScanStopped : kScanRunning);
        EXPECT_EQ(take(kEvtScanComplete), Events{});
        advance(1);
        scnm->GetStatus(h, &st);
        EXPECT_EQ(std::make_tuple(st.result, st.sfStatus),
                  std::make_tuple(stopped ? kScanStopped : kScanDone, stopped ? 50 : 100));
        auto progress = take(kEvtScanProgress);
        ASSERT_FALSE(progress.empty());
        EXPECT_EQ(progress.back(), (std::array<int, 3>{kEvtScanProgress, h, st.sfStatus}));
        EXPECT_TRUE(std::is_sorted(progress.begin(), progress.end()));
        EXPECT_EQ(take(kEvtScanComplete),
                  (stopped ? Events{} : Events{{kEvtScanComplete, h, int(services.size())}}));

        SCNM_ServiceInfo* svc = nullptr;
        EXPECT_EQ(scnm->CreateServiceList(h, &svc), static_cast<int32_t>(services.size()));
        std::set<int> found;
        for (const auto* s = svc; s != nullptr; s = dvbListNext(s)) found.insert(s->svcId);
        EXPECT_EQ(found, services);
        SCNMNET_FrontEndSettings* net = nullptr;
        scnm->CreateNetworkList(h, &net);
        std::vector<int32_t> types;
        for (const auto* n = net; n != nullptr; n = dvbListNext(n)) types.push_back(n->type);
        EXPECT_EQ(types, std::vector<int32_t>(transponders, fe.type));
        EXPECT_EQ(scnm->Close(h), kOk);
    }
}

TEST_F(ReceiverTest, AStreamPlaysWhatTheTransponderCarries) {
    int32_t h;
    EXPECT_EQ(startStream(sat(12551500, 1), 10301, &h), kErrNoService);
    EXPECT_EQ(startStream(sat(12600000, 1), 28006, &h), kErrNoSignal);
    ASSERT_EQ(startStream(sat(12551500, 1), 28006, &h), kOk);
    EXPECT_EQ(streamStatus(h).pictureStatus, kNoPicture);
    advance(400);
    STRM_GetStatus st = streamStatus(h);
    EXPECT_EQ(std::make_tuple(st.feStatus, st.pictureStatus, st.fpsInteger, st.fpsDecimal),
              std::make_tuple(0x1F, kDecoding, 25, 0));
    // Presented frames: the last video frame (40 ms) and audio frame (24 ms) begun by now.
    EXPECT_LT(static_cast<uint32_t>(st.localPts - st.videoPts), 3600u);
    EXPECT_LT(static_cast<uint32_t>(st.localPts - st.audioPts), 2160u);
    int32_t before = st.localPts;
    advance(1000);
    EXPECT_EQ(static_cast<uint32_t>(streamStatus(h).localPts - before), 90000u);

    STRM_StreamInfo info{};
    ASSERT_EQ(strm->CreatStreamInfo(h, &info), kOk);
    EXPECT_EQ(std::vector<int>({info.videoCount, info.video[0].pid, info.audioCount,
                                info.audio[0].isDolbyAC3, info.audio[1].isDolbyAC3,
                                info.audio[2].isDolbyAC3, info.subtitleCount,
                                info.subtitle[0].compositionPageId, info.teletextCount,
                                info.teletext[1].type, info.pcrPid}),
              std::vector<int>({1, 0x201, 3, 0, 0, 1, 1, 1, 2, 2, 0x201}));

    // Present and following: the end-to-end test holds them against the clock; here, their
    // running status, items (every other event has some) and the event when one ends.
    EpgEvent present{}, following{};
    ExtEpgEvent presentExt{}, followingExt{};
    ASSERT_EQ(strm->GetAllEvent(h, &present, &following, &presentExt, &followingExt), kOk);
    EXPECT_EQ(std::make_tuple(present.runStatus, following.runStatus,
                              presentExt.itemCount + followingExt.itemCount),
              std::make_tuple(4, 1, 2u));
    uint32_t t = 0;
    EXPECT_EQ(strm->GetTime(h, &t), kOk);
    EXPECT_EQ(t, static_cast<uint32_t>(rx->clock().nowSeconds()));
    EXPECT_EQ(take(kEvtPresent), (Events{{kEvtPresent, h, present.evtId}}));
    advance((following.startTime - rx->clock().nowSeconds()) * 1000);
    EXPECT_EQ(take(kEvtPresent), (Events{{kEvtPresent, h, following.evtId}}));

    // Time shift: recording from now, paused 5 s into it.
    STRM_Settings s = shifted(h, 0);
    EXPECT_EQ(s.svcId, 28006);
    s.posTime = 5;
    ASSERT_EQ(strm->SetSettings(h, &s), kOk);
    advance(10000);
    ASSERT_EQ(strm->SetSettings(h, &s), kOk);
    advance(10000);
    st = streamStatus(h);
    EXPECT_EQ(std::make_tuple(st.recstate, st.recduration, st.pbstate, st.pbposition),
              std::make_tuple(kPvrActive, 20, kPvrPaused, 5));
}

// A time shift or a dump still making its file (a FIFO opens once it is read) holds off a
// second start, which makes no file (a second later, its own name), and a stop, which may try
// again. A time shift whose disk is full plays back no further than its file holds.
TEST_F(ReceiverTest, FilesBeingMadeHoldOffASecondStartAndAStopAndAFullOneHoldsPlayBack) {
    int32_t h;
    ASSERT_EQ(startStream(sat(12551500, 1), 28006, &h), kOk);
    const STRM_Settings shift = shifted(h, 2), live{};
    const std::string dump = dir / "dump", other = dir / "other.ts";
    const Stream& stream = rx->streams.at(h);
    auto shiftOn = [&] { return strm->SetSettings(h, &shift); };
    const struct {
        std::string fifo, other;
        std::function<int32_t()> start, second, stop;
    } cases[] = {
            {rx->recordingPath(stream, kStart), rx->recordingPath(stream, kStart + 1000), shiftOn,
             shiftOn, [&] { return strm->SetSettings(h, &live); }},
            {dump, other, [&] { return cfg->TSDumpStart(0, 0, 0, dump.c_str()); },
             [&] { return cfg->TSDumpStart(0, 0, 0, other.c_str()); },
             [&] { return cfg->TSDumpStop(); }},
    };
    for (const auto& c : cases) {
        ASSERT_EQ(mkfifo(c.fifo.c_str(), 0600), 0);
        int32_t first = 1;
        std::thread starting([&] { first = c.start(); });
        // Bounded only so that a fault fails instead of hanging; it takes microseconds.
        for (int i = 0; i < 30000 && c.stop() != kErrBusy; ++i) usleep(1000);
        rx->clock().advance(1000);
        EXPECT_EQ(std::make_tuple(c.stop(), c.second()), std::make_tuple(kErrBusy, kErrBusy))
                << c.fifo;
        EXPECT_FALSE(std::filesystem::exists(c.other));
        int fd = open(c.fifo.c_str(), O_RDONLY);
        starting.join();
        std::thread drain([fd] {
            for (char b[4096]; read(fd, b, sizeof b) > 0;) continue;
        });
        EXPECT_EQ(std::make_tuple(first, c.stop()), std::make_tuple(kOk, kOk)) << c.fifo;
        drain.join();
        close(fd);
    }
    std::filesystem::create_symlink("/dev/full", rx->recordingPath(stream, kStart + 2000));
    ASSERT_EQ(shiftOn(), kOk);
    advance(10000);
    const STRM_GetStatus st = streamStatus(h);
    EXPECT_EQ(std::make_tuple(st.recduration, st.recsize, st.pbstate, st.pbposition),
              std::make_tuple(0, 0, kPvrTrick, 0));
}

// A time shift keeps its file to itself, and a retune that the service thread has not looked
// at yet (it is held meanwhile) leaves the time shift and the dump on that front end what they
// received before it.
TEST_F(ReceiverTest, RecordingsKeepTheirFileAndWhatTheyReceivedBeforeARetune) {
    int32_t h, same;  // same: a second stream of the service, whose file this second is h's
    ASSERT_EQ(startStream(sat(12551500, 1), 28006, &h), kOk);
    const STRM_Settings shift = shifted(h, 1);
    const std::string dump = dir / "dump.ts";
    ASSERT_EQ(strm->SetSettings(h, &shift) | cfg->TSDumpStart(0, 0, 0, dump.c_str()), kOk);
    ASSERT_EQ(startStream(sat(12551500, 1), 28006, &same), kOk);
    EXPECT_EQ(strm->SetSettings(same, &shift), kErrBusy);
    std::promise<void> go;
    rx->post([held = go.get_future().share()] { held.wait(); });
    rx->clock().advance(5000);
    const P other = sat(11493750, 0);
    ASSERT_EQ(cfg->Tune(0, &other), kOk);
    go.set_value();
    rx->sync();
    EXPECT_EQ(cfg->TSDumpStop(), kOk);
    EXPECT_TRUE(streamStatus(h).recsize > 0 && std::filesystem::file_size(dump) > 0);
}

// A service of a cable multiplex of the built-in broadcast: time shift records it and plays it
// back, the dump takes the multiplex; ffprobe reads both files as the model says.
TEST_F(ReceiverTest, TimeShiftRecordsTheServiceAndADumpTheTransponder) {
    start(dvbmodel::builtinBroadcast(kStart / 1000));
    const dvbmodel::Transport* tp = &rx->broadcast().networks[2].transports[1];  // 466 MHz
    const dvbmodel::Service& svc = tp->services[0];
    int32_t h;
    ASSERT_EQ(startStream(cable(466000, 4), svc.id, &h), kOk);  // QAM64
    EXPECT_EQ(cfg->TSDumpStart(0, 0, 0, (dir / "missing/dump.ts").c_str()), kErrPath);
    ASSERT_EQ(cfg->TSDumpStart(0, 0, 0, (dir / "dump.ts").c_str()), kOk);
    EXPECT_EQ(cfg->TSDumpStart(0, 0, 0, (dir / "other.ts").c_str()), kErrBusy);
    advance(1000);
    const STRM_Settings s = shifted(h, 0);  // paused at 0: recording
    rx->recordDir = dir / "missing";
    EXPECT_EQ(strm->SetSettings(h, &s), kErrPath);
    rx->recordDir = dir.path;
    ASSERT_EQ(strm->SetSettings(h, &s), kOk);
    advance(2500);
    const STRM_GetStatus st = streamStatus(h);
    // rec-<onid>-<tsid>-<service>-<UTC seconds of its start>.ts
    const std::string file = dir / "rec-61441-2-513-1709323201.ts";
    EXPECT_EQ(st.recduration, 2);
    EXPECT_EQ(st.recsize, static_cast<int64_t>(std::filesystem::file_size(file)));
    advance(500);
    ASSERT_EQ(strm->Stop(h, 0) | cfg->TSDumpStop(), kOk);
    EXPECT_GT(static_cast<int64_t>(std::filesystem::file_size(file)), st.recsize);  // to the stop

    // The recording plays back through a stream opened on its path, its own service only, two
    // days later with the events it recorded.
    advance(2 * 86400000);
    STRM_OpenSettings back{};
    snprintf(back.szPath, sizeof back.szPath, "%s", (dir / "missing.ts").c_str());
    EXPECT_EQ(strm->Open(&back), kErrPath);
    ASSERT_LT(file.size(), sizeof back.szPath);
    snprintf(back.szPath, sizeof back.szPath, "%s", file.c_str());
    int32_t p = strm->Open(&back);
    STRM_Settings play{};
    play.svcId = tp->services[1].id;
    EXPECT_EQ(strm->Start(p, &play), kErrNoService);
    play.svcId = svc.id;
    ASSERT_EQ(strm->Start(p, &play), kOk);
    advance(1500);
    const STRM_GetStatus pb = streamStatus(p);
    STRM_StreamInfo info{};
    EpgEvent present{}, following{};
    ExtEpgEvent ext[2];
    ASSERT_EQ(strm->CreatStreamInfo(p, &info) |
                      strm->GetAllEvent(p, &present, &following, &ext[0], &ext[1]),
              kOk);
    auto count = [&svc](dvbmodel::Kind k) {
        return std::count_if(svc.components.begin(), svc.components.end(),
                             [k](const dvbmodel::Component& c) { return c.kind == k; });
    };
    EXPECT_EQ(std::make_tuple(pb.pbstate, pb.pbposition, info.videoCount, info.audioCount,
                              info.subtitleCount, present.evtId),
              std::make_tuple(int32_t{kPvrActive}, 1, count(dvbmodel::Kind::Video),
                              count(dvbmodel::Kind::Audio), count(dvbmodel::Kind::Subtitle),
                              dvbmodel::eventAt(svc, kStart / 1000 + 2)->id));
    EXPECT_EQ(strm->SetSettings(p, &s), kErrNotSupported);  // not recorded again
    NEED_FFPROBE();
    EXPECT_EQ(testdata::probe(file), testdata::expected(*tp, &svc));
    EXPECT_EQ(testdata::probe(dir / "dump.ts"), testdata::expected(*tp));
}

TEST_F(ReceiverTest, BadInputGetsItsResult) {
    int32_t h, n[4];  // n: a page's links
    ASSERT_EQ(startStream(sat(12551500, 1), 28006, &h), kOk);
    SCNM_OpenSettings scanOpen{0, 0};
    int32_t scan = scnm->Open(&scanOpen);
    ASSERT_EQ(scnm->Close(scan), kOk);
    STRM_GetStatus st{};
    SCNM_GetStatus sst{};
    SCNM_ServiceInfo* list = nullptr;
    SCNMNET_FrontEndSettings* nets = nullptr;
    uint8_t buf[8];
    uint32_t t;
    STRM_OpenSettings badOpen{};
    badOpen.frontend = 3;
    TELTXT_Settings txt{};
    txt.pid = 0x206;
    int32_t tt = teltxt->Start(&txt);
    ASSERT_GT(tt, 0);
    constexpr int32_t kBad = kErrBadParameter, kGone = kErrBadHandle;  // gone: unknown or closed
    const std::tuple<const char*, std::function<int32_t()>, int32_t> cases[] = {
            {"scan used after close", [&] { return scnm->GetStatus(scan, &sst); }, kGone},
            {"scan list after close", [&] { return scnm->CreateServiceList(scan, &list); }, kGone},
            {"networks after close", [&] { return scnm->CreateNetworkList(scan, &nets); }, kGone},
            {"unknown stream", [&] { return strm->GetStatus(12345, &st); }, kGone},
            {"stream on no front end", [&] { return strm->Open(&badOpen); }, kBad},
            {"time of no stream", [&] { return strm->GetTime(-7, &t); }, kGone},
            {"negative count", [&] { return teltxt->GetData(tt, 0, -1, buf); }, kBad},
            {"page 99", [&] { return teltxt->SetData(tt, 99, 0, n, n + 1, n + 2, n + 3); }, kBad},
            {"volume 101", [&] { return cfg->SetAudioVolume(101); }, kBad},
            {"subtitles, 2^31 + h", [&] { return startSubtitles(0x205, 0x80000000u | h); }, kGone},
            {"handles counted round to one open",
             [&] { return rx->nextHandle = tt, teltxt->Start(&txt); }, tt + 1},
            {"stream closed", [&] { return strm->Close(h) | strm->GetStatus(h, &st); }, kGone},
            {"teletext ended with its stream", [&] { return teltxt->Stop(tt); }, kGone},
    };
    for (const auto& [what, op, result] : cases) EXPECT_EQ(op(), result) << what;
    EXPECT_EQ(sst.result, kErrBadHandle);
    EXPECT_TRUE(list == nullptr && nets == nullptr);
}

// A service of each satellite: 158 and 156 events in the week, 21 and 24 on its first day.
const EpgSvc kKanal{0x2801, 1011, 1, {}, 0, 0, 0}, kGunes{0x3101, 12400, 318, {}, 0, 0, 0};

TEST_F(ReceiverTest, TheDatabaseOpensOrSaysWhyNotAndCollectedServicesFillItOnceForGood) {
    const std::string path = dir / "epg.db", text = dir / "text";
    std::ofstream(text) << "not a database\n";
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
    // Dvb_SystemInit checks the path; the service thread opens the file, then says how it went.
    const std::tuple<std::string, int32_t, Events> inits[] = {
            {dir / "missing/epg.db", kErrPath, {}},
            {dir.path, kOk, {{kEvtSystemReady, kErrDatabase, 0}}},
            {text, kOk, {{kEvtSystemReady, kErrDatabase, 0}}},
            {path, kOk, {{kEvtSystemReady, 0, 0}}}};
    for (const auto& [at, result, ready] : inits) {
        EXPECT_EQ(systemInit(at), result) << at;
        EXPECT_EQ(take(kEvtSystemReady), ready) << at;
    }
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

    // Made an hour later, the model has the same days: the list is back, nothing new.
    start(dvbmodel::builtinBroadcast(kStart / 1000 + 3600));
    ASSERT_EQ(systemInit(path), kOk);
    EXPECT_EQ(take(kEvtEpgUpdate), Events{});
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
}

// Kanal Eins on the 506 MHz terrestrial multiplex: German subtitles (PID 0x105, page 1) and
// teletext (PID 0x106), both decoding from a second after the loop's start.
class DecodersTest : public Harness {
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
        start(std::move(b));
        service = &rx->broadcast().networks[3].transports[0].services[0];
        EXPECT_EQ(startStream(terrestrial(506000), 0x0311, &stream), kOk);
        advance(1000);
        subHandle = startSubtitles(0x105, stream);
        TELTXT_Settings txt{};
        txt.pid = 0x106;
        txtHandle = teltxt->Start(&txt);
        rx->sync();
    }
    Events shown() { return take(kEvtSubtitle, kEvtTeletext); }
    int32_t select(int32_t page, int32_t subpage = 0) {
        nav = {};
        return teltxt->SetData(txtHandle, page, subpage, &nav[0], &nav[1], &nav[2], &nav[3]);
    }
    TeltxtImage image() {
        TeltxtImage i;
        EXPECT_EQ(teltxt->GetData(txtHandle, 0, sizeof i, reinterpret_cast<uint8_t*>(&i)), kOk);
        return i;
    }

    const dvbmodel::Service* service;
    int32_t stream = 0, subHandle = 0, txtHandle = 0;
    std::array<int32_t, 4> nav{};
};

TEST_F(DecodersTest, SubtitleBufferHoldsTheModelsDisplaySetWithTheStreamsPts) {
    // Filled with a pattern, and longer than the buffer, to see what is written.
    std::vector<uint8_t> bytes(sizeof(SUBTTL_Data) + 64, 0xAA);
    auto* data = reinterpret_cast<SUBTTL_Data*>(bytes.data());
    ASSERT_EQ(subttl->GetData(subHandle, data), kOk);
    const dvbmodel::DisplaySet& set = service->subtitles[0];
    // Shown at the loop's start, 1000 ms ago.
    EXPECT_EQ(static_cast<uint32_t>(streamStatus(stream).localPts - data->i_pts), 90000u);
    const SUBTTL_Page_t& page = data->page[0];
    const SUBTTL_Display& display = data->display;
    EXPECT_EQ(std::vector<int32_t>({data->numPage, page.i_id, page.i_timeout, page.i_state,
                                    page.i_version, page.i_region_defs, data->numRegions,
                                    data->numCluts, data->cluts[0].i_id, display.i_id,
                                    display.i_width, display.i_height, display.b_windowed}),
              std::vector<int32_t>({1, 1, set.timeout, set.state, set.version,
                                    int32_t(set.placements.size()), int32_t(set.regions.size()), 1,
                                    set.cluts[0].id, 1, 720, 576, 0}));
    for (size_t r = 0; r < set.regions.size(); ++r) {
        const SUBTTL_Region_t& out = data->regions[r];
        const dvbmodel::Region& in = set.regions[r];
        EXPECT_EQ(page.region_defs[r].i_y, set.placements[r].y);
        EXPECT_EQ(std::vector<int32_t>({out.i_id, out.i_x, out.i_y, out.i_width, out.i_height,
                                        out.i_depth, out.i_clut, out.i_object_defs}),
                  std::vector<int32_t>({in.id, set.placements[r].x, set.placements[r].y, in.width,
                                        in.height, in.depth, in.clutId, 1}));
        EXPECT_EQ(memcmp(out.p_pixbuf, in.pixels.data(), in.pixels.size()), 0);
        EXPECT_EQ(out.object_defs[0].i_fg_pc, in.objects[0].foreground);
    }
    EXPECT_EQ(data->regions[set.regions.size()].i_id, static_cast<int32_t>(0xAAAAAAAA));
    EXPECT_EQ(memcmp(data->cluts[0].c_8b, set.cluts[0].c8.data(), 1024), 0);
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
    big.objects[0].text.assign(17, 0x1234);  // a character object: 16 of its codes fit
    set.regions.assign(7, big), set.placements.resize(20), set.cluts.resize(6);
    std::vector<uint8_t> bytes(sizeof(SUBTTL_Data) + 64, 0xAA);
    auto* data = reinterpret_cast<SUBTTL_Data*>(bytes.data());
    fillSubtitleData(set, 7, data);
    const SUBTTL_ObjectDef& chars = data->regions[4].object_defs[0];
    EXPECT_EQ(std::vector<int32_t>({data->numRegions, data->page[0].i_region_defs, data->numCluts,
                                    data->regions[4].i_object_defs, data->regions[4].i_height,
                                    chars.i_text_length, chars.psz_text[30], chars.psz_text[31],
                                    data->display.i_width, data->display.i_height}),
              std::vector<int32_t>({5, 16, 4, 16, 384000 / 700, 16, 0x12, 0x34, 720, 576}));
    EXPECT_EQ(data->regions[4].p_pixbuf[548 * 700 - 1], 5);
    EXPECT_EQ(data->regions[4].p_pixbuf[548 * 700], 0xAA);
    EXPECT_EQ(std::count(bytes.end() - 64, bytes.end(), 0xAA), 64);
}

TEST(SubtitleData, DefaultClutHasTheStandardsColours) {
    const SUBTTL_Clut& c = defaultClut();
    const std::pair<const SUBTTL_ClutEntry&, std::array<int, 4>> cases[] = {
            {c.c_2b[0], {0, 128, 128, 255}},   {c.c_2b[1], {235, 128, 128, 0}},
            {c.c_2b[2], {16, 128, 128, 0}},    {c.c_2b[3], {126, 128, 128, 0}},
            {c.c_4b[4], {41, 110, 240, 0}},    {c.c_4b[9], {49, 184, 109, 0}},
            {c.c_8b[0], {0, 128, 128, 255}},   {c.c_8b[0x01], {81, 240, 90, 191}},
            {c.c_8b[0x10], {60, 203, 103, 0}}, {c.c_8b[0x4C], {41, 110, 240, 128}},
            {c.c_8b[0x88], {16, 128, 128, 0}}, {c.c_8b[0xD6], {181, 141, 159, 0}},
    };
    for (const auto& [e, ycrcbt] : cases)
        EXPECT_EQ((std::array<int, 4>{e.y, e.cr, e.cb, e.t}), ycrcbt);
}

TEST_F(DecodersTest, NewDisplaySetsAndPageSendingsRaiseTheirEvents) {
    auto regions = [&](size_t set) {
        return static_cast<int>(service->subtitles[set].regions.size());
    };
    EXPECT_EQ(shown(), (Events{{kEvtSubtitle, subHandle, regions(0)},
                               {kEvtTeletext, txtHandle, 0x1000000}}));
    EXPECT_EQ(select(0x101), kOk);
    advance(3499);
    EXPECT_EQ(shown(), Events{});
    advance(1);  // 4500: the cue is cleared
    EXPECT_EQ(shown(), (Events{{kEvtSubtitle, subHandle, 0}}));
    // 20000: the fourth cue, and the second story of the news.
    advance(15500);
    EXPECT_EQ(shown(), (Events{{kEvtSubtitle, subHandle, regions(6)},
                               {kEvtTeletext, txtHandle, 0x1010002}}));
    EXPECT_EQ(image().subcode, 2);
    // Story 3 was last sent in the loop before; it is sent again at 40000.
    EXPECT_EQ(select(0x101, 3), kOk);
    EXPECT_EQ(std::make_tuple(image().subcode, image().subpages), std::make_tuple(3u, 3u));
    advance(20000);
    EXPECT_EQ(shown(), (Events{{kEvtSubtitle, subHandle, regions(12)},
                               {kEvtTeletext, txtHandle, 0x1010003}}));
}

TEST_F(DecodersTest, TeletextPageImageShowsCharactersWithTheirAttributes) {
    constexpr uint16_t DH = kCellDoubleHeight, Lower = kCellLowerHalf, Mosaic = kCellMosaic;
    // Page, row, column; the character, its colours and its flags.
    const std::tuple<int32_t, int, int, char32_t, uint8_t, uint8_t, uint16_t> cases[] = {
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
    for (const auto& [page, row, col, ch, fg, bg, flags] : cases) {
        ASSERT_EQ(select(page), kOk);
        const TeltxtImage i = image();
        const TeltxtCellRecord& c = i.cells[row][col];
        EXPECT_EQ(std::vector<uint32_t>({c.ch, c.foreground, c.background, c.flags}),
                  std::vector<uint32_t>({ch, fg, bg, flags}))
                << std::hex << page << std::dec << " row " << row << " col " << col;
    }
    select(0x150);
    const TeltxtImage i = image();
    EXPECT_EQ(std::vector<uint32_t>({i.page, i.subcode, i.controlBits, i.nationalOption, i.status,
                                     i.time, i.subpages}),
              std::vector<uint32_t>({0x150, 0, 0x40A0, 1, kTtxShown, kStart / 1000 + 1, 1}));
    // Beyond the image: zeros.
    std::vector<uint8_t> tail(16, 0xAA);
    EXPECT_EQ(teltxt->GetData(txtHandle, sizeof i - 8, 16, tail.data()), kOk);
    EXPECT_EQ(std::count(tail.begin() + 8, tail.end(), 0), 8);
}

TEST_F(DecodersTest, NavigationFollowsTheLinksOrThePagesPresent) {
    const std::tuple<int32_t, int32_t, std::array<int32_t, 4>> cases[] = {
            {0x200, kOk, {0x101, 0x200, 0x300, 0x150}},  // red, green, yellow, cyan
            {0x150, kOk, {0x888, 0x100, 0x200, 0x200}},
            {0x555, kErrNoData, {0x300, 0x300, 0x777, 0x777}},
            {0x900, kErrBadParameter, {0, 0, 0, 0}},
    };
    for (const auto& [page, result, links] : cases) {
        EXPECT_EQ(select(page), result) << std::hex << page;
        EXPECT_EQ(nav, links) << std::hex << page;
    }
}

// A file played back from mid-second shows each display set at its time from the stream's
// start (not from the whole second before it).
TEST_F(DecodersTest, PlaybackShowsDisplaySetsAtTheirTimesFromItsStart) {
    const STRM_Settings s = shifted(stream, 1);
    ASSERT_EQ(strm->SetSettings(stream, &s), kOk);
    STRM_OpenSettings back{};
    snprintf(back.szPath, sizeof back.szPath, "%s",
             rx->streams.at(stream).recording->path().c_str());
    advance(6000);
    ASSERT_EQ(strm->Stop(stream, 0), kOk);
    int32_t p = strm->Open(&back);
    advance(700);
    ASSERT_EQ(strm->Start(p, &s), kOk);
    int32_t h = startSubtitles(0x105, p);
    std::vector<uint8_t> data(sizeof(SUBTTL_Data));
    advance(rx->streams.at(p).service->subtitles.at(0).time);
    ASSERT_EQ(subttl->GetData(h, data.data()), kOk);
    // Sent just now: its PTS is the stream's.
    EXPECT_EQ(reinterpret_cast<SUBTTL_Data*>(data.data())->i_pts, streamStatus(p).localPts);
}
}  // namespace
