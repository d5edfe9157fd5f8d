#include "host/trial/report.h"

#include "base/file.h"
#include "base/text.h"
#include "host/api/service_status.h"
#include "host/trial/trial_error.h"
#include "host/trial/trial_place.h"
#include "standalone/standalone.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <map>

namespace velt::host {

namespace {

const char* stateOf(const StoredService& service, const std::vector<ServiceDown>& down) {
    if (!service.enabled.value_or(true)) {
        return "off";
    }
    const auto found = std::ranges::find(down, service.daemon, &ServiceDown::service);
    return found == down.end() || found->servesFormerSettings ? "on" : "down";
}

void printProblems(const std::vector<ServiceDown>& down) {
    if (::geteuid() == 0 && !mayMount()) {
        std::fprintf(
            stderr,
            "FTP will not start here: as root it confines sessions by mounts, which this machine does "
            "not allow. A container\nneeds the capability SYS_ADMIN for that; or start as an ordinary "
            "user.\n");
    }
    if (!down.empty()) {
        std::fprintf(stderr, "%s\n", sentenceOf(down).c_str());
    }
}

void printDemo(const std::string& folder, const std::string& ftpAddress) {
    const bool root = ::geteuid() == 0;
    const std::string file = root ? "" : valueOf(readFile("demo-password"));
    const std::string password(trimmedEnd(file, "\n"));
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

void report(const std::string& folder, const std::string& url, const std::string& token) {
    const std::vector<ServiceDown> down = servicesDown();
    printProblems(down);
    std::map<std::string, const char*> states;
    std::map<std::string, std::string> addresses;
    for (const StoredService& each : storedServices()) {
        states[each.name] = stateOf(each, down);
        addresses[each.name] = "127.0.0.1:" + (each.port ? std::to_string(*each.port) : "?");
    }
    std::printf("  administration  %s, token %s\n"
                "  FTP, FTPS       %s, %s and %s\n"
                "  SFTP            %s, %s\n",
                url.c_str(), token.c_str(), addresses["ftp"].c_str(), states["ftp"], states["ftps"],
                addresses["sftp"].c_str(), states["sftp"]);
    printDemo(folder, addresses["ftp"]);
}

} // namespace velt::host
