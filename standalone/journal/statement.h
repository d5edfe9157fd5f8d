// An owner for a prepared statement of the log's database.
#ifndef VELT_STANDALONE_JOURNAL_STATEMENT_H
#define VELT_STANDALONE_JOURNAL_STATEMENT_H

#include <sqlite3.h>

#include <cstdint>
#include <optional>
#include <string>

namespace velt {

/// Texts handed to it are copied. Parameters and columns are counted as SQLite counts them: from 1 and from
/// 0.
class Statement {
public:
    Statement() = default;
    ~Statement() { sqlite3_finalize(statement_); }
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;

    /// SQLITE_OK, or what went wrong.
    int prepare(sqlite3* database, const char* sql);

    void bind(int parameter, std::int64_t number) { sqlite3_bind_int64(statement_, parameter, number); }
    void bind(int parameter, const std::string& text);
    template<class Value> void bind(int parameter, const std::optional<Value>& value) {
        if (value) {
            bind(parameter, *value);
        } else {
            sqlite3_bind_null(statement_, parameter);
        }
    }

    /// SQLITE_ROW, SQLITE_DONE, or what went wrong.
    int step() { return sqlite3_step(statement_); }

    /// Makes it ready to run again.
    void reset() { sqlite3_reset(statement_); }

    /// Runs it to its end and makes it ready again. SQLITE_DONE, or what went wrong.
    int run();

    bool isNull(int column) { return sqlite3_column_type(statement_, column) == SQLITE_NULL; }
    std::int64_t number(int column) { return sqlite3_column_int64(statement_, column); }
    std::string text(int column);

private:
    sqlite3_stmt* statement_ = nullptr;
};

} // namespace velt

#endif
