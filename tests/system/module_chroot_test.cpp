// Chroot users and chroot rules through the module, seen at logins.
#include "tests/support/text.h"
#include "tests/system/support/module_service.h"

namespace velt::test {
namespace {

class ModuleChroot : public ModuleService {
protected:
    static constexpr const char* home = "home-of\r\n";
    static constexpr const char* shares = "closed\r\nmusic\r\npublic\r\nupload\r\n";

    void SetUp() override {
        ModuleService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        makeShares();
        std::filesystem::create_directory("/mnt/srv/music/below");
        writeFile("/mnt/srv/music/below/deep", "di");
        ASSERT_EQ(setSecurity(R"({"user_chroot": false})").code, 0) << lastErrorSentence();
        ASSERT_EQ(setFtp().code, 0) << lastErrorSentence();
    }

    static ModuleAnswer request(int version, const std::string& method, const std::string& parameters) {
        return requestModule("VELT.Core.FileServ.FTP.ChrootUser", version, method, json(parameters));
    }
};

TEST_F(ModuleChroot, usersAreAddedAndDeleted) {
    EXPECT_EQ(rootOf("alice"), shares);
    const ModuleAnswer added = request(1, "add", R"({"id": ["alice", 7, "bob"]})");
    EXPECT_EQ(added.code, 0) << added.sentence;
    EXPECT_EQ(added.data, json(R"({"chrootuser_id": ["alice", "bob"]})"));
    EXPECT_EQ(rootOf("alice"), home);
    EXPECT_EQ(rootOf("bob"), home);
    EXPECT_EQ(rootOf("carol"), shares);
    EXPECT_EQ(request(1, "delete", R"({"id": ["bob"]})").code, 0);
    EXPECT_EQ(rootOf("alice"), home);
    EXPECT_EQ(rootOf("bob"), shares);
}

TEST_F(ModuleChroot, unknownUsersAreRefusedWithTheirName) {
    const ModuleAnswer answer = request(1, "add", R"({"id": ["alice", "nobody-like-this"]})");
    EXPECT_EQ(answer.code, operationFailed);
    EXPECT_TRUE(contains(answer.sentence, "nobody-like-this")) << answer.sentence;
    EXPECT_EQ(rootOf("alice"), shares) << "all or none";
}

TEST_F(ModuleChroot, rulesOfUsersComeBeforeThoseOfGroupsAndTheGeneralSetting) {
    const ModuleAnswer saved = request(2, "save", R"({"rules": [
        {"type": "group", "name": "staff", "path": "/music/below"},
        {"type": "user", "name": "alice", "path": "/home"},
        {"type": "user", "name": "nobody-like-this", "path": "/home"}]})");
    EXPECT_EQ(saved.code, 0) << saved.sentence;
    EXPECT_EQ(rootOf("alice"), home);
    EXPECT_EQ(rootOf("bob"), "deep\r\n");
    EXPECT_EQ(rootOf("carol"), shares);
    const ModuleAnswer loaded = request(2, "load", "{}");
    EXPECT_EQ(loaded.data, json(R"({"total": 2, "rules": [
        {"type": "group", "name": "staff", "path": "/music/below", "path_exist": true},
        {"type": "user", "name": "alice", "path": "/home", "path_exist": true}]})"))
        << loaded.data.toStyledString();
    EXPECT_EQ(request(2, "save", R"({"rules": []})").code, 0);
    EXPECT_EQ(rootOf("bob"), shares);
}

TEST_F(ModuleChroot, aRuleWithoutItsFolderRefusesTheLogin) {
    EXPECT_EQ(
        request(2, "save", R"({"rules": [{"type": "user", "name": "carol", "path": "/music/absent"}]})").code,
        0);
    EXPECT_EQ(rootOf("carol"), "530");
    EXPECT_EQ(request(2, "load", "{}").data["rules"][0]["path_exist"], false);
}

TEST_F(ModuleChroot, usersAreRulesForTheirHomes) {
    EXPECT_EQ(request(1, "add", R"({"id": ["carol"]})").code, 0);
    EXPECT_EQ(request(2, "load", "{}").data["rules"],
              json(R"([{"type": "user", "name": "carol", "path": "/home", "path_exist": true}])"));
}

} // namespace
} // namespace velt::test
