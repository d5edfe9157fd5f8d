#include "host/api/changes.h"

#include "base/json_value.h"
#include "base/text.h"
#include "base/utc_text.h"
#include "host/api/audit.h"
#include "host/api/change_summary.h"
#include "host/api/failure_kind.h"
#include "host/api/problem.h"
#include "host/api/service_status.h"
#include "host/base/json.h"
#include "host/module/platform_request.h"

#include <algorithm>
#include <functional>
#include <utility>

namespace velt::host {

namespace {

/// Nobody has asked for what veltd does by itself.
std::string whoAsked(const Principal& principal) {
    return principal.actor.empty() ? "veltd itself" : principal.actor + " at " + principal.address;
}

/// A change that the platform could not do, though the module accepted it.
HttpResponse notDone(const ChangeOutcome& outcome, const std::string& requestId) {
    if (!outcome.undone) { // nobody who asks again would mend that
        return problemWith(500,
                           jsonObject({{"title", "The change could be taken back only in part"},
                                       {"detail", outcome.failure->message},
                                       {"changed", true}}),
                           requestId);
    }
    const FailureKind kind = kindOf(outcome.failure->number);
    return problemWith(kind.status,
                       jsonObject({{"title", kind.title},
                                   {"detail", outcome.failure->message + " All is as it was before."},
                                   {"changed", false}}),
                       requestId);
}

/// What the staged settings make wrong that was not so before.
std::vector<std::string> warningsBeside(const Findings& known) {
    std::vector<std::string> warnings;
    for (const Finding& each : judgeSettings()) {
        if (std::ranges::find(known, each) == known.end()) {
            warnings.push_back(each.sentence);
        }
    }
    return warnings;
}

Json::Value toObject(const ChangeStep& step) {
    return jsonObject({{"effect", std::string(stepName(step.kind))}, {"subject", step.subject}});
}

} // namespace

Json::Value toObject(const ChangeReport& report) {
    Json::Value object = jsonObject(
        {{"dry_run", report.dryRun},
         {"changes", jsonArray(report.changes, [](const FieldChange& each) { return toObject(each); })},
         {"effects", jsonArray(report.steps, [](const ChangeStep& each) { return toObject(each); })},
         {"sessions_ended", report.sessionsEnded},
         {"warnings", jsonArray(report.warnings, std::identity())},
         {"down", jsonArray(report.down, [](const ServiceDown& each) { return toObject(each); })}});
    if (report.id) {
        object["id"] = Json::Int64{*report.id};
    }
    if (report.confirmBy) {
        object["confirm_by"] = timestamp(*report.confirmBy);
    }
    return object;
}

HttpResponse dryRunAnswer(ChangeSteps steps, int sessionsEnded) {
    ChangeReport report;
    report.dryRun = true;
    report.sessionsEnded = sessionsEnded;
    report.steps = std::move(steps);
    return jsonResponse(200, toObject(report));
}

Changes::Changes(const ModuleTable& table, Metrics& metrics, EventHub& events, HostLog& log)
    : table_(table), metrics_(metrics), events_(events), log_(log) {}

std::variant<ChangeReport, HttpResponse> Changes::make(const ChangeRequest& request, const Ask& ask) {
    const Call& call = request.call;
    const PlatformRequest platform(call.principal.actor, call.principal.address);
    const auto before = readSettingsDocument(table_, call.principal);
    const Findings known = judgeSettings();
    auto change = SettingsChange::begin(request.ports);
    if (!change) {
        return failedUnchanged(change.error(), call.id);
    }
    if (auto refusal = ask()) {
        return std::move(*refusal);
    }
    ChangeReport report;
    report.dryRun = request.options.dryRun;
    const auto after = readSettingsDocument(table_, call.principal);
    // A request may mend what cannot be read; then there is nothing to compare.
    if (before && after) {
        report.changes = differences(*before, *after);
    }
    report.warnings = warningsBeside(known);
    if (auto failure =
            request.options.dryRun ? preview(**change, request, report) : commit(**change, request, report)) {
        return std::move(*failure);
    }
    return report;
}

std::optional<HttpResponse> Changes::preview(SettingsChange& change, const ChangeRequest& request,
                                             ChangeReport& report) {
    const auto plan = change.plan(request.options.sessions);
    if (!plan) {
        return failedUnchanged(plan.error(), request.call.id);
    }
    report.steps = plan->steps;
    report.sessionsEnded = plan->sessionsEnded;
    report.warnings.insert(report.warnings.end(), plan->warnings.begin(), plan->warnings.end());
    return std::nullopt;
}

std::optional<HttpResponse> Changes::commit(SettingsChange& change, const ChangeRequest& request,
                                            ChangeReport& report) {
    // First: a change must be found again after a crash, and one that waits for its confirmation taken back.
    if (!report.changes.empty()) {
        const auto recorded = record(request, ChangeState::begun, report);
        if (!recorded && request.options.confirmWithin) {
            return failedUnchanged(recorded.error(), request.call.id);
        }
    }
    const ChangeOutcome outcome = change.commit(request.options.sessions);
    report.steps = outcome.steps;
    report.sessionsEnded = outcome.sessionsEnded;
    report.warnings.insert(report.warnings.end(), outcome.warnings.begin(), outcome.warnings.end());
    if (outcome.failure) {
        noteFailure(outcome, request, report);
        return notDone(outcome, request.call.id);
    }
    report.down = startWhatIsDown();
    if (!report.empty()) {
        writeDown(request, report);
        tell(request, report);
    }
    return std::nullopt;
}

void Changes::noteFailure(const ChangeOutcome& outcome, const ChangeRequest& request,
                          const ChangeReport& report) {
    log_.write(request.call.id, "platform: " + outcome.failure->message);
    if (report.id) {
        (void)removeChange(*report.id); // else the next start finds that it is not in force
    }
    if (!outcome.undone) {
        revision_.advance();
        const std::string reason(trimmedEnd(outcome.failure->message, "."));
        writeAudit({AuditEvent::takenBackInPart, {request.way, reason}}, log_, request.call);
    }
}

Result<> Changes::record(const ChangeRequest& request, ChangeState state, ChangeReport& report) {
    ChangeRecord change;
    change.time = std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now());
    change.actor = request.call.principal.actor;
    change.address = request.call.principal.address;
    change.way = request.way;
    change.fields = toJson(jsonArray(report.changes, [](const FieldChange& each) { return toObject(each); }));
    change.state = state;
    if (request.options.confirmWithin) {
        change.confirmBy = change.time + *request.options.confirmWithin;
    }
    VELT_ASSIGN_OR_RETURN(report.id, recordChange(change));
    report.confirmBy = change.confirmBy;
    return {};
}

