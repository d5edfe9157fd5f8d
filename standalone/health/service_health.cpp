#include "standalone/control/service_overview.h"
#include "standalone/control/start_failure.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/error_number.h"
#include "standalone/core/unfinished_change.h"
#include "standalone/daemons/tls/certificate.h"
#include "standalone/firewall/foreign_tables.h"
#include "standalone/firewall/rule_script.h"
#include "standalone/health/checks.h"
#include "standalone/health/greeting.h"
#include "standalone/health/mends.h"
#include "standalone/ports/port_probe.h"
#include "standalone/process/replaced_programs.h"

#include <unistd.h>

#include <algorithm>
#include <map>
#include <mutex>
#include <tuple>

namespace velt {
namespace {

constexpr std::chrono::seconds greetingLimit{3};
constexpr std::chrono::seconds greetingBelieved{60};

/// What was asked of a service that runs.
struct Question {
    ProcessId daemon;
    int port = 0;
    bool tls = false;
    std::string certificate; ///< its fingerprint; "" without TLS

    bool operator==(const Question&) const = default;
};

/// The services that answered as they should, so that they are not asked again and again: each time leaves
/// lines in their logs.
class GoodAnswers {
public:
    bool knows(const std::string& service, const Question& question) {
        const std::lock_guard lock(mutex_);
        const auto found = answers_.find(service);
        return found != answers_.end() && found->second.first == question &&
               Clock::now() - found->second.second < greetingBelieved;
    }

    void note(const std::string& service, const Question& question) {
        const std::lock_guard lock(mutex_);
        answers_[service] = {question, Clock::now()};
    }

private:
    using Clock = std::chrono::steady_clock;

