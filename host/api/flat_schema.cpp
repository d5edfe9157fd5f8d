#include "host/api/flat_schema.h"

#include <sstream>
#include <string>

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

} // namespace velt::host
