#include "tests/system/support/host_service.h"

#include "tests/support/files.h"
#include "tests/system/support/leftovers.h"

#include <json/reader.h>
#include <json/writer.h>
#include <sys/stat.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <memory>

namespace velt::test {
namespace fs = std::filesystem;

namespace {

constexpr const char* logFile = "/mnt/veltd.log";
constexpr auto requestLimit = std::chrono::seconds(40);
const std::string socketPath = worldRoot / "run/velt/veltd.sock";

} // namespace

Json::Value jsonOf(const std::string& text) {
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    Json::Value value;
    std::string errors;
    return reader->parse(text.data(), text.data() + text.size(), &value, &errors) ? value : Json::Value();
}

std::string textOf(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    return Json::writeString(builder, value);
}

void HostService::SetUp() {
    if (!whyNoWorld().empty()) {
        GTEST_SKIP() << whyNoWorld();
    }
    mounts_ = contentsOf("/proc/self/mounts");
    furnishHomes();
    makeShares();
    fs::copy_file(VELT_BUILT_FOLDER "/veltctl", "/mnt/veltctl", fs::copy_options::overwrite_existing);
    startHost();
    ASSERT_NE(tcpPort, 0) << hostLog();
    adminToken = makeToken("curl", "admin");
    done({"security", "set", "user_chroot=on"});
    done({"ftp", "set", "portnum=" + std::to_string(port)});
    done({"sftp", "set", "portnum=2222"});
}

void HostService::TearDown() {
    if (!whyNoWorld().empty()) {
        return;
    }
    if (host.running()) {
        done({"ftp", "set", "enable_ftp=off", "enable_ftps=off"});
        done({"sftp", "set", "enable=off"});
        EXPECT_EQ(stopHost(), 0) << hostLog();
    }
    EXPECT_EQ(lastingProcesses(), "");
    EXPECT_EQ(contentsOf("/proc/self/mounts"), mounts_);
    EXPECT_FALSE(somethingListens());
    clearFolders();
    fs::remove(logFile);
}

void HostService::startHost() {
    const std::string built = VELT_BUILT_FOLDER;
    Words words{
        built + "/veltd", "--state-root", worldRoot,      "--module", built + "/VELT.Core.FileServ.FTP.so",
        "--listen",       "127.0.0.1:0",  "--print-ready"};
    words.insert(words.end(), hostArguments.begin(), hostArguments.end());
    host = RunningProgram::start(
        words, {"PATH=/usr/sbin:/usr/bin:/sbin:/bin", "LANG=C.UTF-8", "VELT_LIBEXEC_DIR=" + programFolder},
        logFile);
    const Json::Value ready = jsonOf(host.readUntil("\n"));
    ASSERT_TRUE(ready.isObject()) << hostLog();
    const std::string address = ready["listen"][0].asString();
    tcpPort = std::stoi(address.substr(address.rfind(':') + 1));
}

int HostService::stopHost() {
    host.signal(SIGTERM);
    return host.wait();
}

void HostService::killHost() {
    host.signal(SIGKILL);
    EXPECT_EQ(host.wait(), 128 + SIGKILL);
}

ProcessResult HostService::veltctl(Words words, const std::string& input) {
    words.insert(words.begin(), {"/mnt/veltctl", "--socket", socketPath});
    return runProcess(words, input, requestLimit);
}

std::string HostService::done(const Words& words, const std::string& input) {
    const ProcessResult result = veltctl(words, input);
    EXPECT_EQ(result.exitCode, 0) << testing::PrintToString(words) << "\n" << result.errors << hostLog();
    return result.output;
}

ProcessResult HostService::veltctlWith(const std::string& token, Words words) const {
    writeFile("/mnt/token", token + "\n");
    words.insert(words.begin(), {"/mnt/veltctl", "--url", "http://127.0.0.1:" + std::to_string(tcpPort),
                                 "--token-file", "/mnt/token"});
    return runProcess(words, {}, requestLimit);
}

ProcessResult HostService::veltctlAs(unsigned user, Words words) {
    const std::string id = std::to_string(user);
    words.insert(words.begin(), {"setpriv", "--reuid", id, "--regid", id, "--init-groups", "/mnt/veltctl",
                                 "--socket", socketPath});
    return runProcess(words, {}, requestLimit);
}

HttpResult HostService::curl(const std::string& path, const std::string& body,
                             const Words& furtherArguments) const {
    Words words{"curl",           "--silent", "--globoff",
                "--max-time",     "35",       "--write-out",
                "\n%{http_code}", "--header", "Authorization: Bearer " + adminToken};
    if (!body.empty()) {
        words.insert(words.end(), {"--data-binary", "@-"});
    }
    words.insert(words.end(), furtherArguments.begin(), furtherArguments.end());
    words.push_back("http://127.0.0.1:" + std::to_string(tcpPort) + path);
    const ProcessResult result = runProcess(words, body, requestLimit);
    const std::size_t end = result.output.rfind('\n');
    if (end == std::string::npos) {
        return {};
    }
    HttpResult got;
    got.status = std::stoi(result.output.substr(end + 1));
    got.body = result.output.substr(0, end);
    got.json = jsonOf(got.body);
    return got;
}

std::string HostService::makeToken(const std::string& name, const std::string& role) const {
    std::string token = done({"tokens", "create", name, "--role", role});
    token.erase(token.find_last_not_of('\n') + 1);
    return token;
}

std::string HostService::exported() {
    return done({"export"});
}

std::string HostService::hostLog() {
    return contentsOf(logFile);
}

} // namespace velt::test
