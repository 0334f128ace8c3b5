#include "receiver/EpgDatabase.h"

#include <sqlite3.h>

namespace dvbrx {
namespace {

// The schema's version, kept in PRAGMA user_version; 0 is a file that has none yet.
constexpr int kSchemaVersion = 1;

// Events and items are keyed by the section that carried them, so that a new version of a
// section replaces exactly its own rows with two range deletes; event_start makes the lookups
// by time indexed.
constexpr const char* kSchema = R"sql(
CREATE TABLE event (
    onid INTEGER NOT NULL, tsid INTEGER NOT NULL, sid INTEGER NOT NULL,
    table_id INTEGER NOT NULL, section INTEGER NOT NULL, event_id INTEGER NOT NULL,
    start INTEGER NOT NULL, duration INTEGER NOT NULL,
    running_status INTEGER NOT NULL, content INTEGER NOT NULL, parental_rating INTEGER NOT NULL,
    language TEXT NOT NULL, name BLOB NOT NULL, text BLOB NOT NULL, extended_text BLOB NOT NULL,
    name_utf8 TEXT, text_utf8 TEXT,
    PRIMARY KEY (onid, tsid, sid, table_id, section, event_id)) WITHOUT ROWID;
CREATE INDEX event_start ON event (onid, tsid, sid, start);
CREATE TABLE item (
    onid INTEGER NOT NULL, tsid INTEGER NOT NULL, sid INTEGER NOT NULL,
    table_id INTEGER NOT NULL, section INTEGER NOT NULL, event_id INTEGER NOT NULL,
    position INTEGER NOT NULL, description BLOB NOT NULL, text BLOB NOT NULL,
    PRIMARY KEY (onid, tsid, sid, table_id, section, event_id, position)) WITHOUT ROWID;
CREATE TABLE section (
    onid INTEGER NOT NULL, tsid INTEGER NOT NULL, sid INTEGER NOT NULL,
    table_id INTEGER NOT NULL, section INTEGER NOT NULL, version INTEGER NOT NULL,
    PRIMARY KEY (onid, tsid, sid, table_id, section)) WITHOUT ROWID;
CREATE TABLE service (
    onid INTEGER NOT NULL, tsid INTEGER NOT NULL, sid INTEGER NOT NULL,
    tp_index INTEGER NOT NULL, net_index INTEGER NOT NULL, net_type INTEGER NOT NULL,
    UNIQUE (onid, tsid, sid));
)sql";

#define SECTION_KEY "onid = ?1 AND tsid = ?2 AND sid = ?3 AND table_id = ?4 AND section = ?5"
// The columns that eventAt, nextAfter and events read, in the order readEvent takes them.
#define EVENT_COLUMNS                                                                      \
    "SELECT table_id, section, event_id, start, duration, running_status, content, "       \
    "parental_rating, language, name, text, extended_text FROM event WHERE onid = ?1 AND " \
    "tsid = ?2 AND sid = ?3 AND "

// Resets a reused statement when the scope that ran it ends, on every path.
class Run {
public:
    explicit Run(const SqlStatement& s) : stmt_(s.get()) {}
    ~Run() { sqlite3_reset(stmt_); }
    Run(const Run&) = delete;
    Run& operator=(const Run&) = delete;
    sqlite3_stmt* operator*() const { return stmt_; }
    int step() const { return sqlite3_step(stmt_); }

private:
    sqlite3_stmt* stmt_;
};

void bindKey(sqlite3_stmt* s, ServiceKey key) {
    sqlite3_bind_int(s, 1, key.onid);
    sqlite3_bind_int(s, 2, key.tsid);
    sqlite3_bind_int(s, 3, key.sid);
}

void bindSection(sqlite3_stmt* s, ServiceKey key, int tableId, int section) {
    bindKey(s, key);
    sqlite3_bind_int(s, 4, tableId);
    sqlite3_bind_int(s, 5, section);
}

// Broadcast bytes go in as they are; the statement runs while `b` is alive.
void bindBytes(sqlite3_stmt* s, int i, const std::string& b) {
    sqlite3_bind_blob64(s, i, b.data(), b.size(), SQLITE_STATIC);
}

void bindText(sqlite3_stmt* s, int i, const std::string& t) {
    sqlite3_bind_text64(s, i, t.data(), t.size(), SQLITE_STATIC, SQLITE_UTF8);
}

// One number for a section of a service's table: the key of the versions kept in memory.
uint64_t sectionId(ServiceKey s, unsigned tableId, unsigned section) {
    return uint64_t{s.onid} << 48 | uint64_t{s.tsid} << 32 | uint64_t{s.sid} << 16 | tableId << 8 |
           section;
}

// A BLOB or TEXT column as bytes; NULL (a column someone emptied by hand) reads as empty.
std::string columnBytes(sqlite3_stmt* s, int col) {
    const void* p = sqlite3_column_blob(s, col);
    return p ? std::string(static_cast<const char*>(p), sqlite3_column_bytes(s, col))
             : std::string();
}

void readEvent(sqlite3_stmt* s, dvbmodel::Event& e) {
    e.id = static_cast<uint16_t>(sqlite3_column_int(s, 2));
    e.start = sqlite3_column_int64(s, 3);
    e.duration = static_cast<uint32_t>(sqlite3_column_int64(s, 4));
    e.runningStatus = static_cast<uint8_t>(sqlite3_column_int(s, 5));
    e.content = static_cast<uint8_t>(sqlite3_column_int(s, 6));
    e.parentalRating = static_cast<uint8_t>(sqlite3_column_int(s, 7));
    e.language = columnBytes(s, 8);
    e.name = columnBytes(s, 9);
    e.text = columnBytes(s, 10);
    e.extendedText = columnBytes(s, 11);
}

}  // namespace

