#include "host/api/service_status.h"

#include "base/json_value.h"
#include "host/module/module_call.h"
#include "schema/settings_table.h"

#include <algorithm>

namespace velt::host {

namespace {

/// The setting that switches a service on and off.
struct Switch {
    const schema::SettingGroup* group;
    const char* key;
};

std::optional<Switch> switchOf(std::string_view service) {
    for (const schema::SettingGroup* group : schema::groups) {
        for (const schema::Setting& setting : group->settings) {
            if (setting.service != nullptr && setting.service == service) {
                return Switch{group, setting.key};
            }
        }
    }
    return std::nullopt;
}

/// The row's answer; null when it fails.
Json::Value settingsOf(const Row& row, const Principal& principal) {
    const Outcome outcome = callRow(row, Json::Value(Json::objectValue), principal.actor, principal.address);
    const bool good = outcome.kind == Outcome::Kind::success && outcome.data.isObject();
    return good ? outcome.data : Json::Value();
}

/// Reads what the modules answer about the services, and what is stored of a service without a module. The
/// answer of "get" may be the state of this moment, but every "set" has to name the wanted one: a client that
/// changes a single setting needs to know what is stored, or it would switch off a service that is just down.
class ServiceReader {
public:
    ServiceReader(const ModuleTable& table, const Principal& principal)
        : table_(table), principal_(principal) {}

    /// Empty when the service's module is not loaded.
    std::optional<Service> read(const StoredService& stored) {
        Service service{stored.name, {}, {}, stored.enabled, false, ""};
        const auto known = switchOf(stored.name);
        if (!known) {
            service.enabled = stored.enabled ? Json::Value(*stored.enabled) : Json::Value();
            service.port = stored.port ? Json::Value(*stored.port) : Json::Value();
            return service;
        }
        const Row* const row = table_.find(known->group->api, known->group->newestApiVersion, "get");
        if (row == nullptr) {
            return std::nullopt;
        }
        if (row != former_) {
            settings_ = settingsOf(*row, principal_);
            former_ = row;
        }
        if (settings_.isObject()) {
            service.enabled = settings_[known->key];
            service.port = settings_["portnum"];
        }
        return service;
    }

private:
    const ModuleTable& table_;
    const Principal& principal_;
    const Row* former_ = nullptr; ///< FTP and FTPS share one
    Json::Value settings_;
};

void addState(Service& service, const std::string& daemon, const std::vector<ServiceDown>& down) {
    const auto found = std::ranges::find(down, daemon, &ServiceDown::service);
    // FTP and FTPS share a daemon; the one that is off is not down.
    if (found != down.end() && service.wanted.value_or(true)) {
        service.running = found->servesFormerSettings;
        service.reason = found->reason;
    } else {
        service.running = service.enabled.isBool() && service.enabled.asBool();
    }
}

std::string titleOf(const ServiceDown& down) {
    return "The " + down.label + " service " +
           (down.servesFormerSettings ? "runs with its former settings." : "does not run.");
}

} // namespace

std::vector<Service> listServices(const ModuleTable& table, const Principal& principal) {
    const std::vector<ServiceDown> down = servicesDown();
    std::vector<Service> services;
    ServiceReader reader(table, principal);
    for (const StoredService& stored : storedServices()) {
        if (auto service = reader.read(stored)) {
            addState(*service, stored.daemon, down);
            services.push_back(std::move(*service));
        }
    }
    return services;
}

std::string sentenceOf(const std::vector<ServiceDown>& down) {
    std::string text;
    for (const ServiceDown& each : down) {
        text += (text.empty() ? "" : " ") + titleOf(each) + (each.reason.empty() ? "" : " ") + each.reason;
    }
    return text;
}

Json::Value toObject(const Service& service) {
    Json::Value object = jsonObject({{"name", service.name},
                                     {"enabled", service.enabled},
                                     {"port", service.port},
                                     {"running", service.running}});
    if (service.wanted) {
        object["wanted"] = *service.wanted;
    }
    if (!service.reason.empty()) {
        object["reason"] = service.reason;
    }
    return object;
}

Json::Value toObject(const ServiceDown& down) {
    return jsonObject({{"service", down.service},
                       {"reason", down.reason},
                       {"serves_former_settings", down.servesFormerSettings}});
}

} // namespace velt::host
