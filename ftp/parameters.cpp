#include "ftp/parameters.h"

#include "handler/parameter_types.h"

#include <cstdio>

namespace {

constexpr Parameter requiredKeys[] = {
    {"enable_ftp", &Json::Value::isBool},
    {"enable_ftps", &Json::Value::isBool},
};

constexpr Parameter optionalKeys[] = {
    {"timeout", &Json::Value::isInt},
    {"portnum", &Json::Value::isInt},
    {"custom_port_range", &Json::Value::isBool},
    {"custom_port", &Json::Value::isString},
    {"use_ext_ip", &Json::Value::isBool},
    {"ext_ip", &Json::Value::isString},
    {"enable_fxp", &Json::Value::isBool},
    {"enable_fips", &Json::Value::isBool},
    {"enable_ascii", &Json::Value::isBool},
    {"enable_flow_ctrl", &Json::Value::isBool},
    {"maxuploadrate", &Json::Value::isInt},
    {"maxdownloadrate", &Json::Value::isInt},
    {"max_conn_per_ip", &Json::Value::isInt},
};

constexpr Parameter supportUtf8 = {"enable_utf8", &Json::Value::isBool};
constexpr Parameter useUtf8 = {"use_utf8", &Json::Value::isBool};
constexpr Parameter utf8Mode = {"utf8_mode", &Json::Value::isInt};

const Parameter& utf8Parameter(int version) {
    if (version > 2) {
        return utf8Mode;
    }
    return version == 2 ? useUtf8 : supportUtf8;
}

} // namespace

const char* utf8Key(int version) {
    return utf8Parameter(version).name;
}

bool haveFTPTypes(const Json::Value& params) {
    return haveTypes(params, requiredKeys) && haveTypesIfPresent(params, optionalKeys);
}

bool hasUtf8Type(const Json::Value& params, int version) {
    return haveTypesIfPresent(params, {&utf8Parameter(version), 1});
}

bool hasUtf8Value(const Json::Value& params, int version) {
    const Json::Value& mode = params[utf8Mode.name];
    return version <= 2 || mode.isNull() || (mode.asInt() >= 0 && mode.asInt() <= 2);
}

bool hasEmptyText(const Json::Value& params, const char* key) {
    return !params[key].isNull() && params[key].asString().empty();
}

ParsedRange parseRange(const Json::Value& text) {
    ParsedRange range;
    // sscanf, because what it leaves unread is part of the behaviour: the port collision test then sees 0.
    range.matched = std::sscanf(text.asCString(), "%d:%d", &range.first, &range.last); // NOLINT(cert-err34-c)
    return range;
}
