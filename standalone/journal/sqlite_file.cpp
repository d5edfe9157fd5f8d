#include "standalone/journal/sqlite_file.h"

#include "base/unique_fd.h"
#include "standalone/core/error_number.h"

#include <fcntl.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <string>
#include <system_error>
#include <thread>

namespace velt {

namespace {

constexpr int busyMilliseconds = 5000;

/// While another process does the same, SQLite refuses the switch at once instead of waiting.
int switchToWal(sqlite3* database) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(busyMilliseconds);
    for (;;) {
        const int result = execute(database, "PRAGMA journal_mode = WAL");
        if (result != SQLITE_BUSY || std::chrono::steady_clock::now() > deadline) {
            return result;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
}

/// Names and addresses are in it: SQLite would make the file readable to all. Its side files take its mode.
/// One that is there must not be opened: closing it again would take away the locks of this process's other
/// connections, and whoever closes the database next would delete its side files under them.
Result<> makeMissingFile(const std::filesystem::path& path, const std::string& title) {
    std::error_code error;
    std::filesystem::create_directories(path.parent_path(), error);
    const UniqueFd fd(::open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    if (!fd && errno != EEXIST) {
        return Error(ErrorNumber::log,
                     title + " " + path.string() + " cannot be opened: " + std::strerror(errno) + ".");
    }
    return {};
}

} // namespace

Error databaseError(sqlite3* database, const std::filesystem::path& path, const char* what,
                    const char* title) {
    return {ErrorNumber::log, std::string(title) + " " + path.string() + " cannot be " + what + ": " +
                                  sqlite3_errmsg(database) + "."};
}

int execute(sqlite3* database, const char* sql) {
    return sqlite3_exec(database, sql, nullptr, nullptr, nullptr);
}

Result<DatabaseOwner> openDatabase(const std::filesystem::path& path, const char* title) {
    VELT_RETURN_IF_ERROR(makeMissingFile(path, title));
    const int flags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX | SQLITE_OPEN_EXRESCODE;
    sqlite3* opened = nullptr;
    const int result = sqlite3_open_v2(path.c_str(), &opened, flags, nullptr);
    DatabaseOwner database(opened);
    if (result != SQLITE_OK) {
        return databaseError(opened, path, "opened", title);
    }
    sqlite3_busy_timeout(opened, busyMilliseconds);
    // With the log ahead of the table, a commit that is not forced to the disk survives the end of the
    // process; a power failure may take the last entries, never the table's form.
    if (switchToWal(opened) != SQLITE_OK || execute(opened, "PRAGMA synchronous = NORMAL") != SQLITE_OK) {
        return databaseError(opened, path, "opened", title);
    }
    return database;
}

} // namespace velt
