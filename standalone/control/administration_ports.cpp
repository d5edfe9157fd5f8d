#include "standalone/control/administration_ports.h"

#include "base/file.h"
#include "base/number_text.h"
#include "base/text.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/state_root.h"
#include "standalone/process/listening_sockets.h"

#include <algorithm>
#include <filesystem>
#include <set>
#include <sstream>

namespace velt {
namespace {

constexpr int usualSshPort = 22;
constexpr int highestPort = 65535;
constexpr std::string_view sshConfiguration = "/etc/ssh/sshd_config";
constexpr std::string_view sshConfigurationFolder = "/etc/ssh/sshd_config.d";
constexpr std::string_view sshAtBoot = "/etc/systemd/system/multi-user.target.wants/ssh.service";

/// What our daemons have: one of them is an OpenSSH, too, and during a change it listens on a port that is
/// none of its own any more.
struct Own {
    std::set<pid_t> processes;
    std::set<int> ports;
};

Own ownListeners() {
    Own own;
    for (const Daemon* daemon : allDaemons()) {
        const DaemonState state = daemonState(*daemon);
        for (const ProcessId& each : livingTrees({state.supervisor, state.daemon})) {
            own.processes.insert(each.pid);
        }
        own.ports.insert(state.ports.begin(), state.ports.end());
    }
    return own;
}

/// The program by which the listener lets administrators in; "" for another one. Who owns a socket is hidden
/// from a process without the right to look into others.
std::string administratorsProgram(const ListeningSocket& socket, const SocketOwner& owner, const Own& own) {
    const bool isUsual = socket.port == usualSshPort && socket.user == 0;
    if (owner.pid == 0) {
        return isUsual && !own.ports.contains(socket.port) ? "sshd" : "";
    }
    // systemd listens in the place of an OpenSSH that it starts for each connection.
    const bool administers =
        owner.program == "sshd" || owner.program == "veltd" || (owner.program == "systemd" && isUsual);
    return administers && !own.processes.contains(owner.pid) ? owner.program : "";
}

Result<> addListeners(std::vector<AdministrationPort>& found) {
    VELT_ASSIGN_OR_RETURN(auto sockets, listeningSockets());
    std::erase_if(sockets, &ListeningSocket::ofLoopback);
    const auto owners = ownersOf(sockets);
    const Own own = ownListeners();
    for (const ListeningSocket& socket : sockets) {
        const auto owner = owners.find(socket.inode);
        const std::string program =
            administratorsProgram(socket, owner == owners.end() ? SocketOwner() : owner->second, own);
        if (!program.empty()) {
            found.push_back({socket.port, program});
        }
    }
    return {};
}

std::vector<int> configuredSshPorts() {
    std::vector<int> ports = portsOfSshConfiguration(readFile(sshConfiguration).valueOr(""));
    std::error_code ignored;
    for (std::filesystem::directory_iterator entry(sshConfigurationFolder, ignored), end;
         !ignored && entry != end; entry.increment(ignored)) {
        if (entry->path().extension() == ".conf") {
            const auto further = portsOfSshConfiguration(readFile(entry->path()).valueOr(""));
            ports.insert(ports.end(), further.begin(), further.end());
        }
    }
    return ports.empty() ? std::vector{usualSshPort} : ports;
}

} // namespace

std::vector<int> portsOfSshConfiguration(std::string_view text) {
    std::vector<int> ports;
    while (!text.empty()) {
        std::istringstream words(std::string(cut(text, '\n')));
        std::string key;
        std::string value;
        words >> key >> value;
        const auto port = parseNumber(value);
        if (lowerCase(key) == "match") {
            break; // no port can stand below one
        }
        if (lowerCase(key) == "port" && port && *port > 0 && *port <= highestPort) {
            ports.push_back(static_cast<int>(*port));
        }
    }
    return ports;
}

Result<std::vector<AdministrationPort>> administrationPorts() {
    std::vector<AdministrationPort> found;
    VELT_RETURN_IF_ERROR(addListeners(found));
    // Only the machine's own installation is there at its boot.
    if (statePath("/") == "/" && fileExists(sshAtBoot)) {
        for (const int port : configuredSshPorts()) {
            found.push_back({port, "sshd"});
        }
    }
    std::ranges::sort(found, {}, &AdministrationPort::port);
    const auto samePort = [](const AdministrationPort& one, const AdministrationPort& other) {
        return one.port == other.port;
    };
    found.erase(std::unique(found.begin(), found.end(), samePort), found.end());
    return found;
}

} // namespace velt
