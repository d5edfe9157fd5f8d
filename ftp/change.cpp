#include "ftp/change.h"

#include <cstdio>
#include <cstdlib>

int controlPort(const _tag_VELT_FTP_CONF_& conf) {
    return static_cast<int>(std::strtol(conf.portnum, nullptr, 10));
}

bool hasCustomRange(const _tag_VELT_FTP_CONF_& conf) {
    return conf.passive_port_min != 0 && conf.passive_port_max != 0;
}

bool Change::stageServiceFlag(const char* key, int flag) {
    if (params[key].asBool() != ((oldConf.service_flags & flag) != 0)) {
        changed = true;
        newConf.service_flags ^= flag;
    }
    return true;
}

bool Change::stageBool(const char* key, int32_t _tag_VELT_FTP_CONF_::*field) {
    if (has(key) && params[key].asBool() != (oldConf.*field != 0)) {
        changed = true;
        newConf.*field = params[key].asBool() ? 1 : 0;
    }
    return true;
}

bool Change::stageInt(const char* key, int32_t _tag_VELT_FTP_CONF_::*field) {
    if (has(key) && params[key].asInt() != oldConf.*field) {
        changed = true;
        newConf.*field = params[key].asInt();
    }
    return true;
}

bool Change::stagePort() {
    const Json::Value& port = params["portnum"];
    // Compared as JSON values: a stored 21 and a requested 21.0 differ.
    if (!port.isNull() && port != Json::Value(controlPort(oldConf))) {
        changed = true;
        reloadFirewall = true;
        std::snprintf(newConf.portnum, sizeof(newConf.portnum), "%d", port.asInt());
    }
    return true;
}
