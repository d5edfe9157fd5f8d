#include "cli/json_io.h"

#include "base/printable.h"
#include "cli/failure.h"

#include <ostream>

namespace velt::cli {

Json::Value readJsonFile(Console& console, const std::string& name) {
    const auto value = parseJson(readInput(console, name));
    if (!value) {
        throw Failure(ExitCode::refused,
                      "Invalid JSON in " + inputName(name) + ": " + value.error().message + ".",
                      "Correct it and try again.", {"Nothing was changed."});
    }
    return *value;
}

std::string compactJson(const Json::Value& value) {
    return printableJson(jsonText(value));
}

void writeJson(std::ostream& out, const Json::Value& value) {
    out << printableJson(jsonText(value, "    ")) << '\n';
}

std::string displayValue(const Json::Value& value) {
    if (value.isBool()) {
        return value.asBool() ? "on" : "off";
    }
    if (value.isNull()) {
        return "";
    }
    return value.isString() ? value.asString() : compactJson(value);
}

std::string textAt(const Json::Value& object, const char* key) {
    return object.isObject() ? displayValue(object[key]) : "";
}

} // namespace velt::cli
