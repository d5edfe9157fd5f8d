#include "host/http/listener.h"

#include "base/file.h"
#include "host/base/account_names.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/fsuid.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <system_error>
#include <utility>

namespace velt::host {

namespace {

constexpr int backlog = 512;

const sockaddr* generic(const void* address) {
    return static_cast<const sockaddr*>(address);
}

bool isLoopback(const sockaddr* name, socklen_t size) {
    if (name->sa_family == AF_INET) {
        sockaddr_in address{};
        std::memcpy(&address, name, sizeof address);
        return (ntohl(address.sin_addr.s_addr) >> 24U) == 127;
    }
    sockaddr_in6 address{};
    std::memcpy(&address, name, std::min(sizeof address, static_cast<std::size_t>(size)));
    return name->sa_family == AF_INET6 && IN6_IS_ADDR_LOOPBACK(&address.sin6_addr) != 0;
}

/// Throws for an address that other machines can reach, unless that is allowed.
void checkReach(const std::string& address, const sockaddr* name, socklen_t size, bool allowRemote) {
    if (!allowRemote && !isLoopback(name, size)) {
        throw ListenError(address +
                          " can be reached from other machines: that needs --allow-remote and a TLS "
                          "certificate.");
    }
}

/// Splits "[::1]:80" into "::1" and "80".
std::pair<std::string, std::string> split(const std::string& address) {
    const std::size_t colon = address.rfind(':');
    if (colon == std::string::npos || colon + 1 == address.size()) {
        throw ListenError("\"" + address + "\" is not an address with a port, such as 127.0.0.1:8080.");
    }
    std::string host = address.substr(0, colon);
    if (host.starts_with('[') && host.ends_with(']')) {
        host = host.substr(1, host.size() - 2);
    }
    return {host, address.substr(colon + 1)};
}

struct SocketName {
    sockaddr_storage address{};
    socklen_t size = sizeof(sockaddr_storage);
};

using NameGetter = int (*)(int, sockaddr*, socklen_t*);

/// The name of one end of a socket; its family is AF_UNSPEC when it has none.
SocketName socketName(int descriptor, NameGetter get) {
    SocketName name;
    void* const raw = &name.address;
    if (get(descriptor, static_cast<sockaddr*>(raw), &name.size) != 0) {
        name = {};
    }
    return name;
}

/// The address and port of one end of a socket.
std::pair<std::string, unsigned short> nameOf(int descriptor, NameGetter get) {
    const SocketName name = socketName(descriptor, get);
    std::array<char, INET6_ADDRSTRLEN> text{};
    if (name.address.ss_family == AF_UNSPEC) {
        return {"", 0};
    }
    if (name.address.ss_family == AF_INET) {
        sockaddr_in address{};
        std::memcpy(&address, &name.address, sizeof address);
        inet_ntop(AF_INET, &address.sin_addr, text.data(), text.size());
        return {text.data(), ntohs(address.sin_port)};
    }
    sockaddr_in6 address{};
    std::memcpy(&address, &name.address, sizeof address);
    inet_ntop(AF_INET6, &address.sin6_addr, text.data(), text.size());
    return {text.data(), ntohs(address.sin6_port)};
}

/// An integer option of a socket; 0 on failure.
int optionOf(int descriptor, int option) {
    int value = 0;
    socklen_t size = sizeof value;
    return getsockopt(descriptor, SOL_SOCKET, option, &value, &size) == 0 ? value : 0;
}

int familyOf(int descriptor) {
    return optionOf(descriptor, SO_DOMAIN);
}

sockaddr_un unixAddress(const std::filesystem::path& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    const std::string text = path.string();
    if (text.size() >= sizeof address.sun_path) {
        throw ListenError("The path " + text + " is too long for a Unix socket.");
    }
    std::memcpy(static_cast<char*>(address.sun_path), text.c_str(), text.size() + 1);
    return address;
}

/// Throws where there is none to be had. `place` is where it is to listen.
int openSocket(int family, const std::string& place) {
    const int descriptor = socket(family, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    if (descriptor < 0) {
        throw ListenError(cannot("listen on", place).message);
    }
    return descriptor;
}

/// Whether a process accepts connections there.
bool answers(const sockaddr_un& address, const std::string& path) {
    const UniqueFd caller(openSocket(AF_UNIX, path));
    return connect(caller.get(), generic(&address), sizeof address) == 0 || errno == EAGAIN;
}

void removeStale(const std::filesystem::path& path, const sockaddr_un& address) {
    struct stat status {};
    if (lstat(path.c_str(), &status) != 0) {
        return;
    }
    if (!S_ISSOCK(status.st_mode)) {
        throw ListenError(path.string() + " exists and is not a socket.");
    }
    if (answers(address, path)) {
        throw ListenError("Another program already listens on " + path.string() + ".");
    }
    unlink(path.c_str());
}

/// As a member, an owner may give a file to a group without the right to give it to anybody. Only this thread
/// is one, for as long as this takes.
bool giveAsMember(const std::filesystem::path& path, gid_t group) {
    const auto former = static_cast<gid_t>(setfsgid(group));
    const bool given = lchown(path.c_str(), static_cast<uid_t>(-1), group) == 0;
    const int error = errno;
    setfsgid(former);
    errno = error;
    return given;
}

void giveToGroup(const std::filesystem::path& path, const std::string& name, gid_t group) {
    // A user outside the group cannot give it the socket. Such a user runs a host for personal use.
    if (!giveAsMember(path, group) && (errno != EPERM || geteuid() == 0)) {
        throw ListenError(cannot("give", path.string() + " to the group " + name).message);
    }
}

void readCredentials(int descriptor, Peer& peer) {
    ucred credentials{};
    socklen_t size = sizeof credentials;
    if (getsockopt(descriptor, SOL_SOCKET, SO_PEERCRED, &credentials, &size) != 0) {
        return;
    }
    peer.uid = credentials.uid;
    std::array<gid_t, 1024> groups{};
    size = sizeof groups;
    if (getsockopt(descriptor, SOL_SOCKET, SO_PEERGROUPS, groups.data(), &size) == 0) {
        peer.groups.assign(groups.begin(), groups.begin() + size / sizeof(gid_t));
    }
    peer.groups.push_back(credentials.gid);
}

} // namespace

Listener::Listener(int descriptor, bool isUnixSocket)
    : descriptor_(descriptor), isUnixSocket_(isUnixSocket) {}

Listener::~Listener() {
    if (descriptor_ && !path_.empty()) {
        unlink(path_.c_str());
    }
}

Listener Listener::tcp(const std::string& address, bool allowRemote) {
    const auto [host, port] = split(address);
    addrinfo hints{};
    hints.ai_socktype = SOCK_STREAM;
    hints.ai_flags = AI_PASSIVE | AI_NUMERICSERV;
    addrinfo* list = nullptr;
    if (const int error = getaddrinfo(host.c_str(), port.c_str(), &hints, &list); error != 0) {
        throw ListenError("Cannot listen on " + address + ": " + gai_strerror(error) + ".");
    }
    const std::unique_ptr<addrinfo, decltype(&freeaddrinfo)> owner(list, freeaddrinfo);
    checkReach(address, list->ai_addr, list->ai_addrlen, allowRemote);
    Listener listener(openSocket(list->ai_family, address), false);
    const int on = 1;
    setsockopt(listener.descriptor(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    if (bind(listener.descriptor(), list->ai_addr, list->ai_addrlen) != 0 ||
        listen(listener.descriptor(), backlog) != 0) {
        throw ListenError(cannot("listen on", address).message);
    }
    return listener;
}

Listener Listener::unixSocket(const std::filesystem::path& path, const std::string& group) {
    std::error_code error;
    std::filesystem::create_directories(path.parent_path(), error);
    const sockaddr_un address = unixAddress(path);
    removeStale(path, address);
    Listener listener(openSocket(AF_UNIX, path), true);
    // With the right mode from the start, nobody can connect too early.
    const mode_t former = umask(0117);
    const int bound = bind(listener.descriptor(), generic(&address), sizeof address);
    const int reason = errno;
    umask(former);
    if (bound != 0) {
        throw ListenError(cannot("listen on", path, reason).message);
    }
    listener.path_ = path;
    listener.group_ = group;
    listener.shareWithGroup();
    if (listen(listener.descriptor(), backlog) != 0) {
        throw ListenError(cannot("listen on", path).message);
    }
    return listener;
}

bool Listener::shareWithGroup() {
    if (group_.empty()) {
        return true;
    }
    const auto group = groupNamed(group_);
    if (group) {
        giveToGroup(path_, group_, *group);
        group_.clear();
    }
    return group.has_value();
}

std::vector<Listener> Listener::inherited(bool allowRemote) {
    constexpr int firstDescriptor = 3;
    std::vector<Listener> listeners;
    const char* const process = std::getenv("LISTEN_PID"); // NOLINT(concurrency-mt-unsafe)
    const char* const count = std::getenv("LISTEN_FDS");   // NOLINT(concurrency-mt-unsafe)
    if (process == nullptr || count == nullptr || std::to_string(getpid()) != process) {
        return listeners;
    }
    const long descriptors = std::clamp(std::strtol(count, nullptr, 10), 0L, 64L);
    for (int descriptor = firstDescriptor; descriptor < firstDescriptor + descriptors; ++descriptor) {
        if (optionOf(descriptor, SO_ACCEPTCONN) == 0) {
            throw ListenError("The inherited descriptor " + std::to_string(descriptor) +
                              " is not a listening socket.");
        }
        fcntl(descriptor, F_SETFD, FD_CLOEXEC);
        fcntl(descriptor, F_SETFL, fcntl(descriptor, F_GETFL) | O_NONBLOCK);
        listeners.push_back(Listener(descriptor, familyOf(descriptor) == AF_UNIX));
        if (!listeners.back().isUnixSocket()) {
            const SocketName name = socketName(descriptor, getsockname);
            checkReach(listeners.back().name(), generic(&name.address), name.size, allowRemote);
        }
    }
    return listeners;
}

std::string Listener::name() const {
    if (isUnixSocket()) {
        const SocketName name = socketName(descriptor(), getsockname);
        sockaddr_un address{};
        std::memcpy(&address, &name.address, std::min(sizeof address, static_cast<std::size_t>(name.size)));
        return static_cast<const char*>(address.sun_path);
    }
    const auto [address, port] = nameOf(descriptor(), getsockname);
    const bool isVersion6 = address.find(':') != std::string::npos;
    return (isVersion6 ? "[" + address + "]" : address) + ":" + std::to_string(port);
}

unsigned short Listener::port() const {
    return isUnixSocket() ? static_cast<unsigned short>(0) : nameOf(descriptor(), getsockname).second;
}

Peer peerOf(int descriptor, bool isTls) {
    Peer peer;
    peer.isTls = isTls;
    peer.isUnixSocket = familyOf(descriptor) == AF_UNIX;
    if (peer.isUnixSocket) {
        peer.address = "local";
        readCredentials(descriptor, peer);
    } else {
        peer.address = nameOf(descriptor, getpeername).first;
        std::tie(peer.localAddress, peer.localPort) = nameOf(descriptor, getsockname);
    }
    return peer;
}

} // namespace velt::host
