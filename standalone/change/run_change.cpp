#include "standalone/change/run_change.h"

#include "standalone/change/unfinished_change.h"
#include "standalone/control/daemon_control.h"
#include "standalone/control/service_firewall.h"
#include "standalone/control/supervised_daemon.h"

#include <syslog.h>

#include <map>
#include <utility>

namespace velt {

namespace {

using FormerStates = std::map<const Daemon*, RunState>;

FormerStates statesOf(const std::vector<DaemonRequests::Wish>& wishes) {
    FormerStates states;
    for (const auto& wish : wishes) {
        states[wish.daemon] = daemonState(*wish.daemon).state;
    }
    return states;
}

Result<> bringBack(const Daemon& daemon, RunState former) {
    switch (former) {
    case RunState::running:
        return startDaemon(daemon);
    case RunState::paused:
        return pauseDaemon(daemon);
    default:
        return stopDaemon(daemon);
    }
}

/// Everything as it was. Goes on after a failure, and returns the first.
Result<> undo(const StagedRequest& request, const FormerStates& former) {
    Result<> outcome;
    // Without the lock, too: better so than not at all. Not held while daemons start.
    auto lock = std::optional(StateLock::take());
    const auto note = [&outcome](Result<> done) {
        if (!done && outcome) {
            outcome = std::move(done);
        }
    };
    for (const StagedFile& file : request.files) {
        note(restore(file));
    }
    if (outcome) {
        note(forgetChange()); // else the next start of this system tries once more
    }
    lock.reset();
    for (const auto& [daemon, state] : former) {
        note(bringBack(*daemon, state));
    }
    followWithFirewall();
    return outcome;
}

ChangeOutcome failed(const StagedRequest& request, const FormerStates& former, Error why) {
    const auto undone = undo(request, former);
    if (!undone) {
        why.message += " Not all could be set back to what it was: " + undone.error().message;
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

void writeDown(const std::vector<HeldJournal::Item>& items) {
    HeldJournal journal;
    for (const HeldJournal::Item& item : items) {
        holdBack(item);
    }
    journal.release();
}

} // namespace

ChangeOutcome runChange(const StagedRequest& request, const std::vector<ProgramStep>& program,
                        StateLock lock) {
    ChangeOutcome outcome;
    const FormerStates former = statesOf(request.wishes);
    const auto noted = request.files.empty() ? Result<>() : noteChange(request.files);
    if (!noted) {
        (void)forgetChange(); // it may be there all the same, for the next start to go by
        return {{}, noted.error()};
    }
    if (auto done = doSteps(program, std::move(lock), outcome); !done) {
        return failed(request, former, std::move(done.error()));
    }
    if (request.firewall) {
        followWithFirewall();
    }
    if (const auto forgotten = forgetChange(); !forgotten) {
        return failed(request, former, forgotten.error());
    }
    writeDown(request.journal);
    return outcome;
}

} // namespace velt
