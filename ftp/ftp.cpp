#include "ftp/ftp.h"

#include "ftp/change.h"
#include "ftp/parameters.h"
#include "handler/log.h"
#include "handler/owners.h"
#include "platform/firewall.h"
#include "platform/service.h"
#include "platform/sysevent.h"

#include <algorithm>
#include <cstdio>
#include <string>

namespace {

constexpr int extIpSize = 16;
constexpr int hashSize = 1024;
constexpr int runKeyStarted = 1;
constexpr int runKeyStopped = 2;

/// 0 no UTF-8 support, 1 support with the use-UTF-8 switch off, 2 with the switch on.
int utf8Mode(bool supported, bool used) {
    if (!supported) {
        return 0;
    }
    return used ? 2 : 1;
}

void fillUtf8(Json::Value& result, const _tag_VELT_FTP_CONF_& conf, int version) {
    const bool supported = conf.support_utf8 != 0;
    if (version > 2) {
        result[utf8Key(version)] = utf8Mode(supported, supported && VELTFTPUseUTF8Get() != 0);
    } else if (version == 2) {
        result[utf8Key(version)] = VELTFTPUseUTF8Get() != 0;
    } else {
        result[utf8Key(version)] = supported;
    }
}

bool stageTimeout(ServiceHandler& handler, Change& change) {
    if (!change.has("timeout") || change.params["timeout"].asInt() == VELTFTPTimeOutGet()) {
        return true;
    }
    change.changed = true;
    if (VELTFTPTimeOutSet(change.params["timeout"].asInt()) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to set FTP timeout.");
    }
    return true;
}

bool stagePassiveRange(FTPServiceHandler& handler, Change& change) {
    if (!change.has("custom_port_range")) {
        return true;
    }
    handler.SetCustomPortConf(change.params, change.oldConf, change.newConf, change.reloadFirewall);
    change.changed = change.changed || change.reloadFirewall;
    return true;
}

bool stageExternalAddress(FTPServiceHandler& handler, Change& change) {
    if (!change.has("ext_ip")) {
        return true;
    }
    char address[extIpSize] = {};
    if (!handler.GetExtIP(address, sizeof(address))) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to get FTP external IP setting.");
    }
    // Set for an equal address too: naming the address asks for the services to announce it afresh.
    change.changed = true;
    const std::string requested = change.params["ext_ip"].asString();
    if (requested == address) {
        return true;
    }
    std::snprintf(address, sizeof(address), "%s", requested.c_str());
    if (VLIBCINFOSetKeyValue("ftp_ext_ip", address) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to set FTP external IP");
    }
    return true;
}

bool setUseUtf8(ServiceHandler& handler, bool use) {
    if (VELTFTPUseUTF8Set(use ? 1 : 0) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to set FTP use UTF8 config.");
    }
    return true;
}

bool stageUtf8Mode(ServiceHandler& handler, Change& change, bool used) {
    const int mode = change.params["utf8_mode"].asInt();
    if (mode == utf8Mode(change.oldConf.support_utf8 != 0, used)) {
        return true;
    }
    if (!setUseUtf8(handler, mode == 2)) {
        return false;
    }
    change.changed = true;
    change.newConf.support_utf8 = mode != 0 ? 1 : 0;
    return true;
}

bool stageUseUtf8(ServiceHandler& handler, Change& change, bool used) {
    const bool use = change.params["use_utf8"].asBool();
    if (use == used) {
        return true;
    }
    if (use && change.oldConf.support_utf8 == 0) {
        VELT_LOG("Cannot set ftp_use_utf8='yes' when ftpsupportutf8='no'.");
        return true;
    }
    change.changed = true;
    return setUseUtf8(handler, use);
}

