// A change of the stored settings, and of the daemons that follow them, as a whole: all of it or nothing.
#ifndef VELT_STANDALONE_CHANGE_SETTINGS_CHANGE_H
#define VELT_STANDALONE_CHANGE_SETTINGS_CHANGE_H

#include "base/result.h"
#include "standalone/change/change_step.h"
#include "standalone/control/intended_ports.h"
#include "standalone/control/service_request.h"

#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// What became of a change.
struct ChangeOutcome {
    ChangeSteps steps;            ///< that were done; of a failed change: none, unless undoing failed, too
    std::optional<Error> failure; ///< why it was not done
    bool undone = true;           ///< after a failure: all is as it was before
    int sessionsEnded = 0;
    std::vector<std::string> warnings{}; ///< of one that was done: what did not work beside it, or will not
};

/// Between begin and its end, what this thread stores through the contract is staged: nobody else sees it,
/// and it sees it itself. Stops, starts, log entries and events are held back; a start or stop is checked as
/// far as that is possible without doing it (the ports, the daemon's own test), and fails as it really would.
/// Holds the StateLock. One at a time on a thread, where it stays.
class SettingsChange {
public:
    /// `ports`: those that the daemons are to have in the end, when several calls lead there; a call may then
    /// ask for a port that another one gives up.
    static Result<std::unique_ptr<SettingsChange>> begin(const IntendedPorts& ports = {});

    /// Drops what was not committed.
    virtual ~SettingsChange() = default;
    SettingsChange(const SettingsChange&) = delete;
    SettingsChange& operator=(const SettingsChange&) = delete;

    /// What commit would do. Changes nothing.
    virtual Result<ChangeOutcome> plan(SessionPolicy policy) = 0;

    /// Ends the staging and does it: stores the files, makes each daemon that was started or stopped follow
    /// them, once, and writes down what was held back. When a step fails, those before it are undone. A
    /// process that is killed in between leaves a note, by which undoUnfinishedChange restores the former
    /// settings. Nothing else may be called after it.
    virtual ChangeOutcome commit(SessionPolicy policy) = 0;

protected:
    SettingsChange() = default;
};

/// Restores the settings from before a change that a killed process left half-way. True when there was one.
/// To be called before the services are started.
Result<bool> undoUnfinishedChange();

} // namespace velt

#endif
