#include "host/api/rows.h"

#include "base/json_value.h"
#include "host/api/parameter_check.h"
#include "host/api/problem.h"
#include "host/api/row_answer.h"
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

/// The module's answer; with what else is to be said of the change, where it has room for that.
HttpResponse answerOf(const ChangeReport& report, HttpResponse ofModule) {
    if (report.dryRun) {
        return jsonResponse(200, toObject(report));
    }
    const bool hasRoom = ofModule.status == 204;
    const bool hasMore = !report.down.empty() || !report.warnings.empty();
    return hasRoom && hasMore ? jsonResponse(200, toObject(report)) : std::move(ofModule);
}

} // namespace

Rows::Rows(const ModuleTable& table, const OpenApi& openApi, Metrics& metrics, Changes& changes, HostLog& log)
    : table_(table), openApi_(openApi), metrics_(metrics), changes_(changes), log_(log) {}

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
    if (const auto unfit = findUnfitParameter(row, *parameters)) {
        return fieldProblem(422, *unfit, " Nothing was changed.", call.id);
    }
    HttpResponse response = row.reads() ? read(row, *parameters, call) : change(row, *parameters, call);
    response.headers.emplace_back("ETag", changes_.revision().tag());
    return response;
}

HttpResponse Rows::read(const Row& row, const Json::Value& parameters, const Call& call) {
    const Outcome outcome = callRow(row, parameters, call.principal.actor, call.principal.address);
    HttpResponse response = answerFor(row, parameters, outcome, openApi_, call.id);
    note(row, outcome, response.status, call);
    return response;
}

HttpResponse Rows::change(const Row& row, const Json::Value& parameters, const Call& call) {
    const auto options = parseChangeOptions(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&options)) {
        return fieldProblem(400, *bad, " Nothing was changed.", call.id);
    }
    // Writes run one at a time, so nothing can come between this check and the change.
    if (!changes_.revision().allows(call.request.ifMatch)) {
        return problem(412, "The settings have changed since they were read. Nothing was changed.", call.id);
    }
    Outcome outcome;
    const auto made = changes_.make(
        {row.name(), call, std::get<ChangeOptions>(options), {}}, [&]() -> std::optional<HttpResponse> {
            outcome = callRow(row, parameters, call.principal.actor, call.principal.address);
            if (outcome.kind == Outcome::Kind::success) {
                return std::nullopt;
            }
            return answerFor(row, parameters, outcome, openApi_, call.id);
        });
    const auto* const report = std::get_if<ChangeReport>(&made);
    HttpResponse response = report != nullptr
                                ? answerOf(*report, answerFor(row, parameters, outcome, openApi_, call.id))
                                : std::get<HttpResponse>(made);
    outcome.takenBack = report == nullptr && outcome.kind == Outcome::Kind::success;
    note(row, outcome, response.status, call);
    return response;
}

void Rows::note(const Row& row, const Outcome& outcome, int status, const Call& call) {
    metrics_.countRequest(row, outcome);
    for (const std::string& line : outcome.logLines) {
        log_.write(call.id, "module: " + line);
    }
    if (!outcome.defect.empty()) {
        log_.write(call.id, "defect of the module: " + outcome.defect);
    }
    if (!outcome.platform.sentence.empty()) {
        log_.write(call.id, "platform: " + outcome.platform.sentence);
    }
    log_.write(call.id, row.name() + " for " + call.principal.actor + " at " + call.principal.address + ": " +
                            std::to_string(status) + " in " + milliseconds(outcome.seconds));
}

} // namespace velt::host
