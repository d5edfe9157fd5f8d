// Hears of failed and refused logins from what a daemon writes.
#ifndef VELT_STANDALONE_SUPERVISE_LOGIN_WATCH_H
#define VELT_STANDALONE_SUPERVISE_LOGIN_WATCH_H

#include "standalone/supervise/daemon_process.h"

#include <filesystem>
#include <string>

namespace velt {

/// Counts the failed logins of this daemon against their addresses, and writes those that our own part of it
/// refused into the administrator log, each reason once a minute; a password that SFTP refused is recorded as
/// sessions record what they do. In threads of its own that go on until the
/// process ends, without destructors of static objects: by _exit(). To be called once. `folder` is that
/// of the files about running daemons: it shows which state root this process works for, which is set.
/// Nothing listens when the folder is not that of a state root.
DaemonProcess::Listener watchLogins(const std::filesystem::path& folder, const std::string& daemon);

} // namespace velt

#endif
