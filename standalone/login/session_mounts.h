// Whether FTP sessions can have their own mounts.
#ifndef VELT_STANDALONE_LOGIN_SESSION_MOUNTS_H
#define VELT_STANDALONE_LOGIN_SESSION_MOUNTS_H

#include "base/result.h"

namespace velt {

/// Tries in a child process what each login needs; an error when this process may not do it. Thread-safe.
Result<> checkSessionMounts();

} // namespace velt

#endif