void stageSupportUtf8(Change& change, bool used) {
    const bool support = change.params["enable_utf8"].asBool();
    if (support == (change.oldConf.support_utf8 != 0)) {
        return;
    }
    if (!support && used) {
        VELT_LOG("Cannot set ftpsupportutf8='no' when ftp_use_utf8='yes'.");
        return;
    }
    change.changed = true;
    change.newConf.support_utf8 = support ? 1 : 0;
}

bool stageUtf8(ServiceHandler& handler, Change& change, int version) {
    const bool used = VELTFTPUseUTF8Get() != 0;
    if (!change.has(utf8Key(version))) {
        return true;
    }
    if (version > 2) {
        return stageUtf8Mode(handler, change, used);
    }
    if (version == 2) {
        return stageUseUtf8(handler, change, used);
    }
    stageSupportUtf8(change, used);
    return true;
}

bool stageFips(ServiceHandler& handler, Change& change) {
    if (!change.has("enable_fips") ||
        change.params["enable_fips"].asBool() == (VELTFTPFIPSEnabledGet() != 0)) {
        return true;
    }
    change.changed = true;
    if (VELTFTPFIPSEnabledSet(change.params["enable_fips"].asBool() ? 1 : 0) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to set FTP FIPS mode.");
    }
    return true;
}

bool stageAscii(ServiceHandler& handler, Change& change) {
    if (!change.has("enable_ascii") ||
        change.params["enable_ascii"].asBool() == (VELTFTPASCIIEnabledGet() != 0)) {
        return true;
    }
    change.changed = true;
    if (VELTFTPASCIIEnabledSet(change.params["enable_ascii"].asBool() ? 1 : 0) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to set FTP ASCII mode.");
    }
    return true;
}

int EmitServiceAction(const char* service, const char* action) {
    SzHash params(hashSize);
    if (!params) {
        VELT_LOG("Failed to allocate hash");
        return -1;
    }
    if (params.set("SERVICE_NAME", service) < 0 || params.set("SERVICE_ACTION", action) < 0) {
        VELT_LOG("Failed to set parameters");
        return -1;
    }
    if (VLIBSyseventEmit("velt.service.action", params.get(), 1) < 0) {
        VELT_LOG("Failed to emit service action event for [%s]", service);
        return -1;
    }
    return 0;
}

bool stopServices() {
    return VLIBServicectlStop("ftpd-pure", 0) >= 0 && VLIBServicectlStop("ftpd-ssl", 0) >= 0 &&
           VLIBServicectlStop("ftpd", 0) >= 0 && VLIBServicecfgRunKeySet("ftpd", runKeyStopped) >= 0 &&
           VLIBServicecfgRunKeySet("ftpd-ssl", runKeyStopped) >= 0;
}

bool markStarted(const char* service) {
    if (VLIBServicecfgRunKeySet(service, runKeyStarted) < 0) {
        return false;
    }
    EmitServiceAction(service, "start");
    return true;
}

// With FTPS alone "ftpd" is started as well, but its run key stays at "stopped": the key speaks of plain FTP.
bool startServices(int serviceFlags) {
    const bool plain = (serviceFlags & VELT_FTP_SERVICE_PLAIN) != 0;
    const bool tls = (serviceFlags & VELT_FTP_SERVICE_TLS) != 0;
    if (!plain && !tls) {
        return true;
    }
    return (!plain || VLIBServicectlStart("ftpd-pure", 0) >= 0) &&
           (!tls || VLIBServicectlStart("ftpd-ssl", 0) >= 0) && VLIBServicectlStart("ftpd", 0) >= 0 &&
           (!plain || markStarted("ftpd")) && (!tls || markStarted("ftpd-ssl"));
}

/// Stores the new record and restarts the services with it.
bool apply(ServiceHandler& handler, const Change& change) {
    if (VELTFTPConfSet(change.newConf) < 0) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to set FTP config.");
    }
    if (change.reloadFirewall && VELTFwRuleHup() < 0) {
        VELT_LOG("Failed to reload firewall rules.");
    }
    if (!stopServices()) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to stop FTP/FTPS.");
    }
    EmitServiceAction("ftpd", "stop");
    EmitServiceAction("ftpd-ssl", "stop");
    if (!startServices(change.newConf.service_flags)) {
        return VELT_FAIL(handler, ErrorCode::operationFailed, "Failed to enable FTP/FTPS.");
    }
    return true;
}

} // namespace

