// What a test leaves behind in its world.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_LEFTOVERS_H
#define VELT_TESTS_SYSTEM_SUPPORT_LEFTOVERS_H

#include <string>

namespace velt::test {

/// The processes that run in this world beside the test's own and do not end within three seconds, as
/// "NUMBER COMMAND" lines.
std::string lastingProcesses();

/// Whether anything in this world listens on a TCP port.
bool somethingListens();

} // namespace velt::test

#endif
