#include "standalone/change/run_change.h"

#include "standalone/change/closed_ranges.h"
#include "standalone/control/bring_daemons.h"
#include "standalone/control/daemon_control.h"
#include "standalone/control/service_firewall.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/effects.h"
#include "standalone/core/unfinished_change.h"
#include "standalone/firewall/firewall_table.h"

#include <syslog.h>

#include <algorithm>
#include <map>
#include <optional>
#include <string_view>
#include <utility>

namespace velt {

namespace {

constexpr std::string_view noteSubject = "note of the change";

using FormerStates = std::map<const Daemon*, DaemonState>;

void keepFirst(Result<>& outcome, Result<> next) {
    if (outcome) {
        outcome = std::move(next);
    }
}

FormerStates statesOf(const std::vector<DaemonRequests::Wish>& wishes) {
    FormerStates states;
    for (const auto& wish : wishes) {
        states[wish.daemon] = daemonState(*wish.daemon);
    }
    return states;
}

Result<> bringBack(const Daemon& daemon, RunState former) {
    const bool starts = former == RunState::running;
    return perform(starts ? Effect::start : Effect::stop, daemon.name, [&] {
        switch (former) {
        case RunState::running:
            return startDaemon(daemon);
        case RunState::paused:
            return pauseDaemon(daemon);
        case RunState::closed:
            return closeDaemon(daemon);
        default:
            return stopDaemon(daemon);
        }
    });
}

/// The one that served before the change serves still, with what it was started with: it is better left alone
/// than exchanged for another one, which may not start either.
bool isUntouched(const Daemon& daemon, const DaemonState& former) {
    const DaemonState now = daemonState(daemon);
    return former.state == RunState::running && now.state == RunState::running && isAlive(now.daemon) &&
           now.daemon == former.daemon && now.configurationHash == former.configurationHash;
}

/// Goes on after a failure, and returns the first.
Result<> bringBackDaemons(const FormerStates& former) {
    std::vector<const Daemon*> daemons;
    for (const auto& [daemon, state] : former) {
        if (!isUntouched(*daemon, state)) {
            daemons.push_back(daemon);
        }
    }
    const auto failures = bringDaemons(
        daemons, [&](const Daemon& daemon) { return bringBack(daemon, former.at(&daemon).state); });
    return failures.empty() ? Result<>() : Result<>(failures.front().error);
}

/// The change on the disk, to be undone after a crash. Where nothing is stored there is nothing to note.
Result<> noteIfStored(const std::vector<StagedFile>& files) {
    return files.empty() ? Result<>()
                         : perform(Effect::store, noteSubject, [&] { return noteChange(files); });
}

Result<> forget() {
    return perform(Effect::store, noteSubject, forgetChange);
}

Result<> bringBackFiles(const std::vector<StagedFile>& files) {
    Result<> outcome;
    // Without the lock, too: better so than not at all. Not held while daemons start.
    const auto lock = std::optional(StateLock::take());
    for (const StagedFile& file : files) {
        if (isAsBefore(file)) { // where nothing can be written, nothing was
            continue;
        }
        keepFirst(outcome, perform(Effect::store, subjectOf(file), [&] { return restore(file); }));
    }
    return outcome;
}

bool has(const std::vector<ProgramStep>& program, StepKind kind) {
    return std::ranges::any_of(program,
                               [&](const ProgramStep& each) { return each.step && each.step->kind == kind; });
}

bool movesPorts(const std::vector<ProgramStep>& program) {
    return has(program, StepKind::openPort) || has(program, StepKind::closePort);
}

/// A port that stays closed makes the change one that is not done.
Result<> movePorts(const StagedRequest& request, const std::vector<ProgramStep>& program,
                   ChangeOutcome& outcome) {
    if (!request.firewall && !movesPorts(program)) {
        return {};
    }
    auto loaded = openServicePorts();
    if (!loaded && !(has(program, StepKind::openPort) && rulesCloseOthers())) {
        outcome.warnings.push_back(loaded.error().message);
        return {};
    }
    return loaded;
}

/// Everything as it was. Goes on after a failure, and returns the first; then the note stays, and the next
/// start of this system tries once more.
Result<> undo(const StagedRequest& request, const std::vector<ProgramStep>& program,
              const FormerStates& former, bool rulesMoved) {
    Result<> outcome = bringBackFiles(request.files);
    keepFirst(outcome, bringBackDaemons(former));
    auto followed = movesPorts(program) ? openServicePorts() : Result<>();
    if (rulesMoved) { // else those in force are the former ones
        keepFirst(outcome, std::move(followed));
    }
    if (outcome) {
        return forget();
    }
    return outcome;
}

ChangeOutcome failed(Error why, const Result<>& undone, const std::vector<StagedFile>& files) {
    if (!undone) {
        why.message += " Not all could be set back to what it was: " + undone.error().message;
        if (files.empty()) {
            (void)noteChange(files); // the note tells of more than the files
        }
        ::syslog(LOG_ERR, "%s", why.message.c_str());
    }
    return {{}, std::move(why), bool(undone)};
}

Result<> doSteps(const std::vector<ProgramStep>& program, std::optional<StateLock> lock,
                 ChangeOutcome& outcome) {
    for (const ProgramStep& each : program) {
        if (!each.step || each.step->kind != StepKind::store) {
            lock.reset();
        }
        VELT_ASSIGN_OR_RETURN(const int ended, each.act ? each.act() : Result<int>(0));
        if (each.step) {
            outcome.steps.push_back(*each.step);
        }
        outcome.sessionsEnded += ended;
    }
    return {};
}

Result<> writeDown(const std::vector<HeldJournal::Item>& items) {
    HeldJournal journal;
    for (const HeldJournal::Item& item : items) {
        holdBack(item);
    }
    return journal.release();
}

} // namespace

Result<> checkPorts(const std::vector<ProgramStep>& program) {
    return has(program, StepKind::openPort) ? checkFirewallRules(firewallNeeds) : Result<>();
}

ChangeOutcome runChange(const StagedRequest& request, const std::vector<ProgramStep>& program,
                        StateLock lock) {
    const ChangeAtWork atWork;
    ChangeOutcome outcome;
    const FormerStates former = statesOf(request.wishes);
    if (const auto noted = noteIfStored(request.files); !noted) {
        (void)forgetChange(); // it may be there all the same, for the next start to go by
        return {{}, noted.error()};
    }
    const auto followed = doSteps(program, std::move(lock), outcome);
    const auto moved = followed ? movePorts(request, program, outcome) : Result<>();
    const auto done = followed && moved ? forget() : Result<>();
    for (const Result<>* each : {&followed, &moved, &done}) {
        if (!*each) {
            return failed(each->error(), undo(request, program, former, bool(moved)), request.files);
        }
    }
    if (const auto written = writeDown(request.journal); !written) {
        outcome.warnings.push_back(written.error().message);
    }
    return outcome;
}

} // namespace velt
