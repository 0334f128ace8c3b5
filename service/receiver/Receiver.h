// The emulated receiver: one per process, as a box has one, shared by every android::DVB
// object. It holds the broadcast model, the clock and the receiver state (front ends, the dish,
// scans, streams, decoders, outputs), and runs one service thread of its own, attached to the
// Java VM, that raises every listener event in the order the emulated time makes them happen.
//
// Module objects (Modules.h) lock the receiver, read or change its state and answer from it;
// the service thread compares the state with what it last reported and raises the difference.
#pragma once

#include <DVB.h>

#include <array>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "../Service.h"
#include "../broadcast/Broadcast.h"
#include "Clock.h"
#include "Codes.h"
#include "EpgDatabase.h"
#include "Recording.h"

namespace dvbrx {

constexpr int kFrontends = 2;
// Open handles of each kind (scans, streams, decoders) at once.
constexpr size_t kMaxHandles = 16;
// Services the event collection keeps at most.
constexpr size_t kMaxEpgServices = 1024;
// The dish motor: its speed, its mechanical travel either side of due south, and how far off a
// satellite it may point and still receive it.
constexpr double kMotorDegreesPerSecond = 1.5;
constexpr double kMotorTravel = 75.0;
constexpr double kPointingTolerance = 0.3;

// The observer's site for the dish, in degrees (east and north positive).
struct Site {
    double longitude = 0.0;
    double latitude = 51.5;
};

// Hour angle of a polar-mounted dish that points at the geostationary satellite at
// `satLongitude` from `site`, in degrees (east positive), as USALS computes it; NaN when the
// satellite is below the horizon.
double usalsAngle(double satLongitude, const Site& site);

// A position of the motorised dish over time: it moves from `from` to `to` at the motor's
// speed, starting at `since`.
struct Dish {
    double from = 0.0, to = 0.0;
    int64_t since = 0;
    bool limitsOn = false;
    double east = kMotorTravel, west = -kMotorTravel;
    std::array<double, 256> stored{};
    std::array<bool, 256> isStored{};
    bool arrivalReported = true;

    double at(int64_t ms) const;
    int64_t arrival() const;
    bool moving(int64_t ms) const { return ms < arrival(); }
    // Starts a movement to `target`, cut to the limits in force.
    void moveTo(double target, int64_t now);
};

// What one tuning delivers at one moment.
struct Signal {
    const dvbmodel::Network* network = nullptr;
    const dvbmodel::Transport* transport = nullptr;  // null: nothing to lock on
    int32_t status = 0;                              // FeStatus bits
    int32_t strength = 0;                            // percent
    int32_t quality = 0;                             // percent
    int32_t snr = 0;                                 // tenths of a dB
    int32_t ber = 0;                                 // bit errors per 10^7 bits
    int64_t lockedAt = 0;                            // when the lock came (if locked)
};

struct Frontend {
    bool tuned = false;
    ANT_FrontendParameters params{};
    int64_t tunedAt = 0;
    bool reportedLock = false;
    bool lostPending = false;
};

struct ScanStep {
    int64_t end = 0;  // milliseconds after the start
    const dvbmodel::Network* network = nullptr;
    const dvbmodel::Transport* transport = nullptr;  // found in this step, or null
};

struct Scan {
    int32_t frontend = 0, demux = 0;
    int32_t state = kScanIdle;
    SCNM_StartSettings settings{};
    int64_t startedAt = 0, stoppedAt = 0;
    std::vector<ScanStep> steps;
    size_t reportedSteps = 0;
    bool reportedDone = false;
    // The lists handed out last; the nodes stay valid until the next list call or Close.
    std::vector<SCNM_ServiceInfo> serviceNodes;
    std::vector<SCNMNET_FrontEndSettings> networkNodes;

