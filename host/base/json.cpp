#include "host/base/json.h"

#include <json/reader.h>
#include <json/writer.h>

#include <algorithm>
#include <cstdint>
#include <memory>
#include <sstream>

namespace velt::host {

namespace {

constexpr int maxNesting = 64;

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

/// "* Line 1, Column 5\n  Syntax error...\n" becomes "line 1, column 5: Syntax error...".
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

/// The length of the well-formed UTF-8 sequence at the text's start, or 0.
std::size_t sequenceLength(std::string_view text) {
    const auto first = static_cast<std::uint8_t>(text[0]);
    if (first < 0x80) {
        return 1;
    }
    const std::size_t length = first >= 0xF0 ? 4 : (first >= 0xE0 ? 3 : 2);
    if (first < 0xC2 || first > 0xF4 || text.size() < length) {
        return 0;
    }
    for (std::size_t i = 1; i < length; ++i) {
        if ((static_cast<std::uint8_t>(text[i]) & 0xC0U) != 0x80U) {
            return 0;
        }
    }
    const auto second = static_cast<std::uint8_t>(text[1]);
    const bool overlong = (first == 0xE0 && second < 0xA0) || (first == 0xF0 && second < 0x90);
    const bool outside = (first == 0xED && second > 0x9F) || (first == 0xF4 && second > 0x8F);
    return overlong || outside ? 0 : length;
}

ParsedObject parseText(std::string_view text) {
    thread_local const std::unique_ptr<Json::CharReader> reader = makeReader();
    ParsedObject parsed;
    std::string errors;
    Json::Value value;
    if (!reader->parse(text.data(), text.data() + text.size(), &value, &errors)) {
        parsed.error = firstError(errors);
    } else if (!value.isObject()) {
        parsed.error = positionOf(text, text.find_first_not_of(" \t\r\n")) +
                       ": expected a JSON object, such as {\"key\": true}";
    } else {
        parsed.value = std::move(value);
    }
    return parsed;
}

/// Bytes that are no UTF-8 stand inside of strings, where any character may stand for them.
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

std::size_t findInvalidUtf8(std::string_view text) {
    for (std::size_t i = 0; i < text.size();) {
        const std::size_t length = sequenceLength(text.substr(i));
        if (length == 0) {
            return i;
        }
        i += length;
    }
    return std::string_view::npos;
}

ParsedObject parseObject(std::string_view text) {
    if (text.find_first_not_of(" \t\r\n") == std::string_view::npos) {
        return {};
    }
    ParsedObject parsed;
    if (const std::size_t invalid = findInvalidUtf8(text); invalid != std::string_view::npos) {
        parsed.error = positionOf(text, invalid) + ": the text is not UTF-8";
        return parsed;
    }
    // The library throws when the nesting is too deep.
    try {
        return parseText(text);
    } catch (const std::exception&) {
        parsed.error =
            "line 1, column 1: the values are nested more than " + std::to_string(maxNesting) + " deep";
        return parsed;
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
