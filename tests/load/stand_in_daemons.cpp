#include "tests/load/stand_in_daemons.h"

#include <sys/mount.h>

#include <algorithm>
#include <array>

namespace velt::test {

bool mountStandInDaemons() {
    constexpr std::array daemons{"/usr/sbin/proftpd", "/usr/sbin/sshd"};
    static const bool mounted = std::ranges::all_of(daemons, [](const char* daemon) {
        return ::mount(VELT_STAND_IN_DAEMON, daemon, nullptr, MS_BIND, nullptr) == 0;
    });
    return mounted;
}

} // namespace velt::test
