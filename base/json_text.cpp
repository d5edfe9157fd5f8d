#include "base/json_text.h"

#include "base/text.h"

#include <json/reader.h>
#include <json/writer.h>

#include <memory>

namespace velt {

namespace {

constexpr int mostNesting = 64;

std::unique_ptr<Json::CharReader> makeReader() {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    // A strict reader takes only objects and arrays.
    builder["strictRoot"] = false;
    builder["stackLimit"] = mostNesting;
    return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

/// The first of the library's complaints: "* Line 1, Column 5\n  Syntax error\n..." becomes
/// "line 1, column 5: Syntax error".
std::string firstOf(std::string_view complaints) {
    cut(complaints, ' '); // the star
    const std::string place = lowerCase(cut(complaints, '\n'));
    return place + ": " + std::string(trimmedEnd(trimmed(cut(complaints, '\n')), "."));
}

} // namespace

Result<Json::Value> parseJson(std::string_view text) {
    thread_local const std::unique_ptr<Json::CharReader> reader = makeReader();
    Json::Value value;
    std::string complaints;
    try {
        if (reader->parse(text.data(), text.data() + text.size(), &value, &complaints)) {
            return value;
        }
    } catch (const Json::Exception&) {
        return Error("line 1, column 1: values are nested more than " + std::to_string(mostNesting) +
                     " levels deep");
    }
    return Error(firstOf(complaints));
}

std::string jsonText(const Json::Value& value, const char* indentation) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = indentation;
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value);
}

} // namespace velt
