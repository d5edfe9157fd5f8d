#include "host/api/change_summary.h"

#include "host/base/json.h"

#include <algorithm>

namespace velt::host {

namespace {

constexpr int mostNamed = 20;

bool holds(const Json::Value& rules, const Json::Value& wanted) {
    return std::any_of(rules.begin(), rules.end(), [&](const Json::Value& each) { return each == wanted; });
}

/// "removed user anna /docs, user ben /home"; "" when the others have all of them.
std::string missingFrom(const Json::Value& others, const Json::Value& rules, const std::string& verb) {
    std::string text;
    int missing = 0;
    for (const Json::Value& rule : rules) {
        if (!holds(others, rule) && ++missing <= mostNamed) {
            text += (text.empty() ? verb + " " : ", ") + rule["type"].asString() + " " +
                    rule["name"].asString() + " " + rule["path"].asString();
        }
    }
    return missing > mostNamed ? text + " and " + std::to_string(missing - mostNamed) + " more" : text;
}

std::string ruleSummary(const FieldChange& change) {
    const std::string removed = missingFrom(change.to, change.from, "removed");
    const std::string added = missingFrom(change.from, change.to, "added");
    const std::string both = removed + (removed.empty() || added.empty() ? "" : "; ") + added;
    return change.field + " (" + (both.empty() ? "in another order" : both) + ")";
}

} // namespace

std::string summaryOf(const std::vector<FieldChange>& changes) {
    std::string text;
    for (const FieldChange& change : changes) {
        text += text.empty() ? "" : ", ";
        text += change.to.isArray()
                    ? ruleSummary(change)
                    : change.field + " from " + toJson(change.from) + " to " + toJson(change.to);
    }
    return text;
}

} // namespace velt::host
