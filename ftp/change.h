// One change of the FTP settings: the record as it was read, and a copy in which the differences are staged.
#ifndef VELT_FTP_CHANGE_H
#define VELT_FTP_CHANGE_H

#include "ftp/ftp_library.h"

#include <json/value.h>

/// The control port as a number; text that is none gives 0.
int controlPort(const _tag_VELT_FTP_CONF_& conf);

/// Whether the record holds a custom passive range: both of its ports are set.
bool hasCustomRange(const _tag_VELT_FTP_CONF_& conf);

/// The stage operations compare one parameter with the old record and, when it is present and differs, put it
/// into the new one. They cannot fail and return true, so that they chain with those steps that can.
struct Change {
    const Json::Value& params;
    _tag_VELT_FTP_CONF_ oldConf{};
    _tag_VELT_FTP_CONF_ newConf{};
    bool changed = false;        ///< something differs: store, and restart the services
    bool reloadFirewall = false; ///< a port differs

    /// Whether a parameter is present.
    bool has(const char* key) const { return !params[key].isNull(); }

    /// A switch of service_flags; its parameter is always present.
    bool stageServiceFlag(const char* key, int flag);
    bool stageBool(const char* key, int32_t _tag_VELT_FTP_CONF_::*field);
    bool stageInt(const char* key, int32_t _tag_VELT_FTP_CONF_::*field);
    bool stagePort();
};

#endif
