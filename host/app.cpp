#include "host/app.h"

#include "host/admin_log_json.h"
#include "host/json_text.h"
#include "host/module_answer.h"
#include "host/module_call.h"
#include "host/percent_encoding.h"
#include "host/problem.h"
#include "host/random_text.h"
#include "host/services.h"

#include <algorithm>
#include <cstdio>
#include <exception>
#include <utility>

namespace velt::host {

namespace {

using Path = std::vector<std::string>;

const Path eventsPath{"events"};

struct RowName {
    std::string api;
    int version = 0;
    std::string method;
};

/// "api", name, "v" and version, method; nothing when the path is none of these.
std::optional<RowName> rowNameOf(const Path& path) {
    if (path.size() != 4 || path[0] != "api") {
        return std::nullopt;
    }
    const std::string& version = path[2];
    const bool number = version.size() >= 2 && version.size() <= 7 && version[0] == 'v' &&
                        version[1] != '0' && version.find_first_not_of("0123456789", 1) == std::string::npos;
    if (!number) {
        return std::nullopt;
    }
    return RowName{path[1], std::stoi(version.substr(1)), path[3]};
}

bool matches(const Path& path, const Path& pattern) {
    return std::equal(path.begin(), path.end(), pattern.begin(), pattern.end(),
                      [](const std::string& segment, const std::string& wanted) {
                          return wanted == "*" || segment == wanted;
                      });
}

std::string milliseconds(double seconds) {
    std::array<char, 32> text{};
    std::snprintf(text.data(), text.size(), "%.1f ms", seconds * 1000);
    return text.data();
}

} // namespace

App::App(const AppSettings& settings, const ModuleTable& table, HostLog& log)
    : table_(table), log_(log), tokens_(settings.tokenFile), access_(settings.access, tokens_, log),
      order_(settings.workers, settings.maxWaiting) {
    observe();
}

App::~App() {
    stop();
    unobservePlatform();
}

void App::stop() {
    order_.stop();
}

void App::observe() {
    PlatformObserver observer;
    observer.serviceAction = [this](const std::string& service, const std::string& action) {
        Json::Value data(Json::objectValue);
        data["service"] = service;
        data["action"] = action;
        events_.publish("service", data);
    };
    observer.logEntry = [this](const AdminLogEntry& entry) { events_.publish("log", toObject(entry)); };
    observer.daemonStarted = [this](const std::string& service) { metrics_.countDaemonStart(service); };
    observePlatform(std::move(observer));
}

std::optional<Refusal> App::checkAccess(const HttpRequest& head, const Peer& peer, Principal& principal) {
    auto refusal = access_.check(head, peer, principal);
    if (refusal) {
        metrics_.countRefusal(refusal->response.status);
    }
    return refusal;
}

bool App::asksForEvents(const HttpRequest& request) const {
    return request.method == "GET" && pathSegments(request.path()) == eventsPath;
}

void App::addEventReader(const std::shared_ptr<EventReader>& reader) {
    events_.add(reader);
}

HttpResponse App::failure(int status, const std::string& detail) {
    const std::string id = nextRequestId();
    metrics_.countRefusal(status);
    log_.write(id, std::to_string(status) + " " + detail);
    return problem(status, detail, id);
}

void App::handle(HttpRequest request, const Principal& principal, Done done) {
    const auto job =
        std::make_shared<Job>(Job{std::move(request), {}, principal, nextRequestId(), std::move(done)});
    try {
        route(job);
    } catch (const std::exception& error) {
        log_.write(job->id, std::string("internal error: ") + error.what());
        finish(job, problem(500, "The host failed. Its log has more under this request's id.", job->id));
    }
}

void App::route(const JobPointer& job) {
    auto path = pathSegments(job->request.path());
    if (!path) {
        finish(job, problem(400, "The path is not encoded as it must be.", job->id));
        return;
    }
    job->path = std::move(*path);
    if (!routeToEndpoint(job)) {
        routeToRow(job);
    }
}

bool App::routeToEndpoint(const JobPointer& job) {
    std::string allow;
    for (const Endpoint& endpoint : endpoints()) {
        if (!matches(job->path, endpoint.path)) {
            continue;
        }
        if (job->request.method != endpoint.method) {
            allow += (allow.empty() ? "" : ", ") + std::string(endpoint.method);
            continue;
        }
        if (endpoint.adminOnly && job->principal.role != Role::admin) {
            finish(job, problem(403, "This needs the role admin.", job->id));
            return true;
        }
        run(job, endpoint.kind, [this, job, answer = endpoint.answer] { return (this->*answer)(*job); });
        return true;
    }
    if (job->path == eventsPath) {
        allow = "GET";
    }
    if (!allow.empty()) {
        finish(job, notAllowed(*job, allow));
    }
    return !allow.empty();
}

void App::routeToRow(const JobPointer& job) {
    const auto name = rowNameOf(job->path);
    const Row* const row = name ? table_.find(name->api, name->version, name->method) : nullptr;
    if (row == nullptr) {
        finish(job, problem(404, "Nothing is served at " + job->request.path() + ". GET /api lists the rows.",
                            job->id));
        return;
    }
    const std::string& method = job->request.method;
    if (method != "POST" && (method != "GET" || !row->callableByGet())) {
        finish(job, notAllowed(*job, row->callableByGet() ? "GET, POST" : "POST"));
    } else if (!row->reads() && job->principal.role != Role::admin) {
        finish(job, problem(403, "The role viewer only reads; " + row->method + " needs the role admin.",
                            job->id));
    } else {
        serveRow(job, *row);
    }
}

void App::serveRow(const JobPointer& job, const Row& row) {
    ParsedObject parsed = parseObject(job->request.body);
    if (!parsed.error.empty()) {
        finish(job, problem(400, "The body is no JSON object: " + parsed.error + ". Nothing was changed.",
                            job->id));
        return;
    }
    const auto kind = row.reads() ? RequestOrder::Kind::read : RequestOrder::Kind::write;
    run(job, kind, [this, job, &row, parameters = std::move(parsed.value)] {
        return callAndAnswer(*job, row, parameters);
    });
}

HttpResponse App::callAndAnswer(const Job& job, const Row& row, const Json::Value& parameters) {
    // Writes run one at a time, so nothing comes between this look and the change.
    if (!row.reads() && !revision_.allows(job.request.ifMatch)) {
        return problem(412, "The settings have changed since they were read. Nothing was changed.", job.id);
    }
    Outcome outcome = callRow(row, parameters, job.principal);
    if (!row.reads() && outcome.kind == Outcome::Kind::success) {
        // A change that found nothing to do must not hide that an earlier one ended half-way.
        outcome.down = startWhatIsDown(job.principal);
    }
    HttpResponse response = answerFor(row, parameters, outcome, openApi_, job.id);
    metrics_.countRequest(row, outcome);
    logOutcome(job, row, outcome, response.status);
    if (outcome.platform.changed) {
        revision_.advance();
    }
    response.headers.emplace_back("ETag", revision_.tag());
    if (!row.reads() && outcome.platform.changed) {
        Json::Value data(Json::objectValue);
        data["api"] = row.api;
        data["version"] = row.version;
        data["method"] = row.method;
        data["actor"] = job.principal.actor;
        data["request_id"] = job.id;
        events_.publish("request", data);
    }
    return response;
}

void App::logOutcome(const Job& job, const Row& row, const Outcome& outcome, int status) {
    for (const std::string& line : outcome.logLines) {
        log_.write(job.id, "module: " + line);
    }
    if (!outcome.defect.empty()) {
        log_.write(job.id, "defect of the module: " + outcome.defect);
    }
    if (!outcome.platform.sentence.empty()) {
        log_.write(job.id, "platform: " + outcome.platform.sentence);
    }
    if (!outcome.down.empty()) {
        log_.write(job.id, sentenceOf(outcome.down));
    }
    log_.write(job.id, row.name() + " for " + job.principal.actor + " at " + job.principal.address + ": " +
                           std::to_string(status) + " in " + milliseconds(outcome.seconds));
}

void App::run(const JobPointer& job, RequestOrder::Kind kind, std::function<HttpResponse()> answer) {
    const bool accepted = order_.submit(kind, [this, job, answer = std::move(answer)] {
        HttpResponse response;
        try {
            response = answer();
        } catch (const TokenError& error) {
            log_.write(job->id, error.what());
            response = problem(500, error.what(), job->id);
        } catch (const std::exception& error) {
            log_.write(job->id, std::string("internal error: ") + error.what());
            response = problem(500, "The host failed. Its log has more under this request's id.", job->id);
        }
        finish(job, std::move(response));
    });
    if (!accepted) {
        HttpResponse response =
            problem(503, "Too many requests wait, or the host is stopping. Try again later.", job->id);
        response.headers.emplace_back("Retry-After", "5");
        finish(job, std::move(response));
    }
}

void App::finish(const JobPointer& job, HttpResponse response) {
    response.headers.emplace_back("X-Request-Id", job->id);
    job->done(std::move(response));
}

HttpResponse App::notAllowed(const Job& job, const std::string& allow) {
    HttpResponse response =
        problem(405, "The method " + job.request.method + " is not served here, only " + allow + ".", job.id);
    response.headers.emplace_back("Allow", allow);
    return response;
}

} // namespace velt::host
