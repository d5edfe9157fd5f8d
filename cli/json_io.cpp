#include "cli/json_io.h"

#include "cli/failure.h"
#include "cli/printable.h"

#include <json/reader.h>
#include <json/writer.h>

#include <memory>
#include <ostream>
#include <sstream>

namespace velt::cli {

namespace {

// The first fault of those that the library lists, each as "* Line 1, Column 5" above its description.
std::string firstFault(const std::string& list) {
    std::istringstream lines(list);
    std::string place;
    std::string description;
    if (!std::getline(lines >> std::ws, place) || place.rfind("* L", 0) != 0 ||
        !std::getline(lines >> std::ws, description)) {
        return list;
    }
    std::string fault = "l" + place.substr(3) + ": " + description;
    if (const std::size_t column = fault.find("Column"); column != std::string::npos) {
        fault[column] = 'c';
    }
    return fault;
}

std::string toText(const Json::Value& value, const char* indentation) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = indentation;
    builder["emitUTF8"] = true;
    return printableJson(Json::writeString(builder, value));
}

} // namespace

std::optional<Json::Value> parseJson(const std::string& text, std::string* reason) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    // A strict reader takes objects and arrays only; a method may answer with any value.
    builder["strictRoot"] = false;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    std::string faults;
    try {
        if (reader->parse(text.data(), text.data() + text.size(), &value, &faults)) {
            return value;
        }
    } catch (const Json::Exception& exception) {
        faults = exception.what(); // nested too deeply
    }
    if (reason != nullptr) {
        *reason = firstFault(faults);
    }
    return std::nullopt;
}

Json::Value readJsonFile(Console& console, const std::string& name) {
    std::string reason;
    const std::optional<Json::Value> value = parseJson(readInput(console, name), &reason);
    if (!value) {
        throw Failure(ExitCode::refused, "Invalid JSON in " + inputName(name) + ": " + reason + ".",
                      "Correct it and try again.", {"Nothing was changed."});
    }
    return *value;
}

std::string compactJson(const Json::Value& value) {
    return toText(value, "");
}

void writeJson(std::ostream& out, const Json::Value& value) {
    out << toText(value, "    ") << '\n';
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
