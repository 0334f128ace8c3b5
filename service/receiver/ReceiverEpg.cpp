// The receiver's side of the event database: opening it, keeping the list of collected services
// in it, and storing their schedules from the broadcast, all on the service thread. Module
// operations only change the list and ask for a sync; they never write the database.
#include <broadcast/DvbText.h>
#include <algorithm>
#include <unordered_map>

#include "Receiver.h"

namespace dvbrx {
namespace {

constexpr int64_t kDaySeconds = 86400;

ServiceKey keyOf(const EpgSvc& s) {
    return {s.onId, s.tsId, s.svcId};
}

uint64_t packed(ServiceKey k) {
    return uint64_t{k.onid} << 32 | uint64_t{k.tsid} << 16 | k.sid;
}

// FNV-1a, 64 bits folded to 32: a section's version, from everything that it carries.
class Fingerprint {
public:
    void add(const void* data, size_t n) {
        const auto* p = static_cast<const uint8_t*>(data);
        for (size_t i = 0; i < n; ++i) mHash = (mHash ^ p[i]) * 1099511628211u;
    }
    void add(uint64_t v) { add(&v, sizeof v); }
    // Length first, so that "ab" + "c" and "a" + "bc" differ.
    void add(const std::string& s) {
        add(uint64_t{s.size()});
        add(s.data(), s.size());
    }
    uint32_t value() const { return static_cast<uint32_t>(mHash ^ mHash >> 32); }

private:
    uint64_t mHash = 14695981039346656037u;
};

uint32_t versionOf(int64_t day, const std::vector<const dvbmodel::Event*>& events) {
    Fingerprint f;
    f.add(static_cast<uint64_t>(day));
    for (const dvbmodel::Event* e : events) {
        f.add(uint64_t{e->id} << 48 | uint64_t{e->runningStatus} << 40 |
              uint64_t{e->content} << 32 | uint64_t{e->parentalRating} << 24);
        f.add(static_cast<uint64_t>(e->start));
        f.add(uint64_t{e->duration});
        for (const std::string* s : {&e->language, &e->name, &e->text, &e->extendedText}) f.add(*s);
        f.add(uint64_t{e->items.size()});
        for (const dvbmodel::Item& item : e->items) {
            f.add(item.description);
            f.add(item.text);
        }
    }
    return f.value();
}

}  // namespace

std::array<ScheduleSection, kEpgDays> scheduleSections(const dvbmodel::Service& service,
                                                       int64_t today) {
    std::array<ScheduleSection, kEpgDays> days;
    for (const dvbmodel::Event& e : service.events) {
        if (e.start < today) continue;
        int64_t d = (e.start - today) / kDaySeconds;
        if (d < kEpgDays) days[d].events.push_back(&e);
    }
    for (int d = 0; d < kEpgDays; ++d) {
        days[d].tableId = static_cast<uint8_t>(0x50 + d / 4);
        days[d].number = static_cast<uint8_t>(d % 4 * 64);
        days[d].version = versionOf(today / kDaySeconds + d, days[d].events);
    }
    return days;
}

ScheduleStore storeSchedule(EpgDatabase& db, ServiceKey key, const dvbmodel::Service& service,
                            int64_t today) {
    ScheduleStore out;
    if (!service.eitSections.empty()) {
        // A captured schedule goes in as it was received: its own sections and versions, so
        // that a new version replaces the events of that section and nothing else.
        std::unordered_map<uint16_t, const dvbmodel::Event*> byId;
        for (const dvbmodel::Event& e : service.events) byId.emplace(e.id, &e);  // the first
        std::vector<const dvbmodel::Event*> events;
        for (const dvbmodel::EitSection& s : service.eitSections) {
            if (db.holds(key, s.tableId, s.number, s.version)) continue;
            events.clear();
            for (uint16_t id : s.events) {
                auto e = byId.find(id);
                if (e != byId.end()) events.push_back(e->second);
            }
            if (!db.storeSection(key, s.tableId, s.number, s.version, events)) {
                out.failed = true;
                break;
            }
            ++out.sections;
            out.events += static_cast<int>(events.size());
        }
        return out;
    }
    for (const ScheduleSection& s : scheduleSections(service, today)) {
        if (db.holds(key, s.tableId, s.number, s.version)) continue;
        if (!db.storeSection(key, s.tableId, s.number, s.version, s.events)) {
            out.failed = true;
            break;
        }
        ++out.sections;
        out.events += static_cast<int>(s.events.size());
    }
    return out;
}

void Receiver::requestEpgSync() {
    if (epg == nullptr || mEpgSyncPending) return;
    mEpgSyncPending = true;
    mTasks.push_back([this] { syncEpg(); });
    ++mPokes;
    mWake.notify_all();
}

void Receiver::openEpg(const std::string& path) {
    {
        std::lock_guard<std::mutex> lock(mLock);
        if (epg != nullptr && epgPath == path) {
            queueEvent(kEvtSystemReady, kOk, 0);
            return;
        }
    }
    std::shared_ptr<EpgDatabase> db = EpgDatabase::open(path, nullptr, dvbmodel::decodeText);
    std::vector<EpgService> kept;
    if (db != nullptr) kept = db->services();
    std::lock_guard<std::mutex> lock(mLock);
    // A database that does not open leaves the one open before (if any) in place.
    if (db == nullptr) {
        queueEvent(kEvtSystemReady, kErrDatabase, 0);
        return;
    }
    if (!epgCleared) {
        // The services of the last run first, then those added since the process started.
        std::vector<EpgSvc> merged;
        for (const EpgService& s : kept) {
            if (merged.size() == kMaxEpgServices) break;
            EpgSvc svc{};
            svc.svcId = s.key.sid;
            svc.tsId = s.key.tsid;
            svc.onId = s.key.onid;
            svc.tpIndex = s.tpIndex;
            svc.netIndex = s.netIndex;
            svc.netType = s.netType;
            merged.push_back(svc);
        }
        for (const EpgSvc& s : epgServices) {
            bool known = false;
            for (const EpgSvc& m : merged) known = known || packed(keyOf(m)) == packed(keyOf(s));
            if (!known && merged.size() < kMaxEpgServices) merged.push_back(s);
        }
        epgServices = std::move(merged);
    }
    epgCleared = false;
    epg = std::move(db);
    epgPath = path;
    mEpgStored.clear();
    queueEvent(kEvtSystemReady, kOk, 0);
    requestEpgSync();
}

void Receiver::closeEpg() {
    std::shared_ptr<EpgDatabase> db;
    {
        std::lock_guard<std::mutex> lock(mLock);
        db = std::move(epg);
        epg = nullptr;
        epgPath.clear();
    }
    mEpgStored.clear();
    mEpgDay = -1;
    // The database closes here, outside the lock, once no store holds it any more.
}

void Receiver::syncEpg() {
    std::shared_ptr<EpgDatabase> db;
    std::vector<EpgSvc> list;
    int64_t now;
    {
        std::lock_guard<std::mutex> lock(mLock);
        mEpgSyncPending = false;
        if (epg == nullptr) return;
        db = epg;
        list = epgServices;
        now = mClock.nowSeconds();
    }
    int64_t day = (now >= 0 ? now : now - kDaySeconds + 1) / kDaySeconds;
    if (day != mEpgDay) {
        mEpgStored.clear();
        mEpgDay = day;
    }
    std::vector<EpgService> rows;
    rows.reserve(list.size());
    for (const EpgSvc& s : list) rows.push_back({keyOf(s), s.tpIndex, s.netIndex, s.netType});
    std::vector<std::array<int, 3>> raised;
    if (!db->setServices(rows)) raised.push_back({kEvtEpgUpdate, 0, kErrDatabase});
    for (const EpgSvc& s : list) {
        ServiceKey key = keyOf(s);
        if (mEpgStored.count(packed(key)) != 0) continue;
        // The broadcast model never changes: it is read without the lock.
        const dvbmodel::Service* svc = findService(key.onid, key.tsid, key.sid);
        if (svc == nullptr) continue;  // not on the air: nothing to collect
        ScheduleStore store = storeSchedule(*db, key, *svc, day * kDaySeconds);
        if (store.failed) {
            raised.push_back({kEvtEpgUpdate, s.svcId, kErrDatabase});
        } else {
            mEpgStored.insert(packed(key));
            if (store.sections > 0) raised.push_back({kEvtEpgUpdate, s.svcId, store.events});
        }
    }
    std::lock_guard<std::mutex> lock(mLock);
    for (const auto& e : raised) queueEvent(e[0], e[1], e[2]);
}

}  // namespace dvbrx
