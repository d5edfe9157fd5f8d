// The fake standalone's keys of users: anna and ben have accounts, a key of "gone" is of a former one.
#include "tests/host/fake_standalone.h"

#include <algorithm>
#include <utility>

namespace velt {
namespace {

bool isUser(const std::string& name) {
    return name == "anna" || name == "ben";
}

Error failure() {
    const FakeStandalone& fake = FakeStandalone::instance();
    return {fake.error, fake.sentence};
}

auto placeOf(const std::string& user, const std::string& fingerprint) {
    return std::ranges::find_if(FakeStandalone::instance().keys, [&](const StoredKey& each) {
        return each.user == user && each.entry.key.fingerprint == fingerprint;
    });
}

} // namespace

Result<StoredKeys> storedKeys() {
    const FakeStandalone& fake = FakeStandalone::instance();
    if (fake.keysFail) {
        return failure();
    }
    return StoredKeys{fake.keys,
                      fake.sentence.empty() ? std::vector<std::string>() : std::vector{fake.sentence}};
}

Result<StoredKeys> storedKeys(const std::string& user) {
    VELT_ASSIGN_OR_RETURN(auto stored, storedKeys());
    std::erase_if(stored.keys, [&](const StoredKey& each) { return each.user != user; });
    if (stored.keys.empty() && !isUser(user)) {
        return Error(ErrorNumber::notFound, "There is no user \"" + user + "\".");
    }
    return stored;
}

Result<AddedKey> addKey(const std::string& user, const PublicKey& key, KeyChange change) {
    FakeStandalone& fake = FakeStandalone::instance();
    if (fake.keysFail) {
        return failure();
    }
    if (!isUser(user)) {
        return Error(ErrorNumber::invalid, "a user of this server");
    }
    if (const auto same = placeOf(user, key.fingerprint); same != fake.keys.end()) {
        return AddedKey{*same, false};
    }
    const StoredKey added{user, {key, "2026-11-23T04:00:00.000Z", FakeStandalone::instance().actor}, true};
    if (change == KeyChange::make) {
        fake.keys.push_back(added);
    }
    return AddedKey{added, true};
}

Result<std::optional<StoredKey>> removeKey(const std::string& user, const std::string& fingerprint,
                                           KeyChange change) {
    FakeStandalone& fake = FakeStandalone::instance();
    if (fake.keysFail) {
        return failure();
    }
    const auto found = placeOf(user, fingerprint);
    if (found == fake.keys.end()) {
        return std::nullopt;
    }
    StoredKey removed = *found;
    if (change == KeyChange::make) {
        fake.keys.erase(found);
    }
    return std::optional(std::move(removed));
}

} // namespace velt
