// /api/history: the changes of the settings; undoing and confirming them.
#ifndef VELT_HOST_API_HISTORY_H
#define VELT_HOST_API_HISTORY_H

#include "host/api/all_settings.h"
#include "host/api/route.h"
#include "host/api/taking_back.h"
#include "host/base/host_log.h"

#include <vector>

namespace velt::host {

/// Thread-safe if reads and writes are ordered as its routes say.
class History {
public:
    /// All of these outlive it.
    History(const ModuleTable& table, AllSettings& settings, HostLog& log);

    /// It outlives its routes.
    std::vector<Route> routes();

    /// Takes back each change whose time to confirm it is over, but for fields that were changed again since.
    /// To be called as a write. False when one of them could not be taken back.
    bool takeBackUnconfirmed();

    /// Finds out what became of a change that a former process had begun, and had not written down as done.
    /// To be called before any change is made.
    void settleBegun();

private:
    HttpResponse undo(const Call& call);
    bool tryToTakeBack(const ChangeRecord& change);
    bool takeBack(const ChangeRecord& change);
    static bool noteTakenBack(const ChangeRecord& change, const TakingBack& back);
    void settle(const ChangeRecord& change);

    const ModuleTable& table_;
    AllSettings& settings_;
    HostLog& log_;
};

} // namespace velt::host

#endif
