#include "host/api/row_answer.h"

#include "base/json_value.h"
#include "host/api/failure_kind.h"
#include "host/api/problem.h"
#include "host/module/module_log.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace velt::host {

namespace {

struct Meaning {
    int code; ///< the module's
    int status;
    const char* title;
    const char* field = "";    ///< that is at fault; "" when the code does not say
    const char* expected = ""; ///< of the field
    bool portTaken = false;
};

constexpr int badParameter = 1901;
constexpr const char* freePort = "a free port";

constexpr std::array<Meaning, 5> meanings{{
    {badParameter, 422, "A parameter is invalid"},
    {1903, 409, "The FTP port is taken", "portnum", freePort, true},
    {1904, 409, "The passive port range is taken", "custom_port", freePort, true},
    {1905, 409, "The share cannot be reached over FTP", "anonymous_chroot_share",
     "a share that is offered over FTP"},
    {1951, 409, "The SFTP port is taken", "portnum", freePort, true},
}};

constexpr const char* oneFreePort = "a port from 1 to 65535";
constexpr const char* freePorts = "first and last port from 1024 to 65535, such as 55536:55899";

bool isOnePort(std::string_view field) {
    return field == "portnum";
}

const Meaning* knownMeaning(int code) {
    const auto* const found = std::ranges::find(meanings, code, &Meaning::code);
    return found == meanings.end() ? nullptr : found;
}

/// Whether the platform could not tell if the port can be had, which the module takes for a conflict.
bool isUntold(const Outcome& outcome) {
    constexpr std::array told{ErrorNumber::none, ErrorNumber::invalid, ErrorNumber::portTaken};
    const Meaning* const meaning = knownMeaning(outcome.code);
    const PlatformReport& platform = outcome.platform;
    return meaning != nullptr && meaning->portTaken && platform.conflict.holder.empty() &&
           platform.conflict.sentence.empty() && std::ranges::find(told, platform.error) == told.end();
}

Meaning meaningOf(const Outcome& outcome) {
    const Meaning* const found = knownMeaning(outcome.code);
    // A failure for which the module has no code of its own.
    if (found == nullptr || isUntold(outcome)) {
        const FailureKind kind = kindOf(outcome.platform.error);
        return {outcome.code, kind.status, kind.title};
    }
    // A port that nobody holds is none.
    const FailureKind cannotBe = kindOf(ErrorNumber::invalid);
    return found->portTaken && outcome.platform.conflict.holder.empty()
               ? Meaning{outcome.code, cannotBe.status, cannotBe.title, found->field,
                         isOnePort(found->field) ? oneFreePort : freePorts}
               : *found;
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

std::string detailOf(const Row& row, const Outcome& outcome, const Meaning& meaning,
                     const std::vector<FieldError>& errors) {
    std::string detail;
    if (meaning.portTaken) { // the module only says that there is a conflict
        append(detail, outcome.platform.conflict.sentence);
    } else if (*meaning.field != '\0' && meaning.status == kindOf(ErrorNumber::invalid).status) {
        append(detail, describe({meaning.field, meaning.expected}));
    } else {
        const std::string reason = isUntold(outcome) ? "" : reasonIn(outcome.logLines);
        // One that ends with places in the platform's sources is for its log.
        const bool isForPeople = !reason.ends_with(']') || outcome.platform.sentence.empty();
        append(detail, isForPeople ? reason : "");
        for (const FieldError& error : errors) {
            append(detail, describe(error));
        }
        append(detail, outcome.platform.sentence);
    }
    if (!row.reads()) {
        append(detail, "Nothing was changed.");
    }
    return detail;
}

/// What is wrong with the parameters, as far as their schema or the code says.
std::vector<FieldError> errorsOf(const Row& row, const Json::Value& parameters, const Outcome& outcome,
                                 const OpenApi& openApi) {
    if (outcome.code == badParameter) {
        return openApi.explain(row, parameters);
    }
    const Meaning meaning = meaningOf(outcome);
    return *meaning.field == '\0' ? std::vector<FieldError>{}
                                  : std::vector<FieldError>{{meaning.field, meaning.expected}};
}

HttpResponse refused(const Row& row, const Outcome& outcome, const std::vector<FieldError>& errors,
                     const std::string& requestId) {
    const Meaning meaning = meaningOf(outcome);
    // The title says what is wrong with the field of a code.
    const bool explain = outcome.code == badParameter;
    Json::Value members = jsonObject(
        {{"title", meaning.title},
         {"code", outcome.code},
         {"detail", detailOf(row, outcome, meaning, explain ? errors : std::vector<FieldError>{})}});
    if (!row.reads()) {
        members["changed"] = false;
    }
    for (const FieldError& error : errors) {
        members["errors"].append(toObject(error));
    }
    if (meaning.portTaken) {
        members["holder"] = outcome.platform.conflict.holder;
    }
    return problemWith(meaning.status, std::move(members), requestId);
}

HttpResponse broken(const Outcome& outcome, const std::string& requestId) {
    return problem(500,
                   "The module is faulty: " + outcome.defect +
                       ". The log of veltd says more under this request id.",
                   requestId);
}

} // namespace

HttpResponse answerFor(const Row& row, const Json::Value& parameters, const Outcome& outcome,
                       const OpenApi& openApi, const std::string& requestId) {
    switch (outcome.kind) {
    case Outcome::Kind::success:
        return outcome.data.isNull() ? HttpResponse{204, "", "", {}} : jsonResponse(200, outcome.data);
    case Outcome::Kind::refused:
        return refused(row, outcome, errorsOf(row, parameters, outcome, openApi), requestId);
    default:
        return broken(outcome, requestId);
    }
}

HttpResponse sectionRefusal(const std::string& section, const Row& row, const Json::Value& parameters,
                            const Outcome& outcome, const OpenApi& openApi, const std::string& requestId) {
    if (outcome.kind == Outcome::Kind::broken) {
        return broken(outcome, requestId);
    }
    auto errors = errorsOf(row, parameters, outcome, openApi);
    for (FieldError& error : errors) {
        error.field.insert(0, "/" + section + "/");
    }
    return refused(row, outcome, errors, requestId);
}

} // namespace velt::host
