// The emulated receiver's own costs, with bare SQLite on the same rows in the same run where
// there is a baseline:
//  - the receiver's memory: the resident set before and after building it with the built-in
//    broadcast (/proc/self/status);
//  - a full scan of the built-in broadcast (the band of each delivery system, the satellite one
//    at both orbital positions) on the deterministic clock stepped 100 ms at a time as fast as
//    the receiver follows: wall time against emulated time;
//  - filling the event database with 7 days x 100 services through the receiver
//    (EpgMd_AddService, then the service thread's stores, one transaction per section) against
//    bare inserts of the same rows in the same transactions; target: at least 0.7 times its
//    events per second;
//  - EPG_GetEvent on that database against the bare indexed query (and item query) of the same
//    rows; target: at most 1.5 times its time;
//  - a time-shift recording (one television service of the built-in broadcast, 5 minutes of
//    emulated time: the transport stream made and written to a file) against a plain
//    sequential write of the same bytes to a file, medians of five runs, wall and CPU time (one
//    thread does all of the recording's work); target: at least 0.8 times its bytes per
//    second.
#include <broadcast/Builtin.h>
#include <broadcast/DvbText.h>
#include <receiver/Modules.h>
#include <receiver/Recording.h>

#include <benchmark/benchmark.h>

#include <sqlite3.h>
#include <unistd.h>
#include "BenchSupport.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <random>