SqlStatement::~SqlStatement() {
    sqlite3_finalize(stmt_);
}

bool SqlStatement::prepare(sqlite3* db, const char* sql) {
    return sqlite3_prepare_v3(db, sql, -1, SQLITE_PREPARE_PERSISTENT, &stmt_, nullptr) == SQLITE_OK;
}

void EpgDatabase::Close::operator()(sqlite3* db) const {
    sqlite3_close(db);
}

std::unique_ptr<EpgDatabase> EpgDatabase::open(const std::string& path, std::string* error,
                                               TextDecoder decoder) {
    std::unique_ptr<EpgDatabase> epg(new EpgDatabase());
    epg->decoder_ = std::move(decoder);
    std::string reason;
    auto failed = [&](const std::string& why) {
        if (error) *error = path + ": " + why;
        return nullptr;
    };
    sqlite3* db = nullptr;
    int rc = sqlite3_open_v2(path.c_str(), &db,
                             SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_NOMUTEX,
                             nullptr);
    epg->db_.reset(db);
    if (rc != SQLITE_OK) return failed(db ? sqlite3_errmsg(db) : sqlite3_errstr(rc));
    // SQLite falls back to read-only on a file it may not write; the receiver must write.
    if (sqlite3_db_readonly(db, "main") == 1) return failed("the file is read-only");
    // Another process (sqlite3 run by a user) may hold the lock for a moment.
    sqlite3_busy_timeout(db, 2000);

    // The schema first: a file that is not ours fails here and is left as it was.
    if (!epg->makeSchema(&reason)) return failed(reason);
    // Write-ahead log: a commit appends to the log, readers never see a half-written store, and
    // a process killed in the middle of a store leaves only uncommitted frames that the next
    // open ignores. synchronous=NORMAL syncs the log at checkpoints rather than at every
    // commit: a killed process loses nothing committed; only a power cut may lose the last
    // commits, never consistency.
    std::string mode;
    char* msg = nullptr;
    rc = sqlite3_exec(
            db, "PRAGMA journal_mode = WAL",
            [](void* out, int, char** values, char**) {
                *static_cast<std::string*>(out) = values[0] ? values[0] : "";
                return 0;
            },
            &mode, &msg);
    if (rc != SQLITE_OK) {
        reason = msg ? msg : sqlite3_errstr(rc);
        sqlite3_free(msg);
        return failed(reason);
    }
    // Where the file system cannot share the log's index, the rollback journal with a sync at
    // every commit gives the same guarantee.
    const char* sync = mode == "wal" ? "PRAGMA synchronous = NORMAL" : "PRAGMA synchronous = FULL";
    if (sqlite3_exec(db, sync, nullptr, nullptr, nullptr) != SQLITE_OK) {
        return failed(sqlite3_errmsg(db));
    }
    if (!epg->prepareAll(&reason) || !epg->loadVersions(&reason)) return failed(reason);
    return epg;
}

