#include "host/clock.h"

#include <array>
#include <charconv>
#include <chrono>
#include <cstdio>
#include <ctime>

namespace velt::host {

namespace {

std::tm brokenDown(std::int64_t seconds) {
    const auto time = static_cast<std::time_t>(seconds);
    std::tm parts{};
    gmtime_r(&time, &parts);
    return parts;
}

/// ".5Z" is 500 ms; nothing when it is neither empty, "Z", nor decimals before a "Z".
std::optional<std::int64_t> parseFraction(std::string_view text) {
    std::int64_t milliseconds = 0;
    if (text.starts_with('.')) {
        std::int64_t unit = 100;
        text.remove_prefix(1);
        for (; !text.empty() && text[0] >= '0' && text[0] <= '9'; text.remove_prefix(1)) {
            milliseconds += (text[0] - '0') * unit;
            unit /= 10;
        }
    }
    return text.empty() || text == "Z" ? std::optional(milliseconds) : std::nullopt;
}

} // namespace

std::int64_t nowMilliseconds() {
    const auto now = std::chrono::system_clock::now().time_since_epoch();
    return std::chrono::duration_cast<std::chrono::milliseconds>(now).count();
}

std::string timestamp() {
    return timestamp(nowMilliseconds());
}

std::string timestamp(std::int64_t milliseconds) {
    const std::tm parts = brokenDown(milliseconds / 1000);
    std::array<char, 64> text{};
    const std::size_t length = std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%S", &parts);
    std::snprintf(text.data() + length, text.size() - length, ".%03dZ",
                  static_cast<int>(milliseconds % 1000));
    return text.data();
}

std::optional<std::int64_t> parseTimestamp(const std::string& text) {
    std::int64_t seconds = 0;
    const char* const end = text.data() + text.size();
    if (const auto [stop, error] = std::from_chars(text.data(), end, seconds);
        error == std::errc() && stop == end && seconds >= 0 && seconds < 100'000'000'000) {
        return seconds * 1000;
    }
    std::tm parts{};
    const char* rest = strptime(text.c_str(), "%Y-%m-%dT%H:%M:%S", &parts);
    if (rest == nullptr) {
        parts = {};
        rest = strptime(text.c_str(), "%Y-%m-%d", &parts);
    }
    if (rest == nullptr) {
        return std::nullopt;
    }
    const auto fraction = parseFraction(rest);
    return fraction ? std::optional(timegm(&parts) * std::int64_t{1000} + *fraction) : std::nullopt;
}

std::string httpDate() {
    const std::tm parts = brokenDown(nowMilliseconds() / 1000);
    std::array<char, 64> text{};
    std::strftime(text.data(), text.size(), "%a, %d %b %Y %H:%M:%S GMT", &parts);
    return text.data();
}

} // namespace velt::host
