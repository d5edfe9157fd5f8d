#include "standalone/process/listening_sockets.h"

#include "base/file.h"
#include "base/text.h"
#include "standalone/process/process_identity.h"
#include "standalone/process/socket_diagnosis.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <filesystem>
#include <fstream>
#include <optional>
#include <set>
#include <sstream>
#include <string_view>

namespace velt {
namespace {

constexpr std::string_view listenState = "0A";

/// Whether the address, as the kernel's tables have it, is 127.x.x.x or ::1. The bytes of each group of four
/// stand in the machine's order.
bool isLoopback(std::string_view address) {
    constexpr std::size_t ipv4Length = 8;
    constexpr std::string_view ipv6 = "00000000000000000000000001000000";
    constexpr std::string_view mapped = "0000000000000000FFFF0000";
    if (address.size() > ipv4Length && address.starts_with(mapped)) {
        address.remove_prefix(mapped.size());
    }
    return address == ipv6 || (address.size() == ipv4Length && address.ends_with("7F"));
}

// A kernel without IPv6 has no table of it.
Result<> addSockets(const std::string& table, std::vector<ListeningSocket>& sockets) {
    VELT_ASSIGN_OR_RETURN(const auto text, readOptionalFile(table));
    std::string_view lines = text ? std::string_view(*text) : std::string_view();
    cut(lines, '\n'); // the heading
    while (!lines.empty()) {
        std::istringstream fields{std::string(cut(lines, '\n'))};
        std::string slot;
        std::string local;
        std::string remote;
        std::string state;
        fields >> slot >> local >> remote >> state;
        if (!fields || state != listenState) {
            continue;
        }
        std::string skipped;
        ListeningSocket socket;
        for (int field = 0; field < 3; ++field) { // queues, timer, retransmissions
            fields >> skipped;
        }
        fields >> socket.user >> skipped >> socket.inode; // a timeout between them
        const auto colon = local.rfind(':');
        if (!fields || colon == std::string::npos) {
            continue;
        }
        std::from_chars(local.data() + colon + 1, local.data() + local.size(), socket.port, 16);
        socket.ofLoopback = isLoopback(std::string_view(local).substr(0, colon));
        sockets.push_back(socket);
    }
    return {};
}

/// Whether the process is seen to live in the network of the calling thread.
bool sharesNetwork(pid_t pid) {
    struct stat own {};
    struct stat its {};
    return ::stat("/proc/thread-self/ns/net", &own) == 0 &&
           ::stat(("/proc/" + std::to_string(pid) + "/ns/net").c_str(), &its) == 0 &&
           own.st_dev == its.st_dev && own.st_ino == its.st_ino;
}

/// The inode of the socket behind an entry of /proc/PID/fd.
std::optional<unsigned long> socketInode(const std::filesystem::path& entry) {
    constexpr std::string_view prefix = "socket:[";
    std::array<char, 64> buffer{};
    const ssize_t length = ::readlink(entry.c_str(), buffer.data(), buffer.size());
    if (length <= 0) {
        return std::nullopt;
    }
    const std::string_view target(buffer.data(), static_cast<size_t>(length));
    if (!target.starts_with(prefix)) {
        return std::nullopt;
    }
    unsigned long inode = 0;
    std::from_chars(target.data() + prefix.size(), target.data() + target.size(), inode);
    return inode;
}

std::set<unsigned long> socketsHeldBy(pid_t pid) {
    std::set<unsigned long> inodes;
    std::error_code error;
    const std::filesystem::path folder = "/proc/" + std::to_string(pid) + "/fd";
    for (std::filesystem::directory_iterator entry(folder, error), end; !error && entry != end;
         entry.increment(error)) {
        if (const auto inode = socketInode(entry->path())) {
            inodes.insert(*inode);
        }
    }
    return inodes;
}

/// Whether the process hides its sockets from this one: those that have changed their rights show them to
/// root alone, an FTP daemon among them that runs as the same user.
bool hidesItsSockets(pid_t pid) {
    const std::string folder = "/proc/" + std::to_string(pid) + "/fd";
    return ::access(folder.c_str(), R_OK) != 0 && errno == EACCES;
}

std::optional<uid_t> userOf(pid_t pid) {
    std::ifstream file("/proc/" + std::to_string(pid) + "/status");
    std::string key;
    while (file >> key) {
        uid_t real = 0;
        uid_t effective = 0;
        if (key == "Uid:" && file >> real >> effective) {
            return effective;
        }
        std::getline(file, key);
    }
    return std::nullopt;
}

std::string programOf(pid_t pid) {
    std::ifstream file("/proc/" + std::to_string(pid) + "/comm");
    std::string name;
    std::getline(file, name);
    return name;
}

} // namespace

Result<std::vector<ListeningSocket>> listeningSockets(pid_t pid) {
    if (pid == 0 || sharesNetwork(pid)) {
        if (auto diagnosed = diagnoseListeningSockets()) {
            return *std::move(diagnosed);
        }
    }
    return readListeningSockets(pid);
}

Result<std::vector<ListeningSocket>> readListeningSockets(pid_t pid) {
    // "/proc/net" is the calling process's own; a thread could live in another namespace than its process.
    const std::string folder = pid == 0 ? "/proc/thread-self/net" : "/proc/" + std::to_string(pid) + "/net";
    std::vector<ListeningSocket> sockets;
    VELT_RETURN_IF_ERROR(addSockets(folder + "/tcp", sockets));
    VELT_RETURN_IF_ERROR(addSockets(folder + "/tcp6", sockets));
    return sockets;
}

bool listensOn(pid_t pid, int port) {
    std::vector<ListeningSocket> sockets = listeningSockets(pid).valueOr({});
    std::erase_if(sockets, [port](const ListeningSocket& socket) { return socket.port != port; });
    if (sockets.empty()) {
        return false;
    }
    if (hidesItsSockets(pid)) {
        const auto user = userOf(pid);
        return std::any_of(sockets.begin(), sockets.end(),
                           [user](const ListeningSocket& socket) { return user == socket.user; });
    }
    const std::set<unsigned long> held = socketsHeldBy(pid);
    return std::any_of(sockets.begin(), sockets.end(),
                       [&held](const ListeningSocket& socket) { return held.count(socket.inode) > 0; });
}

std::map<unsigned long, SocketOwner> ownersOf(const std::vector<ListeningSocket>& sockets) {
    std::set<unsigned long> wanted;
    for (const ListeningSocket& socket : sockets) {
        wanted.insert(socket.inode);
    }
    std::map<unsigned long, SocketOwner> owners;
    if (wanted.empty()) {
        return owners;
    }
    for (const pid_t pid : allPids()) {
        for (const unsigned long inode : socketsHeldBy(pid)) {
            if (wanted.count(inode) > 0 && owners.count(inode) == 0) {
                owners[inode] = {pid, programOf(pid)};
            }
        }
    }
    return owners;
}

std::string describeOwner(const SocketOwner& owner) {
    if (owner.pid == 0) {
        return "another program";
    }
    return owner.program + " (process " + std::to_string(owner.pid) + ")";
}

} // namespace velt
