// Daemons that start at once and serve nothing.
#ifndef VELT_TESTS_LOAD_STAND_IN_DAEMONS_H
#define VELT_TESTS_LOAD_STAND_IN_DAEMONS_H

namespace velt::test {

/// Puts them in the place of ProFTPD and OpenSSH, for as long as the world of this program of tests lasts.
/// False, with errno set, when that fails.
bool mountStandInDaemons();

} // namespace velt::test

#endif
