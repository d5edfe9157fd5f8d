#include "cli/time_text.h"

#include "base/number_text.h"
#include "base/utc_text.h"

namespace velt::cli {

namespace {

constexpr std::int64_t minute = 60;
constexpr std::int64_t hour = 60 * minute;
constexpr std::int64_t day = 24 * hour;

std::optional<std::int64_t> secondsOfUnit(char unit) {
    switch (unit) {
    case 's':
        return 1;
    case 'm':
        return minute;
    case 'h':
        return hour;
    case 'd':
        return day;
    default:
        return std::nullopt;
    }
}

bool startsWithDate(const std::string& text) {
    static const std::string form = "dddd-dd-dd";
    if (text.size() < form.size()) {
        return false;
    }
    for (std::size_t i = 0; i < form.size(); ++i) {
        const bool digit = text[i] >= '0' && text[i] <= '9';
        if (form[i] == 'd' ? !digit : text[i] != form[i]) {
            return false;
        }
    }
    return true;
}

} // namespace

std::string utcText(std::time_t time) {
    return velt::utcText(std::chrono::system_clock::from_time_t(time), "%Y-%m-%dT%H:%M:%SZ");
}

std::optional<std::string> parseSince(const std::string& text, std::time_t now) {
    if (startsWithDate(text)) {
        return text;
    }
    const auto unit = secondsOfUnit(text.empty() ? ' ' : text.back());
    const auto count = parseNumber(std::string_view(text).substr(0, text.size() - 1));
    if (!unit || !count || *count < 0 || *count > INT32_MAX) {
        return std::nullopt;
    }
    return utcText(now - *count * *unit);
}

std::string durationText(std::int64_t seconds) {
    const auto two = [](std::int64_t first, const char* firstUnit, std::int64_t second,
                        const char* secondUnit) {
        return std::to_string(first) + firstUnit + std::to_string(second) + secondUnit;
    };
    if (seconds >= day) {
        return two(seconds / day, " d ", seconds % day / hour, " h");
    }
    if (seconds >= hour) {
        return two(seconds / hour, " h ", seconds % hour / minute, " min");
    }
    if (seconds >= minute) {
        return two(seconds / minute, " min ", seconds % minute, " s");
    }
    return std::to_string(seconds) + " s";
}

} // namespace velt::cli
