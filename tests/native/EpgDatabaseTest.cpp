#include <receiver/EpgDatabase.h>

#include <gtest/gtest.h>
#include <signal.h>
#include <sqlite3.h>
#include <sys/wait.h>
#include <unistd.h>

#include <climits>
#include <filesystem>
#include <fstream>

namespace {

using dvbmodel::Event;
using dvbrx::EpgDatabase;
using dvbrx::ServiceKey;

constexpr ServiceKey kSvc{1, 2, 3}, kOther{1, 2, 4};

Event event(uint16_t id, int64_t start, uint32_t duration, size_t extendedBytes = 8) {
    Event e;
    e.id = id;
    e.start = start;
    e.duration = duration;
    e.runningStatus = 1;
    e.language = "fra";
    // Broadcast bytes: a character-table selector, a zero byte, bytes that are not UTF-8.
    e.name = std::string("\x05N\0\xE9", 4) + std::to_string(id);
    e.text = "\x15text " + std::to_string(id);
    e.extendedText = std::string(extendedBytes, static_cast<char>('a' + id % 26));
    e.items = {{"Director", "\xFFX"}, {"", std::to_string(id)}};
    e.content = 0x14;
    e.parentalRating = 9;
    return e;
}

// Every field, so that one comparison checks a whole round trip.
std::string dump(const Event& e) {
    std::string s = std::to_string(e.id) + "|" + std::to_string(e.start) + "|" +
                    std::to_string(e.duration) + "|" + std::to_string(e.runningStatus) + "|" +
                    e.language + "|" + e.name + "|" + e.text + "|" + e.extendedText + "|" +
                    std::to_string(e.content) + "|" + std::to_string(e.parentalRating);
    for (const auto& item : e.items) s += "|" + item.description + "=" + item.text;
    return s;
}

std::vector<std::string> dumps(const std::vector<Event>& events) {
    std::vector<std::string> out;
    for (const Event& e : events) out.push_back(dump(e));
    return out;
}

std::vector<int> ids(const std::vector<Event>& events) {
    std::vector<int> out;
    for (const Event& e : events) out.push_back(e.id);
    return out;
}

class EpgDatabaseTest : public testing::Test {
protected:
    void SetUp() override {
        std::string tmpl = testing::TempDir() + "epgdb-XXXXXX";
        ASSERT_NE(mkdtemp(tmpl.data()), nullptr);
        dir_ = tmpl;
        path_ = dir_ + "/epg.db";
    }
    void TearDown() override { std::filesystem::remove_all(dir_); }

    std::unique_ptr<EpgDatabase> open(dvbrx::TextDecoder decoder = nullptr) {
        std::string error;
        auto db = EpgDatabase::open(path_, &error, std::move(decoder));
        EXPECT_TRUE(db) << error;
        return db;
    }
    static std::vector<Event> all(const EpgDatabase& db, ServiceKey key = kSvc) {
        return db.events(key, INT64_MIN, INT64_MAX);
    }

