#include "standalone/control/open_sessions.h"

#include "standalone/activity/session_pages.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/daemons/daemon.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <thread>

namespace velt {
namespace {

/// A session that ends by itself says how much it has moved; one that is killed said so a second ago.
constexpr std::chrono::milliseconds patience{800};

/// The hashes of the settings in force.
struct InForce {
    std::string ftp = daemonState(ftpDaemon).configurationHash;
    std::string sftp = daemonState(sftpDaemon).configurationHash;
};

OpenSession describe(const SessionName& name, const velt_session_page& page, const InForce& inForce) {
    OpenSession session;
    session.id = name.text;
    session.protocol = static_cast<SessionProtocol>(std::min<std::uint32_t>(page.protocol, velt_sftp));
    session.security = fieldText(page.security);
    session.user = fieldText(page.user);
    session.account = fieldText(page.account);
    session.address = fieldText(page.address);
    session.since = pageTime(page.since);
    session.idleSince = pageTime(page.active);
    session.busy = page.busy != 0;
    session.command = fieldText(page.command);
    session.path = fieldText(page.path);
    session.octetsIn = page.octets_in;
    session.octetsOut = page.octets_out;
    session.rate = page.rate;
    const std::string& hash = session.protocol == SessionProtocol::sftp ? inForce.sftp : inForce.ftp;
    session.current = fieldText(page.configuration) == hash;
    return session;
}

void addTransfer(const velt_session_page& page, OpenSession& session) {
    if (page.transfer != velt_upload && page.transfer != velt_download) {
        return;
    }
    const bool upload = page.transfer == velt_upload;
    (upload ? session.octetsIn : session.octetsOut) += page.transfer_octets;
    session.transfer = RunningTransfer{upload, fieldText(page.transfer_path), page.transfer_octets,
                                       pageTime(page.transfer_since)};
}

bool isOfThisBoot(const SessionName& name) {
    return bootId().starts_with(name.boot);
}

} // namespace

Result<std::vector<OpenSession>> openSessions() {
    const InForce inForce;
    std::vector<OpenSession> sessions;
    VELT_RETURN_IF_ERROR(visitSessionPages([&](const SessionName& name, const velt_session_page& page) {
        sessions.push_back(describe(name, page, inForce));
        addTransfer(page, sessions.back());
    }));
    std::ranges::sort(sessions, {}, [](const OpenSession& each) { return std::pair(each.since, each.id); });
    return sessions;
}

Result<bool> endSession(const std::string& id, const SessionEnd& end) {
    const auto name = parseSessionName(id);
    if (!name || !isOfThisBoot(*name) || !isAlive(name->process)) {
        return false;
    }
    VELT_ASSIGN_OR_RETURN(const bool noted, noteSessionEnd(*name, end.by, end.reason));
    if (!noted) {
        return false;
    }
    if (!endTrees({name->process}, patience)) {
        return Error("The session " + id + " does not end: a process of it hangs in the kernel.");
    }
    // One that had to be killed could not record its end.
    VELT_RETURN_IF_ERROR(visitSessionPages([](const SessionName&, const velt_session_page&) {}));
    return true;
}

} // namespace velt
