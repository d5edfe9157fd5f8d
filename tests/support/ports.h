#ifndef VELT_TESTS_SUPPORT_PORTS_H
#define VELT_TESTS_SUPPORT_PORTS_H

namespace velt::test {

/// A port that was free on all addresses a moment ago, outside the kernel's range for connections, and is not
/// given to another test that runs at the same time. The ports three below and above it are not those of
/// another call.
int freePort();

/// The first of so many free ports in a row.
int freePorts(int count);

} // namespace velt::test

#endif
