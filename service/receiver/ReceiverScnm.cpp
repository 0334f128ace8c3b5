// The scan module: channel searches on a front end, their result lists, system start-up.
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <set>

#include "Modules.h"

namespace dvbrx {
namespace {

// Time a demodulator spends on the tables of a locked transponder (PAT, PMTs, SDT), on the
// NIT that a network search follows, and on a frequency where it finds nothing.
constexpr int64_t kTablesMillis = 1500;
constexpr int64_t kNitMillis = 500;
constexpr int64_t kNoLockMillis = 1000;

// The sweep of a full-band search: segments of the band, and the time spent on each.
struct Band {
    int64_t fromKHz, toKHz, stepKHz, millis;
};

class Planner {
public:
    Planner(const Receiver& rx, const ANT_FrontendParameters& fe, int64_t now)
        : mRx(rx), mFe(fe), mNow(now) {}

    std::vector<ScanStep> single(bool followNit) {
        Signal s = mRx.signal(mFe, mNow, mNow);
        if (s.transport == nullptr) {
            add(kNoLockMillis, nullptr, nullptr);
            return std::move(mSteps);
        }
        dvbmodel::Delivery d = s.transport->tuning.delivery;
        add(Receiver::lockTime(d) + kTablesMillis + (followNit ? kNitMillis : 0), s.network,
            s.transport);
        if (!followNit) return std::move(mSteps);
        // The NIT names every transponder of the network; the receiver picks band and
        // polarisation for each from its delivery descriptor.
        for (const auto& tp : s.network->transports) {
            if (&tp == s.transport || tp.tuning.delivery != d) continue;
            if (mRx.sees(mFe, tp.tuning, mNow, true)) {
                add(Receiver::lockTime(d) + kTablesMillis, s.network, &tp);
            } else {
                add(kNoLockMillis, nullptr, nullptr);
            }
        }
        return std::move(mSteps);
    }

    std::vector<ScanStep> fullBand() {
        if (mFe.type == kSatellite) {
            // Each LNB band and each polarisation, over the tuner's 950 to 2150 MHz.
            for (int32_t lo : {mFe.lnbLowLO, mFe.lnbHigLO}) {
                if (lo <= 0) continue;
                for (int32_t pol : {0, 1}) {
                    for (int64_t f = 950000; f < 2150000; f += 100000) {
                        sweep(f, f + 100000, 250, [&](const dvbmodel::Tuning& t) {
                            int64_t ifreq =
                                    std::llabs(int64_t{t.frequencyKHz} - int64_t{lo} * 1000);
                            bool sameVoltage =
                                    (pol == 1) ==
                                    (t.polarization == dvbmodel::Polarization::Vertical ||
                                     t.polarization == dvbmodel::Polarization::Right);
                            return sameVoltage ? ifreq : -1;
                        });
                    }
                }
            }
        } else {
            const std::vector<Band> bands =
                    mFe.type == kCable ? std::vector<Band>{{47000, 862000, 8000, 150}}
                                       : std::vector<Band>{{174000, 230000, 8000, 200},
                                                           {470000, 862000, 8000, 200}};
            for (const Band& b : bands) {
                for (int64_t f = b.fromKHz; f < b.toKHz; f += b.stepKHz) {
                    sweep(f, f + b.stepKHz, b.millis,
                          [](const dvbmodel::Tuning& t) { return int64_t{t.frequencyKHz}; });
                }
            }
        }
        return std::move(mSteps);
    }

private:
    void add(int64_t millis, const dvbmodel::Network* net, const dvbmodel::Transport* tp) {
        mEnd += millis;
        mSteps.push_back({mEnd, net, tp});
    }

    // One segment [from, to) of the swept band: `position` places a transponder in the band
    // (-1: not in this sweep). Every transponder found there gets a step of its own.
    template <typename Position>
    void sweep(int64_t from, int64_t to, int64_t millis, Position position) {
        add(millis, nullptr, nullptr);
        for (const auto& net : mRx.broadcast().networks) {
            for (const auto& tp : net.transports) {
                if (mFound.count(&tp) || !mRx.sees(mFe, tp.tuning, mNow, true)) continue;
                int64_t at = position(tp.tuning);
                if (at < from || at >= to) continue;
                mFound.insert(&tp);
                add(Receiver::lockTime(tp.tuning.delivery) + kTablesMillis, &net, &tp);
            }
        }
    }

