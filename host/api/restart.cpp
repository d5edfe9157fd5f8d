#include "host/api/restart.h"

#include "base/json_value.h"
#include "host/api/audit.h"
#include "host/api/changes.h"
#include "host/api/failure_kind.h"
#include "host/api/problem.h"
#include "host/base/query_text.h"
#include "host/module/platform_request.h"

#include <algorithm>
#include <variant>

namespace velt::host {

namespace {

struct Wish {
    std::string service; ///< "" for all
    SessionPolicy sessions = SessionPolicy::keep;
    bool dryRun = false;
};

bool isService(const std::string& name) {
    return std::ranges::count(storedServices(), name, &StoredService::daemon) != 0;
}

const char* expectedFor(const std::string& key) {
    if (key == "service") {
        return "ftp or sftp";
    }
    if (key == "sessions") {
        return "keep or end";
    }
    return key == "dry_run" ? "true or false" : "one of service, sessions or dry_run";
}

/// Reads "service=ftp&sessions=end&dry_run=true".
std::variant<Wish, FieldError> wishIn(const std::string& query) {
    Wish wish;
    const auto parameters = queryParameters(query);
    if (const auto repeated = repeatedKey(parameters)) {
        return FieldError{*repeated, oneValue};
    }
    for (const auto& [key, value] : parameters) {
        if (key == "service" && value && isService(*value)) {
            wish.service = *value;
        } else if (key == "sessions" && (value == "keep" || value == "end")) {
            wish.sessions = value == "end" ? SessionPolicy::end : SessionPolicy::keep;
        } else if (key == "dry_run" && (value == "true" || value == "false")) {
            wish.dryRun = value == "true";
        } else {
            return FieldError{key, expectedFor(key)};
        }
    }
    return wish;
}

Json::Value toObject(const ServiceSessions& sessions) {
    return jsonObject({{"service", sessions.service}, {"ended", sessions.ended}, {"kept", sessions.kept}});
}

Json::Value answerOf(const std::vector<ServiceSessions>& services) {
    int ended = 0;
    for (const ServiceSessions& each : services) {
        ended += each.ended;
    }
    const auto asObject = [](const ServiceSessions& each) { return toObject(each); };
    return jsonObject(
        {{"dry_run", false}, {"services", jsonArray(services, asObject)}, {"sessions_ended", ended}});
}

/// "ftp: 3 sessions went on, 0 ended"
std::string textOf(const std::vector<ServiceSessions>& services) {
    std::string text;
    for (const auto& [service, ended, kept] : services) {
        if (ended == 0 && kept == 0) {
            continue;
        }
        text += (text.empty() ? "" : "; ") + service + ": " + std::to_string(kept) + " sessions went on, " +
                std::to_string(ended) + " ended";
    }
    return text.empty() ? "there were no sessions" : text;
}

/// A daemon that does not come up leaves the former one serving.
HttpResponse failure(const Error& error, const Call& call) {
    const FailureKind kind = kindOf(error.number);
    return problemWith(kind.status, jsonObject({{"title", kind.title}, {"detail", error.message}}), call.id);
}

AuditEntry entryOf(const Wish& wish, const std::vector<ServiceSessions>& services) {
    return {AuditEvent::restarted,
            {wish.service.empty() ? "all services" : wish.service, textOf(services), {}, {}}};
}

/// Stages the starts, and drops them.
HttpResponse restartPlan(const Wish& wish, const Call& call) {
    const auto change = SettingsChange::begin();
    if (!change) {
        return failure(change.error(), call);
    }
    if (const auto staged = restartServices(wish.sessions, wish.service); !staged) {
        return failure(staged.error(), call);
    }
    const auto plan = (*change)->plan(wish.sessions);
    if (!plan) {
        return failure(plan.error(), call);
    }
    ChangeReport report;
    report.dryRun = true;
    report.steps = plan->steps;
    report.sessionsEnded = plan->sessionsEnded;
    return jsonResponse(200, toObject(report));
}

HttpResponse restart(HostLog& log, const Call& call) {
    if (auto unread = bodyProblem(call.request.body, call.id)) {
        return std::move(*unread);
    }
    const auto wish = wishIn(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&wish)) {
        return fieldProblem(400, *bad, "", call.id);
    }
    const PlatformRequest request(call.principal.actor, call.principal.address);
    const auto& wanted = std::get<Wish>(wish);
    if (wanted.dryRun) {
        return restartPlan(wanted, call);
    }
    const auto done = restartServices(wanted.sessions, wanted.service);
    if (!done) {
        log.write(call.id, "restart: " + done.error().message);
        return failure(done.error(), call);
    }
    writeAudit(entryOf(wanted, *done), log, call);
    return jsonResponse(200, answerOf(*done));
}

} // namespace

Route restartRoute(HostLog& log) {
    return {"POST", {"api", "restart"}, true, RequestOrder::Kind::write, [&log](const Call& call) {
                return restart(log, call);
            }};
}

} // namespace velt::host
