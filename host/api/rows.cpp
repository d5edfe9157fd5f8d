#include "host/api/rows.h"

#include "base/json_value.h"
#include "host/api/parameter_check.h"
#include "host/api/problem.h"
#include "host/api/row_answer.h"
#include "host/api/service_status.h"
#include "host/base/json.h"

#include <array>
#include <cstdio>
#include <utility>

namespace velt::host {

namespace {

std::string milliseconds(double seconds) {
    std::array<char, 32> text{};
    std::snprintf(text.data(), text.size(), "%.1f ms", seconds * 1000);
    return text.data();
}

} // namespace

Rows::Rows(const ModuleTable& table, const OpenApi& openApi, Metrics& metrics, EventHub& events, HostLog& log)
    : table_(table), openApi_(openApi), metrics_(metrics), events_(events), log_(log) {}

std::vector<Route> Rows::routes() {
    using Kind = RequestOrder::Kind;
    std::vector<Route> routes{
        {"GET", {"api"}, false, Kind::unordered, [this](const Call&) { return list(); }}};
    for (const Row* row : table_.rows()) {
        Route route{"POST",
                    {"api", row->api, "v" + std::to_string(row->version), row->method},
                    !row->reads(),
                    row->reads() ? Kind::read : Kind::write,
                    [this, row](const Call& request) { return call(*row, request); },
                    !row->reads() && openApi_.takesLists(*row)};
        if (row->callableByGet()) {
            routes.push_back(route);
            routes.back().method = "GET";
        }
        routes.push_back(std::move(route));
    }
    return routes;
}

HttpResponse Rows::list() const {
    const auto describe = [](const Row* row) {
        return jsonObject(
            {{"api", row->api}, {"version", row->version}, {"method", row->method}, {"read", row->reads()}});
    };
    return jsonResponse(200, jsonObject({{"rows", jsonArray(table_.rows(), describe)}}));
}

HttpResponse Rows::call(const Row& row, const Call& call) {
    const auto parameters = parseObject(call.request.body);
    if (!parameters) {
        return notAnObject(parameters.error(), " Nothing was changed.", call.id);
    }
    if (const auto unfit = findUnfitText(row, *parameters)) {
        return fieldProblem(422, *unfit, " Nothing was changed.", call.id);
    }
    // Writes run one at a time, so nothing can come between this check and the change.
    if (!row.reads() && !revision_.allows(call.request.ifMatch)) {
        return problem(412, "The settings have changed since they were read. Nothing was changed.", call.id);
    }
    return callAndAnswer(row, *parameters, call);
}

HttpResponse Rows::callAndAnswer(const Row& row, const Json::Value& parameters, const Call& call) {
    Outcome outcome = callRow(row, parameters, call.principal.actor, call.principal.address);
    countStarts(outcome.platform);
    if (!row.reads() && outcome.kind == Outcome::Kind::success) {
        // A change that finds nothing to do must not hide that an earlier one failed half-way.
        outcome.down = startWhatIsDown(call.principal);
    }
    HttpResponse response = answerFor(row, parameters, outcome, openApi_, call.id);
    metrics_.countRequest(row, outcome);
    logOutcome(row, outcome, response.status, call);
    if (outcome.platform.changed) {
        revision_.advance();
    }
    response.headers.emplace_back("ETag", revision_.tag());
    if (!row.reads() && outcome.platform.changed) {
        publishChange(row, call);
    }
    return response;
}

std::vector<ServiceDown> Rows::startWhatIsDown(const Principal& principal) {
    std::vector<ServiceDown> down = servicesDown();
    if (down.empty()) {
        return down;
    }
    PlatformRequest platform(principal.actor, principal.address);
    (void)startEnabledServices(); // servicesDown tells what failed
    countStarts(platform.finish());
    return servicesDown();
}

void Rows::countStarts(const PlatformReport& platform) {
    for (const std::string& service : platform.started) {
        metrics_.countDaemonStart(service);
    }
}

void Rows::publishChange(const Row& row, const Call& call) {
    events_.publish("request", jsonObject({{"api", row.api},
                                           {"version", row.version},
                                           {"method", row.method},
                                           {"actor", call.principal.actor},
                                           {"request_id", call.id}}));
}

void Rows::logOutcome(const Row& row, const Outcome& outcome, int status, const Call& call) {
    for (const std::string& line : outcome.logLines) {
        log_.write(call.id, "module: " + line);
    }
    if (!outcome.defect.empty()) {
        log_.write(call.id, "defect of the module: " + outcome.defect);
    }
    if (!outcome.platform.sentence.empty()) {
        log_.write(call.id, "platform: " + outcome.platform.sentence);
    }
    if (!outcome.down.empty()) {
        log_.write(call.id, sentenceOf(outcome.down));
    }
    log_.write(call.id, row.name() + " for " + call.principal.actor + " at " + call.principal.address + ": " +
                            std::to_string(status) + " in " + milliseconds(outcome.seconds));
}

} // namespace velt::host
