#include "tests/support/full_requests.h"

#include "module/entry_functions.h"

#include <algorithm>

namespace {

void prepareFTP(fake::Platform& platform) {
    platform.conf.support_utf8 = 1;
    platform.conf.passive_port_min = 0;
    platform.extIp = "192.0.2.1";
}

void prepareSFTPEnabled(fake::Platform& platform) {
    platform.sftp.enable = 1;
    platform.services["sftp"] = 1;
}

void prepareNothing(fake::Platform&) {}

void prepareShares(fake::Platform& platform) {
    platform.conf.service_flags = 3;
    platform.shares["public"] = {"", "/", 1};
    platform.ftpShares = {"homes", "public"};
}

void prepareAccounts(fake::Platform& platform) {
    platform.shares["public"] = {"", "/", 1};
    platform.users["bob"] = {"Bob", 1000};
    platform.users["eve"] = {"Eve", 1001};
    platform.groups["staff"] = 50;
    platform.chrootUsers = {"bob"};
    platform.nonChrootUsers = {"eve"};
    platform.rules = {"user:1000:/public", "group:50:/home"};
}

std::string ftpParams(const std::string& utf8) {
    return R"({"enable_ftp":true,"enable_ftps":true,"timeout":60,"portnum":2121,"custom_port_range":true,
        "custom_port":"40000:40100","use_ext_ip":true,"ext_ip":"192.0.2.2",)" +
           utf8 + R"(,"enable_fxp":true,"enable_fips":true,"enable_ascii":true,"enable_flow_ctrl":true,
        "maxuploadrate":100,"maxdownloadrate":200,"max_conn_per_ip":5})";
}

} // namespace

const std::vector<FullRequest>& fullRequests() {
    static const std::vector<FullRequest> requests = {
        {"FTPGet", FTPGet, prepareFTP, "{}"},
        {"FTPGetV2", FTPGetV2, prepareFTP, "{}"},
        {"FTPGetV3", FTPGetV3, prepareFTP, "{}"},
        {"FTPSet", FTPSet, prepareFTP, ftpParams(R"("enable_utf8":false)")},
        {"FTPSetV2", FTPSetV2, prepareFTP, ftpParams(R"("use_utf8":true)")},
        {"FTPSetV3", FTPSetV3, prepareFTP, ftpParams(R"("utf8_mode":2)")},
        {"FTPSecurityGet", FTPSecurityGet, prepareShares, "{}"},
        {"FTPSecuritySet", FTPSecuritySet, prepareShares,
         R"({"user_chroot":true,"anonymous":true,"anonymous_chroot":true,"anonymous_chroot_share":"public",
             "enable_umask":true})"},
        {"FTPSecurityShareGet", FTPSecurityShareGet, prepareShares, "{}"},
        {"FTPChrootUserList", FTPChrootUserList, prepareAccounts,
         R"({"chroot":true,"offset":0,"limit":10,"type":"all","domain_name":"d","substr":"b"})"},
        {"FTPChrootUserList of the others", FTPChrootUserList, prepareAccounts, R"({"chroot":false})"},
        {"FTPChrootUserAdd", FTPChrootUserAdd, prepareAccounts, R"({"id":["eve","bob"]})"},
        {"FTPChrootUserDelete", FTPChrootUserDelete, prepareAccounts, R"({"id":["bob"]})"},
        {"FTPChrootUserLoad", FTPChrootUserLoad, prepareAccounts, "{}"},
        {"FTPChrootUserSave", FTPChrootUserSave, prepareAccounts,
         R"({"rules":[{"type":"user","name":"eve","path":"/public"},
                      {"type":"group","name":"staff","path":"/home"}]})"},
        {"SFTPGet", SFTPGet, prepareNothing, "{}"},
        {"SFTPSet switching on", SFTPSet, prepareNothing, R"({"enable":true,"portnum":2222})"},
        {"SFTPSet moving the port", SFTPSet, prepareSFTPEnabled, R"({"enable":true,"portnum":2222})"},
        {"SFTPSet switching off", SFTPSet, prepareSFTPEnabled, R"({"enable":false,"portnum":2222})"},
    };
    return requests;
}

std::ostream& operator<<(std::ostream& stream, const FullRequest& request) {
    return stream << request.name;
}

std::string testNameOf(const testing::TestParamInfo<FullRequest>& parameter) {
    std::string name = parameter.param.name;
    std::replace(name.begin(), name.end(), ' ', '_');
    return name;
}
