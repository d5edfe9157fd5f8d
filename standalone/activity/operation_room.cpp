#include "standalone/activity/operation_room.h"

#include "standalone/activity/operation_columns.h"
#include "standalone/journal/sqlite_file.h"
#include "standalone/journal/statement.h"

#include <map>

namespace velt {
namespace {

constexpr const char* holderSql = "CASE WHEN operation = 0 OR user IS NULL THEN '' ELSE user END";

/// About what a record takes in the table and its indexes.
constexpr const char* sizeSql = "(200 + 2 * length(CAST(ifnull(reason, '') || ifnull(user, '') || "
                                "ifnull(account, '') || ifnull(address, '') "
                                "|| ifnull(detail, '') || ifnull(path, '') || ifnull(server, '') || "
                                "ifnull(share, '') || ifnull(within, '') "
                                "|| ifnull(newpath, '') || ifnull(newserver, '') || ifnull(newshare, '') || "
                                "ifnull(newwithin, '') AS BLOB)))";

/// The same of one that has just been stored.
std::int64_t sizeOf(const OperationRecord& record) {
    return static_cast<std::int64_t>(200 + 2 * textOctets(record));
}

std::string sums(const std::string& condition) {
    return std::string("SELECT ") + holderSql + " AS name, SUM(" + sizeSql +
           ") AS octets FROM operation WHERE " + condition + " GROUP BY 1";
}

/// The oldest of these, so many that the database's own log stays small.
std::string oldestOf(const std::string& condition) {
    return std::string("SELECT id FROM (SELECT id, size, SUM(size) OVER (ORDER BY time, id) AS upto FROM "
                       "(SELECT id, time, ") +
           sizeSql + " AS size FROM operation WHERE " + condition +
           " ORDER BY time, id LIMIT 2000)) WHERE upto - size < 2000000";
}

int runOnce(sqlite3* database, const std::string& sql, const auto&... parameters) {
    Statement statement;
    if (const int result = statement.prepare(database, sql.c_str()); result != SQLITE_OK) {
        return result;
    }
    int number = 0;
    (statement.bind(++number, parameters), ...);
    return statement.run();
}

/// What `condition` finds by its parameter ?1.
int remove(sqlite3* database, const std::string& condition, const auto& parameter,
           const std::optional<std::int64_t>& early) {
    const std::string part = "id IN (" + oldestOf(condition) + ")";
    const std::string count = "UPDATE holder SET octets = holder.octets - gone.octets, "
                              "grown = max(grown - gone.octets, 0), early = ifnull(?2, early) FROM (" +
                              sums(part) + ") AS gone WHERE holder.name = gone.name";
    int removed = -1;
    if (execute(database, "BEGIN IMMEDIATE") == SQLITE_OK) {
        if (runOnce(database, count, parameter, early) == SQLITE_DONE &&
            runOnce(database, "DELETE FROM operation WHERE " + part, parameter) == SQLITE_DONE) {
            removed = sqlite3_changes(database);
        }
        if (removed < 0 || execute(database, "COMMIT") != SQLITE_OK) {
            execute(database, "ROLLBACK");
            removed = -1;
        }
    }
    return removed;
}

} // namespace

std::string roomTableSql() {
    return "CREATE TABLE holder (name TEXT PRIMARY KEY, octets INTEGER NOT NULL, grown INTEGER NOT NULL "
           "DEFAULT 0, "
           "early INTEGER) WITHOUT ROWID;"
           "CREATE INDEX operation_nobody ON operation (time) WHERE operation = 0 OR user IS NULL;"
           "INSERT INTO holder (name, octets) " +
           sums("TRUE") + ";";
}

int countAdded(sqlite3* database, const std::vector<OperationRecord>& records) {
    std::map<std::string, std::int64_t> octets;
    for (const OperationRecord& record : records) {
        octets[record.operation == Operation::loginRefused ? "" : record.user] += sizeOf(record);
    }
    Statement count;
    int result =
        count.prepare(database, "INSERT INTO holder (name, octets, grown) VALUES (?1, ?2, ?2) "
                                "ON CONFLICT (name) DO UPDATE SET octets = octets + ?2, grown = grown + ?2");
    for (auto each = octets.begin(); each != octets.end() && (result == SQLITE_OK || result == SQLITE_DONE);
         ++each) {
        count.bind(1, each->first);
        count.bind(2, each->second);
        result = count.run();
    }
    return result == SQLITE_OK ? SQLITE_DONE : result;
}

int removeBefore(sqlite3* database, std::int64_t microseconds) {
    return remove(database, "time < ?1", microseconds, std::nullopt);
}

std::optional<std::string> loserOfRecords(sqlite3* database) {
    Statement query;
    if (query.prepare(database, "SELECT name FROM holder WHERE octets > 0 AND octets >= "
                                "(SELECT AVG(octets) FROM holder WHERE octets > 0) "
                                "ORDER BY grown DESC, octets DESC LIMIT 1") != SQLITE_OK ||
        query.step() != SQLITE_ROW) {
        return std::nullopt;
    }
    return query.text(0);
}

int removeOf(sqlite3* database, const std::string& holder, const std::optional<std::int64_t>& early) {
    const int removed = remove(database,
                               holder.empty() ? "(operation = 0 OR user IS NULL) AND ?1 = ''"
                                              : "user = ?1 AND operation <> 0",
                               holder, early);
    // A count that was wrong is put right, so that there is another loser.
    return removed == 0 &&
                   runOnce(database, "UPDATE holder SET octets = 0 WHERE name = ?1", holder) != SQLITE_DONE
               ? -1
               : removed;
}

int settleGrowth(sqlite3* database) {
    return runOnce(database, "UPDATE holder SET grown = 0 WHERE grown > 0");
}

} // namespace velt