// Finds the schema, or makes it in a file that is empty, in one transaction: two processes
// that create the same file at once end up with one schema.
bool EpgDatabase::makeSchema(std::string* error) {
    sqlite3* db = db_.get();
    if (sqlite3_exec(db, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr) != SQLITE_OK) {
        *error = sqlite3_errmsg(db);
        return false;
    }
    SqlStatement version, tables;
    bool read = version.prepare(db, "PRAGMA user_version") &&
                tables.prepare(db, "SELECT count(*) FROM sqlite_schema") &&
                sqlite3_step(version.get()) == SQLITE_ROW &&
                sqlite3_step(tables.get()) == SQLITE_ROW;
    int found = read ? sqlite3_column_int(version.get(), 0) : 0;
    bool ok = false;
    if (!read) {
        *error = sqlite3_errmsg(db);
    } else if (found == kSchemaVersion) {
        ok = true;
    } else if (found != 0) {
        *error = "not an event database (schema version " + std::to_string(found) + ")";
    } else if (sqlite3_column_int(tables.get(), 0) != 0) {
        *error = "not an event database (it holds other tables)";
    } else {
        std::string setVersion = "PRAGMA user_version = " + std::to_string(kSchemaVersion);
        ok = sqlite3_exec(db, kSchema, nullptr, nullptr, nullptr) == SQLITE_OK &&
             sqlite3_exec(db, setVersion.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK;
        if (!ok) *error = sqlite3_errmsg(db);
    }
    sqlite3_reset(version.get());
    sqlite3_reset(tables.get());
    if (ok && sqlite3_exec(db, "COMMIT", nullptr, nullptr, nullptr) == SQLITE_OK) return true;
    if (ok) *error = sqlite3_errmsg(db);
    sqlite3_exec(db, "ROLLBACK", nullptr, nullptr, nullptr);
    return false;
}

bool EpgDatabase::prepareAll(std::string* error) {
    struct {
        SqlStatement& stmt;
        const char* sql;
    } const statements[] = {
            {begin_, "BEGIN IMMEDIATE"},
            {commit_, "COMMIT"},
            {rollback_, "ROLLBACK"},
            {deleteItems_, "DELETE FROM item WHERE " SECTION_KEY},
            {deleteEvents_, "DELETE FROM event WHERE " SECTION_KEY},
            // A section that lists an event id twice keeps the first.
            {insertEvent_,
             "INSERT OR IGNORE INTO event VALUES "
             "(?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, ?11, ?12, ?13, ?14, ?15, ?16, ?17)"},
            {insertItem_, "INSERT INTO item VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9)"},
            {putSection_,
             "INSERT INTO section VALUES (?1, ?2, ?3, ?4, ?5, ?6) "
             "ON CONFLICT DO UPDATE SET version = excluded.version"},
            {runningAt_, EVENT_COLUMNS "start <= ?4 ORDER BY start DESC LIMIT 1"},
            {startingAfter_, EVENT_COLUMNS "start > ?4 ORDER BY start LIMIT 1"},
            {startingIn_, EVENT_COLUMNS "start >= ?4 AND start < ?5 ORDER BY start"},
            {itemsOf_, "SELECT description, text FROM item WHERE " SECTION_KEY
                       " AND event_id = ?6 ORDER BY position"},
            {count_, "SELECT count(*) FROM event"},
            {addService_,
             "INSERT INTO service VALUES (?1, ?2, ?3, ?4, ?5, ?6) ON CONFLICT DO UPDATE SET "
             "tp_index = excluded.tp_index, net_index = excluded.net_index, "
             "net_type = excluded.net_type"},
            {clearServices_, "DELETE FROM service"},
            {listServices_,
             "SELECT onid, tsid, sid, tp_index, net_index, net_type FROM service ORDER BY rowid"},
    };
    for (const auto& s : statements) {
        if (!s.stmt.prepare(db_.get(), s.sql)) {
            *error = sqlite3_errmsg(db_.get());
            return false;
        }
    }
    return true;
}

EpgDatabase::~EpgDatabase() = default;

bool EpgDatabase::fail(const char* what) const {
    error_ = std::string(what) + ": " + sqlite3_errmsg(db_.get());
    return false;
}

std::string EpgDatabase::lastError() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return error_;
}

