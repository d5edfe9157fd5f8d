#include "tests/system/support/module_service.h"

#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/system/support/leftovers.h"

#include <json/reader.h>

#include <algorithm>
#include <cstdlib>
#include <memory>

namespace velt::test {
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
    ASSERT_EQ(messageOf(openState(worldRoot)), "");
    furnishHomes();
    ASSERT_EQ(setSecurity(R"({"user_chroot": true})").code, 0) << lastErrorSentence();
    lastEntry_ = logEntries().back().id;
    mounts_ = contentsOf("/proc/self/mounts");
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
    EXPECT_EQ(contentsOf("/proc/self/mounts"), mounts_);
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

std::vector<LogEntry> ModuleService::logEntries() const {
    auto entries = queryLog({});
    EXPECT_TRUE(entries) << entries.error().message;
    std::vector<LogEntry> found = entries.valueOr({});
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

} // namespace velt::test
