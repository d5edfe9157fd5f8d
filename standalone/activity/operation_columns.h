// The table of operations, as it is written and read.
#ifndef VELT_STANDALONE_ACTIVITY_OPERATION_COLUMNS_H
#define VELT_STANDALONE_ACTIVITY_OPERATION_COLUMNS_H

#include "standalone/activity/operation_record.h"
#include "standalone/journal/statement.h"

#include <cstddef>
#include <cstdint>

namespace velt {

inline constexpr const char* operationStoreTitle = "The record of operations";

/// All but the id; `session` is the number of the session's row.
inline constexpr const char* operationColumns =
    "time, session, number, operation, result, protocol, octets, octetsin, octetsout, duration, escaped, "
    "leftout, cut, reason, user, account, address, detail, path, server, share, within, newpath, newserver, "
    "newshare, "
    "newwithin";
inline constexpr int operationColumnCount = 26;

/// Binds the record to the parameters 1 to operationColumnCount, in the order of the columns.
void bindOperation(Statement& statement, const OperationRecord& record, std::int64_t session);

/// Of all texts of the record but its session.
std::size_t textOctets(const OperationRecord& record);

/// The record of a row "id, the session's name, operationColumns".
OperationRecord readOperation(Statement& row);

} // namespace velt

#endif
