#include "standalone/control/port_conflict.h"

#include "standalone/control/services.h"
#include "standalone/core/last_error.h"
#include "standalone/ports/known_services.h"
#include "standalone/ports/port_range.h"
#include "standalone/process/listening_sockets.h"
#include "standalone/settings/settings.h"

#include <algorithm>
#include <optional>
#include <set>
#include <string_view>
#include <vector>

namespace velt {
namespace {

constexpr std::string_view ftpService = "ftp";
constexpr std::string_view sftpService = "ssh";
constexpr int highestPort = 65535;

/// A port that the service cannot have. What is wrong with the numbers alone has no holder.
struct Conflict {
    PortConflict found;
    std::string sentence;
};

thread_local PortConflict lastConflict;

/// The ports that belong to a service of ours by the stored settings.
struct ConfiguredPorts {
    int ftpControl = 0;
    VELT_FTP_PORT_RANGE ftpPassive{};
    int sftp = 0;
};

struct Question {
    std::string_view service;
    VELT_FTP_PORT_RANGE range;

    bool holds(int port) const { return range.first <= port && port <= range.last; }
    bool isOnePort() const { return range.first == range.last; }
};

bool contains(const VELT_FTP_PORT_RANGE& range, int port) {
    return range.first <= port && port <= range.last;
}

/// The first port that both ranges have; 0 when they have none.
int firstCommonPort(const VELT_FTP_PORT_RANGE& one, const VELT_FTP_PORT_RANGE& other) {
    const int first = std::max(one.first, other.first);
    return first <= std::min(one.last, other.last) ? first : 0;
}

Conflict heldBy(int port, const std::string& holder) {
    return {{port, holder}, "Port " + std::to_string(port) + " is taken by " + holder + "."};
}

std::optional<ConfiguredPorts> loadConfiguredPorts() {
    const auto ftp = orLastError(loadFtpSettings());
    const auto sftp = orLastError(loadSftpSettings());
    if (!ftp || !sftp) {
        return std::nullopt;
    }
    return ConfiguredPorts{controlPort(ftp->record), passiveRange(ftp->record), sftp->port};
}

std::optional<Conflict> conflictOfForm(const Question& question) {
    const VELT_FTP_PORT_RANGE& range = question.range;
    for (const int port : {range.first, range.last}) {
        if (port < 1 || port > highestPort) {
            return Conflict{{port, ""},
                            "The port " + std::to_string(port) + " is not one from 1 to " +
                                std::to_string(highestPort) + "."};
        }
    }
    if (range.first > range.last) {
        return Conflict{{range.first, ""}, "The range " + formatPortRange(range) + " is upside down."};
    }
    return std::nullopt;
}

std::optional<Conflict> conflictWithConfiguration(const Question& question, const ConfiguredPorts& ports) {
    if (question.service != sftpService && question.holds(ports.sftp)) {
        return heldBy(ports.sftp, "the SFTP service");
    }
    // A single port may be asked for by the FTP service since it is its control port; a range may not hold
    // it.
    if (!(question.service == ftpService && question.isOnePort()) && question.holds(ports.ftpControl)) {
        return heldBy(ports.ftpControl, "the control connections of the FTP service");
    }
    const int passive = firstCommonPort(question.range, ports.ftpPassive);
    if (question.service != ftpService && passive != 0) {
        return heldBy(passive,
                      "the passive range " + formatPortRange(ports.ftpPassive) + " of the FTP service");
    }
    return std::nullopt;
}

/// Whether the asking service has the port already, so that nobody else is asked about it.
bool isOwnPort(const Question& question, const ConfiguredPorts& ports, int port) {
    if (question.service == sftpService) {
        return port == ports.sftp;
    }
    if (question.service != ftpService) {
        return false;
    }
    return question.isOnePort() ? port == ports.ftpControl : contains(ports.ftpPassive, port);
}

std::optional<Conflict> conflictWithKnownService(const Question& question, const ConfiguredPorts& ports,
                                                 const std::vector<KnownService>& services) {
    for (const KnownService& service : services) {
        if (service.name == question.service) {
            continue;
        }
        const int first = firstCommonPort(question.range, {service.firstPort, service.lastPort});
        const int last = std::min(question.range.last, service.lastPort);
        for (int port = first; port != 0 && port <= last; ++port) {
            if (!isOwnPort(question, ports, port)) {
                return heldBy(port, "the service " + service.name + " of this server");
            }
        }
    }
    return std::nullopt;
}

/// The daemon of the asking service and its sessions, some of which listen on passive ports.
std::vector<ProcessId> ownProcesses(const Question& question) {
    if (question.service != ftpService && question.service != sftpService) {
        return {};
    }
    const ServiceState state = serviceState(question.service == ftpService ? "ftpd" : "sftp");
    std::vector<ProcessId> roots = state.sessions;
    roots.push_back(state.daemon);
    roots.push_back(state.supervisor);
    return livingTrees(roots);
}

std::optional<Conflict> conflictWithListener(const Question& question, const ConfiguredPorts& ports) {
    std::vector<ListeningSocket> sockets = listeningSockets();
    // A stored passive range may have a port less, since each session takes one that is free. A daemon's own
    // port must be free, also when it is the stored one: the service may have been off.
    const auto canDoWithout = [&](int port) {
        return !question.isOnePort() && isOwnPort(question, ports, port);
    };
    std::erase_if(sockets, [&](const ListeningSocket& socket) {
        return !question.holds(socket.port) || canDoWithout(socket.port);
    });
    if (sockets.empty()) {
        return std::nullopt;
    }
    const auto owners = ownersOf(sockets);
    std::set<pid_t> own;
    for (const ProcessId& process : ownProcesses(question)) {
        own.insert(process.pid);
    }
    for (const ListeningSocket& socket : sockets) {
        const auto owner = owners.find(socket.inode);
        const SocketOwner found = owner == owners.end() ? SocketOwner{} : owner->second;
        if (own.count(found.pid) == 0) {
            return heldBy(socket.port, describeOwner(found));
        }
    }
    return std::nullopt;
}

/// 0 when there is none; else negative, with the last error set and the conflict remembered.
int findConflict(const Question& question) {
    const auto report = [](const Conflict& conflict) {
        lastConflict = conflict.found;
        return fail(ErrorNumber::portTaken, conflict.sentence);
    };
    if (const auto conflict = conflictOfForm(question)) {
        return report(*conflict);
    }
    const auto ports = loadConfiguredPorts();
    const auto services = orLastError(loadKnownServices());
    if (!ports || !services) {
        return -1; // a question that cannot be answered is no permission to take the port
    }
    if (const auto conflict = conflictWithConfiguration(question, *ports)) {
        return report(*conflict);
    }
    if (const auto conflict = conflictWithKnownService(question, *ports, *services)) {
        return report(*conflict);
    }
    const auto conflict = conflictWithListener(question, *ports);
    return conflict ? report(*conflict) : 0;
}

} // namespace

PortConflict lastPortConflict() {
    return lastConflict;
}

int findPortConflict(std::string_view service, int firstPort, int lastPort) {
    lastConflict = {};
    return findConflict({service, {firstPort, lastPort}});
}

} // namespace velt
