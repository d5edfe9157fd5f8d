// The file of the journal's database, and connections to it.
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

/// Opens the file, which is made when it is missing, readable for its owner only. Waits for other writers for
/// some seconds. Not for two threads at once.
Result<DatabaseOwner> openDatabase(const std::filesystem::path& path);

/// An error of the administrator log: "The administrator log PATH cannot be opened: REASON."
Error databaseError(sqlite3* database, const std::filesystem::path& path, const char* what);

int execute(sqlite3* database, const char* sql);

} // namespace velt

#endif
