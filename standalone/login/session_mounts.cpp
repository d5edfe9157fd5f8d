#include "standalone/login/session_mounts.h"

#include "base/ask_child.h"
#include "standalone/core/error_number.h"

#include <sched.h>
#include <sys/mount.h>

#include <cerrno>
#include <cstring>

namespace velt {
namespace {

int tryMounts() {
    const bool possible =
        unshare(CLONE_NEWNS) == 0 && mount(nullptr, "/", nullptr, MS_REC | MS_SLAVE, nullptr) == 0;
    return possible ? 0 : errno;
}

} // namespace

Result<> checkSessionMounts() {
    VELT_ASSIGN_OR_RETURN(const auto error, askChild(tryMounts));
    if (error != 0) {
        return Error(ErrorNumber::daemon,
                     std::string("FTP sessions cannot be confined here: cannot make a mount namespace: ") +
                         std::strerror(error) + ".");
    }
    return {};
}

} // namespace velt
