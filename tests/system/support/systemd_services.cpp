#include "tests/system/support/systemd_services.h"

#include "ftp/ftp_library.h"
#include "platform/sftp.h"
#include "standalone/contract/last_error.h"
#include "standalone/standalone.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"

#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;
using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr const char* got = "/root/got";
constexpr std::size_t largeSize = 400'000;

std::vector<std::string> sftpArguments(int port, const std::vector<std::string>& more) {
    std::vector<std::string> arguments{"sftp",      "-F", "/dev/null",         "-i",
                                       "/root/key", "-P", std::to_string(port)};
    for (const char* option :
         {"BatchMode=yes", "StrictHostKeyChecking=no", "UserKnownHostsFile=/dev/null", "LogLevel=ERROR"}) {
        arguments.insert(arguments.end(), {"-o", option});
    }
    arguments.insert(arguments.end(), more.begin(), more.end());
    arguments.insert(arguments.end(), {"-b", "-", "alice@127.0.0.1"});
    return arguments;
}

} // namespace

void UnderSystemd::SetUp() {
    try {
        world_ = std::make_unique<SystemdWorld>();
    } catch (const NoSystemd& why) {
        GTEST_SKIP() << why.what();
    }
}

void openMachine() {
    ::setenv("VELT_LIBEXEC_DIR", VELT_BUILT_FOLDER, 1);
    ASSERT_EQ(messageOf(openState("/")), "");
    std::ofstream("/home/alice/home-of") << "alice";
    ASSERT_TRUE(fs::is_directory("/run/systemd/system"));
}

void storeFtp(int flags, int atPort, bool confined) {
    _tag_VELT_FTP_CONF_ record{};
    ASSERT_EQ(VELTFTPConfGet(&record), 0) << lastErrorSentence();
    std::snprintf(record.portnum, sizeof record.portnum, "%d", atPort);
    record.service_flags = flags;
    record.user_chroot = confined ? 1 : 0;
    ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
}

void storeSftp(bool enabled, int atPort) {
    ASSERT_EQ(VELTSFTPConfigSet(enabled ? 1 : 0, atPort), 0) << lastErrorSentence();
}

std::string unitProperty(const std::string& unit, const std::string& name) {
    std::string value = runProcess({"systemctl", "show", "--value", "--property=" + name, unit}).output;
    while (!value.empty() && value.back() == '\n') {
        value.pop_back();
    }
    return value;
}

std::string unitState(const std::string& unit) {
    return unitProperty(unit, "ActiveState");
}

bool isBack(const std::string& service, const ProcessId& former) {
    return waitUntil(
        [&] {
            const DaemonState state = serviceState(service);
            return state.daemon != former && isServing(state);
        },
        patience);
}

std::string fetchByFtp(const std::string& path, int fromPort) {
    return runProcess({"curl", "--silent", "--max-time", "10", "--user", "alice:alice-secret",
                       "ftp://127.0.0.1:" + std::to_string(fromPort) + path},
                      {}, seconds(15))
        .output;
}

void letAliceInByKey() {
    ASSERT_EQ(runProcess({"ssh-keygen", "-q", "-t", "ed25519", "-N", "", "-f", "/root/key"}).exitCode, 0);
    fs::create_directories("/home/alice/.ssh");
    fs::copy_file("/root/key.pub", "/home/alice/.ssh/authorized_keys");
    std::ofstream("/home/alice/large") << std::string(largeSize, 'x');
    for (const char* file : {"/home/alice/.ssh", "/home/alice/.ssh/authorized_keys", "/home/alice/large"}) {
        ASSERT_EQ(::chown(file, SystemdWorld::aliceId, SystemdWorld::aliceId), 0);
    }
}

SlowTransfer::SlowTransfer(int fromPort)
    : client_([this, fromPort] {
          result_ = runProcess(sftpArguments(fromPort, {"-l", "800"}), std::string("get large ") + got + "\n",
                               seconds(30));
      }) {
    std::error_code error;
    EXPECT_TRUE(waitUntil([&] { return fs::exists(got) && fs::file_size(got, error) > 0; }, patience));
}

SlowTransfer::~SlowTransfer() {
    if (client_.joinable()) {
        client_.join();
    }
}

bool SlowTransfer::succeeds() {
    client_.join();
    std::error_code error;
    const bool whole = result_.exitCode == 0 && fs::file_size(got, error) == largeSize;
    fs::remove(got, error);
    return whole;
}

void installAndEnableHost() {
    const ProcessResult installed =
        runProcess({VELT_CMAKE, "--install", VELT_BUILT_FOLDER, "--prefix", "/usr/local"}, {}, seconds(60));
    ASSERT_EQ(installed.exitCode, 0) << installed.errors;
    ASSERT_EQ(runProcess({"systemd-sysusers"}).exitCode, 0);
    ASSERT_EQ(runProcess({"systemctl", "daemon-reload"}).exitCode, 0);
    ASSERT_EQ(runProcess({"systemctl", "enable", "--now", "veltd"}).exitCode, 0);
}

bool hostAnswers() {
    return waitUntil([] { return runProcess({"/usr/local/bin/veltctl", "status"}).exitCode == 0; }, patience);
}

ProcessResult runSftp(int atPort, const std::string& commands) {
    return runProcess(sftpArguments(atPort, {}), commands, seconds(15));
}

ProcessResult logInBySftp(int atPort) {
    return runSftp(atPort, "pwd\n");
}

} // namespace velt::test