    std::mutex mutex_;
    std::map<std::string, std::pair<Question, Clock::time_point>> answers_;
};

GoodAnswers& goodAnswers() {
    static GoodAnswers instance;
    return instance;
}

bool servesTls(const DaemonSettings& settings) {
    return std::ranges::any_of(settings.services,
                               [](const ServiceSwitch& each) { return each.on && each.service == "ftps"; });
}

std::optional<Question> questionFor(const Daemon& daemon) {
    const auto settings = daemon.settings();
    const DaemonState state = daemonState(daemon);
    if (!settings || !settings->enabled() || state.ports.empty() || !isServing(state)) {
        return std::nullopt;
    }
    Question question{state.daemon, state.ports.front(), servesTls(*settings), ""};
    if (question.tls) {
        const auto stored = storedCertificate();
        question.certificate = stored && *stored ? (*stored)->fingerprint : "";
    }
    return question;
}

Finding noGreeting(const Daemon& daemon, int port, const Error& error) {
    return {"no-greeting", Severity::error, std::string(daemon.apiName),
            titleOf(daemon) + " listens on port " + std::to_string(port) +
                ", but does not greet: " + error.message + ".",
            restartOf(daemon)};
}

bool isClosedByFirewall(int port) {
    const auto rules = mayTouchRules().valueOr(false) ? listRules() : std::nullopt;
    return rules && closesToThisServer(*rules, port);
}

Findings tlsFindings(const Daemon& daemon, const Question& question) {
    const auto served = certificateServedAt(question.port, greetingLimit);
    if (!served) {
        return {{"tls-fails", Severity::error, "ftp",
                 "Encrypted FTP does not work on port " + std::to_string(question.port) + ": " +
                     served.error().message + ".",
                 restartOf(daemon)}};
    }
    const auto stored = storedCertificate();
    if (stored && *stored && digestOf((*stored)->certificate) != *served) {
        return {{"certificate-not-served", Severity::warning, "ftp",
                 titleOf(daemon) + " still serves a certificate other than the one in " +
                     (*stored)->certificate.string() + ".",
                 restartOf(daemon)}};
    }
    return {};
}

Findings greetingFindingsOf(const Daemon& daemon) {
    const auto question = questionFor(daemon);
    const std::string service(daemon.apiName);
    if (!question || goodAnswers().knows(service, *question)) {
        return {};
    }
    const auto greeted = awaitGreeting(question->port, service == "sftp" ? "SSH-2.0-" : "220", greetingLimit);
    if (!greeted) {
        return isClosedByFirewall(question->port)
                   ? Findings() // the rules are at fault, of which the check of the firewall tells
                   : Findings{noGreeting(daemon, question->port, greeted.error())};
    }
    Findings found = question->tls ? tlsFindings(daemon, *question) : Findings();
    if (found.empty()) {
        goodAnswers().note(service, *question);
    }
    return found;
}

bool isPortTaken(const Daemon& daemon, const DaemonSettings& settings) {
    std::vector<int> ports;
    for (const DaemonPorts& each : settings.ports) {
        if (!each.ofSessions) {
            ports.push_back(each.range.first);
        }
    }
    const DaemonState state = daemonState(daemon);
    const auto free = probePorts(ports, isAlive(state.daemon) ? state.daemon.pid : 0);
    return !free && free.error().number == ErrorNumber::portTaken;
}

/// A restart, after what it could not do without.
std::string mendOf(const Daemon& daemon) {
    const auto settings = daemon.settings();
    if (!settings) {
        return "Correct the file, then run: " + restartOf(daemon);
    }
    return (isPortTaken(daemon, *settings)
                ? "End the program that has the port, or choose another port, then run: "
                : "") +
           restartOf(daemon);
}

Finding finding(const ServiceDown& down) {
    const bool serves = down.servesFormerSettings;
    const auto daemons = allDaemons();
    const auto* const daemon =
        *std::ranges::find(daemons, down.service, [](const Daemon* each) { return each->apiName; });
    return {serves ? "service-former-settings" : "service-down", serves ? Severity::warning : Severity::error,
            down.service,
            "The " + down.label + " service " +
                (serves ? "runs with its former settings. " : "does not run. ") + down.reason,
            mendOf(*daemon)};
}

/// Something else than what runs would come of a start now, or nothing.
std::optional<Finding> whatAStartWouldChange(const Daemon& daemon) {
    const auto settings = daemon.settings();
    const DaemonState state = daemonState(daemon);
    if (!settings || !settings->enabled() || !isServing(state) || startFailure(daemon)) {
        return std::nullopt;
    }
    const std::string service = "The " + std::string(daemon.label) + " service ";
    const auto hash = daemon.test();
    if (!hash) {
        return Finding{std::string(nextStartFails), Severity::warning, std::string(daemon.apiName),
                       service + "runs, but could not be started again. " + hash.error().message,
                       "Mend this, then run: " + restartOf(daemon)};
    }
    if (*hash == state.configurationHash) {
        return std::nullopt;
    }
    return Finding{std::string(settingsNotInForce), Severity::warning, std::string(daemon.apiName),
                   service + "does not run with the settings that are stored, as after an edit of its file "
                             "by hand.",
                   restartOf(daemon)};
}

} // namespace

Findings serviceFindings() {
    Findings findings;
    for (const ServiceDown& down : servicesDown()) {
        findings.push_back(finding(down));
    }
    return findings;
}

Findings settingsInForceFindings() {
    Findings findings;
    const ChangeCount before = changeCount();
    for (const Daemon* daemon : allDaemons()) {
        if (auto found = whatAStartWouldChange(*daemon)) {
            findings.push_back(std::move(*found));
        }
    }
    const ChangeCount after = changeCount(); // what is being changed is not in force yet
    return before.atWork == 0 && before.begun == after.begun ? findings : Findings();
}

Findings greetingFindings() {
    Findings findings;
    for (const Daemon* daemon : allDaemons()) {
        std::ranges::move(greetingFindingsOf(*daemon), std::back_inserter(findings));
    }
    return findings;
}

Findings replacedProgramFindings() {
    Findings findings;
    const auto look = [&](pid_t pid, const std::string& subject, const std::string& what,
                          const std::string& mend) {
        if (const auto file = replacedFileOf(pid)) {
            findings.push_back(
                {"program-replaced", Severity::warning, subject,
                 what + " still runs with the former version of " + *file + ", which has been replaced.",
                 mend});
        }
    };
    for (const Daemon* daemon : allDaemons()) {
        const DaemonState state = daemonState(*daemon);
        const std::string subject(daemon->apiName);
        if (isAlive(state.daemon)) {
            look(state.daemon.pid, subject, titleOf(*daemon), restartOf(*daemon));
        }
        if (isAlive(state.supervisor)) {
            look(state.supervisor.pid, subject,
                 "The supervisor of the " + std::string(daemon->label) + " daemon",
                 restartOf(*daemon) + " --end-sessions");
        }
    }
    look(::getpid(), "host", "veltd", restartOfHost());
    return findings;
}

} // namespace velt
