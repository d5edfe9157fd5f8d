#include "standalone/supervise/login_watch.h"

#include "base/text.h"
#include "base/turn_queue.h"
#include "standalone/activity/session_activity.h"
#include "standalone/bans/failed_login.h"
#include "standalone/bans/failure_counter.h"
#include "standalone/bans/login_guard.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/journal/admin_log.h"
#include "standalone/supervise/refused_logins.h"

#include <syslog.h>

#include <csignal>
#include <exception>
#include <memory>
#include <utility>

namespace velt {
namespace {

struct Readers {
    std::optional<IpNetwork> (*failed)(std::string_view message);
    std::optional<RefusedLogin> (*refused)(std::string_view message);
    /// The name that failed; null where the daemon's sessions record that themselves.
    std::string (*user)(std::string_view message);
    const char* name; ///< of the service, for people
};

constexpr int logCategory = 2;
constexpr int logLevel = 1;
constexpr unsigned refusedEvent = 0x11BF0016;

void count(const std::string& service, const std::string& address) {
    try {
        noteFailedLogin(service, address);
    } catch (const std::exception& error) { // the daemon matters more
        ::syslog(LOG_ERR, "cannot count a failed login: %s", error.what());
    }
}

/// `item` is the user, a line break, and the reason.
void log(const char* service, const std::string& item, ReasonsOfLate& reasons) {
    std::string_view reason = item;
    const std::string user(cut(reason, '\n'));
    const std::string sentence(trimmedEnd(reason, ".")); // the log's own ends with one
    try {
        if (!reasons.isNew(sentence, ReasonsOfLate::Clock::now())) {
            return;
        }
        const auto logged =
            logEvent(logCategory, logLevel, refusedEvent, {service, user.c_str(), sentence.c_str(), nullptr});
        if (!logged) {
            ::syslog(LOG_ERR, "%s", logged.error().message.c_str());
        }
    } catch (const std::exception& error) {
        ::syslog(LOG_ERR, "cannot log a refused login: %s", error.what());
    }
}

/// A queue whose thread leaves all signals to the supervisor's own.
TurnQueue* startQueue(TurnQueue::Work work) {
    sigset_t all;
    sigset_t former;
    ::sigfillset(&all);
    ::pthread_sigmask(SIG_SETMASK, &all, &former);
    auto* const queue = new TurnQueue(std::move(work), {});
    ::pthread_sigmask(SIG_SETMASK, &former, nullptr);
    return queue;
}

/// Writes down a password that the SFTP daemon refused: no session of ours has begun then that could. `item`
/// is the address, a line break, and the name.
void record(const std::string& item) {
    std::string_view user = item;
    const std::string address(cut(user, '\n'));
    const std::string name(user);
    velt_begin_activity(statePath("/").c_str());
    const velt_session session{velt_sftp, "", name.c_str(), "", address.c_str(), ""};
    velt_login_was_refused(&session, "password");
}

// A ban, and the log, wait for whoever changes settings, who may be waiting for this supervisor: the listener
// only notes what it heard. The queues are never destroyed, which would wait for what they do.
DaemonProcess::Listener listenFor(const std::string& service, const Readers& readers) {
    auto* const failures = startQueue([service](const std::string& address) { count(service, address); });
    auto* const refusals = startQueue([name = readers.name, reasons = std::make_shared<ReasonsOfLate>()](
                                          const std::string& item) { log(name, item, *reasons); });
    auto* const records = startQueue(record);
    return [failures, refusals, records, readers](std::string_view message) {
        if (const auto address = readers.failed(message)) {
            failures->add(toText(sourceOf(*address)), toText(*address));
            if (readers.user != nullptr) {
                const std::string item = toText(*address) + '\n' + readers.user(message);
                records->add(item, item);
            }
        } else if (const auto refused = readers.refused(message)) {
            refusals->add(refused->reason, refused->user + '\n' + refused->reason);
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
        return listenFor("ftp", {failedFtpLogin, refusedFtpLogin, nullptr, "FTP"});
    }
    return daemon == "sftp"
               ? listenFor("sftp", {failedSftpLogin, refusedSftpLogin, userOfFailedSftpLogin, "SFTP"})
               : DaemonProcess::Listener();
}

} // namespace velt
