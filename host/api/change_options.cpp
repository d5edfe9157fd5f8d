#include "host/api/change_options.h"

#include "base/number_text.h"
#include "host/base/query_text.h"

#include <algorithm>
#include <array>

namespace velt::host {

namespace {

constexpr std::int64_t longestConfirmation = 86400;

/// `take` returns false for a value other than the expected.
struct Option {
    const char* key;
    const char* expected;
    bool (*take)(const std::string& value, ChangeOptions& options);
};

bool takeDryRun(const std::string& value, ChangeOptions& options) {
    options.dryRun = value == "true" || value == "1";
    return options.dryRun || value == "false" || value == "0";
}

bool takeSessions(const std::string& value, ChangeOptions& options) {
    if (value == "keep") {
        options.sessions = SessionPolicy::keep;
    } else if (value == "end") {
        options.sessions = SessionPolicy::end;
    }
    return value == "keep" || value == "end";
}

bool takeConfirmation(const std::string& value, ChangeOptions& options) {
    const auto seconds = parseNumber(value);
    if (!seconds || *seconds < 1 || *seconds > longestConfirmation) {
        return false;
    }
    options.confirmWithin = std::chrono::seconds(*seconds);
    return true;
}

constexpr std::array<Option, 3> known{{
    {"dry_run", "true or false", takeDryRun},
    {"sessions", "keep or end", takeSessions},
    {"confirm_within", "a number of seconds from 1 to 86400", takeConfirmation},
}};

} // namespace

std::variant<ChangeOptions, FieldError> parseChangeOptions(const std::string& query) {
    ChangeOptions options;
    const auto parameters = queryParameters(query);
    if (const auto repeated = repeatedKey(parameters)) {
        return FieldError{*repeated, oneValue};
    }
    for (const auto& [key, value] : parameters) {
        const auto* const option = std::ranges::find(known, key, &Option::key);
        if (option == known.end()) {
            return FieldError{key, "one of dry_run, sessions or confirm_within"};
        }
        if (!value || !option->take(*value, options)) {
            return FieldError{key, option->expected};
        }
    }
    return options;
}

std::variant<bool, FieldError> parseDryRun(const std::string& query) {
    ChangeOptions options;
    const auto parameters = queryParameters(query);
    if (const auto repeated = repeatedKey(parameters)) {
        return FieldError{*repeated, oneValue};
    }
    for (const auto& [key, value] : parameters) {
        if (key != known[0].key) {
            return FieldError{key, "only dry_run"};
        }
        if (!value || !takeDryRun(*value, options)) {
            return FieldError{key, known[0].expected};
        }
    }
    return options.dryRun;
}

} // namespace velt::host
