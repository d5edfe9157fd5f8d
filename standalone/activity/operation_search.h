// Finding what sessions did.
#ifndef VELT_STANDALONE_ACTIVITY_OPERATION_SEARCH_H
#define VELT_STANDALONE_ACTIVITY_OPERATION_SEARCH_H

#include "base/result.h"
#include "standalone/activity/operation_record.h"

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// Where a page ends.
struct OperationKey {
    std::int64_t time = 0; ///< microseconds since 1970
    std::int64_t id = 0;

    bool operator==(const OperationKey&) const = default;
};

/// "1700000000000000-42", and back; nothing for a text that is no key.
std::string keyText(const OperationKey& key);
std::optional<OperationKey> parseOperationKey(std::string_view text);

/// Which operations are wanted; a field that is not set excludes nothing.
struct OperationFilter {
    std::optional<std::string> user;    ///< exactly this login name
    std::optional<std::string> session; ///< of this session
    std::optional<std::string> share;   ///< in this share; a move, by where it began
    /// Beginning of the path: of the one on the server, or with `share` of the one within the share; of a
    /// move, also of where it led. For an escaped record it is compared with the escaped path.
    std::optional<std::string> pathPrefix;
    std::vector<Operation> operations; ///< one of these; none: all, sessions and refused logins included
    std::optional<OperationResult> result;
    std::optional<std::chrono::system_clock::time_point> from;  ///< at this moment or later
    std::optional<std::chrono::system_clock::time_point> until; ///< before this moment
    std::optional<OperationKey> before;                         ///< `next` of the page before
    int limit = 100;                                            ///< 1 to 1000
};

struct OperationPage {
    std::vector<OperationRecord> records; ///< newest first
    std::optional<OperationKey> next;     ///< where there are more
};

/// Searches what has been taken over so far. Without a store there are none. Opens a connection of its own,
/// so a long search holds up nobody; thread-safe.
Result<OperationPage> searchOperations(const OperationFilter& filter);

/// Who lost records before their age at this moment or later, for want of room, by operation_room.h; sorted.
/// Nobody without a store. Thread-safe.
Result<std::vector<std::string>> losersOfRecords(std::chrono::system_clock::time_point since);

} // namespace velt

#endif
