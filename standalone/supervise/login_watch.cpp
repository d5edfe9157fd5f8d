#include "standalone/supervise/login_watch.h"

#include "base/turn_queue.h"
#include "standalone/bans/failed_login.h"
#include "standalone/bans/failure_counter.h"
#include "standalone/bans/login_guard.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <syslog.h>

#include <csignal>
#include <exception>

namespace velt {
namespace {

using Reader = std::optional<IpNetwork> (*)(std::string_view message);

void count(const std::string& service, const std::string& address) {
    try {
        noteFailedLogin(service, address);
    } catch (const std::exception& error) { // the daemon matters more
        ::syslog(LOG_ERR, "cannot count a failed login: %s", error.what());
    }
}

/// A queue whose thread leaves all signals to the supervisor's own.
TurnQueue* startCounting(const std::string& service) {
    sigset_t all;
    sigset_t former;
    ::sigfillset(&all);
    ::pthread_sigmask(SIG_SETMASK, &all, &former);
    auto* const failures =
        new TurnQueue([service](const std::string& address) { count(service, address); }, {});
    ::pthread_sigmask(SIG_SETMASK, &former, nullptr);
    return failures;
}

// A ban waits for whoever changes settings, who may be waiting for this supervisor: the listener only notes
// whom it is about. The queue is never destroyed, which would wait for that ban.
DaemonProcess::Listener listenFor(const std::string& service, Reader read) {
    return [failures = startCounting(service), read](std::string_view message) {
        if (const auto address = read(message)) {
            failures->add(toText(sourceOf(*address)), toText(*address));
        }
    };
}

} // namespace

DaemonProcess::Listener watchLogins(const std::filesystem::path& folder, const std::string& daemon) {
    const std::string text = folder.lexically_normal().string();
    if (!text.ends_with(paths::run)) {
        return {};
    }
    const std::string root = text.substr(0, text.size() - paths::run.size());
    setStateRoot(root.empty() ? "/" : root);
    if (daemon == "ftpd") {
        return listenFor("ftp", failedFtpLogin);
    }
    return daemon == "sftp" ? listenFor("sftp", failedSftpLogin) : DaemonProcess::Listener();
}

} // namespace velt
