#include "sftp/sftp.h"

#include "handler/log.h"
#include "platform/adminlog.h"
#include "platform/firewall.h"
#include "platform/service.h"

#include <cstdio>

namespace {

constexpr int whichConfig = 1;
constexpr int minPort = 1;
constexpr int maxPort = 65535;
constexpr char service[] = "sftp";

constexpr int logCategory = 2;
constexpr int logLevel = 1;
constexpr unsigned eventPortChanged = 0x11B00035;
constexpr unsigned eventEnabled = 0x11B00036;

void addEntry(unsigned event, const char* arg1 = "", const char* arg2 = "") {
    VELTLogSet1(logCategory, logLevel, event, arg1, arg2, "", "");
}

/// Brings the service into the state that the new record asks for.
bool controlService(ServiceHandler& handler, const _tag_VELT_SFTP_CONFIG_& oldConf,
                    const _tag_VELT_SFTP_CONFIG_& newConf) {
    if (newConf.enable == 0) {
        if (VLIBServiceStop(service, 0) < 0) {
            return VELT_FAIL_LAST_ERROR(handler, ErrorCode::operationFailed,
                                        "Failed to VLIBServiceStop(sftp).[0x%04X %s:%d]");
        }
        return true;
    }
    if (oldConf.enable == 0) {
        if (VLIBServiceStart(service, 0) < 0) {
            return VELT_FAIL_LAST_ERROR(handler, ErrorCode::operationFailed,
                                        "Failed to VLIBServiceStart(sftp).[0x%04X %s:%d]");
        }
        return true;
    }
    if (VLIBServiceResume(service) < 0) {
        return VELT_FAIL_LAST_ERROR(handler, ErrorCode::operationFailed,
                                    "Failed to VLIBServiceResume(sftp).[0x%04X %s:%d]");
    }
    return true;
}

/// Stores the new record and makes the running service follow it. Running sessions outlive the pause; after a
/// failure the service stays paused, until a later change resumes it.
bool apply(ServiceHandler& handler, const _tag_VELT_SFTP_CONFIG_& oldConf,
           const _tag_VELT_SFTP_CONFIG_& newConf) {
    if (oldConf.enable != 0 && VLIBServicePause(service) < 0) {
        return VELT_FAIL_LAST_ERROR(handler, ErrorCode::operationFailed,
                                    "Failed to VLIBServicePause(sftp).[0x%04X %s:%d]");
    }
    if (VELTSFTPConfigSet(newConf.enable, newConf.port) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to set SFTP config.");
    }
    if (newConf.port != oldConf.port && VELTFwRuleHup() < 0) {
        VELT_LOG("Failed to reload firewall rules.");
    }
    return controlService(handler, oldConf, newConf);
}

} // namespace

SFTPServiceHandler::SFTPServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response)
    : ServiceHandler(request, response) {}

SFTPServiceHandler::SFTPServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response, int version)
    : ServiceHandler(request, response, version) {}

void SFTPServiceHandler::Get() {
    RequestWriter writer;
    Json::Value result;
    if (GetData(result)) {
        ReportSuccess(result);
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

void SFTPServiceHandler::Set() {
    RequestWriter writer;
    const Json::Value params = fetchParams();
    if (CheckData(params) && SetData(params)) {
        ReportSuccess();
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

bool SFTPServiceHandler::GetData(Json::Value& result) {
    _tag_VELT_SFTP_CONFIG_ conf{};
    if (VELTSFTPConfigGet(whichConfig, &conf) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get SFTP config.");
    }
    result["enable"] = VELTSFTPIsAlive() != 0;
    result["portnum"] = static_cast<Json::UInt>(conf.port);
    return true;
}

bool SFTPServiceHandler::CheckData(const Json::Value& params) {
    if (!params["enable"].isBool()) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "bool variable 'enable' is missing.");
    }
    if (params["portnum"].isNull()) {
        return true;
    }
    if (!params["portnum"].isInt()) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "Invalid type of input.");
    }
    const int port = params["portnum"].asInt();
    if (port < minPort || port > maxPort) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "Invalid port value of input.");
    }
    // The server belongs to the secure-shell service, and its ports are registered under that name.
    if (WebUtils::IsPortConflict("ssh", port, port) != 0) {
        return VELT_FAIL(*this, ErrorCode::sftpPortConflict, "Port conflict.");
    }
    return true;
}

bool SFTPServiceHandler::SetData(const Json::Value& params) {
    _tag_VELT_SFTP_CONFIG_ oldConf{};
    if (VELTSFTPConfigGet(whichConfig, &oldConf) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get SFTP config.");
    }
    _tag_VELT_SFTP_CONFIG_ newConf = oldConf;
    const bool enable = params["enable"].asBool();
    const bool switched = enable != (oldConf.enable != 0);
    if (switched) {
        newConf.enable = enable ? 1 : 0;
    }
    if (!params["portnum"].isNull()) {
        newConf.port = params["portnum"].asInt();
    }
    if (!switched && newConf.port == oldConf.port) {
        return true;
    }
    if (!apply(*this, oldConf, newConf)) {
        return false;
    }
    LogChanges(&oldConf, &newConf);
    return true;
}

void SFTPServiceHandler::LogChanges(_tag_VELT_SFTP_CONFIG_* oldConf, _tag_VELT_SFTP_CONFIG_* newConf) {
    if (newConf->enable == 0) {
        return;
    }
    if (oldConf->port != newConf->port) {
        char oldPort[32] = {};
        char newPort[32] = {};
        std::snprintf(oldPort, sizeof(oldPort), "%d", oldConf->port);
        std::snprintf(newPort, sizeof(newPort), "%d", newConf->port);
        addEntry(eventPortChanged, oldPort, newPort);
    }
    if (oldConf->enable != newConf->enable) {
        addEntry(eventEnabled);
    }
}