    size_t stepsDone(int64_t now) const;
    // Whether the services of a step's transponder belong to the result: scanNetwrok 0 keeps
    // every network, another value only the network of that id.
    bool keeps(const ScanStep& step) const {
        return step.transport != nullptr &&
               (settings.scanNetwrok == 0 || step.network->id == settings.scanNetwrok);
    }
};

struct Stream {
    int32_t frontend = 0, demux = 0;
    bool started = false, frozen = false;
    // A stream opened on a file (szPath) plays that file's broadcast, from its start at the
    // moment the stream starts and in a loop, instead of what a front end receives.
    std::shared_ptr<dvbmodel::Broadcast> playback;
    STRM_Settings settings{};
    int64_t startedAt = 0;
    const dvbmodel::Network* network = nullptr;
    const dvbmodel::Transport* transport = nullptr;
    const dvbmodel::Service* service = nullptr;
    int32_t reportedEvent = -1;
    // Time shift: engaged by the settings' play speed; recorded from `shiftSince`, played from
    // `shiftPos` (ms into the recording) at `shiftAt` on, at playSpeed / playSpeedDiv.
    bool shifting = false;
    bool shiftOpening = false;  // time shift is making its file, outside the lock
    int64_t shiftSince = 0, shiftPos = 0, shiftAt = 0;
    // The recording that time shift makes, from shiftSince on (null when live).
    std::shared_ptr<Recording> recording;
    // EPG_GetEvent's cursor: the service it walks and the start of the event it gave last.
    bool epgWalking = false;
    ServiceKey epgService;
    int64_t epgLast = 0;
};

// What a decoder last reported: the sending (a display set, a teletext page) of a timed list
// of the model that was current, by its list index and the time it was sent (UTC ms).
struct Sending {
    size_t index = SIZE_MAX;
    int64_t at = 0;
    bool operator==(const Sending& o) const { return index == o.index && at == o.at; }
    bool operator!=(const Sending& o) const { return !(*this == o); }
};

struct Decoder {
    int32_t stream = 0;
    uint16_t pid = 0;
    uint16_t compositionPageId = 0, ancillaryPageId = 0;  // subtitles
    // Teletext: the page selected (0x100..0x8FF) and its subcode (0: the subpages rotate).
    int32_t page = 0x100, subpage = 0;
    Sending reported;
};

struct Outputs {
    bool audioMuted = false, videoMuted = false;
    int32_t volume = 50;
    Video_Position window{0, 0, 1920, 1080};
    bool caStandby = false;
    std::array<int32_t, 32> gpio{};
    int32_t wakeup = 0;
    bool blindScan = false;
    int32_t blindScanDev = 0;
    bool dumpOpening = false;  // a start is making its file, outside the lock
    int32_t dumpFrontend = 0;
    std::shared_ptr<Recording> dump;  // null: no dump
};

// Finishes a recording as it goes out of scope: declared before the receiver's lock is taken,
// it closes the file (planned up to the stop under the lock) after the lock is released.
struct RecordingStop {
    std::shared_ptr<Recording> recording;
    bool discard = false;  // the file is not wanted: closed and removed
    RecordingStop() = default;
    RecordingStop(const RecordingStop&) = delete;
    RecordingStop& operator=(const RecordingStop&) = delete;
    ~RecordingStop() {
        if (recording && discard) recording->discard();
        if (recording && !discard) recording->finish();
    }
};

class Receiver {
public:
    using EventSink = std::function<void(int msg, int ext1, int ext2)>;

    // A receiver of its own, for tests: events go to `sink` instead of the live DVB objects, and
    // its thread does not look for a Java VM (there may be none in the process).
    Receiver(dvbmodel::Broadcast broadcast, const Clock::Settings& clock, EventSink sink = {});
    ~Receiver();
    Receiver(const Receiver&) = delete;
    Receiver& operator=(const Receiver&) = delete;

    // The process's receiver, made on first use from the environment and the default broadcast.
    static std::shared_ptr<Receiver> shared();

    Clock& clock() { return mClock; }
    const dvbmodel::Broadcast& broadcast() const { return mBroadcast; }
    // The broadcast a stream plays: its file's, or the one on the air.
    const dvbmodel::Broadcast& broadcastOf(const Stream& s) const {
        return s.playback ? *s.playback : mBroadcast;
    }

