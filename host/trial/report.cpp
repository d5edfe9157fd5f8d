#include "host/trial/report.h"

#include "base/file.h"
#include "base/text.h"
#include "host/api/service_status.h"
#include "host/trial/trial_error.h"
#include "host/trial/trial_place.h"
#include "standalone/standalone.h"

#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <string>
#include <vector>

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
            "user. SFTP starts, and shows its users the whole\nserver.\n");
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

std::string addressOf(const StoredService& service) {
    return "127.0.0.1:" + (service.port ? std::to_string(*service.port) : "?");
}

std::string titleOf(std::string name) {
    std::ranges::transform(name, name.begin(), [](unsigned char c) { return std::toupper(c); });
    return name;
}

/// A line for each daemon: "  FTP, FTPS       127.0.0.1:2121, on and off".
void printServices(const std::vector<StoredService>& services, const std::vector<ServiceDown>& down) {
    for (auto each = services.begin(); each != services.end();) {
        const StoredService& first = *each;
        std::string titles = titleOf(first.name);
        std::string states = stateOf(first, down);
        for (++each; each != services.end() && each->daemon == first.daemon; ++each) {
            titles += ", " + titleOf(each->name);
            states += std::string(" and ") + stateOf(*each, down);
        }
        std::printf("  %-16s%s, %s\n", titles.c_str(), addressOf(first).c_str(), states.c_str());
    }
}

} // namespace

void report(const std::string& folder, const std::string& url, const std::string& token) {
    const std::vector<ServiceDown> down = servicesDown();
    printProblems(down);
    const std::vector<StoredService> services = storedServices();
    std::printf("  administration  %s, token %s\n", url.c_str(), token.c_str());
    printServices(services, down);
    const auto ftp = std::ranges::find(services, "ftp", &StoredService::name);
    printDemo(folder, ftp == services.end() ? "?" : addressOf(*ftp));
}

} // namespace velt::host
