// The fake standalone's history of changes.
#include "tests/host/fake_standalone.h"

#include <algorithm>
#include <array>
#include <mutex>

namespace {

std::mutex mutex; ///< guards the history

} // namespace

void FakeStandalone::damageChange(std::int64_t id) {
    const std::lock_guard lock(mutex);
    history.at(static_cast<std::size_t>(id) - 1).fields = "[7]";
}

namespace velt {

std::string changeStateName(ChangeState state) {
    constexpr std::array<const char*, 6> names{"done",   "waiting",    "confirmed",
                                               "undone", "superseded", "begun"};
    return names.at(static_cast<std::size_t>(state));
}

Result<std::int64_t> recordChange(const ChangeRecord& change) {
    FakeStandalone& fake = FakeStandalone::instance();
    const std::lock_guard lock(mutex);
    if (fake.historyFails) {
        return Error(fake.sentence);
    }
    fake.history.push_back(change);
    fake.history.back().id = ++fake.lastChange;
    return fake.lastChange;
}

Result<> setChangeState(std::int64_t id, ChangeState state) {
    const std::lock_guard lock(mutex);
    FakeStandalone& fake = FakeStandalone::instance();
    const auto found = std::ranges::find(fake.history, id, &ChangeRecord::id);
    if (found != fake.history.end()) {
        found->state = state;
        if (state == ChangeState::confirmed) {
            found->confirmBy.reset();
        }
    }
    return {};
}

Result<> setChangeFields(std::int64_t id, const std::string& fields) {
    const std::lock_guard lock(mutex);
    FakeStandalone& fake = FakeStandalone::instance();
    const auto found = std::ranges::find(fake.history, id, &ChangeRecord::id);
    if (found != fake.history.end()) {
        found->fields = fields;
    }
    return {};
}

Result<> removeChange(std::int64_t id) {
    const std::lock_guard lock(mutex);
    FakeStandalone& fake = FakeStandalone::instance();
    if (fake.keepsRemovedChanges) {
        return Error(fake.sentence);
    }
    std::erase_if(fake.history, [id](const ChangeRecord& each) { return each.id == id; });
    return {};
}

Result<std::vector<ChangeRecord>> queryChanges(const ChangeFilter& filter) {
    const std::lock_guard lock(mutex);
    const FakeStandalone& fake = FakeStandalone::instance();
    std::vector<ChangeRecord> found;
    for (auto change = fake.history.rbegin(); change != fake.history.rend(); ++change) {
        const bool wanted = (!filter.beforeId || change->id < *filter.beforeId) &&
                            (!filter.state || change->state == *filter.state);
        if (wanted && found.size() < static_cast<std::size_t>(filter.limit)) {
            found.push_back(*change);
        }
    }
    return found;
}

Result<std::optional<ChangeRecord>> changeRecord(std::int64_t id) {
    const std::lock_guard lock(mutex);
    const auto& history = FakeStandalone::instance().history;
    const auto found = std::ranges::find(history, id, &ChangeRecord::id);
    return found == history.end() ? std::nullopt : std::optional(*found);
}

} // namespace velt