FTPServiceHandler::FTPServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response)
    : ServiceHandler(request, response) {}

FTPServiceHandler::FTPServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response, int version)
    : ServiceHandler(request, response, version) {}

void FTPServiceHandler::Get() {
    RequestWriter writer;
    Json::Value result;
    if (GetData(result)) {
        ReportSuccess(result);
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

void FTPServiceHandler::Set() {
    RequestWriter writer;
    const Json::Value params = fetchParams();
    if (CheckData(params) && SetData(params)) {
        ReportSuccess();
        return;
    }
    ReportError();
    VELT_LOG("Request: %s", writer.write(fetchParams()).c_str());
}

bool FTPServiceHandler::GetData(Json::Value& result) {
    char address[extIpSize] = {};
    _tag_VELT_FTP_CONF_ conf{};
    if (VELTFTPConfGet(&conf) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get FTP config.");
    }
    result["enable_ftp"] = VLIBServiceIsEnabled("ftpd") != 0;
    result["enable_ftps"] = VLIBServiceIsEnabled("ftpd-ssl") != 0;
    result["timeout"] = VELTFTPTimeOutGet();
    result["portnum"] = controlPort(conf);
    GetCustomPortConf(result, conf);
    result["use_ext_ip"] = conf.use_ext_ip != 0;
    if (!GetExtIP(address, sizeof(address))) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get FTP external IP setting.");
    }
    result["ext_ip"] = address;
    fillUtf8(result, conf, version_);
    result["enable_fxp"] = conf.enable_fxp != 0;
    result["enable_ascii"] = VELTFTPASCIIEnabledGet() != 0;
    const int fips = VELTFTPFIPSEnabledGet();
    if (fips < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get FTP FIPS Enabled setting");
    }
    result["enable_fips"] = fips != 0;
    result["enable_flow_ctrl"] = conf.enable_flow_ctrl != 0;
    result["maxuploadrate"] = conf.maxuploadrate;
    result["maxdownloadrate"] = conf.maxdownloadrate;
    result["max_conn_per_ip"] = std::max(conf.max_conn_per_ip, 0);
    return true;
}

bool FTPServiceHandler::CheckData(const Json::Value& params) {
    if (params["enable_ftp"].isNull() || params["enable_ftps"].isNull()) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "Null input.");
    }
    if (!haveFTPTypes(params) || !hasUtf8Type(params, version_)) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "Invalid type of input.");
    }
    if (!hasUtf8Value(params, version_)) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "Wrong UTF-8 webapi parameter");
    }
    if (hasEmptyText(params, "custom_port") || hasEmptyText(params, "ext_ip")) {
        return VELT_FAIL(*this, ErrorCode::badParameter, "Empty string input is not allowed.");
    }
    if (!params["portnum"].isNull()) {
        const int port = params["portnum"].asInt();
        if (WebUtils::IsPortConflict("ftp", port, port) != 0) {
            return VELT_FAIL(*this, ErrorCode::ftpPortConflict, "Port conflict.");
        }
    }
    if (!params["custom_port_range"].asBool()) {
        return true;
    }
    if (params["custom_port"].isNull()) {
        return VELT_FAIL(*this, ErrorCode::badParameter,
                         "Set ftp custom port range but port values are not given.");
    }
    const ParsedRange range = parseRange(params["custom_port"]);
    if (WebUtils::IsPortConflict("ftp", range.first, range.last) != 0) {
        return VELT_FAIL(*this, ErrorCode::passivePortConflict, "Port conflict.");
    }
    return true;
}

