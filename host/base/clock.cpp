#include "host/base/clock.h"

#include "base/number_text.h"

#include <algorithm>
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

/// A clock of nanoseconds ends in the year 2262, a client's text does not.
TimePoint clamped(milliseconds since1970) {
    constexpr auto least = std::chrono::ceil<milliseconds>(TimePoint::min().time_since_epoch());
    constexpr auto most = std::chrono::floor<milliseconds>(TimePoint::max().time_since_epoch());
    return TimePoint(std::clamp(since1970, least, most));
}

} // namespace

std::optional<TimePoint> parseTimestamp(const std::string& text) {
    if (const auto seconds = parseNumber(text); seconds && *seconds >= 0 && *seconds < 100'000'000'000) {
        return clamped(std::chrono::seconds(*seconds));
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
    return fraction ? std::optional(clamped(std::chrono::seconds(timegm(&parts)) + *fraction)) : std::nullopt;
}

} // namespace velt::host
