#include "standalone/change/change_program.h"

#include "standalone/control/bring_daemons.h"
#include "standalone/control/daemon_control.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/effects.h"
#include "standalone/core/paths.h"
#include "standalone/ports/port_range.h"
#include "standalone/process/process_identity.h"

#include <algorithm>
#include <array>
#include <set>
#include <utility>

namespace velt {

namespace {

using Wish = DaemonRequests::Wish;

struct StoredFile {
    std::string_view name;
    std::string_view subject;
};

constexpr std::array storedFiles{
    StoredFile{paths::ftpSettings, "ftp settings"},
    StoredFile{paths::sftpSettings, "sftp settings"},
    StoredFile{paths::confinementSettings, "confinement settings"},
    StoredFile{paths::chrootRules, "chroot rules"},
    StoredFile{paths::systemInformation, "system information"},
};

ProgramStep storeStep(const StagedFile& file) {
    const std::string subject = subjectOf(file);
    return {ChangeStep{StepKind::store, subject}, [file, subject]() -> Result<int> {
                VELT_RETURN_IF_ERROR(perform(Effect::store, subject, [&] { return store(file); }));
                return 0;
            }};
}

int sessionCount(const Daemon& daemon) {
    return static_cast<int>(sessionsOf(daemonState(daemon)).size());
}

/// Does it with the daemon, and tells how many of its sessions that ended.
Result<int> actOn(const Daemon& daemon, Effect effect, SessionPolicy policy, Result<> (*act)(const Daemon&)) {
    ServiceRequest request(policy);
    VELT_RETURN_IF_ERROR(perform(effect, daemon.name, [&] { return act(daemon); }));
    VELT_ASSIGN_OR_RETURN(const auto services, request.finish());
    int ended = 0;
    for (const ServiceSessions& sessions : services) {
        ended += sessions.ended;
    }
    return ended;
}

bool endsSessions(const Daemon& daemon, const StagedRequest& request) {
    return request.policy == SessionPolicy::end ||
           (request.policy == SessionPolicy::byChange && request.losingRights.contains(&daemon));
}

/// The end of sessions, which comes with the step before it.
void addEndOfSessions(const Daemon& daemon, std::vector<ProgramStep>& program) {
    if (const int count = sessionCount(daemon); count > 0) {
        program.push_back({ChangeStep{StepKind::endSessions, std::string(daemon.apiName)}, {}, count});
    }
}

ProgramStep stepOf(StepKind kind, const Daemon& daemon, Effect effect, SessionPolicy policy,
                   Result<> (*act)(const Daemon&)) {
    return {ChangeStep{kind, std::string(daemon.apiName)},
            [&daemon, effect, policy, act] { return actOn(daemon, effect, policy, act); }};
}

/// Of a daemon that is off, or is switched off. Sessions that were let go on are not ended by what does not
/// concern them.
void addStop(const Daemon& daemon, const StagedRequest& request, std::vector<ProgramStep>& program) {
    const DaemonState state = daemonState(daemon);
    const bool isClosed = state.state == RunState::closed && isAlive(state.supervisor);
    const bool runs = isAlive(state.supervisor) || isAlive(state.daemon);
    const bool keeps = request.policy == SessionPolicy::keep || (isClosed && !endsSessions(daemon, request));
    if (isClosed && keeps) {
        return;
    }
    if (runs && keeps) {
        program.push_back(stepOf(StepKind::close, daemon, Effect::stop, SessionPolicy::keep, closeDaemon));
        return;
    }
    ProgramStep step = stepOf(StepKind::stop, daemon, Effect::stop, SessionPolicy::end, stopDaemon);
    step.sessionsEnded = isClosed ? 0 : sessionCount(daemon);
    if (isClosed || !runs) {
        step.step.reset(); // what may be left is cleared away
    }
    program.push_back(std::move(step));
    if (isClosed) {
        addEndOfSessions(daemon, program);
    }
}

/// Whether the daemon runs with the configuration that a start would give it.
bool runsAsWanted(const Daemon& daemon) {
    const DaemonState state = daemonState(daemon);
    const auto hash = daemon.test();
    return hash && isAlive(state.supervisor) && state.configurationHash == *hash;
}

/// What a start does, seen from outside.
std::optional<ChangeStep> startKind(const Daemon& daemon, bool serves, bool renew) {
    const std::string name(daemon.apiName);
    if (!serves) {
        return ChangeStep{StepKind::start, name};
    }
    return !renew && runsAsWanted(daemon) ? std::nullopt
                                          : std::optional(ChangeStep{StepKind::handOver, name});
}

/// A start, in which the daemon's sessions end if the policy, or what the change takes from them, wants it.
void addStart(const Wish& wish, bool serves, const StagedRequest& request,
              std::vector<ProgramStep>& program) {
    const Daemon& daemon = *wish.daemon;
    const bool ends = endsSessions(daemon, request);
    ProgramStep step =
        stepOf(StepKind::start, daemon, Effect::start, ends ? SessionPolicy::end : request.policy,
               wish.renew ? renewDaemon : startDaemon);
    step.step = startKind(daemon, serves, wish.renew);
    if (serves && wish.renew && daemon.canPause) { // on the same port, and it shares none
        program.push_back({ChangeStep{StepKind::pause, std::string(daemon.apiName)}, {}, 0});
        step.step->kind = StepKind::start;
    }
    program.push_back(std::move(step));
    if (ends) {
        addEndOfSessions(daemon, program);
    }
}

/// Outside a request, in which it would wait.
ProgramStep pauseStep(const Daemon& daemon) {
    return {ChangeStep{StepKind::pause, std::string(daemon.apiName)}, [&daemon]() -> Result<int> {
                VELT_RETURN_IF_ERROR(
                    perform(Effect::stop, daemon.name, [&daemon] { return pauseDaemon(daemon); }));
                return 0;
            }};
}

/// Whether another of the daemons that are still to come holds a port which this one is to have.
bool mustWait(const Wish& wish, const std::vector<Wish>& rest, const std::set<const Daemon*>& paused) {
    return wish.start && std::ranges::any_of(rest, [&](const Wish& other) {
               return other.daemon != wish.daemon && !paused.contains(other.daemon) &&
                      isInTheWay(*other.daemon, *wish.daemon);
           });
}

/// The daemons follow the settings. One that gives up a port which another is to have goes first; where they
/// exchange ports, one makes room by a pause.
void addDaemonSteps(const StagedRequest& request, std::vector<ProgramStep>& program) {
    std::vector<Wish> rest = request.wishes;
    std::set<const Daemon*> paused;
    while (!rest.empty()) {
        auto next =
            std::ranges::find_if(rest, [&](const Wish& wish) { return !mustWait(wish, rest, paused); });
        if (next == rest.end()) {
            const auto pausable = std::ranges::find_if(rest, [&](const Wish& wish) {
                return wish.daemon->canPause && !paused.contains(wish.daemon);
            });
            if (pausable != rest.end()) {
                program.push_back(pauseStep(*pausable->daemon));
                paused.insert(pausable->daemon);
                continue;
            }
            next = rest.begin();
        }
        const bool serves = isServing(daemonState(*next->daemon)) && !paused.contains(next->daemon);
        if (next->start) {
            addStart(*next, serves, request, program);
        } else {
            addStop(*next->daemon, request, program);
        }
        rest.erase(next);
    }
}

/// The sessions end of daemons that need not follow themselves.
void addLosses(const StagedRequest& request, std::vector<ProgramStep>& program) {
    if (request.policy == SessionPolicy::keep) {
        return;
    }
    for (const Daemon* daemon : allDaemons()) {
        const bool follows = std::ranges::find(request.wishes, daemon, &Wish::daemon) != request.wishes.end();
        if (request.losingRights.contains(daemon) && !follows && sessionCount(*daemon) > 0) {
            program.push_back(
                stepOf(StepKind::endSessions, *daemon, Effect::start, SessionPolicy::end, startDaemon));
            program.back().sessionsEnded = sessionCount(*daemon);
        }
    }
}

std::string textOf(const VELT_FTP_PORT_RANGE& range) {
    return range.first == range.last ? std::to_string(range.first) : formatPortRange(range);
}

/// The ports that only the first has. The firewall follows the daemons by itself.
void addPortSteps(StepKind kind, const OpenPorts& ports, const OpenPorts& others,
                  std::vector<ProgramStep>& program) {
    for (const VELT_FTP_PORT_RANGE& range : ports) {
        const std::string text = textOf(range);
        if (std::ranges::find(others, text, textOf) == others.end()) {
            program.push_back({ChangeStep{kind, text}, {}});
        }
    }
}

ProgramStep journalStep(const LogEntry& entry) {
    return {ChangeStep{StepKind::logEntry, entry.sentence}, {}};
}

ProgramStep journalStep(const SystemEvent& event) {
    std::string subject;
    for (const auto& [name, value] : event.parameters) {
        // "ftpd stop": by name, the action comes first.
        subject.insert(0, subject.empty() ? "" : " ").insert(0, value);
    }
    return {ChangeStep{StepKind::event, subject}, {}};
}

} // namespace

std::string subjectOf(const StagedFile& file) {
    const auto* const known = std::ranges::find(storedFiles, file.name, &StoredFile::name);
    if (known != storedFiles.end()) {
        return std::string(known->subject);
    }
    return "run key of " + file.name.substr(file.name.rfind('/') + 1);
}

std::vector<ProgramStep> programOf(const StagedRequest& request) {
    std::vector<ProgramStep> program;
    for (const StagedFile& file : request.files) {
        program.push_back(storeStep(file));
    }
    for (const std::string& file : request.madeByStarts) {
        program.push_back({ChangeStep{StepKind::store, file}, {}});
    }
    addDaemonSteps(request, program);
    addLosses(request, program);
    addPortSteps(StepKind::closePort, request.openBefore, request.openAfter, program);
    addPortSteps(StepKind::openPort, request.openAfter, request.openBefore, program);
    for (const HeldJournal::Item& item : request.journal) {
        program.push_back(std::visit([](const auto& each) { return journalStep(each); }, item));
    }
    return program;
}

Result<OpenPorts> openPorts() {
    OpenPorts open;
    for (const Daemon* daemon : allDaemons()) {
        VELT_ASSIGN_OR_RETURN(const auto settings, daemon->settings());
        for (const DaemonPorts& ports : settings.ports) {
            if (settings.enabled()) {
                open.push_back(ports.range);
            }
        }
    }
    return open;
}

} // namespace velt
