#include "host/api/app.h"

#include "host/api/bans.h"
#include "host/api/log_page.h"
#include "host/api/problem.h"
#include "host/api/restart.h"
#include "host/api/sessions.h"
#include "host/api/settings_diff.h"
#include "host/api/status.h"
#include "host/api/tokens.h"
#include "host/api/transfers.h"
#include "host/api/user_access.h"
#include "host/api/user_keys.h"
#include "host/base/percent_encoding.h"
#include "host/base/random_text.h"

#include <algorithm>
#include <cstdint>
#include <exception>
#include <utility>

namespace velt::host {

namespace {

using Path = std::vector<std::string>;

/// Bytes that hold the parameters of any method without lists. Small, since the values of a body take up to a
/// hundred times its size.
constexpr std::size_t usualBody = std::size_t{64} * 1024;

bool matches(const Path& path, const Path& pattern) {
    return std::ranges::equal(path, pattern, [](const std::string& segment, const std::string& wanted) {
        return wanted == "*" || segment == wanted;
    });
}

void finish(const HttpHandler::Done& done, const Call& call, HttpResponse response) {
    response.headers.emplace_back("X-Request-Id", call.id);
    done(std::move(response));
}

HttpResponse notFound(const Call& call) {
    return problem(404, "There is nothing at " + call.request.path() + ". GET /api lists what is served.",
                   call.id);
}

HttpResponse notAllowed(const Call& call, const std::string& allow) {
    HttpResponse response = problem(
        405, "The method " + call.request.method + " is not allowed here, only " + allow + ".", call.id);
    response.headers.emplace_back("Allow", allow);
    return response;
}

HttpResponse tooBusy(const Call& call) {
    HttpResponse response = problem(
        503, "Too many requests with this token or user are waiting, or veltd is stopping. Try again later.",
        call.id);
    response.headers.emplace_back("Retry-After", "5");
    return response;
}

/// While a request is answered that may stop and start services.
class ChangeUnderWay {
public:
    explicit ChangeUnderWay(RequestOrder::Kind kind) : holds_(kind == RequestOrder::Kind::write) {
        if (holds_) {
            holdServiceWatch();
        }
    }
    ~ChangeUnderWay() {
        if (holds_) {
            releaseServiceWatch();
        }
    }
    ChangeUnderWay(const ChangeUnderWay&) = delete;
    ChangeUnderWay& operator=(const ChangeUnderWay&) = delete;

private:
    bool holds_;
};

} // namespace

App::App(const AppSettings& settings, const ModuleTable& table, HostLog& log)
    : log_(log), tokens_(settings.tokenFile), wrongTokens_(log),
      access_(settings.access, tokens_, wrongTokens_, log), platformEvents_(events_),
      activityEvents_(events_), changes_(table, metrics_, events_, log),
      rows_(table, openApi_, metrics_, changes_, log), settings_(table, openApi_, changes_),
      history_(table, settings_, log),
      order_(settings.workers, settings.maxWaiting, settings.maxWaitingBytes) {
    addRoutes(table);
}

void App::begin() {
    history_.settleBegun();
    confirmations_.emplace(history_, order_);
    changes_.onWaiting([this] { confirmations_->wake(); });
}

void App::stop() {
    order_.stop(); // first: its tasks wake the other
    confirmations_.reset();
    wrongTokens_.stop();
}

void App::addRoutes(const ModuleTable& table) {
    const auto add = [this](std::vector<Route> routes) {
        std::ranges::move(routes, std::back_inserter(routes_));
    };
    add(rows_.routes());
    add(settings_.routes());
    add(history_.routes());
    add(settingsDiffRoutes(table));
    add({restartRoute(log_)});
    add(statusRoutes(table));
    add(accessRoutes());
    add(banRoutes(log_));
    add(sessionRoutes(log_));
    add(keyRoutes(log_));
    add(tokenRoutes(tokens_, events_, log_));
    add(healthRoutes(health_));
    add({logRoute(), transferRoute(), metricsRoute(metrics_, table, events_, health_), openApiRoute(openApi_),
         eventRoute()});
}

std::optional<Refusal> App::checkAccess(const HttpRequest& head, const Peer& peer, Principal& principal) {
    if (head.authorization.empty()) {
        // Answered like a refusal, which makes nothing of who asks: the connection stays that of a stranger.
        if (auto answer = probeAnswer(head, health_)) {
            return Refusal{std::move(*answer), false};
        }
    }
    auto refusal = access_.check(head, peer, principal);
    if (refusal) {
        metrics_.countRefusal(refusal->response.status);
    }
    return refusal;
}

template<class Condition> bool App::asksFor(const HttpRequest& request, const Condition& holds) const {
    const auto path = pathSegments(request.path());
    return path && std::ranges::any_of(routes_, [&](const Route& each) {
               return holds(each) && each.method == request.method && matches(*path, each.path);
           });
}

std::size_t App::bodyLimit(const HttpRequest& head, const Principal& principal) const {
    const auto takesLists = [](const Route& each) { return each.takesLists; };
    return principal.role == Role::admin && asksFor(head, takesLists) ? SIZE_MAX : usualBody;
}

bool App::asksForEvents(const HttpRequest& request) const {
    return asksFor(request,
                   [&request](const Route& each) { return each.isStream && each.isStream(request.query()); });
}

void App::addEventReader(const std::shared_ptr<EventReader>& reader, const HttpRequest& request,
                         const Principal& principal) {
    events_.add(reader, principal.tokenId, kindsIn(request.query()));
    // It may have been deleted since it was looked at, when the hub did not know of its reader yet.
    if (!principal.tokenId.empty() && !tokens_.has(principal.tokenId)) {
        reader->end();
    }
}

HttpResponse App::failure(int status, const std::string& detail) {
    const std::string id = nextRequestId();
    metrics_.countRefusal(status);
    log_.writeRefusal(id, std::to_string(status) + " " + detail);
    return problem(status, detail, id);
}

void App::handle(HttpRequest request, const Principal& principal, Done done) {
    const auto job =
        std::make_shared<Job>(Job{{std::move(request), {}, principal, nextRequestId()}, std::move(done)});
    try {
        route(job);
    } catch (const std::exception& error) {
        finish(job->done, job->call, internalError(error.what(), job->call));
    }
}

void App::route(const JobPointer& job) {
    Call& call = job->call;
    auto path = pathSegments(call.request.path());
    if (!path) {
        finish(job->done, call, problem(400, "The path is not valid percent-encoded UTF-8.", call.id));
        return;
    }
    call.path = std::move(*path);
    std::string allow;
    for (const Route& each : routes_) {
        if (!matches(call.path, each.path)) {
            continue;
        }
        if (call.request.method == each.method) {
            submit(job, each);
            return;
        }
        allow += (allow.empty() ? "" : ", ") + each.method;
    }
    finish(job->done, call, allow.empty() ? notFound(call) : notAllowed(call, allow));
}

void App::submit(const JobPointer& job, const Route& route) {
    if (route.adminOnly && job->call.principal.role != Role::admin) {
        finish(job->done, job->call, problem(403, "This needs the role admin.", job->call.id));
        return;
    }
    const bool accepted = order_.submit(
        route.kind, job->call.principal.holder,
        [this, job, &route] { finish(job->done, job->call, answer(route, job->call)); },
        job->call.request.body.size());
    if (!accepted) {
        finish(job->done, job->call, tooBusy(job->call));
    }
}

HttpResponse App::answer(const Route& route, const Call& call) {
    const ChangeUnderWay change(route.kind);
    try {
        return route.answer(call);
    } catch (const TokenError& error) {
        log_.write(call.id, error.what());
        return problem(500, error.what(), call.id);
    } catch (const std::exception& error) {
        return internalError(error.what(), call);
    }
}

HttpResponse App::internalError(const std::string& reason, const Call& call) {
    log_.write(call.id, "internal error: " + reason);
    return problem(500, "veltd failed. Its log has the reason under this request id.", call.id);
}

} // namespace velt::host
