// The files of databases, and connections to them.
#ifndef VELT_STANDALONE_JOURNAL_SQLITE_FILE_H
#define VELT_STANDALONE_JOURNAL_SQLITE_FILE_H

#include "base/result.h"

#include <sqlite3.h>

#include <filesystem>
#include <memory>

namespace velt {

struct CloseDatabase {
    void operator()(sqlite3* database) const { sqlite3_close(database); }
};
using DatabaseOwner = std::unique_ptr<sqlite3, CloseDatabase>;

/// How sentences about the journal's database begin.
inline constexpr const char* administratorLog = "The administrator log";

/// Opens the file, which is made when it is missing, readable for its owner only. Waits for other writers for
/// some seconds. `title` begins the sentence of an error. Not for two threads at once.
Result<DatabaseOwner> openDatabase(const std::filesystem::path& path, const char* title = administratorLog);

/// "The administrator log PATH cannot be opened: REASON."
Error databaseError(sqlite3* database, const std::filesystem::path& path, const char* what,
                    const char* title = administratorLog);

int execute(sqlite3* database, const char* sql);

} // namespace velt

#endif
