#include "host/api/openapi.h"

#include "base/number_text.h"
#include "host/api/json_schema.h"
#include "host/api/openapi_document.h"
#include "host/base/json.h"

#include <valijson/adapters/jsoncpp_adapter.hpp>
#include <valijson/schema.hpp>
#include <valijson/schema_parser.hpp>
#include <valijson/validator.hpp>

#include <algorithm>
#include <map>
#include <stdexcept>

namespace velt::host {

namespace {

using Adapter = valijson::adapters::JsonCppAdapter;
using Path = std::vector<std::string>;

std::string pathOf(const Row& row) {
    return "/api/" + row.api + "/v" + std::to_string(row.version) + "/" + row.method;
}

/// Turns "<root>", "[rules]", "[2]" into "rules", "2".
Path withoutBrackets(const Path& context) {
    Path path;
    for (std::size_t i = 1; i < context.size(); ++i) {
        const std::string& element = context[i];
        path.push_back(element.substr(1, element.size() - 2));
    }
    return path;
}

/// Turns "rules", "2", "name" into "rules[2].name".
std::string fieldName(const Path& path) {
    std::string name;
    for (const std::string& element : path) {
        const bool isIndex = parseNumber(element).has_value();
        name += isIndex ? "[" + element + "]" : (name.empty() ? "" : ".") + element;
    }
    return name;
}

/// The property that the validator reports as missing, which it does in words only; "" for other reports.
std::string missingProperty(const std::string& description) {
    constexpr std::string_view words = "Missing required property '";
    if (!description.starts_with(words)) {
        return "";
    }
    const std::size_t end = description.find('\'', words.size());
    return description.substr(words.size(), end - words.size());
}

/// A parameter that is null counts as absent.
Json::Value withoutNulls(const Json::Value& parameters) {
    Json::Value given(Json::objectValue);
    for (const std::string& name : parameters.getMemberNames()) {
        if (!parameters[name].isNull()) {
            given[name] = parameters[name];
        }
    }
    return given;
}

} // namespace

struct OpenApi::Schemas {
    struct Body {
        Json::Value source;
        valijson::Schema compiled;
    };
    std::map<std::string, std::unique_ptr<Body>> byPath;
};

OpenApi::OpenApi() : text_(openApiDocument), schemas_(std::make_unique<Schemas>()) {
    auto document = parseObject(text_);
    if (!document) {
        throw std::runtime_error("The description of the API is damaged: " + document.error().message + ".");
    }
    const Json::Value& paths = (*document)["paths"];
    for (const std::string& path : paths.getMemberNames()) {
        const Json::Value request = flatSchema(*document, paths[path]["post"]["requestBody"]);
        if (!request.isObject()) {
            continue;
        }
        auto body = std::make_unique<Schemas::Body>();
        body->source = request["content"]["application/json"]["schema"];
        valijson::SchemaParser parser;
        parser.populateSchema(Adapter(withBounds(body->source)), body->compiled);
        schemas_->byPath.emplace(path, std::move(body));
    }
}

OpenApi::~OpenApi() = default;

std::vector<FieldError> OpenApi::explain(const Row& row, const Json::Value& parameters) const {
    std::vector<FieldError> errors;
    const auto found = schemas_->byPath.find(pathOf(row));
    if (found == schemas_->byPath.end()) {
        return errors;
    }
    const Schemas::Body& body = *found->second;
    // As strict about types as the module: the text "21" is not a number.
    valijson::Validator validator(valijson::Validator::kStrongTypes);
    valijson::ValidationResults results;
    const Json::Value given = withoutNulls(parameters);
    validator.validate(body.compiled, Adapter(given), &results);
    for (const auto& error : results) {
        Path path = withoutBrackets(error.context);
        const std::string missing = missingProperty(error.description);
        if (!missing.empty()) {
            path.push_back(missing);
        }
        const std::string field = fieldName(path);
        // The validator reports the outer schemas of a nested one as well, which adds nothing.
        const bool adds = std::ranges::none_of(errors, [&field](const FieldError& each) {
            return field.empty() || each.field == field || each.field.starts_with(field + "[") ||
                   each.field.starts_with(field + ".");
        });
        if (adds) {
            errors.push_back({field, expectationOf(body.source, path)});
        }
    }
    return errors;
}

bool OpenApi::takesLists(const Row& row) const {
    const auto found = schemas_->byPath.find(pathOf(row));
    return found != schemas_->byPath.end() &&
           std::ranges::any_of(found->second->source["properties"],
                               [](const Json::Value& each) { return each["type"] == "array"; });
}

Route openApiRoute(const OpenApi& openApi) {
    return {"GET", {"openapi.json"}, false, RequestOrder::Kind::unordered, [&openApi](const Call&) {
                return HttpResponse{200, "application/json", openApi.text(), {}};
            }};
}

} // namespace velt::host
