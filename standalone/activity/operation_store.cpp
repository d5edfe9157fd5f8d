#include "standalone/activity/operation_store.h"

#include "standalone/activity/operation_columns.h"
#include "standalone/activity/operation_room.h"
#include "standalone/core/error_number.h"

#include <algorithm>
#include <string>
#include <utility>

namespace velt {
namespace {

// The version of these tables, kept in the database itself.
constexpr std::int64_t formVersion = 2;

constexpr const char* tableSql = R"(
    CREATE TABLE session (id INTEGER PRIMARY KEY, name TEXT NOT NULL UNIQUE);
    CREATE TABLE operation (
        id INTEGER PRIMARY KEY AUTOINCREMENT,
        time INTEGER NOT NULL, session INTEGER NOT NULL, number INTEGER NOT NULL, operation INTEGER NOT NULL,
        result INTEGER NOT NULL, protocol INTEGER NOT NULL, octets INTEGER, octetsin INTEGER, octetsout INTEGER,
        duration INTEGER, escaped INTEGER, leftout INTEGER, cut INTEGER, reason TEXT, user TEXT, account TEXT, address TEXT, detail TEXT,
        path TEXT, server TEXT, share TEXT, within TEXT, newpath TEXT, newserver TEXT, newshare TEXT,
        newwithin TEXT);
    CREATE UNIQUE INDEX operation_number ON operation (session, number, time, operation);
    CREATE INDEX operation_time ON operation (time);
    CREATE INDEX operation_user ON operation (user, time);
    CREATE INDEX operation_share ON operation (share, time);
    CREATE INDEX operation_server ON operation (server);
    CREATE INDEX operation_newserver ON operation (newserver) WHERE newserver IS NOT NULL;
    CREATE INDEX operation_within ON operation (share, within);
    CREATE INDEX operation_newwithin ON operation (newshare, newwithin) WHERE newshare IS NOT NULL;
    CREATE INDEX operation_incomplete ON operation (time) WHERE result = 1;
    CREATE INDEX operation_refused ON operation (time) WHERE result = 2;
    CREATE TABLE spool (inode INTEGER PRIMARY KEY, taken INTEGER NOT NULL);
    PRAGMA user_version = 2;
)";

constexpr const char* fromFirstFormSql = R"(
    ALTER TABLE operation ADD COLUMN leftout INTEGER;
    ALTER TABLE operation ADD COLUMN cut INTEGER;
    DROP INDEX operation_number;
    CREATE UNIQUE INDEX operation_number ON operation (session, number, time, operation);
    PRAGMA user_version = 2;
)";

std::string insertSql() {
    std::string parameters;
    for (int i = 1; i <= operationColumnCount; ++i) {
        parameters += (i == 1 ? "?" : ", ?") + std::to_string(i);
    }
    // What a crash or a second attempt would store twice is there already. One that has but the number of
    // another is another one: nobody keeps a record out by taking its number before.
    return std::string("INSERT OR IGNORE INTO operation (") + operationColumns + ") VALUES (" + parameters +
           ")";
}

std::int64_t microsecondsOf(std::chrono::system_clock::time_point time) {
    return std::chrono::floor<std::chrono::microseconds>(time.time_since_epoch()).count();
}

} // namespace

struct OperationStore::Statements {
    Statement begin;
    Statement commit;
    Statement insert;
    Statement addSession;
    Statement findSession;
    Statement taken;
    Statement setTaken;
    Statement forget;
};

void OperationStore::CloseStatements::operator()(Statements* statements) const {
    delete statements;
}

Error OperationStore::cannotBe(const char* what) const {
    return databaseError(database_.get(), path_, what, operationStoreTitle);
}

Result<std::unique_ptr<OperationStore>> OperationStore::open(const std::filesystem::path& path) {
    std::unique_ptr<OperationStore> store(new OperationStore(path));
    VELT_ASSIGN_OR_RETURN(store->database_, openDatabase(path, operationStoreTitle));
    // What has been taken over is removed from the spool, so it must not be lost with the power either.
    // The log counts as room of the store, too.
    if (execute(store->database_.get(), "PRAGMA synchronous = FULL; PRAGMA journal_size_limit = 32000000") !=
        SQLITE_OK) {
        return store->cannotBe("opened");
    }
    VELT_RETURN_IF_ERROR(store->makeTables());
    VELT_RETURN_IF_ERROR(store->prepare());
    return store;
}

