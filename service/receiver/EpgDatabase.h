// The receiver's event database: an SQLite file that holds the events of the services whose
// schedule the receiver collects, as EIT sections deliver them, and the list of those services.
// The receiver's service threads write it and the stream module's operations read it; it
// survives a restart, and a process killed in the middle of a store leaves the events of the
// last committed store. README ("Event database") documents the schema.
#pragma once

#include <broadcast/Broadcast.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

struct sqlite3;
struct sqlite3_stmt;

namespace dvbrx {

// A service as EIT sections name it.
struct ServiceKey {
    uint16_t onid = 0, tsid = 0, sid = 0;
    bool operator==(const ServiceKey& o) const {
        return onid == o.onid && tsid == o.tsid && sid == o.sid;
    }
};

// A service whose events are collected, with the indexes that EpgMd_AddService gave it.
struct EpgService {
    ServiceKey key;
    uint32_t tpIndex = 0, netIndex = 0, netType = 0;
};

// Turns broadcast text bytes (with their character-table selector) into UTF-8.
using TextDecoder = std::function<std::string(std::string_view)>;

// Owns one prepared statement; finalizes it when destroyed.
class SqlStatement {
public:
    SqlStatement() = default;
    SqlStatement(const SqlStatement&) = delete;
    SqlStatement& operator=(const SqlStatement&) = delete;
    ~SqlStatement();
    bool prepare(sqlite3* db, const char* sql);
    sqlite3_stmt* get() const { return stmt_; }

private:
    sqlite3_stmt* stmt_ = nullptr;
};

class EpgDatabase {
public:
    // Opens the database at `path`, creating the file and its schema when there is none. Returns
    // null, with the reason in `error` when given, for a path that cannot be opened for writing,
    // a file that is not an SQLite database, or a database of another schema. With a decoder,
    // every stored event also gets UTF-8 copies of its name and text for people who read the file.
    static std::unique_ptr<EpgDatabase> open(const std::string& path, std::string* error,
                                             TextDecoder decoder = nullptr);
    ~EpgDatabase();
    EpgDatabase(const EpgDatabase&) = delete;
    EpgDatabase& operator=(const EpgDatabase&) = delete;

    // Stores the events of one EIT section of a service in one transaction. A section seen
    // before with the same version changes nothing; with another version its events replace
    // those that section held, and those only. Returns false on a database error (lastError()
    // tells it), leaving the database as the last committed store left it. A broadcast's
    // versions are 5 bits; the receiver's own sections use the whole 32.
    bool storeSection(ServiceKey service, uint8_t tableId, uint8_t sectionNumber, uint32_t version,
                      const std::vector<dvbmodel::Event>& events);
    // The same for events that stay where they are (the model's own).
    bool storeSection(ServiceKey service, uint8_t tableId, uint8_t sectionNumber, uint32_t version,
                      const std::vector<const dvbmodel::Event*>& events);

    // Whether the section is stored with that version.
    bool holds(ServiceKey service, uint8_t tableId, uint8_t sectionNumber, uint32_t version) const;

    // The event of a service running at `time` (start <= time < start + duration), or else the
    // first one that starts after it; with its extended text and items. Nothing on an error.
    std::optional<dvbmodel::Event> eventAt(ServiceKey service, int64_t time) const;
    // The first event of a service that starts after `time`.
    std::optional<dvbmodel::Event> nextAfter(ServiceKey service, int64_t time) const;
    // The events of a service that start in [from, to), by start time.
    std::vector<dvbmodel::Event> events(ServiceKey service, int64_t from, int64_t to) const;
    size_t eventCount() const;

    // The list of services whose events are collected. Adding a service that is there already
    // updates its indexes and keeps its place. Clearing the list keeps the stored events.
    bool addService(const EpgService& service);
    bool clearServices();
    // Replaces the list with `list`, in one transaction.
    bool setServices(const std::vector<EpgService>& list);
    std::vector<EpgService> services() const;

    // What the last failed call ran into.
    std::string lastError() const;

private:
    EpgDatabase() = default;
    bool makeSchema(std::string* error);
    bool prepareAll(std::string* error);
    bool loadVersions(std::string* error);
    bool fail(const char* what) const;
    bool replaceSection(ServiceKey service, uint8_t tableId, uint8_t sectionNumber,
                        uint32_t version, bool stored,
                        const std::vector<const dvbmodel::Event*>& events);
    std::optional<dvbmodel::Event> readOne(sqlite3_stmt* stmt, ServiceKey service,
                                           int64_t time) const;
    bool readItems(ServiceKey service, sqlite3_stmt* row, dvbmodel::Event& event) const;
    bool putService(const EpgService& service);

    struct Close {
        void operator()(sqlite3* db) const;
    };
    // Declared before the statements: it closes after they are finalized.
    std::unique_ptr<sqlite3, Close> db_;
    TextDecoder decoder_;
    // One connection, its statements reused: calls from several threads take turns.
    mutable std::mutex mutex_;
    mutable std::string error_;
    SqlStatement begin_, commit_, rollback_;
    // The version of every stored section, as the section table holds it (the receiver is the
    // file's one writer): a section that comes round again costs no query.
    std::unordered_map<uint64_t, uint32_t> versions_;
    SqlStatement deleteItems_, deleteEvents_, insertEvent_, insertItem_, putSection_;
    SqlStatement runningAt_, startingAfter_, startingIn_, itemsOf_, count_;
    SqlStatement addService_, clearServices_, listServices_;
};

}  // namespace dvbrx