    // Returns once the service thread has caught up with the clock as it reads now: every
    // event due by then has been raised.
    void sync();
    // Runs `task` on the service thread, outside the receiver's lock.
    void post(std::function<void()> task);

    // Raises an event from the service thread, after those already due. Called under mLock.
    void queueEvent(int msg, int ext1, int ext2);

    // ---- under mLock -------------------------------------------------------------------
    std::mutex mLock;
    std::array<Frontend, kFrontends> frontends;
    Dish dish;
    Site site;
    Outputs outputs;
    std::map<int32_t, Scan> scans;
    std::map<int32_t, Stream> streams;
    std::map<int32_t, Decoder> subtitles, teletexts;
    int32_t nextHandle = 1;
    // Where time-shift recordings are written: DVB_RECORD_DIR, else the event database's folder.
    std::string recordDir;
    // The services whose events are collected, in the order added; the database keeps a copy.
    std::vector<EpgSvc> epgServices;
    // EpgMd_ClearService ran since the database was last opened: the list it holds is void.
    bool epgCleared = false;
    // The open event database (null before Dvb_SystemInit opens it, and after
    // Dvb_SystemUnInit) and its path.
    std::shared_ptr<EpgDatabase> epg;
    std::string epgPath;

    // What `params` deliver at `now` when tuned at `tunedAt`. With `pickBand` the receiver
    // sets the 22 kHz tone and the polarisation itself (scans that follow a NIT or sweep a
    // band): only the dish, the LNB and its power must see the transponder.
    Signal signal(const ANT_FrontendParameters& params, int64_t tunedAt, int64_t now,
                  bool pickBand = false) const;
    // Whether `params` see transponder `t` at `now` (the dish and the LNB), and how well they
    // are tuned to it (`exact`: the frequency and the other parameters must fit).
    bool sees(const ANT_FrontendParameters& params, const dvbmodel::Tuning& t, int64_t now,
              bool pickBand) const;
    bool fits(const ANT_FrontendParameters& params, const dvbmodel::Tuning& t) const;
    // Milliseconds a demodulator needs to lock on a delivery system.
    static int64_t lockTime(dvbmodel::Delivery d);
    // How far off a transponder's frequency a tuner still locks, in kHz: satellite LNB drift
    // and the demodulator's capture range; a cable QAM and a terrestrial OFDM demodulator's.
    static int64_t toleranceKHz(dvbmodel::Delivery d);

    // Moves the dish to `target` (Dish::moveTo), once recordings have what they received.
    void moveDish(double target);
    // Tunes front end `dev` (valid) to `params`: the same tuning again keeps its lock.
    void tune(int32_t dev, const ANT_FrontendParameters& params);
    // The service with these identifiers, and its transponder; null when the model has none.
    const dvbmodel::Service* findService(uint16_t onid, uint16_t tsid, uint16_t sid,
                                         const dvbmodel::Transport** transport = nullptr) const;

    bool validFrontend(int32_t dev) const { return dev >= 0 && dev < kFrontends; }
    // Whether a tuning is one a front end of its type can take: frequency (kHz), symbol rate
    // (symbols per second) and bandwidth (kHz) in range.
    static bool plausible(const ANT_FrontendParameters& p);
    int32_t newHandle();

    // Whether started stream `s` decodes its service at `now`: its front end locked on the
    // service's transponder and the CA module not blocking it; `*from` is when it began.
    bool decoding(const Stream& s, int64_t now, int64_t* from) const;
    // The UTC second whose events stream `s` shows at `now` (ms): the clock's for a front end;
    // for a file, when its capture was at that point of the loop, from the file's first
    // TDT/TOT (the clock's where it has none), so that it shows the events it recorded.
    int64_t eventSeconds(const Stream& s, int64_t now) const;
    // The 33-bit PTS of a stream decoding since `from`, at `ms`: 90 kHz from an origin of its
    // service's own.
    int64_t ptsAt(const Stream& s, int64_t from, int64_t ms) const;

