#include "standalone/settings/settings_text.h"

#include "standalone/core/last_error.h"

#include <algorithm>
#include <charconv>
#include <optional>

namespace velt {

namespace {

constexpr std::string_view blanks = " \t\r";

std::string_view trimmed(std::string_view text) {
    const auto first = text.find_first_not_of(blanks);
    if (first == std::string_view::npos)
        return {};
    return text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

std::optional<std::int32_t> parseInteger(std::string_view text) {
    std::int32_t number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || end != text.data() + text.size())
        return std::nullopt;
    return number;
}

} // namespace

SettingsReader::SettingsReader(std::string file, std::string_view contents, std::int32_t newestVersion)
    : file_(std::move(file)) {
    int number = 0;
    for (std::size_t at = 0; ok_ && at < contents.size();) {
        const std::string_view line = contents.substr(at, contents.find('\n', at) - at);
        readLine(line, ++number);
        at += line.size() + 1;
    }
    if (!ok_)
        return;
    const std::int32_t version = integer("version");
    if (ok_ && (version < 1 || version > newestVersion))
        complain(&values_.at("version"), "version " + std::to_string(version) +
                                             " is not known here; the newest known version is " +
                                             std::to_string(newestVersion));
}

void SettingsReader::readLine(std::string_view line, int number) {
    const std::string_view content = trimmed(line);
    if (content.empty() || content.front() == '#')
        return;
    const auto equals = content.find('=');
    const Value value{
        equals == std::string_view::npos ? std::string_view() : trimmed(content.substr(equals + 1)), number};
    const std::string key(trimmed(content.substr(0, equals)));
    if (equals == std::string_view::npos || key.empty())
        complain(&value, "this is no line of the form \"key = value\"");
    else if (!values_.emplace(key, value).second)
        complain(&value, "the key " + quotedText(key) + " stands there a second time");
}

std::int32_t SettingsReader::integer(const std::string& key) {
    const Value* value = ask(key);
    if (value == nullptr)
        return 0;
    const auto number = parseInteger(value->text);
    if (!number)
        complain(value, "the value of " + key + " is no whole number of 32 bits");
    return number.value_or(0);
}

bool SettingsReader::boolean(const std::string& key) {
    const Value* value = ask(key);
    if (value == nullptr)
        return false;
    if (value->text != "0" && value->text != "1")
        complain(value, "the value of " + key + " is neither 0 nor 1");
    return value->text == "1";
}

void SettingsReader::bytes(const std::string& key, std::span<char> bytes) {
    const Value* value = ask(key);
    if (value == nullptr)
        return;
    std::string text;
    if (!readQuotedText(value->text, text))
        return complain(value, "the value of " + key + " is no text in double quotes");
    if (text.size() > bytes.size())
        return complain(value,
                        "the value of " + key + " is longer than " + std::to_string(bytes.size()) + " bytes");
    std::fill(std::copy(text.begin(), text.end(), bytes.begin()), bytes.end(), '\0');
}

bool SettingsReader::finish() {
    for (const auto& [key, value] : values_)
        if (!value.asked)
            complain(&value, "the key " + quotedText(key) + " is not known");
    return ok_;
}

const SettingsReader::Value* SettingsReader::ask(const std::string& key) {
    const auto found = values_.find(key);
    if (found == values_.end()) {
        complain(nullptr, "the key " + key + " is missing");
        return nullptr;
    }
    found->second.asked = true;
    return &found->second;
}

void SettingsReader::complain(const Value* value, const std::string& what) {
    if (!ok_)
        return;
    ok_ = false;
    const std::string line = value == nullptr ? "" : ", line " + std::to_string(value->line);
    fail(ErrorNumber::damaged, "Settings file " + file_ + line + ": " + what + ".");
}

} // namespace velt
