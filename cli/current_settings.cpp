#include "cli/current_settings.h"

#include "cli/failure.h"
#include "cli/server_refusal.h"

#include <algorithm>

namespace velt::cli {

namespace {

// Null when the server does not say: a change must not fail because of that.
Json::Value servicesOf(ApiClient& api) {
    try {
        const Json::Value status = api.get("/api/status");
        return status.isObject() ? status["services"] : Json::Value();
    } catch (const Failure&) {
        return {};
    }
}

Json::Value storedSwitch(const Json::Value& services, const std::string& service) {
    for (const Json::Value& each : services) {
        if (each.isObject() && each["name"] == service && each["wanted"].isBool()) {
            return each["wanted"];
        }
    }
    return {};
}

void lookUpSwitch(const Json::Value& services, const Setting& setting, CurrentSettings& current) {
    const std::string key = setting.key;
    const Json::Value stored = storedSwitch(services, setting.service);
    if (stored.isBool()) {
        current.stored[key] = stored;
    } else if (current.shown[key] == false) {
        current.doubts.push_back(key +
                                 " was sent as off, because that is what the server shows. If the service "
                                 "was only down, it is now switched off: set " +
                                 key + "=on to run it.");
    }
}

} // namespace

Json::Value readSettings(ApiClient& api, const SettingGroup& group) {
    Json::Value shown = api.read(group.method("get"));
    const auto missing = [&](const Setting& setting) {
        return setting.service != nullptr && !hasType(shown[setting.key], setting.type);
    };
    if (!shown.isObject() || std::ranges::any_of(group.settings, missing)) {
        throw unexpectedAnswer(std::string("The server's answer contains no ") + group.command +
                               " settings.");
    }
    return shown;
}

CurrentSettings readCurrentSettings(ApiClient& api, const SettingGroup& group, const Json::Value& wanted) {
    CurrentSettings current;
    current.shown = readSettings(api, group);
    current.stored = current.shown;
    std::optional<Json::Value> services; // asked for once at most
    for (const Setting& each : group.settings) {
        if (each.service != nullptr && !wanted.isMember(each.key)) {
            services = services ? services : servicesOf(api);
            lookUpSwitch(*services, each, current);
        }
    }
    return current;
}

} // namespace velt::cli
