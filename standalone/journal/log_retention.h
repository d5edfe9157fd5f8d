// How long entries of the administrator log are kept.
#ifndef VELT_STANDALONE_JOURNAL_LOG_RETENTION_H
#define VELT_STANDALONE_JOURNAL_LOG_RETENTION_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

struct LogRetention {
    std::int64_t maxEntries = 100'000; ///< 0: any number
    std::int64_t maxAgeDays = 365;     ///< 0: for ever
};

/// Reads the text of the configuration file: lines "max_entries=100000" and "max_age_days=365", each of which
/// may be absent, blank lines, and comments after '#'. Nothing when a line is none of these; `flaw` then
/// names it.
std::optional<LogRetention> parseRetention(std::string_view text, std::string& flaw);

/// What "/etc/velt/log.conf" below the state root says, the defaults when there is no such file. Nothing,
/// with the last error naming the file and the line, when it cannot be read or is damaged.
std::optional<LogRetention> loadRetention();

} // namespace velt

#endif
