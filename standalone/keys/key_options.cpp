#include "standalone/keys/key_options.h"

#include "base/ip_network.h"
#include "base/text.h"
#include "base/utc_text.h"
#include "standalone/core/error_number.h"

#include <algorithm>
#include <ctime>

namespace velt {
namespace {

constexpr int firstYear = 1971;
constexpr int lastYear = 2200; ///< a clock counts nanoseconds
constexpr std::size_t longestName = 40;

Error expected(std::string what) {
    return {ErrorNumber::invalid, std::move(what)};
}

Error badForm() {
    return expected("options such as from=\"192.0.2.0/24\",expiry-time=\"20271231\"");
}

Error badSource() {
    return expected("in from addresses, networks such as 192.0.2.0/24, or patterns such as 192.0.2.*, "
                    "separated by commas, and not only such that begin with \"!\"");
}

Error badTime() {
    return expected("in expiry-time a time such as 20271231 or 202712312359Z");
}

/// One entry of `from` in the form that the daemon compares addresses with.
std::optional<std::string> sourceOf(std::string_view entry) {
    const std::string text = lowerCase(entry);
    if (text.empty() || text.find_first_not_of("0123456789abcdef.:/*?") != std::string::npos) {
        return std::nullopt;
    }
    if (text.find_first_of("*?") != std::string::npos) {
        return text.find('/') == std::string::npos ? std::optional(text) : std::nullopt;
    }
    const auto network = parseIpNetwork(text);
    return network ? std::optional(toText(*network)) : std::nullopt;
}

Result<std::string> parseSources(std::string_view text) {
    std::string sources;
    bool letsIn = false;
    do {
        std::string_view entry = cut(text, ',');
        const bool excludes = entry.starts_with('!');
        entry.remove_prefix(excludes ? 1 : 0);
        const auto source = sourceOf(entry);
        if (!source) {
            return badSource();
        }
        letsIn = letsIn || !excludes;
        sources += (sources.empty() ? "" : ",") + std::string(excludes ? "!" : "") + *source;
    } while (!text.empty());
    return letsIn ? Result<std::string>(sources) : badSource();
}

/// The number that the first digits make, which are cut off.
int takeNumber(std::string_view& digits, std::size_t count) {
    int number = 0;
    for (std::size_t i = 0; i < count && !digits.empty(); ++i, digits.remove_prefix(1)) {
        number = number * 10 + (digits.front() - '0');
    }
    return number;
}

/// Whether the calendar has this moment.
bool isMoment(const std::tm& time) {
    std::tm same = time;
    return timegm(&same) != -1 && same.tm_mday == time.tm_mday && same.tm_mon == time.tm_mon &&
           same.tm_hour == time.tm_hour && same.tm_min == time.tm_min && same.tm_sec == time.tm_sec;
}

Result<std::chrono::system_clock::time_point> parseTime(std::string_view text) {
    const bool isUtc = text.ends_with('Z');
    text.remove_suffix(isUtc ? 1 : 0);
    const bool isLong = text.size() == 8 || text.size() == 12 || text.size() == 14;
    if (!isLong || text.find_first_not_of("0123456789") != std::string_view::npos) {
        return badTime();
    }
    std::tm time{};
    const int year = takeNumber(text, 4);
    time.tm_year = year - 1900;
    time.tm_mon = takeNumber(text, 2) - 1;
    time.tm_mday = takeNumber(text, 2);
    time.tm_hour = takeNumber(text, 2);
    time.tm_min = takeNumber(text, 2);
    time.tm_sec = takeNumber(text, 2);
    const int around = isUtc ? 1 : 0; // where a local time may be in another year
    if (year < firstYear - around || year > lastYear + around || !isMoment(time)) {
        return badTime();
    }
    time.tm_isdst = -1;
    return std::chrono::system_clock::from_time_t(isUtc ? timegm(&time) : std::mktime(&time));
}

struct Option {
    std::string name; ///< in lower case
    std::string value;
};

/// Cuts the first option off; nothing when it has another form.
std::optional<Option> takeOption(std::string_view& rest) {
    const std::size_t end = std::min(rest.find_first_of("=,"), rest.size());
    Option option{lowerCase(rest.substr(0, end)), ""};
    rest.remove_prefix(end);
    if (rest.starts_with("=\"")) {
        rest.remove_prefix(2);
        while (!rest.empty() && rest.front() != '"') {
            rest.remove_prefix(rest.starts_with("\\\"") ? 1 : 0);
            option.value += rest.front();
            rest.remove_prefix(1);
        }
        if (rest.empty()) {
            return std::nullopt;
        }
        rest.remove_prefix(1);
    }
    if (rest.empty()) {
        return option;
    }
    const bool goesOn = rest.front() == ',' && rest.size() > 1;
    rest.remove_prefix(1);
    return goesOn ? std::optional(option) : std::nullopt;
}

bool isName(std::string_view name) {
    return !name.empty() && name.size() <= longestName &&
           name.find_first_not_of("abcdefghijklmnopqrstuvwxyz0123456789-") == std::string_view::npos;
}

Result<> apply(const Option& option, KeyOptions& options) {
    if (!isName(option.name)) {
        return badForm();
    }
    if (option.name == "from" && options.from.empty()) {
        VELT_ASSIGN_OR_RETURN(options.from, parseSources(option.value));
    } else if (option.name == "expiry-time" && !options.expires) {
        VELT_ASSIGN_OR_RETURN(options.expires, parseTime(option.value));
    } else if (option.name == "from" || option.name == "expiry-time") {
        return expected(option.name + " only once");
    } else {
        return expected("no other option than from and expiry-time, but there is " + option.name);
    }
    return {};
}

} // namespace

Result<KeyOptions> parseKeyOptions(std::string_view text) {
    KeyOptions options;
    while (!text.empty()) {
        const auto option = takeOption(text);
        if (!option) {
            return badForm();
        }
        VELT_RETURN_IF_ERROR(apply(*option, options));
    }
    return options;
}

std::string toText(const KeyOptions& options) {
    std::string text = options.from.empty() ? "" : "from=\"" + options.from + "\"";
    if (options.expires) {
        text += (text.empty() ? "" : ",") + std::string("expiry-time=\"") +
                utcText(*options.expires, "%Y%m%d%H%M%SZ") + "\"";
    }
    return text;
}

std::optional<std::size_t> lengthOfOptions(std::string_view line) {
    bool quoted = false;
    std::size_t i = 0;
    for (; i < line.size() && (quoted || (line[i] != ' ' && line[i] != '\t')); ++i) {
        if (line[i] == '\\' && line.substr(i + 1).starts_with('"')) {
            ++i;
        } else if (line[i] == '"') {
            quoted = !quoted;
        }
    }
    return quoted ? std::nullopt : std::optional(i);
}

} // namespace velt
