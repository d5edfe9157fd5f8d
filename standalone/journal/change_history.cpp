#include "standalone/journal/change_history.h"

#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/journal/log_retention.h"
#include "standalone/journal/sqlite_file.h"
#include "standalone/journal/statement.h"

#include <algorithm>
#include <array>

namespace velt {

namespace {

using std::chrono::milliseconds;
using std::chrono::system_clock;

constexpr int longestPage = 1000;

constexpr const char* tableSql = R"(
    CREATE TABLE IF NOT EXISTS change (
        id INTEGER PRIMARY KEY AUTOINCREMENT,
        time INTEGER NOT NULL,
        actor TEXT NOT NULL,
        address TEXT NOT NULL,
        way TEXT NOT NULL,
        fields TEXT NOT NULL,
        size INTEGER NOT NULL,
        state INTEGER NOT NULL,
        confirm_by INTEGER);
)";

constexpr const char* insertSql =
    "INSERT INTO change (time, actor, address, way, fields, size, state, confirm_by) "
    "VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8)";
// The newest change at which those from it on take more than so many bytes, and all older ones.
constexpr const char* removeBySizeSql = R"(
    DELETE FROM change WHERE id <= (
        SELECT MAX(id) FROM (SELECT id, SUM(size) OVER (ORDER BY id DESC) AS total FROM change)
        WHERE total > ?1 AND id < ?2)
)";
constexpr const char* columns =
    "SELECT id, time, actor, address, way, fields, state, confirm_by FROM change ";

std::int64_t numberOf(system_clock::time_point time) {
    return std::chrono::floor<milliseconds>(time.time_since_epoch()).count();
}

system_clock::time_point timeOf(std::int64_t number) {
    return system_clock::time_point(milliseconds(number));
}

/// One connection for one operation: changes are rare, and nothing has to be thought of when the file is
/// moved away or the process forks.
class History {
public:
    static Result<History> open() {
        History history(statePath(paths::logDatabase));
        VELT_ASSIGN_OR_RETURN(history.database_, openDatabase(history.path_));
        if (execute(history.database_.get(), tableSql) != SQLITE_OK) {
            return history.cannotBe("made");
        }
        return history;
    }

    /// Runs the statement with these numbers as its parameters.
    Result<> run(const char* sql, std::initializer_list<std::int64_t> numbers) {
        Statement statement;
        if (statement.prepare(database_.get(), sql) != SQLITE_OK) {
            return cannotBe("written");
        }
        int place = 1;
        for (const std::int64_t number : numbers) {
            statement.bind(place++, number);
        }
        return statement.run() == SQLITE_DONE ? Result<>() : cannotBe("written");
    }

    Result<std::int64_t> insert(const ChangeRecord& change) {
        Statement statement;
        if (statement.prepare(database_.get(), insertSql) != SQLITE_OK) {
            return cannotBe("written");
        }
        statement.bind(1, numberOf(change.time));
        statement.bind(2, change.actor);
        statement.bind(3, change.address);
        statement.bind(4, change.way);
        statement.bind(5, change.fields);
        statement.bind(6, static_cast<std::int64_t>(change.fields.size()));
        statement.bind(7, static_cast<std::int64_t>(change.state));
        statement.bind(8, change.confirmBy ? std::optional(numberOf(*change.confirmBy)) : std::nullopt);
        if (statement.run() != SQLITE_DONE) {
            return cannotBe("written");
        }
        return sqlite3_last_insert_rowid(database_.get());
    }

    Result<> update(std::int64_t id, const std::string& fields) {
        Statement statement;
        if (statement.prepare(database_.get(), "UPDATE change SET fields = ?2, size = ?3 WHERE id = ?1") !=
            SQLITE_OK) {
            return cannotBe("written");
        }
        statement.bind(1, id);
        statement.bind(2, fields);
        statement.bind(3, static_cast<std::int64_t>(fields.size()));
        return statement.run() == SQLITE_DONE ? Result<>() : cannotBe("written");
    }

    /// Begins to write, and gives it up again. Others who write just now show that it can be done.
    Result<> tryToWrite() {
        sqlite3_busy_timeout(database_.get(), 0);
        const int begun = execute(database_.get(), "BEGIN IMMEDIATE");
        if (begun != SQLITE_OK && begun != SQLITE_BUSY) {
            return cannotBe("written");
        }
        (void)execute(database_.get(), "ROLLBACK");
        return {};
    }

