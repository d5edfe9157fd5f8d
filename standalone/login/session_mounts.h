// Whether FTP sessions can have mounts of their own.
#ifndef VELT_STANDALONE_LOGIN_SESSION_MOUNTS_H
#define VELT_STANDALONE_LOGIN_SESSION_MOUNTS_H

namespace velt {

/// Tries in a child process what each login needs. Negative, with the last error set, when it is not allowed
/// here. Thread-safe.
int checkSessionMounts();

} // namespace velt

#endif
