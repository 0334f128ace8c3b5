#include <receiver/EpgDatabase.h>

#include <gtest/gtest.h>
#include <signal.h>
#include <sqlite3.h>
#include <sys/wait.h>
#include <unistd.h>

#include <sstream>

#include "Captures.h"

namespace {

using dvbmodel::Event;
using namespace dvbrx;

constexpr ServiceKey kSvc{1, 2, 3}, kOther{1, 2, 4};

// Broadcast bytes: a character-table selector, a zero byte, bytes that are not UTF-8.
Event event(uint16_t id, int64_t start, uint32_t duration, size_t extendedBytes = 8) {
    std::string n = std::to_string(id);
    // clang-format off
    Event e{id, start, duration, 1, "fra", std::string("\x05N\0\xE9", 4) + n, "\x15text " + n,
            std::string(extendedBytes, char('a' + id % 26)), {}, 0x14, 9};
    // clang-format on
    if (id % 2) e.items = {{"Director", "\xFFX"}, {"", n}};
    return e;
}

// Every field of every event, so that one comparison checks a whole round trip.
std::string dump(const std::vector<Event>& events) {
    std::ostringstream s;
    for (const Event& e : events) {
        s << e.id << '|' << e.start << '|' << e.duration << '|' << int(e.runningStatus) << '|'
          << e.language << '|' << e.name << '|' << e.text << '|' << e.extendedText << '|'
          << int(e.content) << '|' << int(e.parentalRating);
        for (const auto& item : e.items) s << '|' << item.description << '=' << item.text;
        s << '\n';
    }
    return s.str();
}

std::vector<int> ids(const std::vector<Event>& events) {
    std::vector<int> out;
    for (const Event& e : events) out.push_back(e.id);
    return out;
}

class EpgDatabaseTest : public testing::Test {
protected:
    std::unique_ptr<EpgDatabase> open() {
        std::string error;
        auto db = EpgDatabase::open(path_, &error);
        EXPECT_TRUE(db) << error;
        return db;
    }
    static std::vector<Event> all(const EpgDatabase& db, ServiceKey key = kSvc) {
        return db.events(key, INT64_MIN, INT64_MAX);
    }

