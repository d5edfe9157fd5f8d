#include "tests/unit/ftp_journal.h"

#include "ftp/ftp.h"

#include <cstdio>

namespace ftptest {

void getVersion0(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler(request, response, 0).Get();
}

void setVersion0(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler(request, response, 0).Set();
}

void getVersion4(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler(request, response, 4).Get();
}

void setVersion4(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler(request, response, 4).Set();
}

std::string log(const std::string& message, const std::string& arguments) {
    return logLine("ftp", message, arguments);
}

Lines operator+(Lines first, const std::string& line) {
    first.push_back(line);
    return first;
}

std::string request(const std::string& more, bool ftp, bool ftps) {
    return std::string(R"({"enable_ftp":)") + (ftp ? "true" : "false") + R"(,"enable_ftps":)" +
           (ftps ? "true" : "false") + (more.empty() ? "" : "," + more) + "}";
}

Lines reads(bool ftpdEnabled) {
    if (ftpdEnabled) {
        return {R"(VLIBServiceIsEnabled("ftpd"))", "VELTFTPConfGet()"};
    }
    return {R"(VLIBServiceIsEnabled("ftpd"))", R"(VLIBServiceIsEnabled("ftpd-ssl"))", "VELTFTPConfGet()"};
}

Lines nothingToApply() {
    return {"APIResponse::SetSuccess(null)"};
}

std::string readsAddress() {
    return R"(VLIBCFileGetKeyValue("/etc/veltinfo.conf", "ftp_ext_ip", 16, 0))";
}

std::string stores(const std::string& differences) {
    return "VELTFTPConfSet({" + differences + "})";
}

Lines announces(int map, const std::string& service, const std::string& action) {
    const std::string name = "map" + std::to_string(map);
    return {"VLIBCSzHashAlloc(1024)",
            "VLIBCSzHashSetValue(" + name + R"(, "SERVICE_NAME", ")" + service + "\")",
            "VLIBCSzHashSetValue(" + name + R"(, "SERVICE_ACTION", ")" + action + "\")",
            R"(VLIBSyseventEmit("velt.service.action", {"SERVICE_NAME": ")" + service +
                R"(", "SERVICE_ACTION": ")" + action + "\"}, 1)",
            "VLIBCSzHashFree(" + name + ")"};
}

Lines stopCalls(int count) {
    const Lines all = {R"(VLIBServicectlStop("ftpd-pure", 0))", R"(VLIBServicectlStop("ftpd-ssl", 0))",
                       R"(VLIBServicectlStop("ftpd", 0))", R"(VLIBServicecfgRunKeySet("ftpd", 2))",
                       R"(VLIBServicecfgRunKeySet("ftpd-ssl", 2))"};
    return {all.begin(), all.begin() + count};
}

Lines stops() {
    return stopCalls() + announces(1, "ftpd", "stop") + announces(2, "ftpd-ssl", "stop");
}

Lines startsPlain() {
    return Lines{R"(VLIBServicectlStart("ftpd-pure", 0))", R"(VLIBServicectlStart("ftpd", 0))",
                 R"(VLIBServicecfgRunKeySet("ftpd", 1))"} +
           announces(3, "ftpd", "start");
}

Lines startsTls() {
    return Lines{R"(VLIBServicectlStart("ftpd-ssl", 0))", R"(VLIBServicectlStart("ftpd", 0))",
                 R"(VLIBServicecfgRunKeySet("ftpd-ssl", 1))"} +
           announces(3, "ftpd-ssl", "start");
}

Lines startsBoth() {
    return Lines{R"(VLIBServicectlStart("ftpd-pure", 0))", R"(VLIBServicectlStart("ftpd-ssl", 0))",
                 R"(VLIBServicectlStart("ftpd", 0))", R"(VLIBServicecfgRunKeySet("ftpd", 1))"} +
           announces(3, "ftpd", "start") + Lines{R"(VLIBServicecfgRunKeySet("ftpd-ssl", 1))"} +
           announces(4, "ftpd-ssl", "start");
}

std::string entry(const std::string& event, const std::string& arg1, const std::string& arg2) {
    return "VELTLogSet1(2, 1, " + event + ", \"" + arg1 + "\", \"" + arg2 + "\", \"\", \"\")";
}

Lines applied(const Lines& steps, const std::string& differences, bool reloadsFirewall) {
    Lines lines = reads() + steps + stores(differences);
    if (reloadsFirewall) {
        lines.emplace_back("VELTFwRuleHup()");
    }
    return lines + stops() + succeeded();
}

void setPort(_tag_VELT_FTP_CONF_& conf, const char* text) {
    std::snprintf(conf.portnum, sizeof(conf.portnum), "%s", text);
}

} // namespace ftptest
