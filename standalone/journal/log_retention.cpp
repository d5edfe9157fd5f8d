#include "standalone/journal/log_retention.h"

#include "base/file.h"
#include "base/plain_text.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <charconv>

namespace velt {

namespace {

// Beyond these a value is a slip, not a wish.
constexpr std::int64_t mostEntries = 100'000'000;
constexpr std::int64_t mostDays = 36'500;

std::string_view trimmed(std::string_view text) {
    const std::size_t first = text.find_first_not_of(" \t\r");
    if (first == std::string_view::npos) {
        return {};
    }
    return text.substr(first, text.find_last_not_of(" \t\r") - first + 1);
}

bool readNumber(std::string_view text, std::int64_t most, std::int64_t& number) {
    std::int64_t value = -1;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc{} || end != text.data() + text.size() || value < 0 || value > most) {
        return false;
    }
    number = value;
    return true;
}

bool readLine(std::string_view line, LogRetention& retention) {
    const std::size_t equals = line.find('=');
    if (equals == std::string_view::npos) {
        return false;
    }
    const std::string_view key = trimmed(line.substr(0, equals));
    const std::string_view value = trimmed(line.substr(equals + 1));
    if (key == "max_entries") {
        return readNumber(value, mostEntries, retention.maxEntries);
    }
    if (key == "max_age_days") {
        return readNumber(value, mostDays, retention.maxAgeDays);
    }
    return false;
}

} // namespace

std::optional<LogRetention> parseRetention(std::string_view text, std::string& flaw) {
    LogRetention retention;
    for (int number = 1; !text.empty(); ++number) {
        const std::size_t end = text.find('\n');
        const std::string_view whole = text.substr(0, end);
        text = end == std::string_view::npos ? std::string_view{} : text.substr(end + 1);
        const std::string_view line = trimmed(whole.substr(0, whole.find('#')));
        if (line.empty() || readLine(line, retention)) {
            continue;
        }
        flaw = "line " + std::to_string(number) +
               " is neither max_entries nor max_age_days with a number: \"" + plainText(line, 80) + "\"";
        return std::nullopt;
    }
    return retention;
}

std::optional<LogRetention> loadRetention() {
    const std::filesystem::path path = statePath(paths::logRetention);
    const auto text = readOptionalFile(path);
    if (!text) {
        fail(text.error());
        return std::nullopt;
    }
    if (!*text) {
        return LogRetention{};
    }
    std::string flaw;
    std::optional<LogRetention> retention = parseRetention(**text, flaw);
    if (!retention) {
        fail(ErrorNumber::damaged, path.string() + " is damaged: " + flaw + ".");
    }
    return retention;
}

} // namespace velt
