#include "cli/wanted_services.h"

#include "cli/failure.h"

namespace velt::cli {

namespace {

// Null when the server does not tell: a change must not fail for that.
Json::Value servicesOf(ApiClient& api) {
    try {
        const Json::Value status = api.get("/api/status");
        return status.isObject() ? status["services"] : Json::Value();
    } catch (const Failure&) {
        return {};
    }
}

Json::Value storedSwitch(const Json::Value& services, const std::string& service) {
    if (!services.isArray()) {
        return {};
    }
    for (const Json::Value& each : services) {
        if (each.isObject() && each["name"] == service && each["wanted"].isBool()) {
            return each["wanted"];
        }
    }
    return {};
}

} // namespace

StoredSwitches readStoredSwitches(ApiClient& api, const SettingGroup& group, const Json::Value& wanted,
                                  const Json::Value& current) {
    StoredSwitches switches{current, {}};
    Json::Value services;
    bool asked = false;
    for (const Setting& setting : group.settings) {
        if (setting.service == nullptr || wanted.isMember(setting.key)) {
            continue;
        }
        if (!asked) {
            services = servicesOf(api);
            asked = true;
        }
        const Json::Value stored = storedSwitch(services, setting.service);
        if (stored.isBool()) {
            switches.values[setting.key] = stored;
        } else if (current[setting.key] == false) {
            const std::string key = setting.key;
            switches.doubts.push_back(key +
                                      " was sent as off, because the server shows it so. If the service was "
                                      "only down, it is switched off now: set " +
                                      key + "=on to have it run.");
        }
    }
    return switches;
}

} // namespace velt::cli
