#include "standalone/control/port_conflict.h"

#include "schema/settings_table.h"
#include "standalone/control/intended_ports.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/ports/known_services.h"
#include "standalone/ports/port_range.h"
#include "standalone/process/listening_sockets.h"

#include <algorithm>
#include <optional>
#include <set>
#include <string_view>
#include <vector>

namespace velt {
namespace {

struct Question {
    std::string_view service;
    VELT_FTP_PORT_RANGE range;
    const Daemon* daemon; ///< the service's, when it is one of ours

    bool isOnePort() const { return range.first == range.last; }
};

/// What the settings give to a daemon.
struct Claim {
    const Daemon* daemon;
    DaemonPorts ports;
};

bool contains(const VELT_FTP_PORT_RANGE& range, int port) {
    return range.first <= port && port <= range.last;
}

/// The first port that both ranges have; 0 when they have none.
int firstCommonPort(const VELT_FTP_PORT_RANGE& one, const VELT_FTP_PORT_RANGE& other) {
    const int first = std::max(one.first, other.first);
    return first <= std::min(one.last, other.last) ? first : 0;
}

PortConflict heldBy(int port, const std::string& holder) {
    return {port, holder, "Port " + std::to_string(port) + " is taken by " + holder + "."};
}

Result<std::vector<DaemonPorts>> storedPorts(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(auto settings, daemon.settings());
    return std::move(settings.ports);
}

Result<std::vector<Claim>> loadClaims(Result<std::vector<DaemonPorts>> (*portsOf)(const Daemon&)) {
    std::vector<Claim> claims;
    for (const Daemon* daemon : allDaemons()) {
        VELT_ASSIGN_OR_RETURN(const auto all, portsOf(*daemon));
        for (const DaemonPorts& ports : all) {
            claims.push_back({daemon, ports});
        }
    }
    return claims;
}

std::optional<PortConflict> conflictOfForm(const Question& question) {
    const VELT_FTP_PORT_RANGE& range = question.range;
    for (const int port : {range.first, range.last}) {
        if (port < 1 || port > schema::highestPort) {
            return PortConflict{port, "",
                                "Port " + std::to_string(port) + ": expected a port from 1 to " +
                                    std::to_string(schema::highestPort) + "."};
        }
    }
    if (range.first > range.last) {
        return PortConflict{range.first, "",
                            "The port range is " + formatPortRange(range) +
                                "; its first port has to be lower than its last."};
    }
    return std::nullopt;
}

/// Whether the claim is the asking service's own and may overlap with what it asks for. A single port may be
/// asked for since the daemon listens on it; a range for the sessions may not hold that port.
bool mayOverlap(const Question& question, const Claim& claim) {
    return claim.daemon == question.daemon && (claim.ports.ofSessions || question.isOnePort());
}

std::optional<PortConflict> conflictWithConfiguration(const Question& question,
                                                      const std::vector<Claim>& claims) {
    for (const Claim& claim : claims) {
        const int port = firstCommonPort(question.range, claim.ports.range);
        if (port != 0 && !mayOverlap(question, claim)) {
            return heldBy(port, claim.ports.use);
        }
    }
    return std::nullopt;
}

/// Whether the asking service has the port already, so that nobody else is asked about it.
bool isOwnPort(const Question& question, const std::vector<Claim>& claims, int port) {
    return std::ranges::any_of(claims, [&](const Claim& claim) {
        return claim.daemon == question.daemon && claim.ports.ofSessions != question.isOnePort() &&
               contains(claim.ports.range, port);
    });
}

std::optional<PortConflict> conflictWithKnownService(const Question& question,
                                                     const std::vector<Claim>& claims,
                                                     const std::vector<KnownService>& services) {
    for (const KnownService& service : services) {
        if (service.name == question.service) {
            continue;
        }
        const int first = firstCommonPort(question.range, {service.firstPort, service.lastPort});
        const int last = std::min(question.range.last, service.lastPort);
        for (int port = first; port != 0 && port <= last; ++port) {
            if (!isOwnPort(question, claims, port)) {
                // Whether it listens or not.
                const std::string owner = "the service " + service.name + " of this server";
                return PortConflict{port, owner,
                                    "Port " + std::to_string(port) + " is reserved for " + owner + "."};
            }
        }
    }
    return std::nullopt;
}

/// The daemon of the asking service and its sessions, some of which listen on ports of their own.
std::set<pid_t> ownProcesses(const Question& question) {
    std::set<pid_t> own;
    if (question.daemon != nullptr) {
        const DaemonState state = daemonState(*question.daemon);
        std::vector<ProcessId> roots = state.sessions;
        roots.push_back(state.daemon);
        roots.push_back(state.supervisor);
        for (const ProcessId& process : livingTrees(roots)) {
            own.insert(process.pid);
        }
    }
    return own;
}

Result<std::optional<PortConflict>> conflictWithListener(const Question& question,
                                                         const std::vector<Claim>& claims) {
    VELT_ASSIGN_OR_RETURN(auto sockets, listeningSockets());
    // A stored passive range may have a port less, since each session takes one that is free. A daemon's own
    // port must be free, also when it is the stored one: the service may have been off.
    const auto canDoWithout = [&](int port) {
        return !question.isOnePort() && isOwnPort(question, claims, port);
    };
    std::erase_if(sockets, [&](const ListeningSocket& socket) {
        return !contains(question.range, socket.port) || canDoWithout(socket.port) ||
               (question.daemon != nullptr && isGivenUp(socket.port, *question.daemon));
    });
    if (sockets.empty()) {
        return std::optional<PortConflict>();
    }
    const auto owners = ownersOf(sockets);
    const auto own = ownProcesses(question);
    for (const ListeningSocket& socket : sockets) {
        const auto owner = owners.find(socket.inode);
        const SocketOwner found = owner == owners.end() ? SocketOwner{} : owner->second;
        if (!own.contains(found.pid)) {
            return std::optional(heldBy(socket.port, describeOwner(found)));
        }
    }
    return std::optional<PortConflict>();
}

} // namespace

Result<std::optional<PortConflict>> findPortConflict(std::string_view service, int firstPort, int lastPort) {
    const auto rows = allDaemons();
    const auto row = std::ranges::find(rows, service, &Daemon::portName);
    const Question question{service, {firstPort, lastPort}, row == rows.end() ? nullptr : *row};
    if (auto conflict = conflictOfForm(question)) {
        return conflict;
    }
    // What is intended counts as the others' already; what the asking service has, it has by what is stored.
    VELT_ASSIGN_OR_RETURN(const auto intended, loadClaims(portsToBe));
    VELT_ASSIGN_OR_RETURN(const auto stored, loadClaims(storedPorts));
    VELT_ASSIGN_OR_RETURN(const auto services, loadKnownServices());
    if (auto conflict = conflictWithConfiguration(question, intended)) {
        return conflict;
    }
    if (auto conflict = conflictWithKnownService(question, stored, services)) {
        return conflict;
    }
    return conflictWithListener(question, stored);
}

} // namespace velt
