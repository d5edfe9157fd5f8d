#include "standalone/journal/log_database.h"

#include "standalone/core/error_number.h"

#include <unistd.h>

#include <chrono>

namespace velt {

namespace {

// The version of this table, kept in the database itself.
constexpr std::int64_t formVersion = 1;

constexpr const char* tableSql = R"(
    CREATE TABLE entry (
        id INTEGER PRIMARY KEY AUTOINCREMENT,
        time INTEGER NOT NULL,
        category INTEGER NOT NULL,
        level INTEGER NOT NULL,
        event INTEGER NOT NULL,
        text1 TEXT NOT NULL,
        text2 TEXT NOT NULL,
        text3 TEXT NOT NULL,
        text4 TEXT NOT NULL,
        sentence TEXT NOT NULL,
        actor TEXT NOT NULL,
        address TEXT NOT NULL);
    PRAGMA user_version = 1;
)";

// A database without them, of an earlier release, gets them when it is opened. Each also holds the id, so a
// page of what one of them finds needs no sorting.
constexpr const char* indexSql = R"(
    CREATE INDEX IF NOT EXISTS entry_time ON entry (time);
    CREATE INDEX IF NOT EXISTS entry_event ON entry (event);
    CREATE INDEX IF NOT EXISTS entry_actor ON entry (actor);
)";

constexpr const char* insertSql =
    "INSERT INTO entry (time, category, level, event, text1, text2, text3, text4, sentence, actor, address) "
    "VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, ?11)";

/// Names only the columns that the filter does: SQLite finds no index for a condition that may not apply.
std::string querySql(const LogFilter& filter) {
    std::string sql = "SELECT id, time, category, level, event, text1, text2, text3, text4, sentence, actor, "
                      "address FROM entry WHERE TRUE";
    sql += filter.since ? " AND time >= ?1" : "";
    sql += filter.event ? " AND event = ?2" : "";
    sql += filter.actor ? " AND actor = ?3" : "";
    sql += filter.beforeId ? " AND id < ?4" : "";
    return sql + " ORDER BY id DESC LIMIT ?5";
}

std::int64_t millisecondsOf(std::chrono::system_clock::time_point time) {
    return std::chrono::floor<std::chrono::milliseconds>(time.time_since_epoch()).count();
}

} // namespace

struct LogDatabase::Statements {
    Statement begin;
    Statement commit;
    Statement insert;
    Statement removeByCount;
    Statement removeByAge;
};

LogDatabase::LogDatabase(std::filesystem::path path) : path_(std::move(path)), process_(getpid()) {}

LogDatabase::~LogDatabase() {
    if (!isOwn()) {
        static_cast<void>(statements_.release());
        static_cast<void>(database_.release());
        return;
    }
    statements_.reset();
}

Error LogDatabase::cannotBe(const char* what) const {
    return databaseError(database_.get(), path_, what);
}

Result<std::unique_ptr<LogDatabase>> LogDatabase::open(const std::filesystem::path& path) {
    std::unique_ptr<LogDatabase> log(new LogDatabase(path));
    VELT_ASSIGN_OR_RETURN(log->database_, openDatabase(path));
    VELT_RETURN_IF_ERROR(log->makeTable());
    VELT_RETURN_IF_ERROR(log->prepareStatements());
    return log;
}

Result<> LogDatabase::makeTable() {
    // Under the write lock, or two processes could both see that there is no table yet.
    if (execute(database_.get(), "BEGIN IMMEDIATE") != SQLITE_OK) {
        return cannotBe("opened");
    }
    Statement version;
    if (version.prepare(database_.get(), "PRAGMA user_version") != SQLITE_OK ||
        version.step() != SQLITE_ROW) {
        return cannotBe("opened");
    }
    const std::int64_t found = version.number(0);
    version.reset();
    isNew_ = found == 0;
    if (found != 0 && found != formVersion) {
        return Error(ErrorNumber::log, "The administrator log " + path_.string() + " has format " +
                                           std::to_string(found) + ", which this version does not know.");
    }
    if ((found == 0 && execute(database_.get(), tableSql) != SQLITE_OK) ||
        execute(database_.get(), indexSql) != SQLITE_OK) {
        return cannotBe("made");
    }
    return execute(database_.get(), "COMMIT") == SQLITE_OK ? Result<>() : cannotBe("made");
}