bool EpgDatabase::loadVersions(std::string* error) {
    SqlStatement all;
    if (!all.prepare(db_.get(),
                     "SELECT onid, tsid, sid, table_id, section, version FROM section")) {
        *error = sqlite3_errmsg(db_.get());
        return false;
    }
    int rc;
    while ((rc = sqlite3_step(all.get())) == SQLITE_ROW) {
        int c[5];
        for (int i = 0; i < 5; ++i) c[i] = sqlite3_column_int(all.get(), i);
        ServiceKey key{static_cast<uint16_t>(c[0]), static_cast<uint16_t>(c[1]),
                       static_cast<uint16_t>(c[2])};
        versions_[sectionId(key, c[3] & 0xFF, c[4] & 0xFF)] =
                static_cast<uint32_t>(sqlite3_column_int64(all.get(), 5));
    }
    if (rc == SQLITE_DONE) return true;
    *error = sqlite3_errmsg(db_.get());
    return false;
}

bool EpgDatabase::storeSection(ServiceKey service, uint8_t tableId, uint8_t sectionNumber,
                               uint32_t version, const std::vector<dvbmodel::Event>& events) {
    std::vector<const dvbmodel::Event*> list;
    list.reserve(events.size());
    for (const dvbmodel::Event& e : events) list.push_back(&e);
    return storeSection(service, tableId, sectionNumber, version, list);
}

bool EpgDatabase::storeSection(ServiceKey service, uint8_t tableId, uint8_t sectionNumber,
                               uint32_t version,
                               const std::vector<const dvbmodel::Event*>& events) {
    std::lock_guard<std::mutex> lock(mutex_);
    // A broadcast repeats its sections every few seconds: the same version again costs a look
    // in memory.
    uint64_t id = sectionId(service, tableId, sectionNumber);
    auto known = versions_.find(id);
    if (known != versions_.end() && known->second == version) return true;
    {
        Run b(begin_);
        if (b.step() != SQLITE_DONE) return fail("starting a store");
    }
    if (replaceSection(service, tableId, sectionNumber, version, known != versions_.end(),
                       events)) {
        Run c(commit_);
        if (c.step() == SQLITE_DONE) {
            versions_[id] = version;
            return true;
        }
        fail("committing a store");
    }
    Run r(rollback_);
    r.step();
    return false;
}

