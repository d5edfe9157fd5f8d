#include "tests/support/fake_platform/text.h"

#include <json/writer.h>

#include <cstdio>

namespace fake {

namespace {

std::string escaped(char c) {
    switch (c) {
    case '"':
        return "\\\"";
    case '\\':
        return "\\\\";
    case '\n':
        return "\\n";
    case '\t':
        return "\\t";
    default:
        break;
    }
    const auto byte = static_cast<unsigned char>(c);
    if (byte >= 0x20 && byte != 0x7F) {
        return std::string(1, c);
    }
    char text[8];
    std::snprintf(text, sizeof(text), "\\x%02X", byte);
    return text;
}

} // namespace

std::string quoted(const std::string& text) {
    std::string result = "\"";
    for (const char c : text) {
        result += escaped(c);
    }
    return result + "\"";
}

std::string render(const char* text) {
    return text == nullptr ? "null" : quoted(text);
}

std::string render(const std::string& text) {
    return quoted(text);
}

std::string render(int number) {
    return std::to_string(number);
}

std::string render(bool value) {
    return value ? "true" : "false";
}

std::string render(Hex number) {
    char text[24];
    std::snprintf(text, sizeof(text), "0x%lX", number.value);
    return text;
}

std::string render(const Verbatim& verbatim) {
    return verbatim.text;
}

std::string render(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value);
}

std::string render(const std::vector<std::string>& texts) {
    std::string result;
    for (const std::string& text : texts) {
        result += (result.empty() ? "" : ", ") + quoted(text);
    }
    return "[" + result + "]";
}

std::string render(const std::vector<std::pair<std::string, std::string>>& entries) {
    std::string result;
    for (const auto& [key, value] : entries) {
        result += (result.empty() ? "" : ", ") + quoted(key) + ": " + quoted(value);
    }
    return "{" + result + "}";
}

} // namespace fake
