#include "host/api/json_schema.h"

#include "host/base/json.h"

#include <sstream>

namespace velt::host {

namespace {

const Json::Value& referredTo(const Json::Value& document, const std::string& reference) {
    const Json::Value* place = &document;
    std::istringstream names(reference.substr(reference.find('/') + 1));
    for (std::string name; std::getline(names, name, '/');) {
        place = &(*place)[name];
    }
    return *place;
}

void merge(Json::Value& into, const Json::Value& from) {
    for (const std::string& name : from.getMemberNames()) {
        Json::Value& member = into[name];
        if (member.isObject() && from[name].isObject()) {
            merge(member, from[name]);
        } else if (member.isArray() && from[name].isArray()) {
            for (const Json::Value& each : from[name]) {
                member.append(each);
            }
        } else {
            member = from[name];
        }
    }
}

std::string alternatives(const Json::Value& values) {
    std::string words;
    for (Json::ArrayIndex i = 0; i < values.size(); ++i) {
        words += (i == 0 ? "" : (i + 1 == values.size() ? " or " : ", ")) + toJson(values[i]);
    }
    return words;
}

std::string integerWords(const Json::Value& schema) {
    if (schema.isMember("minimum") && schema.isMember("maximum")) {
        return "a number from " + schema["minimum"].asString() + " to " + schema["maximum"].asString();
    }
    return schema.isMember("minimum") && !schema.isMember("x-expected")
               ? "a number of at least " + schema["minimum"].asString()
               : "a number";
}

std::string wordsFor(const Json::Value& schema) {
    if (schema.isMember("enum")) {
        return alternatives(schema["enum"]);
    }
    const std::string type = schema["type"].asString();
    if (type == "boolean") {
        return "true or false";
    }
    if (type == "integer") {
        return integerWords(schema);
    }
    if (type == "string") {
        return schema["minLength"].asInt() > 0 ? "a non-empty string" : "a string";
    }
    if (type == "array") {
        return schema["minItems"].asInt() > 0 ? "a list with at least one element" : "a list";
    }
    return type == "object" ? "an object" : "a different value";
}

} // namespace

Json::Value flatSchema(const Json::Value& document, const Json::Value& part) {
    if (part.isObject() && part.isMember("$ref")) {
        return flatSchema(document, referredTo(document, part["$ref"].asString()));
    }
    Json::Value flat = part;
    for (Json::Value& each : flat) {
        each = flatSchema(document, each);
    }
    if (flat.isObject() && flat.isMember("allOf")) {
        Json::Value parts;
        flat.removeMember("allOf", &parts);
        parts.append(flat);
        flat = Json::objectValue;
        for (const Json::Value& each : parts) {
            merge(flat, each);
        }
    }
    return flat;
}

Json::Value withBounds(Json::Value schema) {
    if (schema.isObject() && schema.get("format", "") == "int32") {
        schema.removeMember("format");
        schema["minimum"] = schema.get("minimum", Json::Value::minInt);
        schema["maximum"] = schema.get("maximum", Json::Value::maxInt);
    }
    for (Json::Value& each : schema) {
        each = withBounds(each);
    }
    return schema;
}

std::string expectationOf(const Json::Value& schema, const std::vector<std::string>& path) {
    const Json::Value* place = &schema;
    for (const std::string& element : path) {
        const Json::Value& properties = (*place)["properties"];
        if (properties.isObject() && properties.isMember(element)) {
            place = &properties[element];
        } else if ((*place)["items"].isObject()) {
            place = &(*place)["items"];
        } else {
            return "a different value";
        }
    }
    const std::string words = wordsFor(*place);
    const Json::Value& hint = (*place)["x-expected"];
    return hint.isString() ? words + ": " + hint.asString() : words;
}

} // namespace velt::host
