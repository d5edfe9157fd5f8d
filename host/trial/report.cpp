#include "host/trial/report.h"

#include "base/file.h"
#include "host/trial/trial_error.h"
#include "host/trial/trial_place.h"

#include <unistd.h>

#include <cstdio>

namespace velt::host {

namespace {

const char* stateOf(const Json::Value& service) {
    if (service["running"].asBool()) {
        return "on";
    }
    return service["wanted"].asBool() ? "down" : "off";
}

void printDemo(const std::string& folder, const std::string& ftpAddress) {
    const bool root = ::geteuid() == 0;
    std::string password = root ? "" : valueOf(readFile("demo-password"));
    password.erase(password.find_last_not_of('\n') + 1);
    std::printf("  demo share      %sdemo, for %s\n"
                "  log, token      %sveltd.log, %stoken\n\n"
                "Try:\n"
                "  . %senv\n"
                "  veltctl ftp set enable_ftp=on\n"
                "  curl -T README.md ftp://%s/%s\n",
                folder.c_str(),
                root ? "anonymous users" : ("the user demo with the password " + password).c_str(),
                folder.c_str(), folder.c_str(), folder.c_str(), ftpAddress.c_str(),
                root ? "" : (" --user demo:" + password).c_str());
}

} // namespace

void report(const VeltdClient& client, const std::string& folder, const std::string& url,
            const std::string& token) {
    const Json::Value services = client.get("/api/status").body["services"];
    if (!services.isArray() || services.size() != 3) {
        throw TrialError("veltd does not tell its services. See " + folder + "veltd.log.");
    }
    const Json::Value& ftp = services[0];
    const Json::Value& ftps = services[1];
    const Json::Value& sftp = services[2];
    if (::geteuid() == 0 && !mayMount()) {
        std::fprintf(
            stderr,
            "FTP will not start here: as root it confines sessions by mounts, which this machine does "
            "not allow. A container\nneeds the capability SYS_ADMIN for that; or start as an ordinary "
            "user.\n");
    }
    for (const Json::Value& each : services) {
        if (each.isMember("reason")) {
            std::fprintf(stderr, "%s: %s\n", each["name"].asCString(), each["reason"].asCString());
        }
    }
    const std::string ftpAddress = "127.0.0.1:" + ftp["port"].asString();
    std::printf("  administration  %s, token %s\n"
                "  FTP, FTPS       %s, %s and %s\n"
                "  SFTP            127.0.0.1:%s, %s\n",
                url.c_str(), token.c_str(), ftpAddress.c_str(), stateOf(ftp), stateOf(ftps),
                sftp["port"].asString().c_str(), stateOf(sftp));
    printDemo(folder, ftpAddress);
}

} // namespace velt::host
