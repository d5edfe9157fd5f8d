// The administrator log's database: one connection to it.
#ifndef VELT_STANDALONE_JOURNAL_LOG_DATABASE_H
#define VELT_STANDALONE_JOURNAL_LOG_DATABASE_H

#include "base/result.h"
#include "standalone/journal/log_entry.h"
#include "standalone/journal/log_retention.h"
#include "standalone/journal/sqlite_file.h"
#include "standalone/journal/statement.h"

#include <sys/types.h>

#include <filesystem>
#include <memory>
#include <optional>
#include <vector>

namespace velt {

/// Not thread-safe; several connections may be in use at once, in several processes, too.
class LogDatabase {
public:
    /// Opens the database, which is made when it is missing.
    static Result<std::unique_ptr<LogDatabase>> open(const std::filesystem::path& path);

    /// Closes the connection, unless this process has it from its parent: its locks are the parent's.
    ~LogDatabase();
    LogDatabase(const LogDatabase&) = delete;
    LogDatabase& operator=(const LogDatabase&) = delete;

    /// Whether this process opened the connection. One that it has from its parent cannot be used, nor can
    /// the same file be opened again beside it, since SQLite takes the parent's locks for its own.
    bool isOwn() const;

    /// Whether this is a connection to the file that `path` names now.
    bool leadsTo(const std::filesystem::path& path) const;

    /// The name by which it was opened.
    const std::filesystem::path& path() const { return path_; }

    /// Whether there was no log before it was opened.
    bool isNew() const { return isNew_; }

    /// Adds the entry, whose id it sets, and removes what `retention` (when given) no longer keeps, together
    /// or not at all.
    Result<> append(LogEntry& entry, const std::optional<LogRetention>& retention);

    /// As queryLog.
    Result<std::vector<LogEntry>> query(const LogFilter& filter);

private:
    explicit LogDatabase(std::filesystem::path path);

    Result<> makeTable();
    Result<> prepareStatements();
    int insert(LogEntry& entry);
    int removeOld(const LogEntry& newest, const LogRetention& retention);
    Error cannotBe(const char* what) const;

    struct Statements;

    std::filesystem::path path_;
    pid_t process_;
    DatabaseOwner database_;
    std::unique_ptr<Statements> statements_;
    bool isNew_ = false;
};

} // namespace velt

#endif