Result<> LogDatabase::prepareStatements() {
    statements_ = std::make_unique<Statements>();
    const auto prepared = [this](Statement& statement, const char* sql) {
        return statement.prepare(database_.get(), sql) == SQLITE_OK;
    };
    if (prepared(statements_->begin, "BEGIN IMMEDIATE") && prepared(statements_->commit, "COMMIT") &&
        prepared(statements_->insert, insertSql) &&
        prepared(statements_->removeByCount, "DELETE FROM entry WHERE id <= ?1") &&
        prepared(statements_->removeByAge, "DELETE FROM entry WHERE time < ?1")) {
        return {};
    }
    return cannotBe("used");
}

bool LogDatabase::isOwn() const {
    return process_ == getpid();
}

bool LogDatabase::leadsTo(const std::filesystem::path& path) const {
    int moved = 0;
    return path == path_ &&
           sqlite3_file_control(database_.get(), "main", SQLITE_FCNTL_HAS_MOVED, &moved) == SQLITE_OK &&
           moved == 0;
}

Result<> LogDatabase::append(LogEntry& entry, const std::optional<LogRetention>& retention) {
    if (statements_->begin.run() != SQLITE_DONE) {
        return cannotBe("written");
    }
    int result = insert(entry);
    if (result == SQLITE_DONE && retention) {
        result = removeOld(entry, *retention);
    }
    if (result == SQLITE_DONE) {
        result = statements_->commit.run();
    }
    if (result == SQLITE_DONE) {
        return {};
    }
    const Error error = cannotBe("written");
    if (sqlite3_get_autocommit(database_.get()) == 0) {
        execute(database_.get(), "ROLLBACK");
    }
    return error;
}

int LogDatabase::insert(LogEntry& entry) {
    Statement& insert = statements_->insert;
    insert.bind(1, millisecondsOf(entry.time));
    insert.bind(2, entry.category);
    insert.bind(3, entry.level);
    insert.bind(4, std::int64_t{entry.event});
    for (int i = 0; i < 4; ++i) {
        insert.bind(5 + i, entry.texts[static_cast<std::size_t>(i)]);
    }
    insert.bind(9, entry.sentence);
    insert.bind(10, entry.actor);
    insert.bind(11, entry.address);
    const int result = insert.run();
    entry.id = sqlite3_last_insert_rowid(database_.get());
    return result;
}

int LogDatabase::removeOld(const LogEntry& newest, const LogRetention& retention) {
    if (retention.maxEntries > 0) {
        statements_->removeByCount.bind(1, newest.id - retention.maxEntries);
        if (const int result = statements_->removeByCount.run(); result != SQLITE_DONE) {
            return result;
        }
    }
    if (retention.maxAgeDays > 0) {
        statements_->removeByAge.bind(1,
                                      millisecondsOf(newest.time - std::chrono::days(retention.maxAgeDays)));
        return statements_->removeByAge.run();
    }
    return SQLITE_DONE;
}

Result<std::vector<LogEntry>> LogDatabase::query(const LogFilter& filter) {
    Statement query;
    if (query.prepare(database_.get(), querySql(filter).c_str()) != SQLITE_OK) {
        return cannotBe("read");
    }
    query.bind(1, filter.since ? std::optional(millisecondsOf(*filter.since)) : std::nullopt);
    query.bind(2, filter.event ? std::optional(std::int64_t{*filter.event}) : std::nullopt);
    query.bind(3, filter.actor);
    query.bind(4, filter.beforeId);
    query.bind(5, filter.limit);
    std::vector<LogEntry> entries;
    int result = query.step();
    for (; result == SQLITE_ROW; result = query.step()) {
        LogEntry& entry = entries.emplace_back();
        entry.id = query.number(0);
        entry.time = std::chrono::system_clock::time_point(std::chrono::milliseconds(query.number(1)));
        entry.category = static_cast<int>(query.number(2));
        entry.level = static_cast<int>(query.number(3));
        entry.event = static_cast<unsigned>(query.number(4));
        for (int i = 0; i < 4; ++i) {
            entry.texts[static_cast<std::size_t>(i)] = query.text(5 + i);
        }
        entry.sentence = query.text(9);
        entry.actor = query.text(10);
        entry.address = query.text(11);
    }
    return result == SQLITE_DONE ? Result<std::vector<LogEntry>>(std::move(entries)) : cannotBe("read");
}

} // namespace velt
