#include "standalone/activity/operation_search.h"

#include "base/file.h"
#include "base/number_text.h"
#include "standalone/activity/operation_columns.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/journal/sqlite_file.h"

#include <algorithm>
#include <utility>

namespace velt {
namespace {

constexpr int mostRecords = 1000;
constexpr int busyMilliseconds = 2000;

std::int64_t microsecondsOf(std::chrono::system_clock::time_point time) {
    return std::chrono::floor<std::chrono::microseconds>(time.time_since_epoch()).count();
}

/// The first text behind all that begin with the prefix, which has octets other than the last there is.
std::string endOfPrefix(std::string prefix) {
    while (!prefix.empty() && static_cast<unsigned char>(prefix.back()) == 0xff) {
        prefix.pop_back();
    }
    if (!prefix.empty()) {
        prefix.back() = static_cast<char>(static_cast<unsigned char>(prefix.back()) + 1);
    }
    return prefix;
}

/// Names the columns that the filter does and no others: SQLite finds no index for a condition that may not
/// apply.
class Search {
public:
    explicit Search(const OperationFilter& filter) : filter_(filter) {}

    std::string sql() const {
        return std::string("SELECT id, (SELECT name FROM session WHERE session.id = operation.session), ") +
               operationColumns + " FROM operation WHERE TRUE" + conditions() +
               " ORDER BY time DESC, id DESC LIMIT ?10";
    }

    void bind(Statement& query) const;

private:
    std::string conditions() const;
    std::string pathCondition() const;
    std::string operationCondition() const;
    std::string resultCondition() const;

    const OperationFilter& filter_;
};

std::string Search::pathCondition() const {
    if (!filter_.pathPrefix || filter_.pathPrefix->empty()) {
        return "";
    }
    return filter_.share ? " AND ((share = ?2 AND within >= ?4 AND within < ?5) OR "
                           "(newshare = ?2 AND newwithin >= ?4 AND newwithin < ?5))"
                         : " AND ((server >= ?4 AND server < ?5) OR (newserver >= ?4 AND newserver < ?5))";
}

std::string Search::operationCondition() const {
    std::string numbers;
    for (const Operation operation : filter_.operations) {
        numbers += (numbers.empty() ? "" : ", ") + std::to_string(static_cast<int>(operation));
    }
    return numbers.empty() ? "" : " AND operation IN (" + numbers + ")";
}

std::string Search::resultCondition() const {
    // In words, not as a parameter, so that the index of those with this result is found.
    return filter_.result ? " AND result = " + std::to_string(static_cast<int>(*filter_.result)) : "";
}

std::string Search::conditions() const {
    const std::string path = pathCondition();
    std::string sql;
    sql += filter_.user ? " AND user = ?1" : "";
    sql += filter_.share && path.empty() ? " AND share = ?2" : "";
    sql += filter_.session ? " AND session = (SELECT id FROM session WHERE name = ?3)" : "";
    sql += filter_.from ? " AND time >= ?6" : "";
    sql += filter_.until ? " AND time < ?7" : "";
    sql += filter_.before ? " AND (time, id) < (?8, ?9)" : "";
    return sql + path + resultCondition() + operationCondition();
}

void Search::bind(Statement& query) const {
    const auto time = [](const auto& point) {
        return point ? std::optional(microsecondsOf(*point)) : std::nullopt;
    };
    query.bind(1, filter_.user);
    query.bind(2, filter_.share);
    query.bind(3, filter_.session);
    query.bind(4, filter_.pathPrefix);
    query.bind(5, filter_.pathPrefix ? std::optional(endOfPrefix(*filter_.pathPrefix)) : std::nullopt);
    query.bind(6, time(filter_.from));
    query.bind(7, time(filter_.until));
    query.bind(8, filter_.before ? std::optional(filter_.before->time) : std::nullopt);
    query.bind(9, filter_.before ? std::optional(filter_.before->id) : std::nullopt);
    query.bind(10, std::int64_t{std::clamp(filter_.limit, 1, mostRecords) + 1});
}

Result<OperationPage> run(sqlite3* database, const OperationFilter& filter) {
    const auto path = statePath(paths::operationDatabase);
    const Search search(filter);
    Statement query;
    if (query.prepare(database, search.sql().c_str()) != SQLITE_OK) {
        return databaseError(database, path, "read", operationStoreTitle);
    }
    search.bind(query);
    OperationPage page;
    int result = query.step();
    for (; result == SQLITE_ROW; result = query.step()) {
        page.records.push_back(readOperation(query));
    }
    if (result != SQLITE_DONE) {
        return databaseError(database, path, "read", operationStoreTitle);
    }
    // One more than was asked for tells whether there are more.
    if (const auto limit = static_cast<std::size_t>(std::clamp(filter.limit, 1, mostRecords));
        page.records.size() > limit) {
        page.records.pop_back();
        const OperationRecord& last = page.records.back();
        page.next = OperationKey{microsecondsOf(last.time), last.id};
    }
    return page;
}

Result<std::vector<std::string>> losers(sqlite3* database, std::chrono::system_clock::time_point since) {
    Statement query;
    std::vector<std::string> names;
    int result = query.prepare(database, "SELECT name FROM holder WHERE early >= ?1 ORDER BY name");
    if (result == SQLITE_OK) {
        query.bind(1, microsecondsOf(since));
        for (result = query.step(); result == SQLITE_ROW; result = query.step()) {
            names.push_back(query.text(0));
        }
    }
    return result == SQLITE_DONE
               ? Result<std::vector<std::string>>(names)
               : databaseError(database, statePath(paths::operationDatabase), "read", operationStoreTitle);
}

/// By a connection of its own; nothing is found where there is no store.
template<class Found, class Find> Result<Found> inStore(const Find& find) {
    const auto path = statePath(paths::operationDatabase);
    if (!fileExists(path)) {
        return Found();
    }
    sqlite3* opened = nullptr;
    const int flags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX | SQLITE_OPEN_EXRESCODE;
    const int result = sqlite3_open_v2(path.c_str(), &opened, flags, nullptr);
    const DatabaseOwner database(opened);
    if (result != SQLITE_OK) {
        return databaseError(opened, path, "opened", operationStoreTitle);
    }
    sqlite3_busy_timeout(opened, busyMilliseconds);
    return find(opened);
}

} // namespace

std::string keyText(const OperationKey& key) {
    return std::to_string(key.time) + '-' + std::to_string(key.id);
}

std::optional<OperationKey> parseOperationKey(std::string_view text) {
    const auto middle = text.find('-');
    if (middle == text.npos) {
        return std::nullopt;
    }
    const auto time = parseNumber(text.substr(0, middle));
    const auto id = parseNumber(text.substr(middle + 1));
    return time && id ? std::optional(OperationKey{*time, *id}) : std::nullopt;
}

Result<OperationPage> searchOperations(const OperationFilter& filter) {
    return inStore<OperationPage>([&](sqlite3* database) { return run(database, filter); });
}

Result<std::vector<std::string>> losersOfRecords(std::chrono::system_clock::time_point since) {
    return inStore<std::vector<std::string>>([&](sqlite3* database) { return losers(database, since); });
}

} // namespace velt