namespace {

using bench::folder;
using bench::removeDatabase;

using dvbrx::Receiver;
using dvbrx::ServiceKey;

constexpr int64_t kStart = 1767290400;  // 2026-01-01T18:00:00Z
constexpr int kServices = 100;
const dvbrx::Clock::Settings kClock{true, kStart * 1000, 0.0, 0};
// Events go nowhere: with no sink of its own the receiver would look for a Java VM.
void ignore(int, int, int) {}

long rssKiB() {
    std::ifstream status("/proc/self/status");
    std::string line;
    while (std::getline(status, line)) {
        if (line.rfind("VmRSS:", 0) == 0) return std::strtol(line.c_str() + 6, nullptr, 10);
    }
    return -1;
}

// The built-in broadcast grown to 100 services: copies of its services under new ids on its
// first transponder, each with its week of schedule.
const dvbmodel::Broadcast& hundredServices() {
    static const dvbmodel::Broadcast b = [] {
        dvbmodel::Broadcast out = dvbmodel::builtinBroadcast(kStart);
        std::vector<const dvbmodel::Service*> all;
        for (const auto& n : out.networks) {
            for (const auto& t : n.transports) {
                for (const auto& s : t.services) all.push_back(&s);
            }
        }
        std::vector<dvbmodel::Service> copies;
        for (size_t i = 0; all.size() + copies.size() < kServices; ++i) {
            copies.push_back(*all[i % all.size()]);
            copies.back().id = static_cast<uint16_t>(0x7000 + i);
        }
        auto& tp = out.networks[0].transports[0];
        tp.services.insert(tp.services.end(), copies.begin(), copies.end());
        return out;
    }();
    return b;
}

std::vector<EpgSvc> epgServices(const dvbmodel::Broadcast& b) {
    std::vector<EpgSvc> out;
    for (const auto& n : b.networks) {
        for (const auto& t : n.transports) {
            for (const auto& s : t.services) out.push_back({s.id, t.tsid, t.onid, {}, 0, 0, 0});
        }
    }
    return out;
}

// A receiver of the 100 services with its database open at `path`.
struct Box {
    std::shared_ptr<Receiver> rx;
    android::sp<dvbrx::ReceiverScnm> scnm;
    android::sp<dvbrx::ReceiverStrm> strm;
    explicit Box(const std::string& path)
        : rx(std::make_shared<Receiver>(hundredServices(), kClock, ignore)),
          scnm(new dvbrx::ReceiverScnm(rx)),
          strm(new dvbrx::ReceiverStrm(rx)) {
        setenv("DVB_EPG_DB", path.c_str(), 1);
        DVB_Config config{};
        if (scnm->Dvb_SystemInit(&config) != 0) std::abort();
        rx->sync();
        if (rx->epg == nullptr) std::abort();
    }
    void collectAll() {
        for (const EpgSvc& s : epgServices(hundredServices())) {
            if (strm->EpgMd_AddService(&s) != 0) std::abort();
        }
        rx->sync();
    }
};

size_t gEvents = 0;

void BM_ReceiverFill(benchmark::State& state) {
    std::string path = folder() + "/fill.db";
    for (auto _ : state) {
        state.PauseTiming();
        removeDatabase(path);
        auto box = std::make_unique<Box>(path);
        state.ResumeTiming();
        box->collectAll();
        state.PauseTiming();
        gEvents = box->rx->epg->eventCount();
        box.reset();
        state.ResumeTiming();
    }
    state.SetItemsProcessed(state.iterations() * gEvents);
}

struct Row {
    ServiceKey key;
    dvbrx::ScheduleSection section;
    std::vector<std::string> utf8;  // name and text of each event, decoded beforehand
};

void BM_BareInsert(benchmark::State& state) {
    std::vector<Row> rows;
    size_t events = 0;
    int64_t today = kStart / 86400 * 86400;
    for (const auto& n : hundredServices().networks) {
        for (const auto& t : n.transports) {
            for (const auto& s : t.services) {
                for (auto& section : dvbrx::scheduleSections(s, today)) {
                    rows.push_back({{t.onid, t.tsid, s.id}, std::move(section), {}});
                    for (const auto* e : rows.back().section.events) {
                        rows.back().utf8.push_back(dvbmodel::decodeText(e->name));
                        rows.back().utf8.push_back(dvbmodel::decodeText(e->text));
                        ++events;
                    }
                }
            }
        }
    }
    std::string path = folder() + "/bare.db";
    for (auto _ : state) {
        state.PauseTiming();
        removeDatabase(path);
        dvbrx::EpgDatabase::open(path, nullptr);  // the same schema
        sqlite3* db = nullptr;
        sqlite3_open_v2(path.c_str(), &db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr);
        sqlite3_exec(db, "PRAGMA journal_mode = WAL; PRAGMA synchronous = NORMAL", 0, 0, 0);
        sqlite3_stmt *begin, *commit, *event, *item, *section;
        sqlite3_prepare_v2(db, "BEGIN IMMEDIATE", -1, &begin, nullptr);
        sqlite3_prepare_v2(db, "COMMIT", -1, &commit, nullptr);
        sqlite3_prepare_v2(db,
                           "INSERT INTO event VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, "
                           "?11, ?12, ?13, ?14, ?15, ?16, ?17)",
                           -1, &event, nullptr);
        sqlite3_prepare_v2(db, "INSERT INTO item VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9)", -1,
                           &item, nullptr);
        sqlite3_prepare_v2(db, "INSERT INTO section VALUES (?1, ?2, ?3, ?4, ?5, ?6)", -1, &section,
                           nullptr);
        state.ResumeTiming();
        for (const Row& r : rows) {
            sqlite3_step(begin);
            sqlite3_reset(begin);
            int key[] = {r.key.onid, r.key.tsid, r.key.sid, r.section.tableId, r.section.number};
            for (size_t k = 0; k < r.section.events.size(); ++k) {
                const dvbmodel::Event& e = *r.section.events[k];
                for (int i = 0; i < 5; ++i) sqlite3_bind_int(event, i + 1, key[i]);
                sqlite3_bind_int(event, 6, e.id);
                sqlite3_bind_int64(event, 7, e.start);
                sqlite3_bind_int64(event, 8, e.duration);
                sqlite3_bind_int(event, 9, e.runningStatus);
                sqlite3_bind_int(event, 10, e.content);
                sqlite3_bind_int(event, 11, e.parentalRating);
                sqlite3_bind_text(event, 12, e.language.data(), e.language.size(), nullptr);
                sqlite3_bind_blob(event, 13, e.name.data(), e.name.size(), nullptr);
                sqlite3_bind_blob(event, 14, e.text.data(), e.text.size(), nullptr);
                sqlite3_bind_blob(event, 15, e.extendedText.data(), e.extendedText.size(), nullptr);
                const std::string& name = r.utf8[2 * k];
                const std::string& text = r.utf8[2 * k + 1];
                sqlite3_bind_text(event, 16, name.data(), name.size(), nullptr);
                sqlite3_bind_text(event, 17, text.data(), text.size(), nullptr);
                if (sqlite3_step(event) != SQLITE_DONE) std::abort();
                sqlite3_reset(event);
                for (size_t p = 0; p < e.items.size(); ++p) {
                    for (int i = 0; i < 5; ++i) sqlite3_bind_int(item, i + 1, key[i]);
                    sqlite3_bind_int(item, 6, e.id);
                    sqlite3_bind_int(item, 7, static_cast<int>(p));
                    const auto& it = e.items[p];
                    sqlite3_bind_blob(item, 8, it.description.data(), it.description.size(),
                                      nullptr);
                    sqlite3_bind_blob(item, 9, it.text.data(), it.text.size(), nullptr);
                    if (sqlite3_step(item) != SQLITE_DONE) std::abort();
                    sqlite3_reset(item);
                }
            }
            for (int i = 0; i < 5; ++i) sqlite3_bind_int(section, i + 1, key[i]);
            sqlite3_bind_int64(section, 6, r.section.version);
            if (sqlite3_step(section) != SQLITE_DONE) std::abort();
            sqlite3_reset(section);
            if (sqlite3_step(commit) != SQLITE_DONE) std::abort();
            sqlite3_reset(commit);
        }
        state.PauseTiming();
        for (sqlite3_stmt* s : {begin, commit, event, item, section}) sqlite3_finalize(s);
        sqlite3_close(db);
        state.ResumeTiming();
    }
    state.SetItemsProcessed(state.iterations() * events);
}

// The database that the lookups read, filled once through the receiver, and a fixed list of
// services to ask for.
Box& lookupBox() {
    static Box* box = [] {
        auto* b = new Box(folder() + "/lookup.db");
        b->collectAll();
        return b;
    }();
    return *box;
}

const std::vector<EpgSvc>& queries() {
    static const std::vector<EpgSvc> list = [] {
        std::vector<EpgSvc> all = epgServices(hundredServices()), out;
        std::mt19937 random(15);
        for (int i = 0; i < 4096; ++i) out.push_back(all[random() % all.size()]);
        return out;
    }();
    return list;
}

// As the library calls it: zero-filled records on the stack, one operation.
void BM_EpgGetEvent(benchmark::State& state) {
    Box& box = lookupBox();
    STRM_OpenSettings open{};
    int32_t handle = box.strm->Open(&open);
    size_t i = 0;
    for (auto _ : state) {
        EpgEvent ev{};
        ExtEpgEvent ext{};
        if (box.strm->EPG_GetEvent(&queries()[i++ % queries().size()], handle, &ev, &ext) != 0)
            std::abort();
        benchmark::DoNotOptimize(ev);
        benchmark::DoNotOptimize(ext);
    }
    box.strm->Close(handle);
}

// The same rows with bare SQLite: the event running now by the start index, then its items,
// every column read.
void BM_BareQuery(benchmark::State& state) {
    lookupBox();
    sqlite3* db = nullptr;
    sqlite3_open_v2((folder() + "/lookup.db").c_str(), &db,
                    SQLITE_OPEN_READONLY | SQLITE_OPEN_NOMUTEX, nullptr);
    sqlite3_stmt *event, *items;
    sqlite3_prepare_v2(db,
                       "SELECT table_id, section, event_id, start, duration, running_status, "
                       "content, parental_rating, language, name, text, extended_text FROM event "
                       "WHERE onid = ?1 AND tsid = ?2 AND sid = ?3 AND start <= ?4 ORDER BY "
                       "start DESC LIMIT 1",
                       -1, &event, nullptr);
    sqlite3_prepare_v2(db,
                       "SELECT description, text FROM item WHERE onid = ?1 AND tsid = ?2 AND sid "
                       "= ?3 AND table_id = ?4 AND section = ?5 AND event_id = ?6 ORDER BY "
                       "position",
                       -1, &items, nullptr);
    size_t i = 0;
    for (auto _ : state) {
        const EpgSvc& q = queries()[i++ % queries().size()];
        int key[] = {q.onId, q.tsId, q.svcId};
        for (int k = 0; k < 3; ++k) sqlite3_bind_int(event, k + 1, key[k]);
        sqlite3_bind_int64(event, 4, kStart);
        if (sqlite3_step(event) != SQLITE_ROW) std::abort();
        int64_t sum = 0;
        for (int c = 0; c < 8; ++c) sum += sqlite3_column_int64(event, c);
        for (int c = 8; c < 12; ++c) {
            benchmark::DoNotOptimize(sqlite3_column_blob(event, c));
            sum += sqlite3_column_bytes(event, c);
        }
        for (int k = 0; k < 3; ++k) sqlite3_bind_int(items, k + 1, key[k]);
        for (int k = 0; k < 3; ++k) sqlite3_bind_int(items, k + 4, sqlite3_column_int(event, k));
        while (sqlite3_step(items) == SQLITE_ROW) {
            for (int c = 0; c < 2; ++c) {
                benchmark::DoNotOptimize(sqlite3_column_blob(items, c));
                sum += sqlite3_column_bytes(items, c);
            }
        }
        sqlite3_reset(items);
        sqlite3_reset(event);
        benchmark::DoNotOptimize(sum);
    }
    sqlite3_finalize(items);
    sqlite3_finalize(event);
    sqlite3_close(db);
}

// Five minutes of a recording of the first television service of the first cable multiplex.
constexpr int64_t kRecordMillis = 300000;
std::vector<uint8_t> gRecorded;

void BM_Recording(benchmark::State& state) {
    static const dvbmodel::Broadcast broadcast = dvbmodel::builtinBroadcast(kStart);
    const dvbmodel::Network* net = nullptr;
    const dvbmodel::Transport* tp = nullptr;
    for (const auto& n : broadcast.networks) {
        if (n.delivery == dvbmodel::Delivery::Cable && tp == nullptr)
            net = &n, tp = &n.transports[0];
    }
    std::string path = folder() + "/recording.ts";
    for (auto _ : state) {
        auto rec = dvbrx::Recording::create(path, broadcast, &tp->services[0], kStart * 1000);
        rec->plan(kStart * 1000 + kRecordMillis, net, tp);
        rec->finish();
        state.SetBytesProcessed(rec->bytes());
    }
    std::ifstream in(path, std::ios::binary);
    gRecorded.assign(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// The same bytes written as they are, in the pieces a recording writes (half a second each).
void BM_PlainWrite(benchmark::State& state) {
    if (gRecorded.empty()) return state.SkipWithError("BM_Recording did not run before");
    std::string path = folder() + "/plain.ts";
    size_t piece = gRecorded.size() * 500 / kRecordMillis / 188 * 188;
    for (auto _ : state) {
        FILE* f = std::fopen(path.c_str(), "wb");
        if (f == nullptr) std::abort();
        for (size_t off = 0; off < gRecorded.size(); off += piece) {
            size_t n = std::min(piece, gRecorded.size() - off);
            if (::write(fileno(f), gRecorded.data() + off, n) != static_cast<ssize_t>(n))
                std::abort();
        }
        std::fclose(f);
        state.SetBytesProcessed(static_cast<int64_t>(gRecorded.size()));
    }
}

// Whole recordings and fills, timed on the wall clock: their work is in other threads too.
BENCHMARK(BM_Recording)->Apply([](auto* b) { bench::once(b, 5)->UseRealTime(); });
BENCHMARK(BM_PlainWrite)->Apply([](auto* b) { bench::once(b, 5)->UseRealTime(); });
BENCHMARK(BM_ReceiverFill)->Apply([](auto* b) { bench::once(b, 3)->UseRealTime(); });
BENCHMARK(BM_BareInsert)->Apply([](auto* b) { bench::once(b, 3)->UseRealTime(); });
BENCHMARK(BM_EpgGetEvent)->Repetitions(3);
BENCHMARK(BM_BareQuery)->Repetitions(3);

ANT_FrontendParameters band(int32_t type, int16_t orbital) {
    ANT_FrontendParameters p{};
    p.type = type;
    p.fecInner = 10;   // auto
    p.modulation = 7;  // auto
    p.tone = dvbrx::kToneAuto;
    p.lnbpower = 1;
    p.lnbLowLO = 9750;
    p.lnbHigLO = 10600;
    p.satPosition = orbital;
    return p;
}

// Full-band scans of every delivery system, the clock stepped by the receiver's own tick.
void fullScan() {
    auto rx = std::make_shared<Receiver>(dvbmodel::builtinBroadcast(kStart), kClock, ignore);
    android::sp<dvbrx::ReceiverScnm> scnm = new dvbrx::ReceiverScnm(rx);
    const struct {
        const char* what;
        ANT_FrontendParameters fe;
    } scans[] = {{"satellite 19.2E", band(dvbrx::kSatellite, 192)},
                 {"satellite 13.0E", band(dvbrx::kSatellite, 130)},
                 {"cable", band(dvbrx::kCable, 0)},
                 {"terrestrial", band(dvbrx::kTerrestrial, 0)}};
    std::printf(
            "\nFull-band scans of the built-in broadcast, the clock stepped 100 ms at a time:\n");
    int64_t emulated = 0, services = 0;
    double wall = 0;
    for (const auto& s : scans) {
        SCNM_OpenSettings open{0, 0};
        int32_t h = scnm->Open(&open);
        SCNM_StartSettings start{};
        start.fe = s.fe;
        start.scanType = dvbrx::kScanFullBand;
        int64_t from = rx->clock().nowMillis();
        auto t0 = std::chrono::steady_clock::now();
        if (scnm->Start(h, &start) != 0) std::abort();
        SCNM_GetStatus st{};
        for (scnm->GetStatus(h, &st); st.result == dvbrx::kScanRunning; scnm->GetStatus(h, &st)) {
            rx->clock().advance(100);
            rx->sync();
        }
        double ms = std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - t0)
                            .count();
        SCNM_ServiceInfo* list = nullptr;
        int found = scnm->CreateServiceList(h, &list);
        int64_t took = rx->clock().nowMillis() - from;
        std::printf("  %-16s %3d services, %6.1f s emulated in %7.1f ms wall (%.0fx)\n", s.what,
                    found, took / 1000.0, ms, took / ms);
        emulated += took;
        wall += ms;
        services += found;
        scnm->Close(h);
    }
    std::printf("  %-16s %3lld services, %6.1f s emulated in %7.1f ms wall (%.0fx)\n", "all",
                static_cast<long long>(services), emulated / 1000.0, wall, emulated / wall);
}

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    {
        long before = rssKiB();
        auto rx = std::make_shared<Receiver>(dvbmodel::builtinBroadcast(kStart), kClock, ignore);
        long after = rssKiB();
        std::printf(
                "Resident set: %ld KiB before the receiver, %ld KiB with it and the built-in "
                "broadcast: %ld KiB for the receiver\n",
                before, after, after - before);
    }
    fullScan();
    std::printf("\n");
    bench::Medians reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    auto& m = reporter.median;
    std::printf("\n%zu events of %d services x 7 days\n", gEvents, kServices);
    if (m.count("BM_EpgGetEvent") && m.count("BM_BareQuery")) {
        std::printf(
                "EPG_GetEvent time / bare indexed query time: %.2f wall, %.2f CPU (target <= "
                "1.5)\n",
                m["BM_EpgGetEvent"].real / m["BM_BareQuery"].real,
                m["BM_EpgGetEvent"].cpu / m["BM_BareQuery"].cpu);
    }
    // The receiver stores on its service thread: the CPU time of the calling thread does not
    // see that work, only the wall time does.
    if (m.count("BM_ReceiverFill") && m.count("BM_BareInsert")) {
        std::printf("receiver fill events/s / bare insert events/s: %.2f wall (target >= 0.7)\n",
                    m["BM_BareInsert"].real / m["BM_ReceiverFill"].real);
    }
    if (m.count("BM_Recording") && m.count("BM_PlainWrite")) {
        // One thread makes and writes the recording: its CPU time counts all of its work.
        std::printf(
                "recording bytes/s / plain write bytes/s: %.2f wall, %.2f CPU (%.1f MB in "
                "%.0f ms, %.0fx real time; target >= 0.8)\n",
                m["BM_PlainWrite"].real / m["BM_Recording"].real,
                m["BM_PlainWrite"].cpu / m["BM_Recording"].cpu, gRecorded.size() / 1e6,
                m["BM_Recording"].real, kRecordMillis / m["BM_Recording"].real);
    }
    std::filesystem::remove_all(folder());
    return 0;
}