    // ---- recordings and dumps (Recording.h) -------------------------------------------
    // The file of a recording of stream `s` that starts at `ms`:
    // <recordDir>/rec-<onid>-<tsid>-<sid>-<UTC seconds>.ts.
    std::string recordingPath(const Stream& s, int64_t ms) const;
    // Plans recording `r` of stream `s` up to `now`: the stream's service while it decodes.
    void planRecording(Recording& r, const Stream& s, int64_t now) const;
    // Plans the dump up to `now`: the transponder its front end is locked on.
    void planDump(int64_t now) const;
    // Plans every recording and the dump up to `now`, before a change of what they receive.
    void planWrites(int64_t now) const;

    // ---- event database (ReceiverEpg.cpp), on the service thread ----------------------
    // Opens the database at `path` (an open one at the same path stays), takes the services
    // it lists as collected unless EpgMd_ClearService ran since, and stores their schedules.
    // Raises kEvtSystemReady with 0 or kErrDatabase.
    void openEpg(const std::string& path);
    void closeEpg();
    // Writes the list of collected services to the database and stores the schedule of each
    // one not stored yet today; raises kEvtEpgUpdate for each service whose store committed.
    void syncEpg();
    // Asks the service thread for a syncEpg() (once, however often asked before it runs).
    // Called under mLock.
    void requestEpgSync();

private:
    void run();
    std::vector<std::array<int, 3>> collectEvents(int64_t now);
    // New display sets and teletext page updates of the decoders (Decoders.cpp).
    void collectDecoderEvents(int64_t now, std::vector<std::array<int, 3>>& out);

    dvbmodel::Broadcast mBroadcast;
    Clock mClock;
    EventSink mSink;
    bool mJava;
    std::condition_variable mWake;
    std::vector<std::function<void()>> mTasks;
    std::vector<std::array<int, 3>> mQueued;
    uint64_t mSyncAsked = 0, mSyncDone = 0, mPokes = 0;
    std::condition_variable mSynced;
    // Service thread only: the services whose schedule is in the open database, and the day
    // (since 1970) they were stored on; a new day stores them again.
    std::set<uint64_t> mEpgStored;
    int64_t mEpgDay = -1;
    bool mEpgSyncPending = false;  // under mLock
    bool mStop = false;
    std::thread mThread;
};

// How the receiver stores a service's schedule: one section per day from `today` (UTC
// seconds at midnight), as the first section of the day's first EIT schedule segment (table
// 0x50 for days 0-3, 0x51 for days 4-7, section 0, 64, 128 or 192), every one of the 8 days
// even where it has no event; events outside the 8 days are left out. A section's version is
// a fingerprint of its day and events: the same schedule again stores nothing.
struct ScheduleSection {
    uint8_t tableId = 0, number = 0;
    uint32_t version = 0;
    std::vector<const dvbmodel::Event*> events;
};
constexpr int kEpgDays = 8;
std::array<ScheduleSection, kEpgDays> scheduleSections(const dvbmodel::Service& service,
                                                       int64_t today);
// Stores those that the database does not hold yet for `key`, one transaction each. A failed
// store ends it; the sections stored before stay.
struct ScheduleStore {
    int sections = 0, events = 0;  // stored
    bool failed = false;
};
ScheduleStore storeSchedule(EpgDatabase& db, ServiceKey key, const dvbmodel::Service& service,
                            int64_t today);

// The broadcast the process's receiver plays.
dvbmodel::Broadcast defaultBroadcast(int64_t start);
// A small broadcast of the receiver's own (FallbackBroadcast.cpp).
dvbmodel::Broadcast fallbackBroadcast(int64_t start);

// The backend that gives DVB objects the receiver's modules.
dvbsvc::Backend& backend();

// Where Dvb_SystemInit creates the event database file: DVB_EPG_DB, else the build's setting.
std::string epgDatabasePath();

}  // namespace dvbrx
