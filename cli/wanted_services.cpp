#include "cli/wanted_services.h"

#include "cli/failure.h"

namespace velt::cli {

namespace {

// Null from a server that has no such answer: the methods are what counts.
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
            switches.doubts.push_back(std::string(setting.key) +
                                      " was sent as off, as the server shows it. If the service is switched "
                                      "on and only down, it is "
                                      "switched off now: name " +
                                      setting.key + "=on to have it run.");
        }
    }
    return switches;
}

} // namespace velt::cli
