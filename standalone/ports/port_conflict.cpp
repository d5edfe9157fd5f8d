#include "standalone/ports/port_conflict.h"

#include "platform/webapi.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"
#include "standalone/ports/known_services.h"
#include "standalone/ports/listening_sockets.h"
#include "standalone/ports/port_range.h"
#include "standalone/services/services.h"
#include "standalone/settings/settings.h"

#include <algorithm>
#include <cstdlib>
#include <optional>
#include <set>
#include <string_view>
#include <vector>

namespace velt {
namespace {

constexpr std::string_view ftpService = "ftp";
constexpr std::string_view sftpService = "ssh";
constexpr int highestPort = 65535;

thread_local std::string holder;

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

std::string portName(int port) {
    return "Port " + std::to_string(port);
}

std::optional<ConfiguredPorts> loadConfiguredPorts() {
    const auto ftp = loadFtpSettings();
    const auto sftp = loadSftpSettings();
    if (!ftp || !sftp) {
        return std::nullopt;
    }
    return ConfiguredPorts{std::atoi(ftp->record.portnum), passiveRangeOf(ftp->record), sftp->port};
}

/// What is wrong with the numbers themselves; "" when nothing is. Like the following: a sentence.
std::string conflictOfForm(const Question& question) {
    const auto& [first, last] = question.range;
    for (const int port : {first, last}) {
        if (port < 1 || port > highestPort) {
            return "The port " + std::to_string(port) + " is not one from 1 to " +
                   std::to_string(highestPort) + ".";
        }
    }
    if (first > last) {
        return "The range " + formatPortRange(question.range) + " is upside down.";
    }
    return "";
}

std::string conflictWithConfiguration(const Question& question, const ConfiguredPorts& ports) {
    if (question.service != sftpService && question.holds(ports.sftp)) {
        return portName(ports.sftp) + " is the port of the SFTP service.";
    }
    // A single port may be asked for by the FTP service since it is its control port; a range may not hold it.
    if (!(question.service == ftpService && question.isOnePort()) && question.holds(ports.ftpControl)) {
        return portName(ports.ftpControl) + " is the control port of the FTP service.";
    }
    const int passive = firstCommonPort(question.range, ports.ftpPassive);
    if (question.service != ftpService && passive != 0) {
        return portName(passive) + " is in the passive range " + formatPortRange(ports.ftpPassive) +
               " of the FTP service.";
    }
    return "";
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

/// Nothing, with the last error set, when the list of known services cannot be read.
std::optional<std::string> conflictWithKnownService(const Question& question, const ConfiguredPorts& ports) {
    const auto services = loadKnownServices();
    if (!services) {
        return std::nullopt;
    }
    for (const KnownService& service : *services) {
        if (service.name == question.service) {
            continue;
        }
        const int first = firstCommonPort(question.range, {service.firstPort, service.lastPort});
        const int last = std::min(question.range.last, service.lastPort);
        for (int port = first; port != 0 && port <= last; ++port) {
            if (!isOwnPort(question, ports, port)) {
                return portName(port) + " is kept for the service " + service.name + ".";
            }
        }
    }
    return "";
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

std::string conflictWithListener(const Question& question, const ConfiguredPorts& ports) {
    std::vector<ListeningSocket> sockets = listeningSockets();
    std::erase_if(sockets, [&](const ListeningSocket& socket) {
        return !question.holds(socket.port) || isOwnPort(question, ports, socket.port);
    });
    if (sockets.empty()) {
        return "";
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
            return portName(socket.port) + " is in use by " + describeOwner(found) + ".";
        }
    }
    return "";
}

/// The first conflict as a sentence, "" when there is none; nothing, with the last error set, when it cannot be found out.
std::optional<std::string> findConflict(const Question& question) {
    std::string conflict = conflictOfForm(question);
    if (!conflict.empty()) {
        return conflict;
    }
    const auto ports = loadConfiguredPorts();
    if (!ports) {
        return std::nullopt;
    }
    conflict = conflictWithConfiguration(question, *ports);
    if (!conflict.empty()) {
        return conflict;
    }
    auto known = conflictWithKnownService(question, *ports);
    if (!known || !known->empty()) {
        return known;
    }
    return conflictWithListener(question, *ports);
}

} // namespace

const std::string& lastPortHolder() {
    return holder;
}

} // namespace velt

namespace WebUtils {

int IsPortConflict(const char* service, int firstPort, int lastPort) {
    velt::holder.clear();
    const int result = velt::atBoundary([&] {
        const auto conflict = velt::findConflict({service == nullptr ? "" : service, {firstPort, lastPort}});
        if (!conflict) {
            return -1;
        }
        velt::holder = *conflict;
        return conflict->empty() ? 0 : velt::fail(velt::ErrorNumber::portTaken, *conflict);
    });
    // A question that cannot be answered is no permission to take the port.
    if (result < 0 && velt::holder.empty()) {
        velt::holder = velt::lastErrorSentence();
    }
    return result == 0 ? 0 : 1;
}

} // namespace WebUtils
