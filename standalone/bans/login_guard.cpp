#include "standalone/bans/login_guard.h"

#include "base/utc_text.h"
#include "standalone/bans/ban_settings.h"
#include "standalone/bans/failure_counter.h"
#include "standalone/core/effects.h"
#include "standalone/core/state_lock.h"
#include "standalone/journal/admin_log.h"
#include "standalone/journal/announce.h"

#include <syslog.h>

#include <algorithm>
#include <map>
#include <mutex>

namespace velt {
namespace {

using Clock = Ban::Clock;

constexpr int logCategory = 2;
constexpr int logLevel = 1;
constexpr unsigned bannedEvent = 0x11BF0001;
constexpr unsigned liftedEvent = 0x11BF0002;

void complain(const Error& error) {
    ::syslog(LOG_ERR, "%s", error.message.c_str());
}

BanSettings settingsOrDefaults() {
    const auto settings = loadBanSettings();
    if (!settings) {
        complain(settings.error()); // guessing must not become free by a slip of the pen
    }
    return settings.valueOr({});
}

bool isTooMany(const IpNetwork& source, const BanSettings& settings) {
    static std::mutex mutex;
    static FailureCounter counter;
    const std::lock_guard lock(mutex);
    return counter.count(source, settings, FailureCounter::Clock::now());
}

std::string nameOf(const std::string& service) {
    static const std::map<std::string, std::string> names{{"ftp", "FTP"}, {"sftp", "SFTP"}};
    const auto found = names.find(service);
    return found == names.end() ? service : found->second;
}

/// Writes it into the list and into the firewall, which agree with each other under the lock. True when the
/// list has it now. A source that is banned already keeps its ban.
Result<bool> store(const Ban& ban) {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    const auto now = Clock::now(); // whoever had the lock may have kept it for long
    VELT_ASSIGN_OR_RETURN(const auto bans, bansAt(now));
    const auto former = banOf(ban.source, bans);
    if (!former) {
        VELT_RETURN_IF_ERROR(storeBan(ban, now));
    }
    // Also for one that is banned already: if it still gets to guess, the firewall may have failed.
    const Ban& current = former ? *former : ban;
    const auto left = std::chrono::floor<std::chrono::seconds>(current.until - now);
    if (const auto refused = banSource({current.source, left}); !refused) {
        complain(refused.error()); // the list counts nevertheless
    }
    return !former;
}

Result<bool> putInForce(const Ban& ban) {
    bool begins = false;
    VELT_RETURN_IF_ERROR(perform(Effect::store, "bans", [&]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(begins, store(ban));
        return {};
    }));
    return begins;
}

void tell(const std::string& action, const Ban& ban) {
    const auto announced = announce("velt.login.ban", {{"ACTION", action},
                                                       {"ADDRESS", toText(ban.source)},
                                                       {"SERVICE", ban.service},
                                                       {"UNTIL", timestamp(ban.until)}});
    if (!announced) {
        complain(announced.error());
    }
}

void impose(const Ban& ban, std::chrono::seconds duration) {
    const auto begins = putInForce(ban);
    if (!begins) {
        complain(begins.error());
    }
    if (!begins.valueOr(false)) {
        return; // who goes on guessing must not fill the log
    }
    const auto logged = logEvent(logCategory, logLevel, bannedEvent,
                                 {toText(ban.source).c_str(), std::to_string(duration.count()).c_str(),
                                  std::to_string(ban.failures).c_str(), nameOf(ban.service).c_str()});
    if (!logged) {
        complain(logged.error());
    }
    tell("begin", ban);
}

Result<std::optional<Ban>> takeOut(const IpNetwork& source) {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const auto bans, bansAt(Clock::now()));
    auto found = banOf(source, bans);
    if (found) {
        VELT_ASSIGN_OR_RETURN(const bool admitted, admitSource(found->source));
        (void)admitted; // where there are no rules, nobody is refused
        VELT_ASSIGN_OR_RETURN(const bool removed, removeBan(found->source, Clock::now()));
        (void)removed;
    }
    return found;
}

} // namespace

void noteFailedLogin(const std::string& service, const IpNetwork& address) {
    const IpNetwork source = sourceOf(address);
    const BanSettings settings = settingsOrDefaults();
    if (settings.enabled && !isSpared(source, settings) && isTooMany(source, settings)) {
        // The list never ends a ban before the firewall does.
        const auto until = std::chrono::ceil<std::chrono::seconds>(Clock::now()) + settings.ban;
        impose({source, until, service, settings.failures}, settings.ban);
    }
}

void noteFailedLogin(const std::string& service, const std::string& address) {
    if (const auto network = parseIpAddress(address)) {
        noteFailedLogin(service, *network);
    }
}

std::string sourceOfLogin(const std::string& address) {
    const auto network = parseIpAddress(address);
    return network ? toText(sourceOf(*network)) : "";
}

Result<CurrentBans> currentBans() {
    CurrentBans current;
    VELT_ASSIGN_OR_RETURN(current.bans, bansAt(Clock::now()));
    VELT_ASSIGN_OR_RETURN(current.firewall, firewallRefuses());
    return current;
}

std::optional<Ban> currentBanOf(const std::string& address) {
    const auto network = parseIpAddress(address);
    if (!network || isSpared(*network, {})) {
        return std::nullopt;
    }
    const auto bans = bansAt(Clock::now());
    return bans ? banOf(*network, *bans) : std::nullopt;
}

Result<bool> liftBan(const std::string& addressOrSource) {
    const auto source = parseIpNetwork(addressOrSource);
    if (!source) {
        return false;
    }
    std::optional<Ban> lifted;
    VELT_RETURN_IF_ERROR(perform(Effect::store, "bans", [&]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(lifted, takeOut(*source));
        return {};
    }));
    if (!lifted) {
        return false;
    }
    const std::string address = toText(lifted->source);
    VELT_RETURN_IF_ERROR(
        logEvent(logCategory, logLevel, liftedEvent, {address.c_str(), nullptr, nullptr, nullptr}));
    tell("lifted", *lifted);
    return true;
}

Result<std::vector<BannedSource>> sourcesToRefuse() {
    const auto now = Clock::now();
    VELT_ASSIGN_OR_RETURN(const auto bans, bansAt(now));
    std::vector<BannedSource> sources;
    for (const Ban& each : bans) {
        sources.push_back({each.source, std::chrono::floor<std::chrono::seconds>(each.until - now)});
    }
    return sources;
}

} // namespace velt
