// Whose records take how much room in their store, and which of them go when there is too little.
#ifndef VELT_STANDALONE_ACTIVITY_OPERATION_ROOM_H
#define VELT_STANDALONE_ACTIVITY_OPERATION_ROOM_H

#include "standalone/activity/operation_record.h"

#include <sqlite3.h>

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// Makes the table of this, and fills it for the records that are there.
///
/// A user's records are those of the user's sessions. Refused logins, whose names anybody may choose, belong
/// to one holder together, with the name "".
std::string roomTableSql();

/// Counts records that have been stored. SQLITE_DONE, or what went wrong.
int countAdded(sqlite3* database, const std::vector<OperationRecord>& records);

/// Removes a part of the records from before this moment, the oldest first. How many; -1 when that failed.
int removeBefore(sqlite3* database, std::int64_t microseconds);

/// Who loses records when there is too little room. Each holder has the same share of it, and who has less
/// than that loses none. Of the others it is who has added most since settleGrowth. Nothing when there is
/// nobody.
std::optional<std::string> loserOfRecords(sqlite3* database);

/// Removes a part of the holder's records, the oldest first. How many; -1 when that failed. With `early`,
/// notes that moment as the last at which this holder lost records before their age.
int removeOf(sqlite3* database, const std::string& holder, const std::optional<std::int64_t>& early);

/// There is room for all: what has been added until now counts no more.
int settleGrowth(sqlite3* database);

} // namespace velt

#endif
