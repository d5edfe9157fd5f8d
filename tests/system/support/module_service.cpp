#include "tests/system/support/module_service.h"

#include "tests/system/support/leftovers.h"

#include <json/reader.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <memory>

namespace velt::test {
namespace fs = std::filesystem;

namespace {

constexpr const char* ftpApi = "VELT.Core.FileServ.FTP";
constexpr const char* securityApi = "VELT.Core.FileServ.FTP.Security";
constexpr const char* sftpApi = "VELT.Core.FileServ.FTP.SFTP";

Json::Value dataOf(const ModuleAnswer& answer) {
    EXPECT_EQ(answer.code, 0) << answer.sentence;
    return answer.data;
}

} // namespace

Json::Value ModuleService::json(const std::string& text) {
    Json::Value value;
    std::string errors;
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, &errors)) << errors;
    return value;
}

void ModuleService::SetUp() {
    if (!whyNoWorld().empty()) {
        GTEST_SKIP() << whyNoWorld();
    }
    setenv("VELT_LIBEXEC_DIR", VELT_BUILT_FOLDER, 1);
    ASSERT_EQ(openState(worldRoot), 0) << lastErrorSentence();
    furnishHomes();
    ASSERT_EQ(setSecurity(R"({"user_chroot": true})").code, 0) << lastErrorSentence();
    lastEntry_ = logEntries().back().id;
    mounts_ = readFileText("/proc/self/mounts");
    subscription_ = subscribeEvents([this](const SystemEvent& event) {
        const std::lock_guard lock(mutex_);
        EXPECT_EQ(event.name, "velt.service.action");
        actions_.push_back(event.parameters.at("SERVICE_NAME") + " " + event.parameters.at("SERVICE_ACTION"));
    });
}

void ModuleService::TearDown() {
    if (!whyNoWorld().empty()) {
        return;
    }
    unsubscribe(subscription_);
    EXPECT_EQ(setFtp(R"({"enable_ftp": false})").code, 0) << lastErrorSentence();
    EXPECT_EQ(setSftp(R"({"enable": false})").code, 0) << lastErrorSentence();
    EXPECT_EQ(lastingProcesses(), "");
    EXPECT_EQ(readFileText("/proc/self/mounts"), mounts_);
    EXPECT_FALSE(somethingListens());
    clearFolders();
}

ModuleAnswer ModuleService::setFtp(const std::string& changes, int version) {
    Json::Value parameters;
    parameters["enable_ftp"] = true;
    parameters["enable_ftps"] = false;
    parameters["portnum"] = port;
    const Json::Value changed = json(changes);
    for (const std::string& name : changed.getMemberNames()) {
        parameters[name] = changed[name];
    }
    return requestModule(ftpApi, version, "set", parameters);
}

Json::Value ModuleService::getFtp(int version) {
    return dataOf(requestModule(ftpApi, version, "get", Json::objectValue));
}

ModuleAnswer ModuleService::setSecurity(const std::string& parameters) {
    return requestModule(securityApi, 1, "set", json(parameters));
}

Json::Value ModuleService::getSecurity() {
    return dataOf(requestModule(securityApi, 1, "get", Json::objectValue));
}

ModuleAnswer ModuleService::setSftp(const std::string& parameters) {
    return requestModule(sftpApi, 1, "set", json(parameters));
}

Json::Value ModuleService::getSftp() {
    return dataOf(requestModule(sftpApi, 1, "get", Json::objectValue));
}

void ModuleService::makeShares() {
    std::string text;
    for (const std::string name : {"public", "music", "upload", "closed"}) {
        const fs::path folder = fs::path("/mnt/srv") / name;
        fs::create_directories(folder);
        EXPECT_EQ(chmod(folder.c_str(), 0777), 0);
        writeFile(folder / "about", name);
        const char* grant = name == "public" ? "read" : name == "upload" ? "write" : "none";
        text += (text.empty() ? "" : ",") + (R"({"name": ")" + name) + R"(", "path": ")" + folder.string() +
                R"(", "ftp": true, "users": {"ftp": ")" + grant +
                R"(", "alice": "write", "bob": "write", "carol": "write"}})";
    }
    fs::create_directories(worldRoot / "etc/velt");
    writeFile(worldRoot / "etc/velt/shares.json", R"({"version": 1, "shares": [)" + text + "]}\n");
}

std::string ModuleService::fetchHome(int fromPort, std::vector<std::string> curlArguments) {
    curlArguments.insert(curlArguments.begin(),
                         {"curl", "--silent", "--max-time", "20", "--user", "alice:alice-secret",
                          "ftp://127.0.0.1:" + std::to_string(fromPort) + "/home-of"});
    return runProcess(curlArguments, {}, std::chrono::seconds(30)).output;
}

bool ModuleService::fetchesUnderTls() {
    return fetchHome(port, {"--ssl-reqd", "--cacert", worldRoot / "var/lib/velt/tls/server.crt"}) == "alice";
}

FtpSession ModuleService::aliceAt(int atPort) {
    FtpSession session(atPort);
    EXPECT_EQ(session.logIn("alice"), 230);
    return session;
}

UniqueFd ModuleService::listenOn(int atPort) {
    UniqueFd listener(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const int on = 1;
    EXPECT_EQ(setsockopt(listener.get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on), 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<in_port_t>(atPort));
    EXPECT_EQ(bind(listener.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    EXPECT_EQ(listen(listener.get(), 1), 0);
    return listener;
}

std::vector<LogEntry> ModuleService::logEntries() const {
    auto entries = queryLog({});
    EXPECT_TRUE(entries) << lastErrorSentence();
    std::vector<LogEntry> found = entries.value_or(std::vector<LogEntry>{});
    std::erase_if(found, [this](const LogEntry& entry) { return entry.id <= lastEntry_; });
    std::ranges::reverse(found);
    return found;
}

std::vector<std::string> ModuleService::logSentences() const {
    std::vector<std::string> sentences;
    for (const LogEntry& entry : logEntries()) {
        sentences.push_back(entry.sentence);
    }
    return sentences;
}

std::vector<std::string> ModuleService::serviceActions() {
    const std::lock_guard lock(mutex_);
    return actions_;
}

bool contains(const std::string& text, const std::string& part) {
    return text.find(part) != std::string::npos;
}

std::string namesIn(FtpSession& session) {
    return session.receive("NLST").value_or("(refused)");
}

} // namespace velt::test