    testdata::TempDir dir_;
    const std::string path_ = dir_ / "epg.db";
};

TEST_F(EpgDatabaseTest, ANewVersionReplacesOnlyItsOwnSectionAndAllSurvivesARestart) {
    // Service, table, section, version, the events stored; the events of kSvc afterwards, by start.
    using Ids = std::vector<int>;
    const std::tuple<ServiceKey, uint8_t, uint8_t, uint8_t, std::vector<uint16_t>, Ids> steps[] = {
            {kSvc, 0x50, 0, 1, {1, 2}, {1, 2}},
            {kSvc, 0x50, 8, 1, {3}, {1, 2, 3}},
            {kSvc, 0x50, 0, 2, {4}, {3, 4}},
            {kSvc, 0x51, 0, 2, {5}, {3, 4, 5}},     // another table, the same section number
            {kOther, 0x50, 0, 3, {6}, {3, 4, 5}},   // another service
            {kSvc, 0x50, 8, 0, {}, {4, 5}},         // an empty section empties its own
            {kSvc, 0x52, 0, 1, {7, 7}, {4, 5, 7}},  // an event id listed twice: the first
            {kSvc, 0x51, 0, 2, {8}, {4, 5, 7}},     // after the restart: a version it knows
    };
    auto db = open();
    ASSERT_TRUE(db->addService({kSvc, 1, 2, 3}) && db->addService({kOther, 4, 5, 6}));
    ASSERT_TRUE(db->addService({kSvc, 7, 8, 9}));  // updated in its place
    for (const auto& step : steps) {
        const auto& [service, table, section, version, stored, expected] = step;
        if (&step == &steps[7]) db = open();
        std::vector<Event> events;
        for (size_t i = 0; i < stored.size(); ++i)
            events.push_back(event(stored[i], stored[i] * 1000 + int64_t(i), 60, i * 999));
        ASSERT_TRUE(db->storeSection(service, table, section, version, events)) << db->lastError();
        EXPECT_EQ(ids(all(*db)), expected)
                << "after section " << int(section) << " v" << int(version);
    }
    EXPECT_EQ(dump(all(*db)),
              dump({event(4, 4000, 60, 0), event(5, 5000, 60, 0), event(7, 7000, 60, 0)}));
    EXPECT_EQ(dump(all(*db, kOther)), dump({event(6, 6000, 60, 0)}));
    std::string services;
    for (const auto& v : db->services())
        services += std::to_string(v.key.sid) + ":" + std::to_string(v.tpIndex) +
                    std::to_string(v.netIndex) + std::to_string(v.netType) + " ";
    EXPECT_EQ(services, "3:789 4:456 ");
    ASSERT_TRUE(db->clearServices());
    EXPECT_TRUE(open()->services().empty());
}

TEST_F(EpgDatabaseTest, LooksEventsUpByTime) {
    auto db = open();
    // A [1000, 1600), B [1600, 1700), a gap, C [2000, 2100).
    ASSERT_TRUE(db->storeSection(kSvc, 0x50, 0, 1,
                                 {event(1, 1000, 600), event(2, 1600, 100), event(3, 2000, 100)}));
    auto id = [](const std::optional<Event>& e) { return e ? int(e->id) : 0; };
    // A time, the id of the event at it and of the event after it; 0 for none.
    const int64_t cases[][3] = {{0, 1, 1},         {1000, 1, 2},     {1599, 1, 2}, {1600, 2, 3},
                                {1700, 3, 3},      {1999, 3, 3},     {2099, 3, 0}, {2100, 0, 0},
                                {INT64_MIN, 1, 1}, {INT64_MAX, 0, 0}};
    for (const auto& [time, at, next] : cases) {
        EXPECT_EQ(id(db->eventAt(kSvc, time)), at) << "at " << time;
        EXPECT_EQ(id(db->nextAfter(kSvc, time)), next) << "after " << time;
    }
    EXPECT_EQ(ids(db->events(kSvc, 1000, 2000)), (std::vector<int>{1, 2}));
    EXPECT_EQ(ids(db->events(kSvc, 1001, 2001)), (std::vector<int>{2, 3}));
}

TEST_F(EpgDatabaseTest, AStoreKilledMidwayLeavesTheLastCommittedEvents) {
    std::vector<Event> committed, killed;
    for (uint16_t i = 0; i < 100; ++i) committed.push_back(event(i, i * 60, 60));
    // Larger than SQLite's page cache, so that the killed store has spilled pages to the log.
    for (uint16_t i = 0; i < 3000; ++i) killed.push_back(event(i, i * 60, 60, 2000));
    ASSERT_TRUE(open()->storeSection(kSvc, 0x50, 0, 1, committed));

    pid_t child = fork();
    if (child == 0) {
        // The decoder runs inside the store's transaction: it kills its process at the 2500th
        // event, with no chance to roll back or close.
        int calls = 0;
        auto db = EpgDatabase::open(path_, nullptr, [&](std::string_view t) {
            if (++calls == 5000) kill(getpid(), SIGKILL);
            return std::string(t);
        });
        if (db) db->storeSection(kSvc, 0x50, 0, 2, killed);
        _exit(0);
    }
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) << "status " << status;
    EXPECT_GT(std::filesystem::file_size(path_ + "-wal"), 4u << 20) << "nothing half-written";

    auto db = open();
    EXPECT_EQ(dump(all(*db)), dump(committed));
    EXPECT_EQ(db->eventCount(), 100u);
    ASSERT_TRUE(db->storeSection(kSvc, 0x50, 0, 2, {event(7, 0, 1)}));
    EXPECT_EQ(ids(all(*open())), std::vector<int>{7});
}

TEST_F(EpgDatabaseTest, RefusesWhatItCannotOpenWithTheReason) {
    // Path, what the file holds (bytes, or what SQL made), the reason.
    const std::string cases[][4] = {
            {dir_ / "missing/epg.db", "", "", "unable to open database file"},
            {path_, std::string(8192, 'Z'), "", "file is not a database"},
            {path_, "", "CREATE TABLE t (x)", "not an event database (it holds other tables)"},
            {path_, "", "PRAGMA user_version = 7", "not an event database (schema version 7)"},
    };
    for (const auto& [path, content, statement, reason] : cases) {
        std::filesystem::remove(path_);
        if (!content.empty()) std::ofstream(path_, std::ios::binary) << content;
        sqlite3* raw = nullptr;
        if (!statement.empty() && sqlite3_open(path_.c_str(), &raw) == SQLITE_OK)
            sqlite3_exec(raw, statement.c_str(), nullptr, nullptr, nullptr);
        sqlite3_close(raw);
        auto bytes = [&] {
            std::ifstream in(path_, std::ios::binary);
            return std::string(std::istreambuf_iterator<char>(in), {});
        };
        std::string before = bytes(), error;
        EXPECT_EQ(EpgDatabase::open(path, &error), nullptr);
        EXPECT_EQ(error, path + ": " + reason);
        EXPECT_EQ(bytes(), before) << "a file that is not ours stays as it was";
    }
}

}  // namespace