// Within the store's transaction. A section never stored before has no rows to remove.
bool EpgDatabase::replaceSection(ServiceKey service, uint8_t tableId, uint8_t sectionNumber,
                                 uint32_t version, bool stored,
                                 const std::vector<const dvbmodel::Event*>& events) {
    for (const SqlStatement* del : {&deleteItems_, &deleteEvents_}) {
        if (!stored) break;
        Run d(*del);
        bindSection(*d, service, tableId, sectionNumber);
        if (d.step() != SQLITE_DONE) return fail("removing a section's events");
    }
    std::string nameUtf8, textUtf8;
    for (const dvbmodel::Event* event : events) {
        const dvbmodel::Event& e = *event;
        {
            Run ins(insertEvent_);
            sqlite3_stmt* s = *ins;
            bindSection(s, service, tableId, sectionNumber);
            sqlite3_bind_int(s, 6, e.id);
            sqlite3_bind_int64(s, 7, e.start);
            sqlite3_bind_int64(s, 8, e.duration);
            sqlite3_bind_int(s, 9, e.runningStatus);
            sqlite3_bind_int(s, 10, e.content);
            sqlite3_bind_int(s, 11, e.parentalRating);
            bindText(s, 12, e.language);
            bindBytes(s, 13, e.name);
            bindBytes(s, 14, e.text);
            bindBytes(s, 15, e.extendedText);
            if (decoder_) {
                nameUtf8 = decoder_(e.name);
                textUtf8 = decoder_(e.text);
                bindText(s, 16, nameUtf8);
                bindText(s, 17, textUtf8);
            } else {
                sqlite3_bind_null(s, 16);
                sqlite3_bind_null(s, 17);
            }
            if (ins.step() != SQLITE_DONE) return fail("storing an event");
            if (sqlite3_changes(db_.get()) == 0) continue;  // a repeated event id
        }
        for (size_t i = 0; i < e.items.size(); ++i) {
            Run ins(insertItem_);
            sqlite3_stmt* s = *ins;
            bindSection(s, service, tableId, sectionNumber);
            sqlite3_bind_int(s, 6, e.id);
            sqlite3_bind_int64(s, 7, static_cast<sqlite3_int64>(i));
            bindBytes(s, 8, e.items[i].description);
            bindBytes(s, 9, e.items[i].text);
            if (ins.step() != SQLITE_DONE) return fail("storing an event's item");
        }
    }
    Run put(putSection_);
    bindSection(*put, service, tableId, sectionNumber);
    sqlite3_bind_int64(*put, 6, version);
    return put.step() == SQLITE_DONE || fail("storing the section's version");
}

// Reads the items of the event on the current row of `row`.
bool EpgDatabase::readItems(ServiceKey service, sqlite3_stmt* row, dvbmodel::Event& e) const {
    Run items(itemsOf_);
    bindSection(*items, service, sqlite3_column_int(row, 0), sqlite3_column_int(row, 1));
    sqlite3_bind_int(*items, 6, e.id);
    int rc;
    while ((rc = items.step()) == SQLITE_ROW) {
        e.items.push_back({columnBytes(*items, 0), columnBytes(*items, 1)});
    }
    return rc == SQLITE_DONE || fail("reading an event's items");
}

std::optional<dvbmodel::Event> EpgDatabase::readOne(sqlite3_stmt* stmt, ServiceKey service,
                                                    int64_t time) const {
    bindKey(stmt, service);
    sqlite3_bind_int64(stmt, 4, time);
    int rc = sqlite3_step(stmt);
    if (rc != SQLITE_ROW) {
        if (rc != SQLITE_DONE) fail("looking an event up");
        return std::nullopt;
    }
    dvbmodel::Event e;
    readEvent(stmt, e);
    if (!readItems(service, stmt, e)) return std::nullopt;
    return e;
}

std::optional<dvbmodel::Event> EpgDatabase::eventAt(ServiceKey service, int64_t time) const {
    std::lock_guard<std::mutex> lock(mutex_);
    {
        Run q(runningAt_);
        std::optional<dvbmodel::Event> e = readOne(*q, service, time);
        // The duration is unsigned 32 bits and start at most `time`: no overflow.
        if (e && e->start + static_cast<int64_t>(e->duration) > time) return e;
    }
    Run q(startingAfter_);
    return readOne(*q, service, time);
}