Result<> OperationStore::makeTables() {
    sqlite3* const database = database_.get();
    if (execute(database, "BEGIN IMMEDIATE") != SQLITE_OK) {
        return cannotBe("opened");
    }
    Statement version;
    if (version.prepare(database, "PRAGMA user_version") != SQLITE_OK || version.step() != SQLITE_ROW) {
        return rollBack("opened");
    }
    const std::int64_t found = version.number(0);
    version.reset();
    if (found < 0 || found > formVersion) {
        return Error(ErrorNumber::log, std::string(operationStoreTitle) + " " + path_.string() +
                                           " has format " + std::to_string(found) +
                                           ", which this version does not know.");
    }
    if (found < formVersion && (execute(database, found == 0 ? tableSql : fromFirstFormSql) != SQLITE_OK ||
                                execute(database, roomTableSql().c_str()) != SQLITE_OK)) {
        return rollBack("made");
    }
    return execute(database, "COMMIT") == SQLITE_OK ? Result<>() : rollBack("made");
}

Result<> OperationStore::prepare() {
    statements_.reset(new Statements);
    const auto prepared = [this](Statement& statement, const std::string& sql) {
        return statement.prepare(database_.get(), sql.c_str()) == SQLITE_OK;
    };
    Statements& all = *statements_;
    if (prepared(all.begin, "BEGIN IMMEDIATE") && prepared(all.commit, "COMMIT") &&
        prepared(all.insert, insertSql()) &&
        prepared(all.addSession, "INSERT OR IGNORE INTO session (name) VALUES (?1)") &&
        prepared(all.findSession, "SELECT id FROM session WHERE name = ?1") &&
        prepared(all.taken, "SELECT taken FROM spool WHERE inode = ?1") &&
        prepared(all.setTaken, "INSERT OR REPLACE INTO spool (inode, taken) VALUES (?1, ?2)") &&
        prepared(all.forget, "DELETE FROM spool WHERE inode = ?1")) {
        return {};
    }
    return cannotBe("used");
}

Result<> OperationStore::rollBack(const char* what) {
    const Error error = cannotBe(what);
    if (sqlite3_get_autocommit(database_.get()) == 0) {
        execute(database_.get(), "ROLLBACK");
    }
    return error;
}

Result<std::int64_t> OperationStore::taken(std::int64_t spool) {
    Statement& query = statements_->taken;
    query.bind(1, spool);
    const int result = query.step();
    const std::int64_t taken = result == SQLITE_ROW ? query.number(0) : 0;
    query.reset();
    return result == SQLITE_ROW || result == SQLITE_DONE ? Result<std::int64_t>(taken) : cannotBe("read");
}

int OperationStore::sessionOf(const OperationRecord& record, std::int64_t& session) {
    Statement& find = statements_->findSession;
    find.bind(1, record.session);
    int result = find.step();
    if (result == SQLITE_ROW) {
        session = find.number(0);
    }
    find.reset();
    if (result == SQLITE_DONE) {
        statements_->addSession.bind(1, record.session);
        result = statements_->addSession.run();
        session = sqlite3_last_insert_rowid(database_.get());
    }
    return result == SQLITE_ROW ? SQLITE_DONE : result;
}

int OperationStore::insert(OperationRecord& record, bool& isNew) {
    std::int64_t session = 0;
    if (const int result = sessionOf(record, session); result != SQLITE_DONE) {
        return result;
    }
    bindOperation(statements_->insert, record, session);
    const int result = statements_->insert.run();
    isNew = result == SQLITE_DONE && sqlite3_changes(database_.get()) == 1;
    record.id = isNew ? sqlite3_last_insert_rowid(database_.get()) : 0;
    return result;
}

int OperationStore::insertAll(std::vector<OperationRecord>& records) {
    for (OperationRecord& record : records) {
        bool isNew = false;
        if (const int result = insert(record, isNew); result != SQLITE_DONE) {
            return result;
        }
    }
    std::erase_if(records, [](const OperationRecord& record) { return record.id == 0; });
    return SQLITE_DONE;
}

