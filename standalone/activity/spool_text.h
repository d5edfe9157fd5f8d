// Reading what sessions wrote into the spool.
#ifndef VELT_STANDALONE_ACTIVITY_SPOOL_TEXT_H
#define VELT_STANDALONE_ACTIVITY_SPOOL_TEXT_H

#include "standalone/activity/operation_record.h"

#include <cstddef>
#include <optional>
#include <string_view>
#include <vector>

namespace velt {

/// The record of a line, without RS and LF; nothing for a text of another form.
std::optional<OperationRecord> parseRecord(std::string_view line);

struct SpoolText {
    std::vector<OperationRecord> records;
    std::size_t taken = 0; ///< octets up to the end of the last line; what follows may still be being written
    std::size_t damaged = 0; ///< lines that are no records, such as those that a full disk cut
};

/// The records of this part of a spool, which begins where the former part's `taken` ended.
SpoolText parseSpool(std::string_view text);

} // namespace velt

#endif
