#include "host/api/sessions.h"

#include "base/json_value.h"
#include "host/api/audit.h"
#include "host/api/changes.h"
#include "host/api/problem.h"
#include "host/api/session_query.h"
#include "host/api/session_text.h"
#include "host/module/platform_request.h"

#include <algorithm>
#include <atomic>
#include <future>
#include <mutex>
#include <variant>

namespace velt::host {

namespace {

using Sessions = std::vector<OpenSession>;

constexpr const char* noneEnded = " No session was ended.";

HttpResponse list(const Call& call) {
    const auto query = parseSessionQuery(call.request.query(), SessionMethod::list);
    if (const auto* const bad = std::get_if<FieldError>(&query)) {
        return fieldProblem(400, *bad, "", call.id);
    }
    const auto sessions = openSessions();
    if (!sessions) {
        return problem(500, sessions.error().message, call.id);
    }
    const SessionFilter& filter = std::get<SessionQuery>(query).filter;
    const auto isWanted = [&filter](const OpenSession& session) { return filter.matches(session); };
    return {200, "application/json", toJsonText(*sessions, isWanted), {}};
}

AuditEntry entryOf(const OpenSession& session, const std::string& reason) {
    return {AuditEvent::sessionEnded,
            {session.id, session.user, session.address, reason.empty() ? "" : ": " + reason}};
}

HttpResponse plan(const Sessions& sessions, const std::string& reason) {
    ChangeSteps steps;
    for (const OpenSession& session : sessions) {
        steps.push_back(stepOf(entryOf(session, reason)));
    }
    return dryRunAnswer(std::move(steps), static_cast<int>(sessions.size()));
}

/// Ends the session and writes that down. False when it has ended by itself.
Result<bool> end(const OpenSession& session, const std::string& reason, HostLog& log, const Call& call) {
    VELT_ASSIGN_OR_RETURN(const bool ended, endSession(session.id, {call.principal.actor, reason}));
    if (ended) {
        log.write(call.id, "session " + session.id + " ended by " + call.principal.actor);
        writeAudit(entryOf(session, reason), log, call);
    }
    return ended;
}

HttpResponse noSuchSession(const Call& call) {
    return problem(404, "There is no session " + call.path.back() + ".", call.id);
}

HttpResponse endOne(HostLog& log, const Call& call) {
    const auto parsed = parseSessionQuery(call.request.query(), SessionMethod::end);
    if (const auto* const bad = std::get_if<FieldError>(&parsed)) {
        return fieldProblem(400, *bad, noneEnded, call.id);
    }
    const auto& query = std::get<SessionQuery>(parsed);
    const auto sessions = openSessions();
    if (!sessions) {
        return problem(500, sessions.error().message, call.id);
    }
    const auto session = std::ranges::find(*sessions, call.path.back(), &OpenSession::id);
    if (session == sessions->end()) {
        return noSuchSession(call);
    }
    if (query.dryRun) {
        return plan({*session}, query.reason);
    }
    const auto ended = end(*session, query.reason, log, call);
    if (!ended) {
        log.write(call.id, ended.error().message);
        return problem(500, ended.error().message, call.id);
    }
    return *ended ? HttpResponse{204, "", "", {}} : noSuchSession(call);
}

/// Several sessions that are ended, by a few threads: each of them waits until its session is gone.
class Ending {
public:
    Ending(const Sessions& sessions, const std::string& reason, HostLog& log, const Call& call)
        : sessions_(sessions), reason_(reason), log_(log), call_(call) {}

    /// Ends all that can be ended. One that cannot does not save those behind it.
    void run() {
        std::vector<std::future<void>> threads;
        for (std::size_t i = 0; i < std::min(mostAtOnce, sessions_.size()); ++i) {
            threads.push_back(std::async(std::launch::async, [this] { work(); }));
        }
        for (std::future<void>& thread : threads) {
            thread.get();
        }
    }

    std::size_t ended() const { return ended_; }
    const std::string& failures() const { return failures_; }

private:
    static constexpr std::size_t mostAtOnce = 8;

    void work() {
        for (std::size_t i = next_++; i < sessions_.size(); i = next_++) {
            const auto ended = end(sessions_[i], reason_, log_, call_);
            const std::lock_guard lock(mutex_);
            ended_ += ended && *ended ? 1U : 0U;
            failures_ += ended ? "" : " " + ended.error().message;
        }
    }

    const Sessions& sessions_;
    const std::string& reason_;
    HostLog& log_;
    const Call& call_;
    std::atomic<std::size_t> next_{0};
    std::mutex mutex_; ///< of both below
    std::size_t ended_ = 0;
    std::string failures_;
};

HttpResponse endAll(const Sessions& sessions, const std::string& reason, HostLog& log, const Call& call) {
    Ending ending(sessions, reason, log, call);
    ending.run();
    const Json::UInt64 count = ending.ended();
    if (const std::string& failures = ending.failures(); !failures.empty()) {
        log.write(call.id, failures.substr(1));
        const std::string detail = "Sessions that were ended: " + std::to_string(count) + "." + failures;
        return problemWith(500, jsonObject({{"detail", detail}, {"ended", count}}), call.id);
    }
    return jsonResponse(200, jsonObject({{"ended", count}}));
}

HttpResponse endSome(HostLog& log, const Call& call) {
    const auto parsed = parseSessionQuery(call.request.query(), SessionMethod::endSome);
    if (const auto* const bad = std::get_if<FieldError>(&parsed)) {
        return fieldProblem(400, *bad, noneEnded, call.id);
    }
    const auto& query = std::get<SessionQuery>(parsed);
    auto sessions = openSessions();
    if (!sessions) {
        return problem(500, sessions.error().message, call.id);
    }
    std::erase_if(*sessions, [&](const OpenSession& each) { return !query.filter.matches(each); });
    return query.dryRun ? plan(*sessions, query.reason) : endAll(*sessions, query.reason, log, call);
}

} // namespace

std::vector<Route> sessionRoutes(HostLog& log) {
    using Kind = RequestOrder::Kind;
    return {
        {"GET", {"api", "sessions"}, false, Kind::unordered, list},
        {"DELETE",
         {"api", "sessions"},
         true,
         Kind::unordered,
         [&log](const Call& call) { return endSome(log, call); }},
        {"DELETE",
         {"api", "sessions", "*"},
         true,
         Kind::unordered,
         [&log](const Call& call) { return endOne(log, call); }},
    };
}

} // namespace velt::host
