// Whether FTP sessions can have mounts of their own.
#ifndef VELT_STANDALONE_LOGIN_SESSION_MOUNTS_H
#define VELT_STANDALONE_LOGIN_SESSION_MOUNTS_H

#include "base/result.h"

namespace velt {

/// Tries in a child process what each login needs. An error when it is not allowed here. Thread-safe.
Result<> checkSessionMounts();

} // namespace velt

#endif