    /// What the rest of the query, with these numbers in it, selects.
    Result<std::vector<ChangeRecord>> select(const std::string& rest,
                                             std::initializer_list<std::int64_t> numbers) {
        Statement statement;
        if (statement.prepare(database_.get(), (columns + rest).c_str()) != SQLITE_OK) {
            return cannotBe("read");
        }
        int place = 1;
        for (const std::int64_t number : numbers) {
            statement.bind(place++, number);
        }
        std::vector<ChangeRecord> changes;
        int result = statement.step();
        for (; result == SQLITE_ROW; result = statement.step()) {
            changes.push_back(changeIn(statement));
        }
        return result == SQLITE_DONE ? Result<std::vector<ChangeRecord>>(std::move(changes))
                                     : cannotBe("read");
    }

private:
    explicit History(std::filesystem::path path) : path_(std::move(path)) {}

    Error cannotBe(const char* what) const { return databaseError(database_.get(), path_, what); }

    static ChangeRecord changeIn(Statement& row) {
        ChangeRecord change;
        change.id = row.number(0);
        change.time = timeOf(row.number(1));
        change.actor = row.text(2);
        change.address = row.text(3);
        change.way = row.text(4);
        change.fields = row.text(5);
        change.state = static_cast<ChangeState>(row.number(6));
        if (row.number(7) != 0) {
            change.confirmBy = timeOf(row.number(7));
        }
        return change;
    }

    std::filesystem::path path_;
    DatabaseOwner database_;
};

Result<> removeOld(History& history, std::int64_t newest, system_clock::time_point now) {
    VELT_RETURN_IF_ERROR(history.run("DELETE FROM change WHERE id <= ?1", {newest - keptChanges}));
    VELT_RETURN_IF_ERROR(history.run(removeBySizeSql, {keptBytes, newest}));
    const auto retention = loadRetention();
    // Keeping too much harms less than deleting by a rule that nobody wrote.
    if (!retention || retention->maxAgeDays == 0) {
        return {};
    }
    return history.run("DELETE FROM change WHERE time < ?1",
                       {numberOf(now - std::chrono::days(retention->maxAgeDays))});
}

} // namespace

std::string changeStateName(ChangeState state) {
    // In the order of ChangeState.
    constexpr std::array<const char*, 6> names{"done",   "waiting",    "confirmed",
                                               "undone", "superseded", "begun"};
    return names.at(static_cast<std::size_t>(state));
}

Result<std::int64_t> recordChange(const ChangeRecord& change) {
    VELT_ASSIGN_OR_RETURN(auto history, History::open());
    VELT_ASSIGN_OR_RETURN(const auto id, history.insert(change));
    VELT_RETURN_IF_ERROR(removeOld(history, id, change.time));
    return id;
}

Result<> checkHistoryCanBeWritten() {
    VELT_ASSIGN_OR_RETURN(auto history, History::open());
    return history.tryToWrite();
}

Result<> setChangeState(std::int64_t id, ChangeState state) {
    VELT_ASSIGN_OR_RETURN(auto history, History::open());
    return history.run(
        "UPDATE change SET state = ?2, confirm_by = iif(?2 = ?3, NULL, confirm_by) WHERE id = ?1",
        {id, static_cast<std::int64_t>(state), static_cast<std::int64_t>(ChangeState::confirmed)});
}

Result<> setChangeFields(std::int64_t id, const std::string& fields) {
    VELT_ASSIGN_OR_RETURN(auto history, History::open());
    return history.update(id, fields);
}

Result<> removeChange(std::int64_t id) {
    VELT_ASSIGN_OR_RETURN(auto history, History::open());
    return history.run("DELETE FROM change WHERE id = ?1", {id});
}

Result<std::vector<ChangeRecord>> queryChanges(const ChangeFilter& filter) {
    if (filter.limit < 1 || filter.limit > longestPage) {
        return Error(ErrorNumber::invalid, "Page size: expected a number from 1 to 1000.");
    }
    VELT_ASSIGN_OR_RETURN(auto history, History::open());
    const std::int64_t before = filter.beforeId.value_or(INT64_MAX);
    const std::string page = " ORDER BY id DESC LIMIT ?2";
    return filter.state ? history.select("WHERE id < ?1 AND state = ?3" + page,
                                         {before, filter.limit, static_cast<std::int64_t>(*filter.state)})
                        : history.select("WHERE id < ?1" + page, {before, filter.limit});
}

Result<std::optional<ChangeRecord>> changeRecord(std::int64_t id) {
    VELT_ASSIGN_OR_RETURN(auto history, History::open());
    VELT_ASSIGN_OR_RETURN(auto found, history.select("WHERE id = ?1", {id}));
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

} // namespace velt
