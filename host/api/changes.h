// Everything that changes settings passes here: staged, then done as a whole or not at all, written down,
// told.
#ifndef VELT_HOST_API_CHANGES_H
#define VELT_HOST_API_CHANGES_H

#include "host/api/change_options.h"
#include "host/api/events.h"
#include "host/api/metrics.h"
#include "host/api/revision.h"
#include "host/api/route.h"
#include "host/api/settings_document.h"
#include "host/base/host_log.h"

#include <json/value.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <variant>
#include <vector>

namespace velt::host {

/// What is to be changed, by whom and how.
struct ChangeRequest {
    std::string way; ///< "VELT.Core.FileServ.FTP v3 set", "settings", "undo 12"
    const Call& call;
    ChangeOptions options;
    IntendedPorts ports; ///< see SettingsChange::begin
};

/// What a change did, or would do.
struct ChangeReport {
    bool dryRun = false;
    std::vector<FieldChange> changes;
    ChangeSteps steps;
    int sessionsEnded = 0;
    std::vector<std::string> warnings;
    std::vector<ServiceDown> down;  ///< services that are on and do not run, for reasons of their own
    std::optional<std::int64_t> id; ///< in the history
    std::optional<std::chrono::system_clock::time_point> confirmBy; ///< else it is taken back

    bool empty() const { return changes.empty() && steps.empty(); }
};

/// {"changes", "effects", "sessions_ended", "warnings", "down", "id", "confirm_by"}
Json::Value toObject(const ChangeReport& report);

/// The answer to a dry run of something that is not a change of settings.
HttpResponse dryRunAnswer(ChangeSteps steps, int sessionsEnded = 0);

/// Thread-safe, if one change runs at a time.
class Changes {
public:
    /// All of these outlive it.
    Changes(const ModuleTable& table, Metrics& metrics, EventHub& events, HostLog& log);

    /// Asks for the change, by calling rows; what they do is staged. Returns a problem when it is refused.
    using Ask = std::function<std::optional<HttpResponse>()>;

    /// Stages what `ask` asks for, and does it, unless it is a dry run. Or the problem for which nothing was
    /// done.
    std::variant<ChangeReport, HttpResponse> make(const ChangeRequest& request, const Ask& ask);

    Revision& revision() { return revision_; }

    /// Calls this after each change that waits for its confirmation. To be set before the first change.
    void onWaiting(std::function<void()> tell) { tellOfWaiting_ = std::move(tell); }

private:
    static std::optional<HttpResponse> preview(SettingsChange& change, const ChangeRequest& request,
                                               ChangeReport& report);
    std::optional<HttpResponse> commit(SettingsChange& change, const ChangeRequest& request,
                                       ChangeReport& report);
    static std::vector<ServiceDown> startWhatIsDown();
    static Result<> record(const ChangeRequest& request, ChangeState state, ChangeReport& report);
    void noteFailure(const ChangeOutcome& outcome, const ChangeRequest& request, const ChangeReport& report);
    void writeDown(const ChangeRequest& request, ChangeReport& report);
    void tell(const ChangeRequest& request, const ChangeReport& report);

    const ModuleTable& table_;
    Metrics& metrics_;
    EventHub& events_;
    HostLog& log_;
    Revision revision_;
    std::function<void()> tellOfWaiting_ = [] {};
};

} // namespace velt::host

#endif
