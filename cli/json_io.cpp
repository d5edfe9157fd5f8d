#include "cli/json_io.h"

#include <json/reader.h>
#include <json/writer.h>

#include <memory>
#include <ostream>

namespace velt::cli {

std::optional<Json::Value> parseJson(const std::string& text, std::string& problem) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    // A strict reader takes objects and arrays only; a method may answer with any value.
    builder["strictRoot"] = false;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    try {
        if (reader->parse(text.data(), text.data() + text.size(), &value, &problem)) {
            return value;
        }
    } catch (const Json::Exception& exception) {
        problem = exception.what(); // nested too deeply
    }
    return std::nullopt;
}

std::string compactJson(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value);
}

void writeJson(std::ostream& out, const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "    ";
    builder["emitUTF8"] = true;
    out << Json::writeString(builder, value) << '\n';
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
