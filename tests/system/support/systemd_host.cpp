#include "tests/system/support/systemd_host.h"

#include "standalone/core/state_root.h"
#include "tests/support/run_program.h"
#include "tests/system/support/systemd_services.h"

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <chrono>
#include <filesystem>
#include <fstream>

namespace velt::test {
namespace fs = std::filesystem;
using std::chrono::seconds;

std::string done(const std::vector<std::string>& words, const std::string& input) {
    std::vector<std::string> arguments{"/usr/local/bin/veltctl"};
    arguments.insert(arguments.end(), words.begin(), words.end());
    const ProcessResult result = runProcess(arguments, input, seconds(30));
    EXPECT_EQ(result.exitCode, 0) << ::testing::PrintToString(words) << result.output << result.errors;
    return result.output;
}

std::string refused(const std::vector<std::string>& words) {
    std::vector<std::string> arguments{"/usr/local/bin/veltctl"};
    arguments.insert(arguments.end(), words.begin(), words.end());
    const ProcessResult result = runProcess(arguments, {}, seconds(30));
    EXPECT_NE(result.exitCode, 0) << ::testing::PrintToString(words) << result.output;
    return result.errors;
}

std::string shell(const std::string& commands) {
    const ProcessResult result = runProcess({"sh", "-c", commands}, {}, seconds(30));
    return result.output + result.errors;
}

void startHost() {
    setStateRoot("/");
    fs::create_directories("/etc/velt");
    std::ofstream("/etc/velt/firewall.conf") << "version = 1\nmode = drop\nports = 2323\n";
    fs::create_directories("/srv/public");
    std::ofstream("/srv/public/about") << "public";
    std::ofstream("/srv/public/large") << "large";
    fs::resize_file("/srv/public/large", 64 << 20);
    ASSERT_EQ(::chmod("/srv/public", 0777), 0);
    fs::create_directories("/srv/private");
    ASSERT_EQ(::chmod("/srv/private", 0700), 0);
    std::ofstream("/etc/velt/shares.json") << R"({"version": 1, "shares": [
        {"name": "public", "comment": "", "path": "/srv/public", "ftp": true,
         "users": {"alice": "write", "ftp": "write"}, "groups": {}},
        {"name": "private", "comment": "", "path": "/srv/private", "ftp": true,
         "users": {"ftp": "write"}, "groups": {}}]})";
    installAndEnableHost();
    ASSERT_TRUE(hostAnswers());
    letAliceInByKey();
    std::ofstream("/home/alice/home-of") << "alice";
}

} // namespace velt::test
