#include "host/base/json.h"

#include "base/utf8.h"

#include <json/reader.h>
#include <json/writer.h>

#include <algorithm>
#include <memory>
#include <sstream>

namespace velt::host {

namespace {

constexpr int maxNesting = 64;
constexpr const char* blanks = " \t\r\n";

std::unique_ptr<Json::CharReader> makeReader() {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    builder["strictRoot"] = false;
    builder["stackLimit"] = maxNesting;
    return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

std::unique_ptr<Json::StreamWriter> makeWriter() {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return std::unique_ptr<Json::StreamWriter>(builder.newStreamWriter());
}

std::string positionOf(std::string_view text, std::size_t offset) {
    const std::string_view before = text.substr(0, offset);
    const auto lines = std::count(before.begin(), before.end(), '\n');
    const std::size_t lineStart = before.rfind('\n') + 1;
    return "line " + std::to_string(lines + 1) + ", column " + std::to_string(offset - lineStart + 1);
}

/// Turns "* Line 1, Column 5\n  Syntax error...\n" into "line 1, column 5: Syntax error...".
std::string firstError(const std::string& errors) {
    std::istringstream lines(errors);
    std::string where;
    std::string what;
    std::getline(lines, where);
    std::getline(lines, what);
    where.erase(0, where.find_first_not_of("* "));
    what.erase(0, what.find_first_not_of(' '));
    std::transform(where.begin(), where.end(), where.begin(), [](unsigned char c) {
        return static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
    });
    return where + ": " + what;
}

Result<Json::Value> parseText(std::string_view text) {
    thread_local const std::unique_ptr<Json::CharReader> reader = makeReader();
    std::string errors;
    Json::Value value;
    if (!reader->parse(text.data(), text.data() + text.size(), &value, &errors)) {
        return Error(firstError(errors));
    }
    if (!value.isObject()) {
        return Error(positionOf(text, text.find_first_not_of(blanks)) +
                     ": expected a JSON object, such as {\"key\": true}");
    }
    return value;
}

/// Bytes that are not UTF-8 are inside strings, where any character may take their place.
std::string repaired(const std::string& text) {
    constexpr std::string_view replacement = "\xEF\xBF\xBD";
    std::string good;
    std::string_view rest = text;
    for (std::size_t bad = findInvalidUtf8(rest); bad != std::string_view::npos;
         bad = findInvalidUtf8(rest)) {
        good.append(rest.substr(0, bad)).append(replacement);
        rest.remove_prefix(bad + 1);
    }
    return good.append(rest);
}

} // namespace

Result<Json::Value> parseObject(std::string_view text) {
    if (text.find_first_not_of(blanks) == std::string_view::npos) {
        return Json::Value(Json::objectValue);
    }
    if (const std::size_t invalid = findInvalidUtf8(text); invalid != std::string_view::npos) {
        return Error(positionOf(text, invalid) + ": the text is not UTF-8");
    }
    // The library throws when values are nested too deeply.
    try {
        return parseText(text);
    } catch (const std::exception&) {
        return Error("line 1, column 1: values are nested more than " + std::to_string(maxNesting) +
                     " levels deep");
    }
}

std::string toJson(const Json::Value& value) {
    thread_local const std::unique_ptr<Json::StreamWriter> writer = makeWriter();
    std::ostringstream stream;
    writer->write(value, &stream);
    std::string text = std::move(stream).str();
    return findInvalidUtf8(text) == std::string_view::npos ? text : repaired(text);
}

} // namespace velt::host
