#include "host/api/operation_query.h"

#include "base/number_text.h"
#include "base/text.h"
#include "host/base/clock.h"
#include "host/base/query_text.h"

#include <algorithm>
#include <array>
#include <sstream>
#include <string_view>

namespace velt::host {

namespace {

constexpr int mostRecords = 1000;

struct NamedForm {
    std::string_view name;
    std::string_view mediaType;
    OperationForm form;
};

constexpr std::array<NamedForm, 3> forms{{
    {"json", "application/json", OperationForm::json},
    {"jsonl", "application/x-ndjson", OperationForm::jsonLines},
    {"csv", "text/csv", OperationForm::csv},
}};

/// The form of "text/csv;q=0.9, */*"; JSON where none is named.
OperationForm acceptedForm(const std::string& accept) {
    std::istringstream types(lowerCase(accept));
    for (std::string type; std::getline(types, type, ',');) {
        type = type.substr(0, type.find(';'));
        std::erase_if(type, [](char c) { return c == ' ' || c == '\t'; });
        const auto* const known = std::ranges::find(forms, type, &NamedForm::mediaType);
        if (known != forms.end()) {
            return known->form;
        }
    }
    return OperationForm::json;
}

bool takeOperations(const std::string& value, OperationQuery& query) {
    std::istringstream names(value);
    for (std::string name; std::getline(names, name, ',');) {
        const auto operation = operationNamed(name);
        if (!operation) {
            return false;
        }
        query.filter.operations.push_back(*operation);
    }
    return !query.filter.operations.empty();
}

/// `take` returns false for a value other than the expected.
struct Parameter {
    const char* key;
    const char* expected;
    bool (*take)(const std::string& value, OperationQuery& query);
};

constexpr std::array<Parameter, 10> parameters{{
    {"user", "the name of a login",
     [](const std::string& value, OperationQuery& query) {
         query.filter.user = value;
         return true;
     }},
    {"session", "the id of a session",
     [](const std::string& value, OperationQuery& query) {
         query.filter.session = value;
         return true;
     }},
    {"share", "the name of a share",
     [](const std::string& value, OperationQuery& query) {
         query.filter.share = value;
         return true;
     }},
    {"path", "the beginning of a path",
     [](const std::string& value, OperationQuery& query) {
         query.filter.pathPrefix = value;
         return true;
     }},
    {"operation",
     "one or several of login-refused, session-opened, session-closed, upload, download, delete, rename, "
     "make-folder, remove-folder, mode, owner, times, link or truncate, separated by commas",
     takeOperations},
    {"result", "done, incomplete or refused",
     [](const std::string& value, OperationQuery& query) {
         query.filter.result = operationResultNamed(value);
         return query.filter.result.has_value();
     }},
    {"from", "a time such as 2026-11-21T06:30:00Z",
     [](const std::string& value, OperationQuery& query) {
         query.filter.from = parseTimestamp(value);
         return query.filter.from.has_value();
     }},
    {"until", "a time such as 2026-11-21T06:30:00Z",
     [](const std::string& value, OperationQuery& query) {
         query.filter.until = parseTimestamp(value);
         return query.filter.until.has_value();
     }},
    {"before", "the \"next\" of another page",
     [](const std::string& value, OperationQuery& query) {
         query.filter.before = parseOperationKey(value);
         return query.filter.before.has_value();
     }},
    {"limit", "a number from 1 to 1000",
     [](const std::string& value, OperationQuery& query) {
         const auto number = parseNumber(value);
         query.filter.limit = static_cast<int>(std::clamp<std::int64_t>(number.value_or(0), 0, mostRecords));
         return number && query.filter.limit == *number && *number > 0;
     }},
}};

constexpr const char* formKey = "format";

std::optional<OperationForm> formNamed(const std::string& name) {
    const auto* const known = std::ranges::find(forms, name, &NamedForm::name);
    return known == forms.end() ? std::nullopt : std::optional(known->form);
}

/// What is wrong with the parameter, if anything.
std::optional<FieldError> take(const QueryParameter& parameter, OperationQuery& query) {
    const auto& [key, value] = parameter;
    if (!value || value->find('\0') != std::string::npos) {
        return FieldError{key, "percent-encoded UTF-8 without U+0000"};
    }
    if (key == formKey) {
        const auto form = formNamed(*value);
        query.form = form.value_or(query.form);
        return form ? std::nullopt : std::optional(FieldError{key, "json, jsonl or csv"});
    }
    const auto* const known = std::ranges::find(parameters, key, &Parameter::key);
    if (known == parameters.end()) {
        return FieldError{key, "one of user, session, share, path, operation, result, from, until, before, "
                               "limit or format"};
    }
    // An empty filter lets everything through.
    const bool good = value->empty() || known->take(*value, query);
    return good ? std::nullopt : std::optional(FieldError{key, known->expected});
}

} // namespace

std::variant<OperationQuery, FieldError> parseOperationQuery(const std::string& query,
                                                             const std::string& accept) {
    OperationQuery result;
    result.form = acceptedForm(accept);
    const auto given = queryParameters(query);
    if (const auto repeated = repeatedKey(given)) {
        return FieldError{*repeated, oneValue};
    }
    for (const QueryParameter& parameter : given) {
        if (auto wrong = take(parameter, result)) {
            return *wrong;
        }
    }
    return result;
}

} // namespace velt::host
