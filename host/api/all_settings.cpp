#include "host/api/all_settings.h"

#include "base/json_value.h"
#include "base/sha256.h"
#include "host/api/document_check.h"
#include "host/api/problem.h"
#include "host/api/row_answer.h"
#include "host/api/rules_section.h"
#include "host/api/settings_document.h"
#include "host/base/json.h"
#include "host/module/module_call.h"

#include <algorithm>
#include <utility>

namespace velt::host {

namespace {

constexpr const char* nothing = " Nothing was changed.";

/// The same for the same settings, whoever stored them and however often veltd was started since.
std::string tagOf(const Json::Value& document) {
    return "\"" + sha256(toJson(document)) + "\"";
}

bool allows(const std::string& ifMatch, const Json::Value& document) {
    return ifMatch.empty() || ifMatch == "*" || ifMatch.find(tagOf(document)) != std::string::npos;
}

HttpResponse refused(const std::vector<FieldError>& errors, const std::string& requestId) {
    std::string detail;
    for (const FieldError& error : errors) {
        detail += (detail.empty() ? "" : " ") + error.field + ": expected " + error.expected + ".";
    }
    Json::Value members = jsonObject(
        {{"title", "The settings cannot be like this"}, {"detail", detail + nothing}, {"changed", false}});
    for (const FieldError& error : errors) {
        members["errors"].append(toObject(error));
    }
    return problemWith(422, std::move(members), requestId);
}

FieldError faultOfIgnored(const Json::Value& rule, const std::string& place) {
    const std::string type = rule["type"].asString();
    const std::string name = rule["name"].asString();
    if (!isRuleOwner(type == "user", name)) {
        return {place + "/name", "a " + type + " that exists, not " + name};
    }
    return {place + "/path", "a folder like /home or /SHARE/FOLDER, not " + rule["path"].asString()};
}

/// What was accepted and not taken: a rule for somebody who does not exist, a value that another setting
/// overrules.
std::vector<FieldError> ignoredParts(const Json::Value& wanted, const Json::Value& after) {
    std::vector<FieldError> errors;
    const std::string rules(rulesSection);
    for (const FieldChange& change : differences(after, wanted)) {
        if (change.field != "/" + rules) {
            errors.push_back(
                {change.field, "a value that can take effect; it would stay " + toJson(change.from)});
        }
    }
    for (Json::ArrayIndex i = 0; i < wanted[rules].size(); ++i) {
        const auto isRule = [&](const Json::Value& each) { return each == wanted[rules][i]; };
        if (std::none_of(after[rules].begin(), after[rules].end(), isRule)) {
            errors.push_back(faultOfIgnored(wanted[rules][i], "/" + rules + "/" + std::to_string(i)));
        }
    }
    return errors;
}

/// A document that a former version wrote has no section for what came later: it keeps its values.
Json::Value withLaterSections(Json::Value document, const Json::Value& current) {
    const char* const name = schema::confinement.name;
    if (!document.isMember(name)) {
        document[name] = current[name];
    }
    return document;
}

/// Nothing is staged for a change that is none.
HttpResponse unchanged(const Json::Value& document, const ChangeOptions& options) {
    ChangeReport report;
    report.dryRun = options.dryRun;
    report.down = servicesDown();
    HttpResponse response = jsonResponse(200, toObject(report));
    response.headers.emplace_back("ETag", tagOf(document));
    return response;
}

} // namespace

AllSettings::AllSettings(const ModuleTable& table, const OpenApi& openApi, Changes& changes)
    : table_(table), openApi_(openApi), changes_(changes) {}

std::vector<Route> AllSettings::routes() {
    using Kind = RequestOrder::Kind;
    const auto writing = [this](const char* method, bool isPatch) {
        return Route{method,
                     {"api", "settings"},
                     true,
                     Kind::write,
                     [this, isPatch](const Call& call) { return change(call, isPatch); },
                     true};
    };
    return {
        {"GET", {"api", "settings"}, false, Kind::read, [this](const Call& call) { return get(call); }},
        writing("PUT", false),
        writing("PATCH", true),
    };
}

HttpResponse AllSettings::get(const Call& call) const {
    const auto document = readSettingsDocument(table_, call.principal);
    if (!document) {
        return problem(500, document.error().message, call.id);
    }
    HttpResponse response = jsonResponse(200, *document);
    response.headers.emplace_back("ETag", tagOf(*document));
    return response;
}

HttpResponse AllSettings::change(const Call& call, bool isPatch) {
    const auto options = parseChangeOptions(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&options)) {
        return fieldProblem(400, *bad, nothing, call.id);
    }
    const auto body = parseObject(call.request.body);
    if (!body) {
        return notAnObject(body.error(), nothing, call.id);
    }
    const auto before = readSettingsDocument(table_, call.principal);
    if (!before) {
        return failedUnchanged(before.error(), call.id);
    }
    const Json::Value wanted =
        withNames(isPatch ? patched(*before, *body) : withLaterSections(*body, *before));
    return store(*before, wanted, "settings", std::get<ChangeOptions>(options), call);
}

HttpResponse AllSettings::store(const Json::Value& before, const Json::Value& wanted, const std::string& way,
                                const ChangeOptions& options, const Call& call) {
    // Writes run one at a time, so nothing can come between this check and the change.
    if (!allows(call.request.ifMatch, before)) {
        return problem(412, std::string("The settings have changed since they were read.") + nothing,
                       call.id);
    }
    if (const auto errors = checkSettings(wanted, before); !errors.empty()) {
        return refused(errors, call.id);
    }
    if (differences(before, wanted).empty()) {
        return unchanged(before, options);
    }
    const auto made =
        changes_.make({way, call, options, portsIn(wanted)}, [&] { return ask(before, wanted, call); });
    if (const auto* const refusal = std::get_if<HttpResponse>(&made)) {
        return *refusal;
    }
    HttpResponse response = jsonResponse(200, toObject(std::get<ChangeReport>(made)));
    // Some of what was wanted may be stored in another form, such as a range that is not in use.
    if (const auto now = readSettingsDocument(table_, call.principal)) {
        response.headers.emplace_back("ETag", tagOf(*now));
    }
    return response;
}

/// Calls the rows that lead to the wanted settings. The problem of the first that is refused, or what they
/// ignored.
std::optional<HttpResponse> AllSettings::ask(const Json::Value& before, const Json::Value& wanted,
                                             const Call& call) const {
    if (const auto stored = storePlatformSettings(before, wanted); !stored) {
        return failedUnchanged(stored.error(), call.id);
    }
    for (const SettingsCall& each : callsFor(before, wanted)) {
        const Row* const row = table_.find(each.api, each.version, each.method);
        if (row == nullptr) {
            return failedUnchanged("The module has no method " + each.method + " for " + each.section + ".",
                                   call.id);
        }
        const Outcome outcome = callRow(*row, each.parameters, call.principal.actor, call.principal.address);
        if (outcome.kind != Outcome::Kind::success) {
            return sectionRefusal(each.section, *row, each.parameters, outcome, openApi_, call.id);
        }
        if (each.section == rulesSection) {
            if (const auto stored = storeUnnamedRules(wanted[each.section]); !stored) {
                return failedUnchanged(stored.error(), call.id);
            }
        }
    }
    const auto after = readSettingsDocument(table_, call.principal);
    if (!after) {
        return failedUnchanged(after.error(), call.id);
    }
    const auto ignored = ignoredParts(wanted, *after);
    return ignored.empty() ? std::nullopt : std::optional(refused(ignored, call.id));
}

} // namespace velt::host
