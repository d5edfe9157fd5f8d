#include "base/file.h"
#include "base/ipv4.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/health/checks.h"
#include "standalone/ports/port_range.h"
#include "standalone/process/listening_sockets.h"
#include "standalone/settings/settings.h"

#include <algorithm>
#include <optional>
#include <set>
#include <sstream>

namespace velt {
namespace {

/// Beside so many ports, those that the kernel takes for outgoing connections do not matter.
constexpr int roomyRange = 16;

constexpr const char* moveRange = "veltctl ftp set custom_port_range=on custom_port=FIRST:LAST";

bool contains(const VELT_FTP_PORT_RANGE& range, int port) {
    return port >= range.first && port <= range.last;
}

/// Passive ports are taken for a moment by sessions of ours.
bool isOurs(pid_t pid) {
    const DaemonState state = daemonState(ftpDaemon);
    return std::ranges::any_of(livingTrees({state.supervisor, state.daemon}),
                               [pid](const ProcessId& each) { return each.pid == pid; });
}

std::optional<VELT_FTP_PORT_RANGE> kernelsRange() {
    const auto text = readFile("/proc/sys/net/ipv4/ip_local_port_range");
    std::istringstream numbers(text.valueOr(""));
    VELT_FTP_PORT_RANGE range{};
    numbers >> range.first >> range.last;
    return numbers ? std::optional(range) : std::nullopt;
}

void addListeners(const VELT_FTP_PORT_RANGE& passive, Findings& findings) {
    std::vector<ListeningSocket> sockets = listeningSockets().valueOr({});
    std::erase_if(sockets, [&](const ListeningSocket& each) { return !contains(passive, each.port); });
    const auto owners = ownersOf(sockets);
    std::set<int> named;
    for (const ListeningSocket& socket : sockets) {
        const auto owner = owners.find(socket.inode);
        // One that cannot be seen may be a session that has changed its rights.
        if (owner == owners.end() || isOurs(owner->second.pid) || !named.insert(socket.port).second) {
            continue;
        }
        findings.push_back({"passive-port-taken", Severity::warning, "ftp",
                            describeOwner(owner->second) + " listens on port " + std::to_string(socket.port) +
                                ", in the passive range " + formatPortRange(passive) + " of FTP.",
                            moveRange});
    }
}

/// Those that are for use within a site.
bool isPrivate(const IPv4Address& address) {
    constexpr int firstOf172 = 16;
    constexpr int lastOf172 = 31;
    return address[0] == 10 || (address[0] == 192 && address[1] == 168) ||
           (address[0] == 172 && address[1] >= firstOf172 && address[1] <= lastOf172);
}

} // namespace

Findings passiveRangeFindings() {
    const auto settings = loadFtpSettings();
    if (!settings || !enablesFtp(settings->record)) {
        return {};
    }
    const VELT_FTP_PORT_RANGE passive = passiveRange(settings->record);
    Findings findings;
    addListeners(passive, findings);
    const auto kernels = kernelsRange();
    const bool within = kernels && passive.first >= kernels->first && passive.last <= kernels->last;
    if (within && passive.last - passive.first + 1 < roomyRange) {
        findings.push_back({"passive-range-small", Severity::notice, "ftp",
                            "The passive range " + formatPortRange(passive) +
                                " is small, and lies within the ports that this server uses for outgoing "
                                "connections, " +
                                formatPortRange(*kernels) + ".",
                            moveRange});
    }
    return findings;
}

Findings externalAddressFindings() {
    const auto settings = loadFtpSettings();
    if (!settings || !enablesFtp(settings->record) || settings->record.use_ext_ip == 0) {
        return {};
    }
    const std::string change = "veltctl ftp set ext_ip=ADDRESS";
    if (settings->externalAddress.empty()) {
        return {{"external-address-missing", Severity::notice, "ftp",
                 "FTP is to give its clients the external address, but there is none: it gives them the "
                 "address that they connect to.",
                 change}};
    }
    if (const auto checked = checkExternalAddress(settings->externalAddress); !checked) {
        return {{"external-address-unreachable", Severity::error, "ftp", checked.error().message, change}};
    }
    const auto address = parseIPv4(settings->externalAddress);
    if (address && isPrivate(*address)) {
        return {{"external-address-private", Severity::notice, "ftp",
                 "The external address " + settings->externalAddress +
                     " is a private one, so that clients outside of that network cannot transfer files.",
                 change}};
    }
    return {};
}

} // namespace velt