std::optional<dvbmodel::Event> EpgDatabase::nextAfter(ServiceKey service, int64_t time) const {
    std::lock_guard<std::mutex> lock(mutex_);
    Run q(startingAfter_);
    return readOne(*q, service, time);
}

std::vector<dvbmodel::Event> EpgDatabase::events(ServiceKey service, int64_t from,
                                                 int64_t to) const {
    std::lock_guard<std::mutex> lock(mutex_);
    std::vector<dvbmodel::Event> out;
    Run q(startingIn_);
    bindKey(*q, service);
    sqlite3_bind_int64(*q, 4, from);
    sqlite3_bind_int64(*q, 5, to);
    int rc;
    while ((rc = q.step()) == SQLITE_ROW) {
        out.emplace_back();
        readEvent(*q, out.back());
        if (!readItems(service, *q, out.back())) return {};
    }
    if (rc != SQLITE_DONE) {
        fail("listing events");
        return {};
    }
    return out;
}

size_t EpgDatabase::eventCount() const {
    std::lock_guard<std::mutex> lock(mutex_);
    Run q(count_);
    if (q.step() != SQLITE_ROW) {
        fail("counting events");
        return 0;
    }
    return static_cast<size_t>(sqlite3_column_int64(*q, 0));
}

bool EpgDatabase::holds(ServiceKey service, uint8_t tableId, uint8_t sectionNumber,
                        uint32_t version) const {
    std::lock_guard<std::mutex> lock(mutex_);
    auto known = versions_.find(sectionId(service, tableId, sectionNumber));
    return known != versions_.end() && known->second == version;
}

bool EpgDatabase::addService(const EpgService& service) {
    std::lock_guard<std::mutex> lock(mutex_);
    return putService(service);
}

bool EpgDatabase::setServices(const std::vector<EpgService>& list) {
    std::lock_guard<std::mutex> lock(mutex_);
    {
        Run b(begin_);
        if (b.step() != SQLITE_DONE) return fail("starting to write the services");
    }
    bool ok;
    {
        Run clear(clearServices_);
        ok = clear.step() == SQLITE_DONE || fail("clearing the services");
    }
    for (size_t i = 0; ok && i < list.size(); ++i) ok = putService(list[i]);
    if (ok) {
        Run c(commit_);
        if (c.step() == SQLITE_DONE) return true;
        fail("committing the services");
    }
    Run r(rollback_);
    r.step();
    return false;
}

bool EpgDatabase::putService(const EpgService& service) {
    Run q(addService_);
    bindKey(*q, service.key);
    sqlite3_bind_int64(*q, 4, service.tpIndex);
    sqlite3_bind_int64(*q, 5, service.netIndex);
    sqlite3_bind_int64(*q, 6, service.netType);
    return q.step() == SQLITE_DONE || fail("adding a service");
}

bool EpgDatabase::clearServices() {
    std::lock_guard<std::mutex> lock(mutex_);
    Run q(clearServices_);
    return q.step() == SQLITE_DONE || fail("clearing the services");
}

std::vector<EpgService> EpgDatabase::services() const {
    std::lock_guard<std::mutex> lock(mutex_);
    std::vector<EpgService> out;
    Run q(listServices_);
    int rc;
    while ((rc = q.step()) == SQLITE_ROW) {
        sqlite3_stmt* s = *q;
        EpgService svc;
        svc.key = {static_cast<uint16_t>(sqlite3_column_int(s, 0)),
                   static_cast<uint16_t>(sqlite3_column_int(s, 1)),
                   static_cast<uint16_t>(sqlite3_column_int(s, 2))};
        svc.tpIndex = static_cast<uint32_t>(sqlite3_column_int64(s, 3));
        svc.netIndex = static_cast<uint32_t>(sqlite3_column_int64(s, 4));
        svc.netType = static_cast<uint32_t>(sqlite3_column_int64(s, 5));
        out.push_back(svc);
    }
    if (rc != SQLITE_DONE) {
        fail("listing the services");
        return {};
    }
    return out;
}

}  // namespace dvbrx
