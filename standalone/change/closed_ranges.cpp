#include "standalone/change/closed_ranges.h"

#include "standalone/control/supervised_daemon.h"
#include "standalone/daemons/daemon.h"
#include "standalone/firewall/firewall_settings.h"
#include "standalone/ports/port_range.h"
#include "standalone/supervise/daemon_state.h"

#include <algorithm>

namespace velt {
namespace {

bool isRange(const VELT_FTP_PORT_RANGE& ports) {
    return ports.first != ports.last; // one port alone is a listener's
}

bool has(const OpenPorts& all, const VELT_FTP_PORT_RANGE& ports) {
    return std::ranges::any_of(all, [&](const VELT_FTP_PORT_RANGE& each) {
        return each.first == ports.first && each.last == ports.last;
    });
}

/// Sessions of FTP that the change lets go on.
int keptSessions(const std::vector<ProgramStep>& program) {
    int kept = static_cast<int>(sessionsOf(daemonState(ftpDaemon)).size());
    for (const ProgramStep& each : program) {
        kept -= each.step && each.step->subject == ftpDaemon.apiName ? each.sessionsEnded : 0;
    }
    return kept;
}

} // namespace

bool rulesCloseOthers() {
    const auto firewall = loadFirewallSettings();
    return !firewall || firewall->mode == FirewallMode::drop;
}

std::vector<std::string> closedRangeWarnings(const StagedRequest& request,
                                             const std::vector<ProgramStep>& program) {
    const auto closed = std::ranges::find_if(request.openBefore, [&](const VELT_FTP_PORT_RANGE& each) {
        return isRange(each) && !has(request.openAfter, each);
    });
    const int kept = keptSessions(program);
    if (closed == request.openBefore.end() || kept <= 0 || !rulesCloseOthers()) {
        return {};
    }
    const bool one = kept == 1;
    return {std::to_string(kept) + (one ? " open session of FTP keeps" : " open sessions of FTP keep") +
            " the passive ports " + formatPortRange(*closed) +
            ", which the firewall closes: " + (one ? "its" : "their") + " next transfers fail."};
}

} // namespace velt
