#include "security/security.h"

#include "handler/log.h"
#include "handler/owners.h"
#include "handler/parameter_types.h"
#include "platform/adminlog.h"
#include "platform/service.h"
#include "platform/share.h"

#include <strings.h>

#include <cstdio>
#include <cstring>

namespace {

constexpr int sharesOfferedToFTP = 0x207;
constexpr int privilegeNone = 0;
constexpr int privilegeDenied = 4;

constexpr int logCategory = 2;
constexpr int logLevel = 1;
constexpr unsigned eventAnonymousAllowed = 0x11B00010;
constexpr unsigned eventAnonymousRefused = 0x11B00011;
constexpr unsigned eventAnonymousChroot = 0x11B00026;
constexpr unsigned eventUserChroot = 0x11B00027;
constexpr unsigned eventAnonymousChrootShare = 0x11B00028;

constexpr Parameter parameters[] = {
    {"user_chroot", &Json::Value::isBool},      {"anonymous", &Json::Value::isBool},
    {"anonymous_chroot", &Json::Value::isBool}, {"anonymous_chroot_share", &Json::Value::isString},
    {"enable_umask", &Json::Value::isBool},
};

/// What one "set" compares and stages.
struct Change {
    const Json::Value& params;
    _tag_VELT_FTP_CONF_ oldConf{};
    _tag_VELT_FTP_CONF_ newConf{};
    bool changed = false; ///< something differs: store, and restart the daemons

    bool has(const char* key) const { return !params[key].isNull(); }

    /// Cannot fail; true, so that it chains with those steps that can.
    bool stageBool(const char* key, int32_t _tag_VELT_FTP_CONF_::*field) {
        if (has(key) && params[key].asBool() != (oldConf.*field != 0)) {
            changed = true;
            newConf.*field = params[key].asBool() ? 1 : 0;
        }
        return true;
    }
};

/// The rules hold for the merged record, whether or not the request touched these settings.
bool checkAnonymousChroot(FTPSecurityServiceHandler& handler, const _tag_VELT_FTP_CONF_& conf) {
    if (conf.anonymous_chroot == 0) {
        return true;
    }
    if (conf.anonymous_chroot_share[0] == '\0') {
        return VELT_FAIL(handler, ErrorCode::operationFailed,
                         "Anonymous chroot share setting cannot be empty when anonymous chroot is enabled.");
    }
    if (!handler.IsFTPShare(conf.anonymous_chroot_share)) {
        return VELT_FAIL(handler, ErrorCode::shareNotAccessible,
                         "This anonymous chroot share is not accessible by ftp.");
    }
    return true;
}

/// The name counts as it is stored, perhaps cut: for the rules as for the comparison.
bool stageShare(FTPSecurityServiceHandler& handler, Change& change) {
    char(&name)[sizeof(change.newConf.anonymous_chroot_share)] = change.newConf.anonymous_chroot_share;
    if (change.has("anonymous_chroot_share")) {
        std::snprintf(name, sizeof(name), "%s", change.params["anonymous_chroot_share"].asCString());
    }
    if (!checkAnonymousChroot(handler, change.newConf)) {
        return false;
    }
    if (std::strcmp(name, change.oldConf.anonymous_chroot_share) != 0) {
        change.changed = true;
    }
    return true;
}

/// The umask switch lives outside the record; a change of it alone leads to the store and restart too.
bool stageUmask(ServiceHandler& handler, Change& change) {
    if (!change.has("enable_umask") ||
        change.params["enable_umask"].asBool() == (VELTFTPUmaskEnabledGet() != 0)) {
        return true;
    }
    change.changed = true;
    if (VELTFTPUmaskEnabledSet(change.params["enable_umask"].asBool()) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to set FTP umask.");
    }
    return true;
}

/// Stores the new record and restarts the daemons that it asks for.
bool apply(ServiceHandler& handler, const Change& change) {
    if (VELTFTPConfSet(change.newConf) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to set FTP config.");
    }
    if (VLIBServiceStop("ftpd", 0) < 0 || VLIBServiceStop("ftpd-ssl", 0) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to disable FTP.");
    }
    if ((change.newConf.service_flags & VELT_FTP_SERVICE_PLAIN) != 0 && VLIBServiceStart("ftpd", 0) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to enable FTP.");
    }
    if ((change.newConf.service_flags & VELT_FTP_SERVICE_TLS) != 0 && VLIBServiceStart("ftpd-ssl", 0) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to enable FTPES.");
    }
    return true;
}

void addEntry(unsigned event, const char* arg1 = "") {
    VELTLogSet1(logCategory, logLevel, event, arg1, "", "", "");
}

} // namespace

