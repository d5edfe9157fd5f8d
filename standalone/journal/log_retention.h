// How long entries of the administrator log are kept.
#ifndef VELT_STANDALONE_JOURNAL_LOG_RETENTION_H
#define VELT_STANDALONE_JOURNAL_LOG_RETENTION_H

#include "base/result.h"

#include <cstdint>

namespace velt {

struct LogRetention {
    std::int64_t maxEntries = 100'000; ///< 0: no limit
    std::int64_t maxAgeDays = 365;     ///< 0: no limit
};

/// What the configuration file says: lines "max_entries = 100000" and "max_age_days = 365". What is not set
/// there has its default.
Result<LogRetention> loadRetention();

} // namespace velt

#endif
