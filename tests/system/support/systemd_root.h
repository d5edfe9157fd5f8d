// The file system of a machine that systemd boots: the real one's, seen through a layer that takes all
// writes.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SYSTEMD_ROOT_H
#define VELT_TESTS_SYSTEM_SUPPORT_SYSTEMD_ROOT_H

#include <string>

namespace velt::test {

/// Moves this process into a mount name space of its own and makes the root there, with little to start at
/// boot and an account for the tests. It lasts over boots. Throws NoSystemd.
void makeSystemdRoot();

/// Unmounts what makeSystemdRoot() made.
void removeSystemdRoot();

/// Makes that root, with fresh kernel file systems, the root of the calling process, which is the first of
/// fresh mount and process name spaces; moves it into the control group and makes that the only one to be
/// seen, and gives up what could reach the real machine. Throws std::runtime_error.
void enterSystemdRoot(const std::string& group);

} // namespace velt::test

#endif