/// In the history and in the administrator log. The change is done, so a failure is only a warning.
void Changes::writeDown(const ChangeRequest& request, ChangeReport& report) {
    if (report.changes.empty()) {
        return;
    }
    const ChangeState state = request.options.confirmWithin ? ChangeState::waiting : ChangeState::done;
    const auto recorded = report.id ? setChangeState(*report.id, state) : record(request, state, report);
    if (!recorded) {
        report.warnings.push_back("The change is not in the history. " + recorded.error().message);
    }
    if (const auto logged =
            writeAudit({AuditEvent::settingsChanged, {request.way, summaryOf(report.changes), {}, {}}});
        !logged) {
        report.warnings.push_back("The change is not in the administrator log. " + logged.error().message);
    }
    for (const std::string& warning : report.warnings) {
        log_.write(request.call.id, warning);
    }
}

/// What an earlier change, or a boot, left down may start by now. That it does not is no failure of this
/// change.
std::vector<ServiceDown> Changes::startWhatIsDown() {
    if (servicesDown().empty()) {
        return {};
    }
    (void)startEnabledServices(); // servicesDown tells what failed
    return servicesDown();
}

void Changes::tell(const ChangeRequest& request, const ChangeReport& report) {
    revision_.advance();
    for (const ChangeStep& step : report.steps) {
        if (step.kind == StepKind::start || step.kind == StepKind::handOver) {
            metrics_.countDaemonStart(step.subject);
        }
    }
    log_.write(request.call.id,
               request.way + " for " + whoAsked(request.call.principal) + ": " +
                   (report.changes.empty() ? "no other settings" : summaryOf(report.changes)));
    if (!report.down.empty()) {
        log_.write(request.call.id, sentenceOf(report.down));
    }
    Json::Value event = jsonObject(
        {{"way", request.way}, {"actor", request.call.principal.actor}, {"request_id", request.call.id}});
    if (report.id) {
        event["id"] = Json::Int64{*report.id};
    }
    events_.publish("change", event);
    if (request.options.confirmWithin && report.id) {
        tellOfWaiting_();
    }
}

} // namespace velt::host
