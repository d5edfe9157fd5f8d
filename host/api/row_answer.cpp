#include "host/api/row_answer.h"

#include "base/json_value.h"
#include "host/api/problem.h"
#include "host/api/service_status.h"
#include "host/module/module_log.h"

#include <algorithm>
#include <array>

namespace velt::host {

namespace {

struct Meaning {
    int code;
    int status;
    const char* title;
    bool portTaken;
};

constexpr int badParameter = 1901;
constexpr Meaning otherFailure{0, 500, "The operation failed", false};

constexpr std::array<Meaning, 5> meanings{{
    {badParameter, 422, "A parameter is invalid", false},
    {1903, 409, "The FTP port is taken", true},
    {1904, 409, "The passive port range is taken", true},
    {1905, 409, "The share cannot be reached over FTP", false},
    {1951, 409, "The SFTP port is taken", true},
}};

const Meaning& meaningOf(int code) {
    const auto* const found = std::ranges::find(meanings, code, &Meaning::code);
    return found == meanings.end() ? otherFailure : *found;
}

void append(std::string& detail, const std::string& sentence) {
    if (sentence.empty()) {
        return;
    }
    detail += (detail.empty() ? "" : " ") + sentence;
    if (detail.back() != '.' && detail.back() != ']') {
        detail += '.';
    }
}

std::string describe(const FieldError& error) {
    return error.field + ": expected " + error.expected + ".";
}

/// How far a refused change got.
std::string extentOf(const PlatformReport& platform) {
    if (!platform.changed) {
        return "Nothing was changed.";
    }
    if (!platform.stored) {
        return "";
    }
    return platform.storeFailed ? "Some of the new settings are stored." : "The new settings are stored.";
}

std::string detailOf(const Row& row, const Outcome& outcome, const Meaning& meaning,
                     const std::vector<FieldError>& errors) {
    std::string detail;
    append(detail, reasonIn(outcome.logLines));
    for (const FieldError& error : errors) {
        append(detail, describe(error));
    }
    if (meaning.portTaken && !outcome.platform.conflict.holder.empty()) {
        append(detail, "Port " + std::to_string(outcome.platform.conflict.port) + " is held by " +
                           outcome.platform.conflict.holder + ".");
    } else {
        append(detail, outcome.platform.sentence);
    }
    if (!row.reads()) {
        append(detail, extentOf(outcome.platform));
    }
    return detail;
}

HttpResponse refused(const Row& row, const Outcome& outcome, const std::vector<FieldError>& errors,
                     const std::string& requestId) {
    const Meaning& meaning = meaningOf(outcome.code);
    Json::Value members = jsonObject({{"title", meaning.title},
                                      {"code", outcome.code},
                                      {"detail", detailOf(row, outcome, meaning, errors)}});
    if (!row.reads()) {
        members["changed"] = outcome.platform.changed;
    }
    for (const FieldError& error : errors) {
        members["errors"].append(toObject(error));
    }
    if (meaning.portTaken && !outcome.platform.conflict.holder.empty()) {
        members["holder"] = outcome.platform.conflict.holder;
    }
    return problemWith(meaning.status, std::move(members), requestId);
}

/// The module accepted the request, but a service that is switched on does not run.
HttpResponse serviceDown(const Outcome& outcome, const std::string& requestId) {
    const std::string extent = outcome.platform.changed ? "The change is stored. " : "Nothing was changed. ";
    const auto describe = [](const ServiceDown& down) { return toObject(down); };
    return problemWith(500,
                       jsonObject({{"title", "A service that is switched on does not run"},
                                   {"detail", extent + sentenceOf(outcome.down)},
                                   {"changed", outcome.platform.changed},
                                   {"down", jsonArray(outcome.down, describe)}}),
                       requestId);
}

} // namespace

HttpResponse answerFor(const Row& row, const Json::Value& parameters, const Outcome& outcome,
                       const OpenApi& openApi, const std::string& requestId) {
    switch (outcome.kind) {
    case Outcome::Kind::success:
        if (!outcome.down.empty()) {
            return serviceDown(outcome, requestId);
        }
        return outcome.data.isNull() ? HttpResponse{204, "", "", {}} : jsonResponse(200, outcome.data);
    case Outcome::Kind::refused:
        return refused(row, outcome,
                       outcome.code == badParameter ? openApi.explain(row, parameters)
                                                    : std::vector<FieldError>{},
                       requestId);
    default:
        return problem(500,
                       "The module is faulty: " + outcome.defect +
                           ". The log of veltd says more under this request id.",
                       requestId);
    }
}

} // namespace velt::host