    std::string dir_, path_;
};

TEST_F(EpgDatabaseTest, ANewVersionReplacesOnlyItsOwnSection) {
    struct Step {
        ServiceKey service;
        uint8_t table, section, version;
        std::vector<uint16_t> events;
        std::vector<int> expected;  // the events of kSvc afterwards, by start
    } const steps[] = {
            {kSvc, 0x50, 0, 1, {1, 2}, {1, 2}},
            {kSvc, 0x50, 8, 1, {3}, {1, 2, 3}},
            {kSvc, 0x50, 0, 1, {9}, {1, 2, 3}},  // the same version again: nothing changes
            {kSvc, 0x50, 0, 2, {4}, {3, 4}},
            {kSvc, 0x51, 0, 2, {5}, {3, 4, 5}},     // another table, the same section number
            {kOther, 0x50, 0, 3, {6}, {3, 4, 5}},   // another service
            {kSvc, 0x50, 8, 0, {}, {4, 5}},         // an empty section empties its own
            {kSvc, 0x52, 0, 1, {7, 7}, {4, 5, 7}},  // an event id listed twice: the first
    };
    auto db = open();
    for (const Step& s : steps) {
        std::vector<Event> events;
        for (size_t i = 0; i < s.events.size(); ++i) {
            events.push_back(event(s.events[i], s.events[i] * 1000 + int64_t(i), 60));
        }
        ASSERT_TRUE(db->storeSection(s.service, s.table, s.section, s.version, events))
                << db->lastError();
        EXPECT_EQ(ids(all(*db)), s.expected)
                << "after section " << int(s.section) << " v" << int(s.version);
    }
    EXPECT_EQ(dumps(all(*db, kOther)), dumps({event(6, 6000, 60)}));
    EXPECT_EQ(all(*db)[2].start, 7000) << "the first of the two events numbered 7";
    EXPECT_EQ(db->eventCount(), 4u);
}

TEST_F(EpgDatabaseTest, LooksEventsUpByTime) {
    auto db = open();
    // A [1000, 1600), B [1600, 1700), a gap, C [2000, 2100).
    ASSERT_TRUE(db->storeSection(kSvc, 0x50, 0, 1,
                                 {event(1, 1000, 600), event(2, 1600, 100), event(3, 2000, 100)}));
    struct {
        int64_t time;
        int at, next;  // event ids, 0 for none
    } const cases[] = {{0, 1, 1},         {1000, 1, 2},     {1599, 1, 2}, {1600, 2, 3},
                       {1700, 3, 3},      {1999, 3, 3},     {2099, 3, 0}, {2100, 0, 0},
                       {INT64_MIN, 1, 1}, {INT64_MAX, 0, 0}};
    auto id = [](const std::optional<Event>& e) { return e ? int(e->id) : 0; };
    for (const auto& c : cases) {
        EXPECT_EQ(id(db->eventAt(kSvc, c.time)), c.at) << "at " << c.time;
        EXPECT_EQ(id(db->nextAfter(kSvc, c.time)), c.next) << "after " << c.time;
        EXPECT_EQ(id(db->eventAt(kOther, c.time)), 0);
    }
    EXPECT_EQ(dump(*db->eventAt(kSvc, 1650)), dump(event(2, 1600, 100)));
    EXPECT_EQ(ids(db->events(kSvc, 1000, 2000)), (std::vector<int>{1, 2}));
    EXPECT_EQ(ids(db->events(kSvc, 1001, 2001)), (std::vector<int>{2, 3}));
}

TEST_F(EpgDatabaseTest, ReopensWithWhatWasStored) {
    std::vector<Event> stored = {event(1, 100, 50, 2048), event(2, 150, 50, 0)};
    stored[1].items.clear();
    {
        auto db = open();
        ASSERT_TRUE(db->storeSection(kSvc, 0x50, 0, 1, stored));
        ASSERT_TRUE(db->addService({kSvc, 1, 2, 3}));
        ASSERT_TRUE(db->addService({kOther, 4, 5, 6}));
        ASSERT_TRUE(db->addService({kSvc, 7, 8, 9}));  // updated in its place
    }
    auto db = open();
    EXPECT_EQ(dumps(all(*db)), dumps(stored));
    ASSERT_TRUE(db->storeSection(kSvc, 0x50, 0, 1, {event(9, 0, 1)}));  // a version it knows
    EXPECT_EQ(dumps(all(*db)), dumps(stored));
    auto services = db->services();
    ASSERT_EQ(services.size(), 2u);
    EXPECT_TRUE(services[0].key == kSvc && services[0].tpIndex == 7 && services[0].netIndex == 8 &&
                services[0].netType == 9);
    EXPECT_TRUE(services[1].key == kOther && services[1].tpIndex == 4);
    ASSERT_TRUE(db->clearServices());
    db = open();
    EXPECT_TRUE(db->services().empty());
    EXPECT_EQ(db->eventCount(), 2u) << "clearing the services keeps their events";
}

TEST_F(EpgDatabaseTest, KeepsDecodedCopiesForPeopleWhereADecoderIsGiven) {
    for (bool decoding : {false, true}) {
        std::filesystem::remove(path_);
        auto decoder = [](std::string_view t) { return "<" + std::string(t.substr(1)) + ">"; };
        auto db = decoding ? open(decoder) : open();
        ASSERT_TRUE(db->storeSection(kSvc, 0x50, 0, 1, {event(1, 0, 10)}));
        sqlite3* raw = nullptr;
        ASSERT_EQ(sqlite3_open(path_.c_str(), &raw), SQLITE_OK);
        sqlite3_stmt* q = nullptr;
        ASSERT_EQ(sqlite3_prepare_v2(raw, "SELECT name_utf8, text_utf8 FROM event", -1, &q, 0),
                  SQLITE_OK);
        ASSERT_EQ(sqlite3_step(q), SQLITE_ROW);
        auto column = [&](int i) {
            auto p = sqlite3_column_text(q, i);
            return p ? std::string(reinterpret_cast<const char*>(p), sqlite3_column_bytes(q, i))
                     : std::string("NULL");
        };
        EXPECT_EQ(column(0), decoding ? std::string("<N\0\xE9"
                                                    "1>",
                                                    6)
                                      : "NULL");
        EXPECT_EQ(column(1), decoding ? "<text 1>" : "NULL");
        sqlite3_finalize(q);
        sqlite3_close(raw);
    }
}

TEST_F(EpgDatabaseTest, AStoreKilledMidwayLeavesTheLastCommittedEvents) {
    std::vector<Event> committed, killed;
    for (uint16_t i = 0; i < 100; ++i) committed.push_back(event(i, i * 60, 60));
    // Larger than SQLite's page cache, so that the killed store has spilled pages to the log.
    for (uint16_t i = 0; i < 3000; ++i) killed.push_back(event(i, i * 60, 60, 2000));
    ASSERT_TRUE(open()->storeSection(kSvc, 0x50, 0, 1, committed));

    pid_t child = fork();
    ASSERT_NE(child, -1);
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
    EXPECT_EQ(dumps(all(*db)), dumps(committed));
    ASSERT_TRUE(db->storeSection(kSvc, 0x50, 0, 2, {event(7, 0, 1)}));
    EXPECT_EQ(ids(all(*open())), std::vector<int>{7});
}

TEST_F(EpgDatabaseTest, RefusesWhatItCannotOpenWithTheReason) {
    const std::string garbage(8192, '\x5A');
    struct {
        std::string path, content, sql, reason;
    } const cases[] = {
            {dir_ + "/missing/epg.db", "", "", "unable to open database file"},
            {dir_, "", "", "unable to open database file"},  // a folder
            {path_, garbage, "", "file is not a database"},
            {path_, "", "CREATE TABLE t (x)", "not an event database (it holds other tables)"},
            {path_, "", "PRAGMA user_version = 7", "not an event database (schema version 7)"},
    };
    for (const auto& c : cases) {
        std::filesystem::remove(path_);
        if (!c.content.empty()) std::ofstream(path_, std::ios::binary) << c.content;
        if (!c.sql.empty()) {
            sqlite3* raw = nullptr;
            ASSERT_EQ(sqlite3_open(path_.c_str(), &raw), SQLITE_OK);
            ASSERT_EQ(sqlite3_exec(raw, c.sql.c_str(), nullptr, nullptr, nullptr), SQLITE_OK);
            sqlite3_close(raw);
        }
        auto bytes = [&] {
            std::ifstream in(path_, std::ios::binary);
            return std::string(std::istreambuf_iterator<char>(in), {});
        };
        std::string before = bytes(), error;
        EXPECT_EQ(EpgDatabase::open(c.path, &error), nullptr);
        EXPECT_EQ(error, c.path + ": " + c.reason);
        EXPECT_EQ(bytes(), before) << "a file that is not ours stays as it was";
    }
}

}  // namespace
