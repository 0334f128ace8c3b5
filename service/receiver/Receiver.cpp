#include "Receiver.h"

#include "broadcast/Ts.h"

#include "broadcast/BroadcastSource.h"
#include "broadcast/Builtin.h"

#include <android_runtime/AndroidRuntime.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "Modules.h"

#ifndef DVB_EPG_DB_PATH
#define DVB_EPG_DB_PATH "/mnt/epg.db"
#endif

namespace dvbrx {
namespace {

constexpr double kPi = 3.14159265358979323846;
constexpr double kEarthRadius = 6378.14;                      // km
constexpr double kGeostationaryRadius = 42164.2;              // km, from the Earth's centre
constexpr int64_t kTickMillis = 100;                          // emulated time between two looks
constexpr auto kShortestTick = std::chrono::milliseconds(5);  // real time, at any speed

bool deliveryOf(int32_t type, dvbmodel::Delivery* d) {
    switch (type) {
        case kSatellite:
            *d = dvbmodel::Delivery::Satellite;
            return true;
        case kCable:
            *d = dvbmodel::Delivery::Cable;
            return true;
        case kTerrestrial:
            *d = dvbmodel::Delivery::Terrestrial;
            return true;
        default:
            return false;
    }
}

// An LNB switches 13 V for vertical and right-hand circular, 18 V for horizontal and left.
int voltageOf(int32_t polarization) {
    return polarization == 1 || polarization == 3 ? 13 : 18;
}

bool motorised(const ANT_FrontendParameters& p) {
    return p.diseqctype == kMotor || p.diseqctype == kUsals;
}

}  // namespace

double usalsAngle(double satLongitude, const Site& site) {
    double lat = site.latitude * kPi / 180;
    double dLon = (satLongitude - site.longitude) * kPi / 180;
    // Below the horizon when the site sees the satellite's arc no more.
    if (std::cos(lat) * std::cos(dLon) <= kEarthRadius / kGeostationaryRadius) return NAN;
    double east = kGeostationaryRadius * std::sin(dLon);
    double out = kGeostationaryRadius * std::cos(dLon) - kEarthRadius * std::cos(lat);
    return std::atan2(east, out) * 180 / kPi;
}

double Dish::at(int64_t ms) const {
    if (ms <= since) return from;
    double travelled = static_cast<double>(ms - since) / 1000.0 * kMotorDegreesPerSecond;
    double distance = to - from;
    if (travelled >= std::fabs(distance)) return to;
    return from + std::copysign(travelled, distance);
}

int64_t Dish::arrival() const {
    return since + std::llround(std::fabs(to - from) / kMotorDegreesPerSecond * 1000.0);
}

void Dish::moveTo(double target, int64_t now) {
    double lo = limitsOn ? std::min(west, east) : -kMotorTravel;
    double hi = limitsOn ? std::max(west, east) : kMotorTravel;
    from = at(now);
    to = std::clamp(target, std::max(lo, -kMotorTravel), std::min(hi, kMotorTravel));
    since = now;
    arrivalReported = false;
}

size_t Scan::stepsDone(int64_t now) const {
    if (state == kScanIdle) return 0;
    int64_t t = (state == kScanStopped ? stoppedAt : now) - startedAt;
    size_t n = 0;
    while (n < steps.size() && steps[n].end <= t) ++n;
    return n;
}

Receiver::Receiver(dvbmodel::Broadcast broadcast, const Clock::Settings& clock, EventSink sink)
    : mBroadcast(std::move(broadcast)), mClock(clock), mSink(std::move(sink)), mJava(!mSink) {
    if (!mSink) {
        mSink = [](int msg, int ext1, int ext2) {
            for (const auto& dvb : dvbsvc::liveDvbs()) dvbsvc::raiseEvent(*dvb, msg, ext1, ext2);
        };
    }
    const char* dir = getenv("DVB_RECORD_DIR");
    if (dir != nullptr && *dir != '\0') {
        recordDir = dir;
    } else {
        std::string db = epgDatabasePath();
        size_t slash = db.rfind('/');
        recordDir = slash == std::string::npos ? "." : slash == 0 ? "/" : db.substr(0, slash);
    }
    mClock.onAdvance([this] {
        std::lock_guard<std::mutex> lock(mLock);
        ++mPokes;
        mWake.notify_all();
    });
    mThread = std::thread(&Receiver::run, this);
}

Receiver::~Receiver() {
    mClock.onAdvance({});
    {
        std::lock_guard<std::mutex> lock(mLock);
        mStop = true;
        ++mPokes;
        mWake.notify_all();
    }
    mThread.join();
}

std::shared_ptr<Receiver> Receiver::shared() {
    // Made once and never destroyed: its thread serves the process to its end.
    static auto* rx = [] {
        Clock::Settings settings = Clock::fromEnvironment();
        int64_t start = Clock(settings).nowSeconds();
        const char* setting = getenv("DVB_BROADCAST");
        dvbmodel::Broadcast broadcast;
        if (setting != nullptr && *setting != '\0' && strcmp(setting, "builtin") != 0) {
            // Captures: what was dropped from them goes to the console, for the user to see;
            // a setting that cannot be read leaves nothing on the air.
            std::string error;
            dvbmodel::TsReadStats stats;
            if (!dvbmodel::loadBroadcast(setting, start, broadcast, error, &stats)) {
                fprintf(stderr, "DVB_BROADCAST: %s\n", error.c_str());
            } else {
                fprintf(stderr, "DVB_BROADCAST %s: %s\n", setting,
                        dvbmodel::formatTsReadStats(stats).c_str());
                // The clock starts at the captures' own time unless DVB_CLOCK_START says
                // otherwise, so that "now" is the broadcast's now.
                const char* clockStart = getenv("DVB_CLOCK_START");
                if (clockStart == nullptr || *clockStart == '\0') {
                    settings.deterministic = true;
                    settings.startMillis = broadcast.start * 1000;
                }
            }
        } else {
            broadcast = defaultBroadcast(start);
        }
        return new std::shared_ptr<Receiver>(
                std::make_shared<Receiver>(std::move(broadcast), settings));
    }();
    return *rx;
}

void Receiver::sync() {
    std::unique_lock<std::mutex> lock(mLock);
    uint64_t ticket = ++mSyncAsked;
    ++mPokes;
    mWake.notify_all();
    mSynced.wait(lock, [&] { return mSyncDone >= ticket || mStop; });
}

void Receiver::post(std::function<void()> task) {
    std::lock_guard<std::mutex> lock(mLock);
    mTasks.push_back(std::move(task));
    ++mPokes;
    mWake.notify_all();
}

void Receiver::queueEvent(int msg, int ext1, int ext2) {
    mQueued.push_back({msg, ext1, ext2});
    ++mPokes;
    mWake.notify_all();
}

void Receiver::run() {
    // The device's service threads are known to the VM; ours attach once, as daemons, so
    // that the listener's calls into Java need no attach of their own.
    JavaVM* vm = mJava ? android::AndroidRuntime::getJavaVM() : nullptr;
    JNIEnv* env = nullptr;
    bool attached = vm != nullptr && vm->AttachCurrentThreadAsDaemon(&env, nullptr) == JNI_OK;

    std::unique_lock<std::mutex> lock(mLock);
    while (!mStop) {
        uint64_t asked = mSyncAsked, pokes = mPokes;
        auto tasks = std::move(mTasks);
        mTasks.clear();
        if (!tasks.empty()) {
            lock.unlock();
            for (auto& task : tasks) task();
            lock.lock();
        }
        int64_t now = mClock.nowMillis();
        auto events = collectEvents(now);
        // Recordings and the dump catch up with the clock, written outside the lock.
        planWrites(now);
        std::vector<std::shared_ptr<Recording>> writes;
        for (const auto& [h, s] : streams) {
            if (s.recording) writes.push_back(s.recording);
        }
        if (outputs.dump) writes.push_back(outputs.dump);
        lock.unlock();
        for (const auto& e : events) mSink(e[0], e[1], e[2]);
        for (const auto& w : writes) w->catchUp();
        lock.lock();
        // Caught up only once the tasks that tasks posted have run too.
        if (mTasks.empty()) {
            mSyncDone = asked;
            mSynced.notify_all();
        }
        if (mPokes != pokes) continue;
        auto delay = mClock.realDelay(now + kTickMillis);
        if (delay == std::chrono::steady_clock::duration::max()) {
            mWake.wait(lock, [&] { return mPokes != pokes; });
        } else {
            mWake.wait_for(lock,
                           std::max<std::chrono::steady_clock::duration>(delay, kShortestTick),
                           [&] { return mPokes != pokes; });
        }
    }
    lock.unlock();
    if (attached) vm->DetachCurrentThread();
}

std::vector<std::array<int, 3>> Receiver::collectEvents(int64_t now) {
    std::vector<std::array<int, 3>> out = std::move(mQueued);
    mQueued.clear();
    // A new day moves every schedule section by one day: store them again.
    if (epg != nullptr && mEpgDay >= 0 && now / 86400000 != mEpgDay) {
        mEpgDay = -1;
        requestEpgSync();
    }
    for (int i = 0; i < kFrontends; ++i) {
        Frontend& fe = frontends[i];
        if (fe.lostPending) {
            out.push_back({kEvtLock, i, 0});
            fe.lostPending = false;
            fe.reportedLock = false;
        }
        bool locked = fe.tuned && (signal(fe.params, fe.tunedAt, now).status & kFeLock) != 0;
        if (locked != fe.reportedLock) {
            out.push_back({kEvtLock, i, locked ? 1 : 0});
            fe.reportedLock = locked;
        }
    }
    if (!dish.arrivalReported && now >= dish.arrival()) {
        out.push_back({kEvtPositioner, 0, static_cast<int>(std::lround(dish.to * 10))});
        dish.arrivalReported = true;
    }
    for (auto& [handle, scan] : scans) {
        if (scan.state == kScanIdle || scan.steps.empty()) continue;
        size_t done = scan.stepsDone(now);
        while (scan.reportedSteps < done) {
            ++scan.reportedSteps;
            out.push_back({kEvtScanProgress, handle,
                           static_cast<int>(scan.reportedSteps * 100 / scan.steps.size())});
        }
        if (scan.state != kScanStopped && done == scan.steps.size() && !scan.reportedDone) {
            scan.state = kScanDone;
            scan.reportedDone = true;
            int found = 0;
            for (const ScanStep& step : scan.steps) {
                if (step.transport == nullptr) continue;
                if (scan.keeps(step)) found += static_cast<int>(step.transport->services.size());
            }
            out.push_back({kEvtScanComplete, handle, found});
        }
    }
    for (auto& [handle, stream] : streams) {
        if (!stream.started || stream.service == nullptr) continue;
        const dvbmodel::Event* ev = dvbmodel::eventAt(*stream.service, eventSeconds(stream, now));
        int32_t id = ev != nullptr ? ev->id : -1;
        if (id != stream.reportedEvent) {
            stream.reportedEvent = id;
            if (ev != nullptr) out.push_back({kEvtPresent, handle, id});
        }
    }
    collectDecoderEvents(now, out);
    return out;
}

int64_t Receiver::eventSeconds(const Stream& s, int64_t now) const {
    if (!s.playback || s.playback->start == 0) return now / 1000;
    int64_t pos = now - s.startedAt, loop = s.playback->loopMillis;
    return s.playback->start + (loop > 0 ? pos % loop : pos) / 1000;
}

bool Receiver::decoding(const Stream& s, int64_t now, int64_t* from) const {
    if (!s.started || s.service == nullptr) return false;
    if (s.playback) {
        *from = s.startedAt;
        return true;
    }
    const Frontend& fe = frontends[s.frontend];
    Signal sig = signal(fe.params, fe.tunedAt, now);
    if (sig.transport != s.transport || (sig.status & kFeLock) == 0) return false;
    if (s.service->scrambled && outputs.caStandby) return false;
    *from = std::max(s.startedAt, sig.lockedAt);
    return true;
}

int64_t Receiver::ptsAt(const Stream& s, int64_t from, int64_t ms) const {
    uint32_t key = static_cast<uint32_t>(s.transport->tsid) << 16 | s.service->id;
    int64_t pts = (mix(mClock.seed(), key, 3) + (ms - from) * 90) % dvbmodel::kPtsWrap;
    // Before `from` (a display set sent before the stream began) the count runs backwards.
    return pts < 0 ? pts + dvbmodel::kPtsWrap : pts;
}

std::string Receiver::recordingPath(const Stream& s, int64_t ms) const {
    return recordDir + "/rec-" + std::to_string(s.transport->onid) + "-" +
           std::to_string(s.transport->tsid) + "-" + std::to_string(s.service->id) + "-" +
           std::to_string(ms / 1000) + ".ts";
}

void Receiver::planRecording(Recording& r, const Stream& s, int64_t now) const {
    int64_t from = 0;
    bool on = s.started && decoding(s, now, &from);
    r.plan(now, on ? s.network : nullptr, on ? s.transport : nullptr);
}

void Receiver::planDump(int64_t now) const {
    const Frontend& fe = frontends[outputs.dumpFrontend];
    Signal sig;
    if (fe.tuned) sig = signal(fe.params, fe.tunedAt, now);
    bool locked = (sig.status & kFeLock) != 0;
    outputs.dump->plan(now, locked ? sig.network : nullptr, locked ? sig.transport : nullptr);
}

void Receiver::planWrites(int64_t now) const {
    for (const auto& [h, s] : streams) {
        if (s.recording) planRecording(*s.recording, s, now);
    }
    if (outputs.dump) planDump(now);
}

int64_t Receiver::toleranceKHz(dvbmodel::Delivery d) {
    switch (d) {
        case dvbmodel::Delivery::Satellite:
            return 2000;
        case dvbmodel::Delivery::Cable:
            return 200;
        default:
            return 166;
    }
}

int64_t Receiver::lockTime(dvbmodel::Delivery d) {
    switch (d) {
        case dvbmodel::Delivery::Satellite:
            return 400;
        case dvbmodel::Delivery::Cable:
            return 250;
        default:
            return 600;
    }
}

// Frequencies a front end of each type can tune to, in kHz: the satellite C and Ku bands
// (downlink), and the VHF and UHF range of a cable or terrestrial tuner.
bool Receiver::plausible(const ANT_FrontendParameters& p) {
    switch (p.type) {
        case kSatellite:
            return p.frequency >= 3000000 && p.frequency <= 13000000 && p.symbolRate >= 1000000 &&
                   p.symbolRate <= 45000000;
        case kCable:
            return p.frequency >= 45000 && p.frequency <= 870000 && p.symbolRate >= 1000000 &&
                   p.symbolRate <= 7200000;
        case kTerrestrial:
            return p.frequency >= 45000 && p.frequency <= 870000 && p.bandwidth >= 0 &&
                   p.bandwidth <= 10000;
        default:
            return false;
    }
}

void Receiver::moveDish(double target) {
    int64_t now = mClock.nowMillis();
    planWrites(now);
    dish.moveTo(target, now);
}

void Receiver::tune(int32_t dev, const ANT_FrontendParameters& params) {
    // What recordings received up to now is theirs, whenever the service thread writes it.
    planWrites(mClock.nowMillis());
    Frontend& fe = frontends[dev];
    if (params.myLongitude != 0 || params.myLatitude != 0) {
        site = {params.myLongitude / 10.0, params.myLatitude / 10.0};
    }
    if (fe.tuned && memcmp(&fe.params, &params, sizeof params) == 0) return;
    if (fe.reportedLock) fe.lostPending = true;
    fe.tuned = true;
    fe.params = params;
    fe.tunedAt = mClock.nowMillis();
}

const dvbmodel::Service* Receiver::findService(uint16_t onid, uint16_t tsid, uint16_t sid,
                                               const dvbmodel::Transport** transport) const {
    for (const auto& net : mBroadcast.networks) {
        for (const auto& tp : net.transports) {
            if (tp.onid != onid || tp.tsid != tsid) continue;
            for (const auto& svc : tp.services) {
                if (svc.id != sid) continue;
                if (transport != nullptr) *transport = &tp;
                return &svc;
            }
        }
    }
    return nullptr;
}

int32_t Receiver::newHandle() {
    // Handles are not reused, so a closed one stays unknown; a count gone round past INT32_MAX
    // skips those still open (at most 16 of each kind, so the loop ends).
    int32_t h;
    do {
        h = nextHandle;
        nextHandle = nextHandle == INT32_MAX ? 1 : nextHandle + 1;
    } while (scans.count(h) + streams.count(h) + subtitles.count(h) + teletexts.count(h) != 0);
    return h;
}

bool Receiver::sees(const ANT_FrontendParameters& p, const dvbmodel::Tuning& t, int64_t now,
                    bool pickBand) const {
    dvbmodel::Delivery d;
    if (!deliveryOf(p.type, &d) || d != t.delivery) return false;
    if (d != dvbmodel::Delivery::Satellite) return true;
    if (p.lnbpower == 0) return false;
    if (motorised(p)) {
        double want = usalsAngle(t.orbitalPosition / 10.0, site);
        if (std::isnan(want) || std::fabs(dish.at(now) - want) > kPointingTolerance) return false;
    } else if (std::abs(p.satPosition - t.orbitalPosition) > kPointingTolerance * 10) {
        return false;
    }
    double mhz = t.frequencyKHz / 1000.0;
    bool high = p.lnbHigLO > 0 &&
                ((pickBand || p.tone == kToneAuto) ? mhz >= 11700 : p.tone == kToneOn);
    int32_t lo = high ? p.lnbHigLO : p.lnbLowLO;
    if (lo <= 0) return false;
    // The tuner takes the LNB's intermediate frequency band, 950 to 2150 MHz.
    double ifreq = std::fabs(mhz - lo);
    if (ifreq < 950 || ifreq > 2150) return false;
    if (!pickBand) {
        if (p.polarization < 0 || p.polarization > 3) return false;
        if (voltageOf(p.polarization) != voltageOf(static_cast<int32_t>(t.polarization)))
            return false;
    }
    return true;
}

bool Receiver::fits(const ANT_FrontendParameters& p, const dvbmodel::Tuning& t) const {
    if (std::llabs(int64_t{p.frequency} - t.frequencyKHz) > Receiver::toleranceKHz(t.delivery))
        return false;
    if (t.delivery == dvbmodel::Delivery::Terrestrial) {
        return p.bandwidth == 0 || static_cast<uint32_t>(p.bandwidth) == t.bandwidthKHz;
    }
    int64_t sr = t.symbolRate;
    if (std::llabs(int64_t{p.symbolRate} - sr) * 100 > sr) return false;
    if (p.modulation != static_cast<int32_t>(dvbmodel::Modulation::Auto) &&
        p.modulation != static_cast<int32_t>(t.modulation))
        return false;
    return p.fecInner == static_cast<int32_t>(dvbmodel::Fec::Auto) ||
           p.fecInner == static_cast<int32_t>(t.fec);
}

Signal Receiver::signal(const ANT_FrontendParameters& p, int64_t tunedAt, int64_t now,
                        bool pickBand) const {
    Signal s;
    int64_t best = INT64_MAX;
    for (const auto& net : mBroadcast.networks) {
        for (const auto& tp : net.transports) {
            if (!sees(p, tp.tuning, now, pickBand) || (!pickBand && !fits(p, tp.tuning))) continue;
            int64_t off = std::llabs(int64_t{p.frequency} - tp.tuning.frequencyKHz);
            if (off < best) {
                best = off;
                s.network = &net;
                s.transport = &tp;
            }
        }
    }
    uint64_t seed = mClock.seed();
    int64_t second = now / 1000;
    if (s.transport == nullptr) {
        // The noise floor; a tuner that finds nothing gives up after a second.
        s.strength = 4 + static_cast<int32_t>(mix(seed, second, p.frequency, 4));
        s.status = now - tunedAt >= 1000 ? kFeTimedOut : 0;
        return s;
    }
    const dvbmodel::Tuning& t = s.transport->tuning;
    int64_t from = tunedAt;
    double pointing = 0;
    if (t.delivery == dvbmodel::Delivery::Satellite) {
        if (motorised(p)) {
            from = std::max(from, dish.arrival());
            pointing = std::fabs(dish.at(now) - usalsAngle(t.orbitalPosition / 10.0, site));
        } else {
            pointing = std::abs(p.satPosition - t.orbitalPosition) / 10.0;
        }
        pointing /= kPointingTolerance;
    }
    double offset = pickBand ? 0.0 : static_cast<double>(best) / Receiver::toleranceKHz(t.delivery);
    int32_t jitter = static_cast<int32_t>(mix(seed, second, s.transport->tsid, 3)) - 1;
    uint32_t key = static_cast<uint32_t>(s.transport->onid) << 16 | s.transport->tsid;
    s.strength = 55 + static_cast<int32_t>(mix(seed, key, 1, 30)) -
                 static_cast<int32_t>(10 * pointing) + jitter;
    int32_t quality = 62 + static_cast<int32_t>(mix(seed, key, 2, 33)) -
                      static_cast<int32_t>(30 * offset + 30 * pointing) + jitter;
    int64_t lock = lockTime(t.delivery);
    int64_t elapsed = now - from;
    s.status = kFeSignal | kFeCarrier;
    if (elapsed >= lock / 2) s.status |= kFeViterbi;
    if (elapsed >= lock) {
        s.status |= kFeSync | kFeLock;
        s.lockedAt = from + lock;
        s.quality = std::clamp(quality, 0, 100);
        s.snr = s.quality * 3 / 2;
        s.ber = (100 - s.quality) * (100 - s.quality) / 10;
    }
    return s;
}

std::string epgDatabasePath() {
    const char* env = getenv("DVB_EPG_DB");
    return env != nullptr && *env != '\0' ? env : DVB_EPG_DB_PATH;
}

dvbmodel::Broadcast defaultBroadcast(int64_t start) {
    return dvbmodel::builtinBroadcast(start);
}

namespace {

class ReceiverBackend : public dvbsvc::Backend {
public:
    void createModules(android::DVB& dvb) override {
        std::shared_ptr<Receiver> rx = Receiver::shared();
        dvb.mScnm = new ReceiverScnm(rx);
        dvb.mStrm = new ReceiverStrm(rx);
        dvb.mCfg = new ReceiverCfg(rx);
        dvb.mSubttl = new ReceiverSubttl(rx);
        dvb.mTeltxt = new ReceiverTeltxt(rx);
    }
};

}  // namespace

dvbsvc::Backend& backend() {
    static auto* b = new ReceiverBackend;
    return *b;
}

}  // namespace dvbrx