    const Receiver& mRx;
    const ANT_FrontendParameters& mFe;
    int64_t mNow;
    int64_t mEnd = 0;
    std::vector<ScanStep> mSteps;
    std::set<const dvbmodel::Transport*> mFound;
};

void fillService(SCNM_ServiceInfo& node, const dvbmodel::Transport& tp,
                 const dvbmodel::Service& svc, int64_t seconds) {
    node.svcType = svc.type;
    node.svcId = svc.id;
    for (const auto& c : svc.components) {
        if (c.kind == dvbmodel::Kind::Video && node.videoPid == 0) {
            node.videoPid = c.pid;
            node.videoType = c.streamType;
        } else if (c.kind == dvbmodel::Kind::Audio && node.audioPid == 0) {
            node.audioPid = c.pid;
            node.audioType = c.streamType;
        }
    }
    node.pcrPid = svc.pcrPid;
    node.pmtPid = svc.pmtPid;
    uint16_t* ca[] = {&node.caSysId0, &node.caSysId1, &node.caSysId2};
    for (size_t i = 0; i < 3 && i < svc.caSystems.size(); ++i) *ca[i] = svc.caSystems[i];
    copyBroadcastText(node.svcName, svc.name);
    node.tsId = tp.tsid;
    node.onId = tp.onid;
    node.lcn = svc.lcn;
    const dvbmodel::Event* now = dvbmodel::eventAt(svc, seconds);
    node.content = now != nullptr ? now->content : 0;
}

void fillNetwork(SCNMNET_FrontEndSettings& node, const dvbmodel::Tuning& t) {
    node.frequency = static_cast<int32_t>(t.frequencyKHz);
    switch (t.delivery) {
        case dvbmodel::Delivery::Satellite:
            node.type = kSatellite;
            node.polarization = static_cast<int32_t>(t.polarization);
            node.rolloff = static_cast<int32_t>(t.rolloff);
            break;
        case dvbmodel::Delivery::Cable:
            node.type = kCable;
            break;
        case dvbmodel::Delivery::Terrestrial:
            node.type = kTerrestrial;
            break;
    }
    // Laid out as the front-end block: a terrestrial multiplex gives its bandwidth in the
    // symbol rate's place.
    if (t.delivery == dvbmodel::Delivery::Terrestrial) {
        node.symbolRate = static_cast<int32_t>(t.bandwidthKHz);
    } else {
        node.symbolRate = static_cast<int32_t>(t.symbolRate);
        node.fecInner = static_cast<int32_t>(t.fec);
        node.modulation = static_cast<int32_t>(t.modulation);
    }
}

template <typename Node>
int32_t handOut(std::vector<Node>& nodes, Node** head) {
    for (size_t i = 0; i < nodes.size(); ++i) {
        dvbListLink(&nodes[i], i + 1 < nodes.size() ? &nodes[i + 1] : nullptr);
    }
    *head = nodes.empty() ? nullptr : nodes.data();
    return static_cast<int32_t>(nodes.size());
}

}  // namespace

int32_t ReceiverScnm::Init() {
    return kOk;
}

int32_t ReceiverScnm::Open(const SCNM_OpenSettings* settings) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (settings == nullptr || !mRx->validFrontend(settings->frontend) || settings->demux < 0)
        return kErrBadParameter;
    if (mRx->scans.size() >= kMaxHandles) return kErrTooMany;
    int32_t h = mRx->newHandle();
    Scan& scan = mRx->scans[h];
    scan.frontend = settings->frontend;
    scan.demux = settings->demux;
    return h;
}

int32_t ReceiverScnm::Close(int32_t handle) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    return mRx->scans.erase(handle) != 0 ? kOk : kErrBadHandle;
}

int32_t ReceiverScnm::Start(int32_t handle, const SCNM_StartSettings* settings) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    auto it = mRx->scans.find(handle);
    if (it == mRx->scans.end()) return kErrBadHandle;
    if (settings == nullptr || settings->scanType < kScanSingle ||
        settings->scanType > kScanFullBand)
        return kErrBadParameter;
    const ANT_FrontendParameters& fe = settings->fe;
    if (settings->scanType == kScanFullBand ? fe.type < kSatellite || fe.type > kTerrestrial
                                            : !Receiver::plausible(fe))
        return kErrBadParameter;
    Scan& scan = it->second;
    for (const auto& entry : mRx->scans) {
        if (entry.second.state == kScanRunning && entry.second.frontend == scan.frontend &&
            entry.second.stepsDone(mRx->clock().nowMillis()) < entry.second.steps.size())
            return kErrBusy;
    }
    int64_t now = mRx->clock().nowMillis();
    Planner planner(*mRx, fe, now);
    scan.steps = settings->scanType == kScanFullBand
                         ? planner.fullBand()
                         : planner.single(settings->scanType == kScanNetwork);
    scan.settings = *settings;
    scan.state = kScanRunning;
    scan.startedAt = now;
    scan.reportedSteps = 0;
    scan.reportedDone = false;
    return kOk;
}

int32_t ReceiverScnm::Stop(int32_t handle) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    auto it = mRx->scans.find(handle);
    if (it == mRx->scans.end()) return kErrBadHandle;
    Scan& scan = it->second;
    int64_t now = mRx->clock().nowMillis();
    if (scan.state != kScanRunning || scan.stepsDone(now) == scan.steps.size())
        return kErrNotStarted;
    scan.state = kScanStopped;
    scan.stoppedAt = now;
    return kOk;
}

