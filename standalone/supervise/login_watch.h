// Hears of failed logins from what a daemon writes.
#ifndef VELT_STANDALONE_SUPERVISE_LOGIN_WATCH_H
#define VELT_STANDALONE_SUPERVISE_LOGIN_WATCH_H

#include "standalone/supervise/daemon_process.h"

#include <filesystem>
#include <string>

namespace velt {

/// Counts the failed logins of this daemon against their addresses, in a thread of its own that goes on until
/// the process ends, without destructors of static objects: by _exit(). To be called once. `folder` is that
/// of the files about running daemons: it shows which state root this process works for, which is set.
/// Nothing listens when the folder is not that of a state root.
DaemonProcess::Listener watchLogins(const std::filesystem::path& folder, const std::string& daemon);

} // namespace velt

#endif