bool FTPServiceHandler::SetData(const Json::Value& params) {
    const bool wasEnabled = VLIBServiceIsEnabled("ftpd") != 0 || VLIBServiceIsEnabled("ftpd-ssl") != 0;
    Change change{params};
    if (VELTFTPConfGet(&change.oldConf) < 0) {
        return VELT_FAIL(*this, ErrorCode::operationFailed, "Failed to get FTP config.");
    }
    change.newConf = change.oldConf;

    // The order of effects. A setting with a setter of its own is in force as soon as its step is done, the
    // others wait in the new record for apply().
    const bool staged = change.stageServiceFlag("enable_ftp", VELT_FTP_SERVICE_PLAIN) &&
                        change.stageServiceFlag("enable_ftps", VELT_FTP_SERVICE_TLS) &&
                        stageTimeout(*this, change) && change.stagePort() &&
                        stagePassiveRange(*this, change) &&
                        change.stageBool("use_ext_ip", &_tag_VELT_FTP_CONF_::use_ext_ip) &&
                        stageExternalAddress(*this, change) && stageUtf8(*this, change, version_) &&
                        change.stageBool("enable_fxp", &_tag_VELT_FTP_CONF_::enable_fxp) &&
                        stageFips(*this, change) && stageAscii(*this, change) &&
                        change.stageBool("enable_flow_ctrl", &_tag_VELT_FTP_CONF_::enable_flow_ctrl) &&
                        change.stageInt("maxuploadrate", &_tag_VELT_FTP_CONF_::maxuploadrate) &&
                        change.stageInt("maxdownloadrate", &_tag_VELT_FTP_CONF_::maxdownloadrate) &&
                        change.stageInt("max_conn_per_ip", &_tag_VELT_FTP_CONF_::max_conn_per_ip);
    if (!staged) {
        return false;
    }
    if (!change.changed) {
        return true;
    }
    if (!apply(*this, change)) {
        return false;
    }
    LogChanges(wasEnabled ? 1 : 0, change.newConf.service_flags != 0 ? 1 : 0, &change.oldConf,
               &change.newConf);
    return true;
}

void FTPServiceHandler::GetCustomPortConf(Json::Value& result, const _tag_VELT_FTP_CONF_& conf) {
    char range[16] = {};
    const bool custom = hasCustomRange(conf);
    if (custom) {
        std::snprintf(range, sizeof(range), "%d:%d", conf.passive_port_min, conf.passive_port_max);
    } else {
        VELT_FTP_PORT_RANGE defaultRange{};
        VELTFTPDefaultPassivePortGet(&defaultRange);
        std::snprintf(range, sizeof(range), "%d:%d", defaultRange.first, defaultRange.last);
    }
    result["custom_port_range"] = custom;
    result["custom_port"] = range;
}

int FTPServiceHandler::SetCustomPortConf(const Json::Value& params, const _tag_VELT_FTP_CONF_& oldConf,
                                         _tag_VELT_FTP_CONF_& newConf, bool& reloadFirewall) {
    ParsedRange range;
    if (params["custom_port_range"].asBool()) {
        range = parseRange(params["custom_port"]);
    } else if (!hasCustomRange(oldConf)) {
        return 0;
    }
    if (range.first != oldConf.passive_port_min || range.last != oldConf.passive_port_max) {
        newConf.passive_port_min = range.first;
        newConf.passive_port_max = range.last;
        reloadFirewall = true;
    }
    return std::max(range.matched, 0);
}

bool FTPServiceHandler::GetExtIP(char* buffer, int size) {
    const int result = VLIBCFileGetKeyValue("/etc/veltinfo.conf", "ftp_ext_ip", buffer, size, 0);
    if (result < 0) {
        VELT_LOG("Failed to VLIBCFileGetKeyValue.");
        return false;
    }
    if (result == 0) {
        buffer[0] = '\0';
    }
    return true;
}