int32_t ReceiverScnm::GetStatus(int32_t handle, SCNM_GetStatus* status) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (status == nullptr) return kErrBadParameter;
    auto it = mRx->scans.find(handle);
    if (it == mRx->scans.end()) {
        status->result = kErrBadHandle;
        return kErrBadHandle;
    }
    const Scan& scan = it->second;
    int64_t now = mRx->clock().nowMillis();
    size_t done = scan.stepsDone(now);
    status->result = scan.state;
    if (scan.state == kScanIdle || scan.steps.empty()) return kOk;
    if (scan.state == kScanRunning && done == scan.steps.size()) status->result = kScanDone;
    status->sfStatus = static_cast<int32_t>(done * 100 / scan.steps.size());
    // The front end as the step in progress (or the last one) has it.
    size_t at = std::min(done, scan.steps.size() - 1);
    const ScanStep& step = scan.steps[at];
    if (step.transport != nullptr) {
        int64_t stepStart = scan.startedAt + (at == 0 ? 0 : scan.steps[at - 1].end);
        int64_t t = scan.state == kScanStopped ? scan.stoppedAt : now;
        status->feStatus = t - stepStart >= Receiver::lockTime(step.transport->tuning.delivery)
                                   ? kFeSignal | kFeCarrier | kFeViterbi | kFeSync | kFeLock
                                   : kFeSignal | kFeCarrier;
    }
    return kOk;
}

int32_t ReceiverScnm::CreateServiceList(int32_t handle, SCNM_ServiceInfo** head) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (head == nullptr) return kErrBadParameter;
    auto it = mRx->scans.find(handle);
    if (it == mRx->scans.end()) return kErrBadHandle;
    Scan& scan = it->second;
    int64_t now = mRx->clock().nowMillis();
    size_t done = scan.stepsDone(now);
    scan.serviceNodes.clear();
    for (size_t i = 0; i < done; ++i) {
        const ScanStep& step = scan.steps[i];
        if (!scan.keeps(step)) continue;
        for (const auto& svc : step.transport->services) {
            scan.serviceNodes.emplace_back();
            memset(&scan.serviceNodes.back(), 0, sizeof(SCNM_ServiceInfo));
            fillService(scan.serviceNodes.back(), *step.transport, svc, now / 1000);
        }
    }
    return handOut(scan.serviceNodes, head);
}

int32_t ReceiverScnm::CreateNetworkList(int32_t handle, SCNMNET_FrontEndSettings** head) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (head == nullptr) return kErrBadParameter;
    auto it = mRx->scans.find(handle);
    if (it == mRx->scans.end()) return kErrBadHandle;
    Scan& scan = it->second;
    size_t done = scan.stepsDone(mRx->clock().nowMillis());
    scan.networkNodes.clear();
    for (size_t i = 0; i < done; ++i) {
        if (!scan.keeps(scan.steps[i])) continue;
        scan.networkNodes.emplace_back();
        memset(&scan.networkNodes.back(), 0, sizeof(SCNMNET_FrontEndSettings));
        fillNetwork(scan.networkNodes.back(), scan.steps[i].transport->tuning);
    }
    return handOut(scan.networkNodes, head);
}

int32_t ReceiverScnm::Dvb_SystemInit(const DVB_Config* config) {
    if (config == nullptr) return kErrBadParameter;
    std::string path = epgDatabasePath();
    std::string dir = path.find('/') == std::string::npos ? "." : path.substr(0, path.rfind('/'));
    if (dir.empty()) dir = "/";
    if (access(path.c_str(), F_OK) == 0 ? access(path.c_str(), W_OK) != 0
                                        : access(dir.c_str(), W_OK) != 0)
        return kErrPath;
    // The service thread makes the file shortly after, as the device's start-up does, and
    // keeps the database open; it runs on the receiver's own thread, which ends before the
    // receiver does.
    Receiver* rx = mRx.get();
    rx->post([rx, path] { rx->openEpg(path); });
    return kOk;
}

int32_t ReceiverScnm::Dvb_SystemUnInit(const DVB_Config* config) {
    if (config == nullptr) return kErrBadParameter;
    {
        std::lock_guard<std::mutex> lock(mRx->mLock);
        int64_t now = mRx->clock().nowMillis();
        for (auto& entry : mRx->scans) {
            Scan& scan = entry.second;
            if (scan.state == kScanRunning && scan.stepsDone(now) < scan.steps.size()) {
                scan.state = kScanStopped;
                scan.stoppedAt = now;
            }
        }
    }
    // The database closes after the stores already asked for.
    Receiver* rx = mRx.get();
    rx->post([rx] { rx->closeEpg(); });
    return kOk;
}

}  // namespace dvbrx
