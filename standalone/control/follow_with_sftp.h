// SFTP after a change of settings that are not its own.
#ifndef VELT_STANDALONE_CONTROL_FOLLOW_WITH_SFTP_H
#define VELT_STANDALONE_CONTROL_FOLLOW_WITH_SFTP_H

#include "base/result.h"

namespace velt {

/// The listener of a running SFTP service gives way to one with the settings as they are stored now, or
/// staged by this thread.
Result<> followWithSftp();

} // namespace velt

#endif
