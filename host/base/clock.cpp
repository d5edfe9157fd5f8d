#include "host/base/clock.h"

#include "base/number_text.h"

#include <ctime>

namespace velt::host {

namespace {

using std::chrono::milliseconds;

/// 500 ms for ".5Z". Accepts "", "Z", and decimals with or without "Z".
std::optional<milliseconds> parseFraction(std::string_view text) {
    int count = 0;
    if (text.starts_with('.')) {
        int unit = 100;
        text.remove_prefix(1);
        for (; !text.empty() && text[0] >= '0' && text[0] <= '9'; text.remove_prefix(1)) {
            count += (text[0] - '0') * unit;
            unit /= 10;
        }
    }
    return text.empty() || text == "Z" ? std::optional(milliseconds(count)) : std::nullopt;
}

} // namespace

std::optional<TimePoint> parseTimestamp(const std::string& text) {
    if (const auto seconds = parseNumber(text); seconds && *seconds >= 0 && *seconds < 100'000'000'000) {
        return TimePoint(std::chrono::seconds(*seconds));
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
    return fraction ? std::optional(std::chrono::system_clock::from_time_t(timegm(&parts)) + *fraction)
                    : std::nullopt;
}

} // namespace velt::host
