#include "base/json_text.h"

#include "base/text.h"

#include <json/reader.h>
#include <json/writer.h>

#include <algorithm>
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

// The reader takes comments inside of objects and arrays even when it is told not to. Outside of strings, a
// slash is nothing else.
std::size_t findComment(std::string_view text) {
    bool inString = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '"') {
            inString = !inString;
        } else if (inString && text[i] == '\\') {
            ++i;
        } else if (!inString && text[i] == '/') {
            return i;
        }
    }
    return std::string_view::npos;
}

} // namespace

std::string placeIn(std::string_view text, std::size_t offset) {
    const std::string_view before = text.substr(0, offset);
    const auto lines = std::count(before.begin(), before.end(), '\n');
    const std::size_t lineStart = before.rfind('\n') + 1;
    return "line " + std::to_string(lines + 1) + ", column " + std::to_string(offset - lineStart + 1);
}

Result<Json::Value> parseJson(std::string_view text) {
    if (const std::size_t comment = findComment(text); comment != std::string_view::npos) {
        return Error(placeIn(text, comment) + ": JSON has no comments");
    }
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
