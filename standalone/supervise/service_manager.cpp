#include "standalone/supervise/service_manager.h"

#include "base/unique_fd.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <string_view>

namespace velt {

void tellServiceManager(const std::string& assignments) {
    const char* place = std::getenv("NOTIFY_SOCKET");
    const std::string_view path = place == nullptr ? "" : place;
    sockaddr_un address{};
    if (path.empty() || path.size() >= sizeof address.sun_path) {
        return;
    }
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, path.size());
    if (path.front() == '@') { // an abstract address, not a file
        address.sun_path[0] = '\0';
    }
    const auto size = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + path.size());
    const UniqueFd socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    if (::sendto(socket.get(), assignments.data(), assignments.size(), MSG_NOSIGNAL,
                 reinterpret_cast<const sockaddr*>(&address), size) < 0) {
        ::syslog(LOG_WARNING, "cannot reach the service manager: %s", std::strerror(errno));
    }
}

std::string statusLine(const DaemonState& state) {
    switch (state.state) {
    case RunState::running:
        return "STATUS=the daemon serves";
    case RunState::paused:
        return "STATUS=paused: open sessions continue";
    case RunState::closed:
        return "STATUS=switched off: open sessions continue";
    case RunState::failed:
        return "STATUS=the daemon does not serve: " + state.reason;
    case RunState::stopped:
        break;
    }
    return "STATUS=";
}

} // namespace velt
