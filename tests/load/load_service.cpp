#include "tests/load/load_service.h"

#include "base/number_text.h"
#include "tests/load/stand_in_daemons.h"

#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <ostream>

namespace velt::test {
namespace fs = std::filesystem;

namespace {

/// Of this world, but for the test itself.
std::vector<pid_t> processes() {
    std::vector<pid_t> all;
    for (const fs::directory_entry& entry : fs::directory_iterator("/proc")) {
        const auto number = parseNumber(entry.path().filename().string());
        if (number && *number != getpid()) {
            all.push_back(static_cast<pid_t>(*number));
        }
    }
    return all;
}

int entriesOf(const fs::path& folder) {
    std::error_code gone;
    return static_cast<int>(std::distance(fs::directory_iterator(folder, gone), fs::directory_iterator()));
}

/// The number behind "Threads:" or "VmRSS:"; 0 for a process that has ended meanwhile.
long statusValue(const fs::path& process, const std::string& key) {
    std::ifstream status(process / "status");
    for (std::string line; std::getline(status, line);) {
        if (line.starts_with(key)) {
            return std::strtol(line.c_str() + key.size(), nullptr, 10);
        }
    }
    return 0;
}

} // namespace

bool isLong() {
    const char* form = std::getenv("VELT_LOAD");
    return form != nullptr && std::strcmp(form, "long") == 0;
}

void LoadService::SetUp() {
    if (!whyNoWorld().empty()) {
        GTEST_SKIP() << whyNoWorld();
    }
    ASSERT_TRUE(mountStandInDaemons()) << std::strerror(errno);
    HostService::SetUp();
    if (HasFatalFailure()) {
        return;
    }
    Client root = asRoot();
    ASSERT_EQ(setFtp(root, "\"timeout\":60").status, 204);
    ASSERT_EQ(post(root, std::string(sftpApi) + "set", "{\"enable\":true}").status, 204);
}

void LoadService::reap() const {
    for (const pid_t process : processes()) {
        // The supervisors that others have replaced: this program is the first process of its world.
        if (process != host.pid()) {
            waitpid(process, nullptr, WNOHANG);
        }
    }
}

Client LoadService::asRoot() {
    return Client::unixSocket((worldRoot / "run/velt/veltd.sock").string());
}

Answer LoadService::post(Client& client, const std::string& path, const std::string& body) {
    return client.ask(requestText("POST", path, "", body));
}

Answer LoadService::setFtp(Client& client, const std::string& members) {
    return post(client, std::string(ftpApi) + "set",
                R"({"enable_ftp":true,"enable_ftps":false,)" + members + "}");
}

Json::Value LoadService::get(Client& client, const std::string& path) {
    return client.ask(requestText("GET", path)).json();
}

Holdings LoadService::holdings() const {
    reap();
    Holdings all;
    for (const pid_t process : processes()) {
        const fs::path folder = fs::path("/proc") / std::to_string(process);
        ++all.processes;
        all.threads += static_cast<int>(statusValue(folder, "Threads:"));
        all.descriptors += entriesOf(folder / "fd");
        (process == host.pid() ? all.hostKilobytes : all.othersKilobytes) += statusValue(folder, "VmRSS:");
    }
    const fs::recursive_directory_iterator files(worldRoot);
    all.files =
        static_cast<int>(std::count_if(begin(files), end(files), [](const fs::directory_entry& entry) {
            return entry.path().parent_path() != worldRoot / "var/log/velt";
        }));
    return all;
}

std::ostream& operator<<(std::ostream& out, const Holdings& holdings) {
    return out << holdings.processes << " processes, " << holdings.threads << " threads, "
               << holdings.descriptors << " descriptors, " << holdings.files << " files, veltd "
               << holdings.hostKilobytes << " KiB, all others " << holdings.othersKilobytes << " KiB";
}

} // namespace velt::test
