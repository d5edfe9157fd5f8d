#include "handler/parameter_types.h"

#include <algorithm>

bool haveTypes(const Json::Value& params, std::span<const Parameter> parameters) {
    return std::all_of(parameters.begin(), parameters.end(), [&params](const Parameter& parameter) {
        return (params[parameter.name].*parameter.hasType)();
    });
}

bool haveTypesIfPresent(const Json::Value& params, std::span<const Parameter> parameters) {
    return std::all_of(parameters.begin(), parameters.end(), [&params](const Parameter& parameter) {
        const Json::Value& value = params[parameter.name];
        return value.isNull() || (value.*parameter.hasType)();
    });
}