FTPSecurityServiceHandler::FTPSecurityServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response)
    : ServiceHandler(request, response) {}

void FTPSecurityServiceHandler::Get() {
    RequestWriter writer;
    Json::Value result;
    if (GetData(result)) {
        ReportSuccess(result);
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

void FTPSecurityServiceHandler::Set() {
    RequestWriter writer;
    const Json::Value params = fetchParams();
    if (CheckData(params) && SetData(params)) {
        ReportSuccess();
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

void FTPSecurityServiceHandler::GetShare() {
    RequestWriter writer;
    Json::Value result;
    if (GetShareData(result)) {
        ReportSuccess(result);
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

bool FTPSecurityServiceHandler::GetData(Json::Value& result) {
    _tag_VELT_FTP_CONF_ conf{};
    if (VELTFTPConfGet(&conf) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get FTP config.");
    }
    result["user_chroot"] = conf.user_chroot != 0;
    result["anonymous"] = conf.anonymous != 0;
    result["anonymous_chroot"] = conf.anonymous_chroot != 0;
    result["anonymous_chroot_share"] = conf.anonymous_chroot_share;
    result["enable_umask"] = VELTFTPUmaskEnabledGet() != 0;
    return true;
}

bool FTPSecurityServiceHandler::CheckData(const Json::Value& params) {
    if (!haveTypesIfPresent(params, parameters)) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "Invalid type of input.");
    }
    return true;
}

bool FTPSecurityServiceHandler::SetData(const Json::Value& params) {
    Change change{params};
    if (VELTFTPConfGet(&change.oldConf) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get FTP config.");
    }
    change.newConf = change.oldConf;
    const bool staged = change.stageBool("user_chroot", &_tag_VELT_FTP_CONF_::user_chroot) &&
                        change.stageBool("anonymous", &_tag_VELT_FTP_CONF_::anonymous) &&
                        change.stageBool("anonymous_chroot", &_tag_VELT_FTP_CONF_::anonymous_chroot) &&
                        stageShare(*this, change) && stageUmask(*this, change);
    if (!staged) {
        return false;
    }
    if (!change.changed) {
        return true;
    }
    if (!apply(*this, change)) {
        return false;
    }
    LogChanges(&change.oldConf, &change.newConf);
    return true;
}

bool FTPSecurityServiceHandler::GetShareData(Json::Value& result) {
    Json::Value shares(Json::arrayValue);
    SzList list;
    if (!list) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to VLIBCSzListAlloc. Err = [%X]",
                         static_cast<unsigned>(VLIBCErrGet()));
    }
    if (VELTFTPShareEnum(list.address(), sharesOfferedToFTP) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to VELTFTPShareEnum. Err = [%X]",
                         static_cast<unsigned>(VLIBCErrGet()));
    }
    for (int i = 0; i < list.count(); ++i) {
        const char* const name = list.at(i);
        if (strcasecmp(name, "homes") != 0) {
            shares.append(name);
        }
    }
    result["share"] = shares;
    return true;
}

bool FTPSecurityServiceHandler::IsFTPShare(const char* share) {
    ShareHandle handle;
    if (VELTShareGet(share, handle.address()) < 0) {
        VELT_LOG_LAST_ERROR("Fail to VELTShareGet().[0x%04X %s:%d]");
        return false;
    }
    VELT_SHARE_PRIV privilege{};
    if (VELTShareUGPrivGetLocal("ftp", handle.get(), &privilege) < 0) {
        VELT_LOG_LAST_ERROR("Fail to VELTShareUGPrivGetLocal().[0x%04X %s:%d]");
        return false;
    }
    return privilege.effective != privilegeNone && privilege.effective != privilegeDenied;
}

void FTPSecurityServiceHandler::LogChanges(_tag_VELT_FTP_CONF_* oldConf, _tag_VELT_FTP_CONF_* newConf) {
    if (oldConf->anonymous != newConf->anonymous) {
        addEntry(newConf->anonymous != 0 ? eventAnonymousAllowed : eventAnonymousRefused);
    }
    if (oldConf->anonymous_chroot != newConf->anonymous_chroot) {
        addEntry(eventAnonymousChroot, newConf->anonymous_chroot != 0 ? "started" : "stopped");
    }
    // A name that differs in letter case alone is the same name to an administrator, though not to the store.
    if (strcasecmp(oldConf->anonymous_chroot_share, newConf->anonymous_chroot_share) != 0) {
        addEntry(eventAnonymousChrootShare, newConf->anonymous_chroot_share);
    }
    if (oldConf->user_chroot != newConf->user_chroot) {
        addEntry(eventUserChroot, newConf->user_chroot != 0 ? "enable" : "disable");
    }
}
