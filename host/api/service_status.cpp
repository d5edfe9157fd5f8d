#include "host/api/service_status.h"

#include "ftp/ftp_library.h"
#include "host/module/module_call.h"
#include "platform/sftp.h"

#include <algorithm>
#include <array>

namespace velt::host {

namespace {

/// Which services the stored settings ask for. The answer of "get" may be the state of this moment, but every
/// "set" has to name the wanted one: a client that changes a single setting needs to know what is stored, or
/// it would switch off a service that is just down.
struct StoredSwitches {
    bool ftp = false;
    bool ftps = false;
    bool sftp = false;
};

/// Nothing when the platform cannot read one of the settings.
std::optional<StoredSwitches> readStoredSwitches() {
    _tag_VELT_FTP_CONF_ ftp{};
    _tag_VELT_SFTP_CONFIG_ sftp{};
    if (VELTFTPConfGet(&ftp) < 0 || VELTSFTPConfigGet(1, &sftp) < 0) {
        return std::nullopt;
    }
    return StoredSwitches{(ftp.service_flags & VELT_FTP_SERVICE_PLAIN) != 0,
                          (ftp.service_flags & VELT_FTP_SERVICE_TLS) != 0, sftp.enable != 0};
}

/// Which row tells about a service, and how the platform names its daemon.
struct Place {
    const char* name;
    const char* api;
    int version;
    const char* switchKey;
    const char* daemon;
    bool StoredSwitches::*wanted;
};

constexpr std::array<Place, 3> places{{
    {"ftp", "VELT.Core.FileServ.FTP", 3, "enable_ftp", "ftp", &StoredSwitches::ftp},
    {"ftps", "VELT.Core.FileServ.FTP", 3, "enable_ftps", "ftp", &StoredSwitches::ftps},
    {"sftp", "VELT.Core.FileServ.FTP.SFTP", 1, "enable", "sftp", &StoredSwitches::sftp},
}};

/// The row's answer; null when it fails.
Json::Value settingsOf(const Row& row, const Principal& principal) {
    const Outcome outcome = callRow(row, Json::Value(Json::objectValue), principal.actor, principal.address);
    const bool good = outcome.kind == Outcome::Kind::success && outcome.data.isObject();
    return good ? outcome.data : Json::Value();
}

Service describe(const Place& place, const Json::Value& settings, const std::optional<StoredSwitches>& stored,
                 const std::vector<ServiceDown>& down) {
    Service service;
    service.name = place.name;
    if (settings.isObject()) {
        service.enabled = settings[place.switchKey];
        service.port = settings["portnum"];
    }
    if (stored) {
        service.wanted = (*stored).*place.wanted;
    }
    const auto found = std::find_if(
        down.begin(), down.end(), [&place](const ServiceDown& each) { return each.service == place.daemon; });
    // FTP and FTPS share a daemon; the one that is off is not down.
    if (found != down.end() && service.wanted.value_or(true)) {
        service.running = found->servesFormerSettings;
        service.reason = found->reason;
    } else {
        service.running = service.enabled.isBool() && service.enabled.asBool();
    }
    return service;
}

std::string titleOf(const ServiceDown& down) {
    const std::string name = down.service == "sftp" ? "SFTP" : "FTP";
    return "The " + name + " service " +
           (down.servesFormerSettings ? "runs with its former settings." : "does not run.");
}

} // namespace

std::vector<Service> listServices(const ModuleTable& table, const Principal& principal) {
    const std::vector<ServiceDown> down = servicesDown();
    const std::optional<StoredSwitches> stored = readStoredSwitches();
    std::vector<Service> services;
    const Row* former = nullptr;
    Json::Value settings;
    for (const Place& place : places) {
        const Row* const row = table.find(place.api, place.version, "get");
        if (row == nullptr) {
            continue;
        }
        if (row != former) {
            settings = settingsOf(*row, principal);
            former = row;
        }
        services.push_back(describe(place, settings, stored, down));
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
    Json::Value object(Json::objectValue);
    object["name"] = service.name;
    object["enabled"] = service.enabled;
    object["port"] = service.port;
    object["running"] = service.running;
    if (service.wanted) {
        object["wanted"] = *service.wanted;
    }
    if (!service.reason.empty()) {
        object["reason"] = service.reason;
    }
    return object;
}

Json::Value toObject(const ServiceDown& down) {
    Json::Value object(Json::objectValue);
    object["service"] = down.service;
    object["reason"] = down.reason;
    object["serves_former_settings"] = down.servesFormerSettings;
    return object;
}

} // namespace velt::host
