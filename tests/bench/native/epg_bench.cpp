// The event database against bare SQLite on the same rows, in the same run:
//  - eventAt on a database of 7 days x 100 services, against the bare indexed query (and item
//    query) that finds the same rows; target: at most 1.5 times its time;
//  - filling that database section by section (one transaction each, as the receiver stores
//    EIT sections), against bare inserts of the same event and item rows in the same
//    transactions; target: at least 0.7 times its events per second.
// Prints google benchmark's table, then the two ratios from the medians, of wall and CPU time.
#include <receiver/EpgDatabase.h>

#include <benchmark/benchmark.h>

#include <sqlite3.h>
#include <unistd.h>
#include "BenchSupport.h"

#include <cstdio>
#include <filesystem>
#include <map>
#include <random>

namespace {

using bench::folder;
using bench::removeDatabase;

using dvbmodel::Event;
using dvbrx::EpgDatabase;
using dvbrx::ServiceKey;

constexpr int kServices = 100, kDays = 7;
constexpr int64_t kStart = 1767225600;  // 2026-01-01 00:00 UTC
constexpr int64_t kSegment = 3 * 3600;  // EIT schedule segments of three hours

struct Section {
    ServiceKey service;
    uint8_t tableId, number;
    std::vector<Event> events;
};

// A week of programmes of 20 minutes to 2 hours for each service, grouped into the sections
// of their three-hour segments (table 0x50 for days 0-3, 0x51 for days 4-7).
const std::vector<Section>& schedule() {
    static const std::vector<Section> sections = [] {
        std::vector<Section> out;
        std::mt19937 random(14);
        const uint32_t durations[] = {1200, 1800, 2700, 3600, 5400, 7200};
        for (int s = 0; s < kServices; ++s) {
            ServiceKey key{1, static_cast<uint16_t>(1 + s / 10), static_cast<uint16_t>(100 + s)};
            uint16_t id = 0;
            for (int64_t t = kStart; t < kStart + kDays * 86400;) {
                Event e;
                e.id = ++id;
                e.start = t;
                e.duration = durations[random() % 6];
                e.runningStatus = 1;
                e.language = "deu";
                e.name = "\x05Programm " + std::to_string(id);
                e.text = "\x05" + std::string(120, 'k');
                e.extendedText = "\x05" + std::string(400, 'x');
                e.items = {{"Regie", "Jemand"}, {"Darsteller", "Jemand anderes"}};
                e.content = 0x10;
                int64_t segment = (t - kStart) / kSegment;
                auto table = static_cast<uint8_t>(0x50 + segment / 32);
                auto number = static_cast<uint8_t>(segment % 32 * 8);
                if (out.empty() || !(out.back().service == key) || out.back().number != number ||
                    out.back().tableId != table) {
                    out.push_back({key, table, number, {}});
                }
                out.back().events.push_back(std::move(e));
                t += out.back().events.back().duration;
            }
        }
        return out;
    }();
    return sections;
}

size_t eventTotal() {
    size_t n = 0;
    for (const Section& s : schedule()) n += s.events.size();
    return n;
}

std::unique_ptr<EpgDatabase> openOrDie(const std::string& path) {
    std::string error;
    auto db = EpgDatabase::open(path, &error);
    if (!db) {
        std::fprintf(stderr, "%s\n", error.c_str());
        std::abort();
    }
    return db;
}

sqlite3_stmt* prepare(sqlite3* db, const char* sql) {
    sqlite3_stmt* s = nullptr;
    if (sqlite3_prepare_v2(db, sql, -1, &s, nullptr) != SQLITE_OK) {
        std::fprintf(stderr, "%s: %s\n", sql, sqlite3_errmsg(db));
        std::abort();
    }
    return s;
}

void fill(EpgDatabase& db) {
    for (const Section& s : schedule()) {
        if (!db.storeSection(s.service, s.tableId, s.number, 1, s.events)) std::abort();
    }
}

void BM_Fill(benchmark::State& state) {
    std::string path = folder() + "/fill.db";
    for (auto _ : state) {
        state.PauseTiming();
        removeDatabase(path);
        auto db = openOrDie(path);
        state.ResumeTiming();
        fill(*db);
        state.PauseTiming();
        db.reset();
        state.ResumeTiming();
    }
    state.SetItemsProcessed(state.iterations() * eventTotal());
}

void BM_BareInsert(benchmark::State& state) {
    std::string path = folder() + "/bare.db";
    for (auto _ : state) {
        state.PauseTiming();
        removeDatabase(path);
        openOrDie(path);  // the same schema
        sqlite3* db = nullptr;
        sqlite3_open_v2(path.c_str(), &db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr);
        sqlite3_exec(db, "PRAGMA journal_mode = WAL; PRAGMA synchronous = NORMAL", 0, 0, 0);
        sqlite3_stmt* begin = prepare(db, "BEGIN IMMEDIATE");
        sqlite3_stmt* commit = prepare(db, "COMMIT");
        sqlite3_stmt* event = prepare(db,
                                      "INSERT INTO event VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, "
                                      "?9, ?10, ?11, ?12, ?13, ?14, ?15, NULL, NULL)");
        sqlite3_stmt* item = prepare(db,
                                     "INSERT INTO item VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, "
                                     "?8, ?9)");
        state.ResumeTiming();
        for (const Section& s : schedule()) {
            sqlite3_step(begin);
            sqlite3_reset(begin);
            for (const Event& e : s.events) {
                int values[] = {s.service.onid, s.service.tsid, s.service.sid,
                                s.tableId,      s.number,       e.id};
                for (int i = 0; i < 6; ++i) sqlite3_bind_int(event, i + 1, values[i]);
                sqlite3_bind_int64(event, 7, e.start);
                sqlite3_bind_int64(event, 8, e.duration);
                sqlite3_bind_int(event, 9, e.runningStatus);
                sqlite3_bind_int(event, 10, e.content);
                sqlite3_bind_int(event, 11, e.parentalRating);
                sqlite3_bind_text(event, 12, e.language.data(), e.language.size(), nullptr);
                sqlite3_bind_blob(event, 13, e.name.data(), e.name.size(), nullptr);
                sqlite3_bind_blob(event, 14, e.text.data(), e.text.size(), nullptr);
                sqlite3_bind_blob(event, 15, e.extendedText.data(), e.extendedText.size(), nullptr);
                if (sqlite3_step(event) != SQLITE_DONE) std::abort();
                sqlite3_reset(event);
                for (size_t k = 0; k < e.items.size(); ++k) {
                    for (int i = 0; i < 6; ++i) sqlite3_bind_int(item, i + 1, values[i]);
                    sqlite3_bind_int(item, 7, static_cast<int>(k));
                    const auto& it = e.items[k];
                    sqlite3_bind_blob(item, 8, it.description.data(), it.description.size(),
                                      nullptr);
                    sqlite3_bind_blob(item, 9, it.text.data(), it.text.size(), nullptr);
                    if (sqlite3_step(item) != SQLITE_DONE) std::abort();
                    sqlite3_reset(item);
                }
            }
            if (sqlite3_step(commit) != SQLITE_DONE) std::abort();
            sqlite3_reset(commit);
        }
        state.PauseTiming();
        for (sqlite3_stmt* s : {begin, commit, event, item}) sqlite3_finalize(s);
        sqlite3_close(db);
        state.ResumeTiming();
    }
    state.SetItemsProcessed(state.iterations() * eventTotal());
}

// The database that the lookups read, filled once, and a fixed list of (service, time) queries
// inside the week.
const std::string& lookupDatabase() {
    static const std::string path = [] {
        std::string p = folder() + "/lookup.db";
        fill(*openOrDie(p));
        return p;
    }();
    return path;
}

struct Query {
    ServiceKey service;
    int64_t time;
};

const std::vector<Query>& queries() {
    static const std::vector<Query> list = [] {
        std::vector<Query> out;
        std::mt19937 random(15);
        for (int i = 0; i < 4096; ++i) {
            int s = random() % kServices;
            out.push_back({{1, static_cast<uint16_t>(1 + s / 10), static_cast<uint16_t>(100 + s)},
                           kStart + 3600 + static_cast<int64_t>(random() % ((kDays - 1) * 86400))});
        }
        return out;
    }();
    return list;
}

void BM_EventAt(benchmark::State& state) {
    auto db = openOrDie(lookupDatabase());
    size_t i = 0;
    for (auto _ : state) {
        const Query& q = queries()[i++ % queries().size()];
        auto e = db->eventAt(q.service, q.time);
        if (!e) std::abort();
        benchmark::DoNotOptimize(e);
    }
}

// The same rows with bare SQLite: the indexed event query, then the event's items; every
// column read as eventAt reads it.
void BM_BareQuery(benchmark::State& state) {
    sqlite3* db = nullptr;
    sqlite3_open_v2(lookupDatabase().c_str(), &db, SQLITE_OPEN_READONLY | SQLITE_OPEN_NOMUTEX,
                    nullptr);
    sqlite3_stmt* event = prepare(
            db,
            "SELECT table_id, section, event_id, start, duration, running_status, content, "
            "parental_rating, language, name, text, extended_text FROM event WHERE onid = ?1 "
            "AND tsid = ?2 AND sid = ?3 AND start <= ?4 ORDER BY start DESC LIMIT 1");
    sqlite3_stmt* items = prepare(db,
                                  "SELECT description, text FROM item WHERE onid = ?1 AND tsid = "
                                  "?2 AND sid = ?3 AND table_id = ?4 AND section = ?5 AND "
                                  "event_id = ?6 ORDER BY position");
    size_t i = 0;
    for (auto _ : state) {
        const Query& q = queries()[i++ % queries().size()];
        int key[] = {q.service.onid, q.service.tsid, q.service.sid};
        for (int k = 0; k < 3; ++k) sqlite3_bind_int(event, k + 1, key[k]);
        sqlite3_bind_int64(event, 4, q.time);
        if (sqlite3_step(event) != SQLITE_ROW) std::abort();
        int64_t sum = 0;
        for (int c = 0; c < 9; ++c) sum += sqlite3_column_int64(event, c);
        for (int c = 9; c < 12; ++c) {
            benchmark::DoNotOptimize(sqlite3_column_blob(event, c));
            sum += sqlite3_column_bytes(event, c);
        }
        for (int k = 0; k < 3; ++k) sqlite3_bind_int(items, k + 1, key[k]);
        for (int k = 0; k < 3; ++k) {
            sqlite3_bind_int(items, k + 4, sqlite3_column_int(event, k));
        }
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

BENCHMARK(BM_Fill)->Apply([](auto* b) { bench::once(b, 3); });
BENCHMARK(BM_BareInsert)->Apply([](auto* b) { bench::once(b, 3); });
BENCHMARK(BM_EventAt)->Repetitions(3);
BENCHMARK(BM_BareQuery)->Repetitions(3);

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    bench::Medians reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    auto& m = reporter.median;
    std::printf("\n%zu events in %zu sections, %d services x %d days\n", eventTotal(),
                schedule().size(), kServices, kDays);
    // On a shared machine the wall time also counts other processes' turns; CPU time does not.
    if (m.count("BM_EventAt") && m.count("BM_BareQuery")) {
        std::printf("eventAt time / bare indexed query time: %.2f wall, %.2f CPU (target <= 1.5)\n",
                    m["BM_EventAt"].real / m["BM_BareQuery"].real,
                    m["BM_EventAt"].cpu / m["BM_BareQuery"].cpu);
    }
    if (m.count("BM_Fill") && m.count("BM_BareInsert")) {
        std::printf("fill events/s / bare insert events/s:   %.2f wall, %.2f CPU (target >= 0.7)\n",
                    m["BM_BareInsert"].real / m["BM_Fill"].real,
                    m["BM_BareInsert"].cpu / m["BM_Fill"].cpu);
    }
    std::filesystem::remove_all(folder());
    return 0;
}
