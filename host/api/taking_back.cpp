#include "host/api/taking_back.h"

#include "base/json_value.h"
#include "base/number_text.h"
#include "host/api/recorded_change.h"
#include "host/api/rules_section.h"
#include "host/base/json.h"

#include <algorithm>
#include <optional>
#include <set>
#include <string_view>
#include <utility>

namespace velt::host {
namespace {

/// Those that count, oldest first: a change and its undoing leave everything as it was.
std::vector<ChangeRecord> inForce(const ChangeRecord& change, const std::vector<ChangeRecord>& later) {
    std::vector<ChangeRecord> found;
    for (auto each = later.rbegin(); each != later.rend(); ++each) {
        const bool changedSettings = each->state == ChangeState::done ||
                                     each->state == ChangeState::waiting ||
                                     each->state == ChangeState::confirmed;
        if (changedSettings && undoneBy(*each) <= change.id) {
            found.push_back(*each);
        }
    }
    return found;
}

/// The place of the field in what was recorded; null when it is not there.
Json::Value* findField(Json::Value& fields, const std::string& name) {
    const auto found = std::ranges::find_if(
        fields, [&](const Json::Value& each) { return each["field"].asString() == name; });
    return found == fields.end() ? nullptr : &*found;
}

/// The later changes while the fields of an earlier one are taken back.
class Later {
public:
    explicit Later(std::vector<ChangeRecord> changes) : changes_(std::move(changes)) {
        for (const ChangeRecord& each : changes_) {
            fields_.push_back(fieldsOf(each));
        }
    }

    /// What the first change of the field after it was.
    std::optional<ChangeState> firstOf(const std::string& field) {
        const auto index = indexOf(field);
        return index ? std::optional(changes_[*index].state) : std::nullopt;
    }

    /// From now on this change goes back to the value.
    void rebase(const std::string& field, const Json::Value& value) {
        const auto index = indexOf(field);
        (*findField(fields_[*index], field))["from"] = value;
        rebased_.insert(*index);
    }

    std::vector<ChangeRecord> rebased() const {
        std::vector<ChangeRecord> found;
        for (const std::size_t index : rebased_) {
            found.push_back(changes_[index]);
            found.back().fields = toJson(fields_[index]);
        }
        return found;
    }

private:
    std::optional<std::size_t> indexOf(const std::string& field) {
        for (std::size_t i = 0; i < changes_.size(); ++i) {
            if (findField(fields_[i], field) != nullptr) {
                return i;
            }
        }
        return std::nullopt;
    }

    std::vector<ChangeRecord> changes_;
    std::vector<Json::Value> fields_;
    std::set<std::size_t> rebased_;
};

} // namespace

TakingBack takingBack(const ChangeRecord& change, const std::vector<ChangeRecord>& later,
                      const Json::Value& current) {
    TakingBack result{current, false, {}, {}};
    Later others(inForce(change, later));
    for (const Json::Value& stored : fieldsOf(change)) {
        const std::string name = stored["field"].asString();
        const Json::Value field = withNamesOfNow(stored);
        Json::Value& place = placeIn(result.wanted, name);
        const auto next = others.firstOf(name);
        if (!next && place == field["to"]) {
            place = field["from"];
            result.any = true;
            continue;
        }
        if (next == ChangeState::waiting) {
            others.rebase(name, stored["from"]);
        }
        result.kept.push_back(name);
    }
    result.rebased = others.rebased();
    return result;
}

Json::Value withNamesOfNow(Json::Value field) {
    const std::string rules(rulesSection);
    if (field["field"] == "/" + rules) {
        for (const char* each : {"from", "to"}) {
            field[each] = withNames(jsonObject({{rules.c_str(), field[each]}}))[rules];
        }
    }
    return field;
}

std::int64_t undoneBy(const ChangeRecord& change) {
    constexpr std::string_view prefix = "undo ";
    return change.way.starts_with(prefix)
               ? parseNumber(std::string_view(change.way).substr(prefix.size())).value_or(0)
               : 0;
}

} // namespace velt::host
