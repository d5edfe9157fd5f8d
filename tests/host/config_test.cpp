// The host's settings, its log, and the lines that modules write to the system log.

#include "host/config.h"
#include "host/host_log.h"
#include "host/module_log.h"

#include <gtest/gtest.h>
#include <syslog.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <thread>

namespace {

using velt::host::Config;
using velt::host::ConfigError;
using velt::host::ModuleLog;
using velt::host::readConfig;

TEST(Config, TheCommandLineIsRead) {
    const Config config =
        readConfig({"--module", "a.so", "--module=b.so", "--state-root", "/tmp/x", "--listen", "127.0.0.1:80",
                    "--max-body", "2048", "--head-seconds=3", "--print-ready"});
    EXPECT_EQ(config.modules, (std::vector<std::filesystem::path>{"a.so", "b.so"}));
    EXPECT_EQ(config.socketPath(), "/tmp/x/run/velt/veltd.sock");
    EXPECT_EQ(config.tokenFile(), "/tmp/x/var/lib/velt/tokens.json");
    EXPECT_EQ(config.listen, std::vector<std::string>{"127.0.0.1:80"});
    EXPECT_EQ(config.limits.body, 2048U);
    EXPECT_EQ(config.limits.headTime, std::chrono::seconds(3));
    EXPECT_TRUE(config.printReady);
}

TEST(Config, TheDefaultsAreTheDocumentedLimits) {
    const Config config = readConfig({"--module", "a.so"});
    EXPECT_EQ(config.limits.body, 1048576U);
    EXPECT_EQ(config.limits.head, 16384U);
    EXPECT_EQ(config.limits.headTime, std::chrono::seconds(10));
    EXPECT_EQ(config.limits.bodyTime, std::chrono::seconds(30));
    EXPECT_EQ(config.limits.connections, 1000U);
    EXPECT_EQ(config.socketPath(), "/run/velt/veltd.sock");
}

TEST(Config, TheCommandLineGoesBeforeTheFile) {
    std::string file = (std::filesystem::temp_directory_path() / "velt-config-XXXXXX").string();
    const int descriptor = mkstemp(file.data());
    ASSERT_GE(descriptor, 0);
    std::ofstream(file) << R"({"module": ["a.so"], "listen": ["127.0.0.1:1", "[::1]:1"], "max-body": 4096,
        "workers": 7, "allow-remote": false})";
    const Config fromFile = readConfig({"--config", file});
    EXPECT_EQ(fromFile.listen.size(), 2U);
    EXPECT_EQ(fromFile.limits.body, 4096U);
    const Config both = readConfig({"--listen", "127.0.0.1:2", "--config", file, "--max-body=1024"});
    EXPECT_EQ(both.listen, std::vector<std::string>{"127.0.0.1:2"});
    EXPECT_EQ(both.limits.body, 1024U);
    EXPECT_EQ(both.workers, 7U);
    for (const char* text : {"[", "{\"nonsense\": 1}", "{\"max-body\": true}", "{\"print-ready\": 1}"}) {
        std::ofstream(file) << text;
        EXPECT_THROW(readConfig({"--config", file}), ConfigError) << text;
    }
    std::remove(file.c_str());
}

TEST(Config, WhatMakesNoSenseIsRefused) {
    for (const std::vector<std::string>& words :
         std::vector<std::vector<std::string>>{{},
                                               {"--module"},
                                               {"module.so"},
                                               {"--nonsense"},
                                               {"--module", "a.so", "--max-body", "many"},
                                               {"--module", "a.so", "--max-body", "0"},
                                               {"--module", "a.so", "--workers", "0"},
                                               {"--module", "a.so", "--tls-certificate", "c"},
                                               {"--module", "a.so", "--tls-key", "k"},
                                               {"--module", "a.so", "--allow-remote"},
                                               {"--config", "/nowhere"}}) {
        EXPECT_THROW(readConfig(words), ConfigError) << (words.empty() ? "" : words.back());
    }
    EXPECT_TRUE(readConfig({"--help"}).help);
}

TEST(ModuleLog, KeepsTheLinesOfItsThread) {
    const ModuleLog log;
    errno = ENOENT;
    syslog(LOG_ERR, "%s:%d %s", "ftp", 12, "x");
    EXPECT_EQ(errno, ENOENT);
    std::thread([] { syslog(LOG_ERR, "of another thread"); }).join();
    {
        const ModuleLog inner;
        syslog(LOG_ERR, "inner\n");
        EXPECT_EQ(inner.lines(), std::vector<std::string>{"inner"});
    }
    EXPECT_EQ(log.lines(), std::vector<std::string>{"ftp:12 x"});
}

TEST(ModuleLog, TheReasonIsTheLastLineThatTellsOne) {
    using velt::host::reasonIn;
    EXPECT_EQ(reasonIn({}), "");
    EXPECT_EQ(reasonIn({"ftp:7 Port conflict.", "ftp:9 Request: {}"}), "Port conflict.");
    EXPECT_EQ(reasonIn({"first", "no source: here"}), "no source: here");
    EXPECT_EQ(reasonIn({"ftp:9 Request: {}"}), "");
}

TEST(HostLog, NobodyWritesALineOfHisOwn) {
    std::string line;
    velt::host::HostLog log([&line](const std::string& text) { line = text; });
    log.write("id", "a\nb\x1B[0m \xC3\xBC");
    EXPECT_EQ(line, "request=id a\\x0Ab\\x1B[0m \xC3\xBC");
}

} // namespace
