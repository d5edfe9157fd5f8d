// What sessions did, for programs that read what FTP servers have always written.
#ifndef VELT_STANDALONE_ACTIVITY_TRANSFER_LOG_H
#define VELT_STANDALONE_ACTIVITY_TRANSFER_LOG_H

#include "base/result.h"
#include "standalone/activity/activity_settings.h"
#include "standalone/activity/operation_record.h"

#include <span>
#include <string>

namespace velt {

/// The line of xferlog(5) with its line break, in the local time zone, for an upload or download that moved
/// something or a file that was deleted; "" for any other record. Blanks and what cannot be shown are '_' in
/// names, as FTP servers have it.
std::string xferlogLine(const OperationRecord& record);

/// "alice (192.0.2.1, sftp): upload done /srv/music/a, 250 octets", in one line.
std::string operationSentence(const OperationRecord& record);

/// Appends the records to the file, and gives them to syslog under the facility "ftp", as the settings say. A
/// file that was moved away meanwhile is made anew. A crash in the middle loses the rest.
Result<> writeTransferLog(const ActivitySettings& settings, std::span<const OperationRecord> records);

} // namespace velt

#endif