Result<std::vector<OperationRecord>> OperationStore::take(std::int64_t spool, std::int64_t upTo,
                                                          std::vector<OperationRecord> records) {
    if (statements_->begin.run() != SQLITE_DONE) {
        return cannotBe("written");
    }
    int result = insertAll(records);
    if (result == SQLITE_DONE) {
        result = countAdded(database_.get(), records);
    }
    if (result == SQLITE_DONE) {
        statements_->setTaken.bind(1, spool);
        statements_->setTaken.bind(2, upTo);
        result = statements_->setTaken.run();
    }
    if (result == SQLITE_DONE) {
        result = statements_->commit.run();
    }
    if (result != SQLITE_DONE) {
        return rollBack("written").error();
    }
    return records;
}

Result<> OperationStore::forget(std::int64_t spool) {
    statements_->forget.bind(1, spool);
    return statements_->forget.run() == SQLITE_DONE ? Result<>() : cannotBe("written");
}

std::int64_t OperationStore::logOctets() const {
    std::error_code error;
    const auto size = std::filesystem::file_size(path_.string() + "-wal", error);
    return error ? 0 : static_cast<std::int64_t>(size);
}

Result<std::int64_t> OperationStore::usedOctets() {
    Statement query;
    // The file itself does not shrink; what is free in it is used again.
    if (query.prepare(database_.get(),
                      "SELECT (page_count - freelist_count) * page_size FROM "
                      "pragma_page_count, pragma_freelist_count, pragma_page_size") != SQLITE_OK ||
        query.step() != SQLITE_ROW) {
        return cannotBe("read");
    }
    return query.number(0);
}

/// Room is kept for what is taken before the next look.
Result<bool> OperationStore::isFull(std::int64_t size) {
    constexpr std::int64_t mostKept = 32'000'000;
    const std::int64_t most = size - std::min(size / 10, mostKept);
    VELT_ASSIGN_OR_RETURN(const std::int64_t used, usedOctets());
    if (size == 0 || used + logOctets() <= most) {
        return false;
    }
    // What is in the log is in the database afterwards, if nobody reads it just now.
    execute(database_.get(), "PRAGMA wal_checkpoint(TRUNCATE)");
    return used + std::min(logOctets(), size / 4) > most;
}

Result<int> OperationStore::removeOld(const OperationLimits& limits,
                                      std::chrono::system_clock::time_point now) {
    if (limits.age.count() == 0) {
        return 0;
    }
    const int removed = removeBefore(database_.get(), microsecondsOf(now - limits.age));
    return removed >= 0 ? Result<int>(removed) : cannotBe("written");
}

Result<int> OperationStore::removeMost(const OperationLimits& limits,
                                       std::chrono::system_clock::time_point now) {
    const auto loser = loserOfRecords(database_.get());
    if (!loser) {
        return 0;
    }
    const auto early = limits.age.count() > 0 ? std::optional(microsecondsOf(now)) : std::nullopt;
    const int removed = removeOf(database_.get(), *loser, early);
    return removed >= 0 ? Result<int>(std::max(removed, 1)) : cannotBe("written");
}

Result<bool> OperationStore::trim(const OperationLimits& limits, std::chrono::system_clock::time_point now) {
    VELT_ASSIGN_OR_RETURN(int removed, removeOld(limits, now));
    if (removed == 0) {
        VELT_ASSIGN_OR_RETURN(const bool full, isFull(limits.size));
        if (full) {
            VELT_ASSIGN_OR_RETURN(removed, removeMost(limits, now));
        } else if (settleGrowth(database_.get()) != SQLITE_DONE) {
            return cannotBe("written");
        }
    }
    // Numbers of sessions grow, and so, but for long sessions, do those of their operations.
    if (removed > 0 &&
        execute(database_.get(), "DELETE FROM session WHERE id < (SELECT MIN(session) FROM operation)") !=
            SQLITE_OK) {
        return cannotBe("written");
    }
    return removed > 0;
}

} // namespace velt
