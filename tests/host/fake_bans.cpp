// The fake standalone's failed logins and bans.
#include "tests/host/fake_standalone.h"

#include <mutex>
#include <utility>

namespace {

std::mutex mutex; ///< guards the failed logins and the bans

} // namespace

std::vector<std::string> FakeStandalone::noted() const {
    const std::lock_guard lock(mutex);
    return failedLogins;
}

void FakeStandalone::setBans(std::vector<velt::Ban> theirs) {
    const std::lock_guard lock(mutex);
    bans = std::move(theirs);
}

namespace velt {

void noteFailedLogin(const std::string& service, const std::string& address) {
    if (FakeStandalone::instance().whileNoted) {
        FakeStandalone::instance().whileNoted();
    }
    const std::lock_guard lock(mutex);
    FakeStandalone::instance().failedLogins.push_back(service + " " + address);
}

std::string sourceOfLogin(const std::string& address) {
    return address.substr(0, address.find("::")); // nearly as in earnest
}

Result<CurrentBans> currentBans() {
    const std::lock_guard lock(mutex);
    const FakeStandalone& fake = FakeStandalone::instance();
    return fake.bansFail ? Result<CurrentBans>(Error(fake.sentence)) : CurrentBans{fake.bans, true};
}

std::optional<Ban> currentBanOf(const std::string& address) {
    const std::lock_guard lock(mutex);
    const auto network = parseIpAddress(address);
    for (const Ban& ban : FakeStandalone::instance().bans) {
        if (network && ban.source.contains(*network)) {
            return ban;
        }
    }
    return std::nullopt;
}

Result<bool> liftBan(const std::string& addressOrSource) {
    const std::lock_guard lock(mutex);
    FakeStandalone& fake = FakeStandalone::instance();
    if (fake.bansFail) {
        return Error(fake.sentence);
    }
    return std::erase_if(fake.bans, [&](const Ban& ban) { return toText(ban.source) == addressOrSource; }) >
           0;
}

} // namespace velt
