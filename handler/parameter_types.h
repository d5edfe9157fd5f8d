// The types that a request's parameters must have.
#ifndef VELT_HANDLER_PARAMETER_TYPES_H
#define VELT_HANDLER_PARAMETER_TYPES_H

#include <json/value.h>

#include <span>

/// A parameter and the type test that its value must pass.
struct Parameter {
    const char* name;
    bool (Json::Value::*hasType)() const;
};

/// Whether each parameter is present and has its type.
bool haveTypes(const Json::Value& params, std::span<const Parameter> parameters);

/// Whether each parameter is absent, which null is too, or has its type.
bool haveTypesIfPresent(const Json::Value& params, std::span<const Parameter> parameters);

#endif
