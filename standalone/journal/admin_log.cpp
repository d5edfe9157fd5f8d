#include "standalone/journal/admin_log.h"

#include "base/file.h"
#include "base/plain_text.h"
#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/journal/catalogue.h"
#include "standalone/journal/event_bus.h"
#include "standalone/journal/held_journal.h"
#include "standalone/journal/log_database.h"
#include "standalone/journal/request_actor.h"

#include <syslog.h>

#include <mutex>

namespace velt {

namespace {

constexpr std::size_t longestText = 1024;
constexpr std::size_t longestActor = 255;
constexpr int longestPage = 1000;

constexpr int logCategory = 2;
constexpr int logLevel = 1;
constexpr unsigned beginsAnew = 0x11BF0015;

struct Connection {
    std::mutex mutex;
    std::unique_ptr<LogDatabase> database;
};

Connection& connection() {
    static Connection instance;
    return instance;
}

/// Keeping too much harms less than losing an entry, or deleting by a rule that nobody wrote.
std::optional<LogRetention> retentionIfReadable() {
    const Result<LogRetention> retention = loadRetention();
    if (!retention) {
        syslog(LOG_WARNING, "administrator log: cannot remove old entries: %s",
               retention.error().message.c_str());
        return std::nullopt;
    }
    return *retention;
}

LogEntry makeEntry(int category, int level, unsigned event, const std::array<const char*, 4>& texts) {
    LogEntry entry;
    entry.time = std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now());
    entry.category = category;
    entry.level = level;
    entry.event = event;
    for (std::size_t i = 0; i < texts.size(); ++i) {
        entry.texts[i] = plainText(texts[i] == nullptr ? "" : texts[i], longestText);
    }
    entry.sentence = sentenceOf(event, entry.texts);
    entry.actor = plainText(requestActor().actor, longestActor);
    entry.address = plainText(requestActor().address, longestActor);
    return entry;
}

/// Whoever reads the new log would take it for the whole one.
void noteLoss(LogDatabase& database) {
    LogEntry entry = makeEntry(logCategory, logLevel, beginsAnew, {});
    entry.actor.clear(); // nobody who asks now has lost it
    entry.address.clear();
    (void)database.append(entry, std::nullopt);
}

/// Opens the log when it is not open, or leads to a file that was moved away. The connection's lock is held.
Result<LogDatabase*> currentDatabase(Connection& open) {
    if (open.database != nullptr && !open.database->isOwn()) {
        return Error(ErrorNumber::log,
                     "A process that was forked off while the administrator log was open cannot use it.");
    }
    const std::filesystem::path path = statePath(paths::logDatabase);
    if (open.database == nullptr || !open.database->leadsTo(path)) {
        const bool hadOne = (open.database != nullptr && open.database->path() == path) ||
                            fileExists(statePath(paths::initialized));
        open.database.reset();
        VELT_ASSIGN_OR_RETURN(open.database, LogDatabase::open(path));
        if (hadOne && open.database->isNew()) {
            noteLoss(*open.database);
        }
    }
    return open.database.get();
}

Result<> store(LogEntry& entry) {
    const std::optional<LogRetention> retention = retentionIfReadable();
    Connection& open = connection();
    const std::lock_guard lock(open.mutex);
    VELT_ASSIGN_OR_RETURN(LogDatabase* const database, currentDatabase(open));
    return database->append(entry, retention);
}

} // namespace

Result<> logEvent(int category, int level, unsigned event, const std::array<const char*, 4>& texts) {
    return writeLogEntry(makeEntry(category, level, event, texts));
}

Result<> writeLogEntry(LogEntry entry) {
    return perform(Effect::logEntry, entry.sentence, [&entry]() -> Result<> {
        if (holdBack(entry)) {
            return {};
        }
        Result<> stored = store(entry);
        if (stored) {
            publish(entry);
        }
        return stored;
    });
}

Result<std::vector<LogEntry>> queryLog(const LogFilter& filter) {
    if (filter.limit < 1 || filter.limit > longestPage) {
        return Error(ErrorNumber::invalid, "Page size: expected a number from 1 to 1000.");
    }
    Connection& open = connection();
    const std::lock_guard lock(open.mutex);
    VELT_ASSIGN_OR_RETURN(LogDatabase* const database, currentDatabase(open));
    return database->query(filter);
}

} // namespace velt
