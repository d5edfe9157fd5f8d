// The security settings through the module, seen by clients.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/module_service.h"

#include <filesystem>

namespace velt::test {
namespace {

constexpr int shareNotAccessible = 1905;

class ModuleSecurity : public ModuleService {
protected:
    void SetUp() override {
        ModuleService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        makeShares();
        ASSERT_EQ(setFtp().code, 0) << lastErrorSentence();
    }
};

TEST_F(ModuleSecurity, letsAnonymousUsersInAndOut) {
    EXPECT_EQ(anonymousLogin(), 530);
    ASSERT_EQ(setSecurity(R"({"anonymous": true})").code, 0);
    EXPECT_EQ(getSecurity()["anonymous"], true);
    {
        FtpSession session(port);
        ASSERT_EQ(session.logIn("anonymous", "a@b"), 230);
        EXPECT_EQ(session.receive("RETR /public/about"), "public");
        EXPECT_EQ(session.send("STOR /public/new", "x"), 550);
        EXPECT_EQ(session.send("STOR /upload/new", "x"), 226);
        EXPECT_FALSE(contains(namesIn(session), "closed"));
    }
    ASSERT_EQ(setSecurity(R"({"anonymous": false})").code, 0);
    EXPECT_EQ(anonymousLogin(), 530);
    EXPECT_EQ(fetchHome(), "alice");
}

TEST_F(ModuleSecurity, confinesAnonymousUsersToAShare) {
    ASSERT_EQ(
        setSecurity(R"({"anonymous": true, "anonymous_chroot": true, "anonymous_chroot_share": "public"})")
            .code,
        0);
    {
        FtpSession session(port);
        ASSERT_EQ(session.logIn("anonymous", "a@b"), 230);
        EXPECT_EQ(namesIn(session), "about\r\n");
        EXPECT_EQ(session.receive("RETR /about"), "public");
        EXPECT_EQ(session.send("STOR new", "x"), 550);
    }
    ASSERT_EQ(setSecurity(R"({"anonymous_chroot_share": "upload"})").code, 0);
    EXPECT_EQ(getSecurity()["anonymous_chroot_share"], "upload");
    FtpSession session(port);
    ASSERT_EQ(session.logIn("anonymous", "a@b"), 230);
    EXPECT_EQ(session.receive("RETR /about"), "upload");
    EXPECT_EQ(session.send("STOR new", "x"), 226);
    EXPECT_EQ(contentsOf("/mnt/srv/upload/new"), "x");
}

TEST_F(ModuleSecurity, refusesAShareThatAnonymousUsersCannotReach) {
    for (const char* share : {"closed", "absent"}) {
        Json::Value parameters;
        parameters["anonymous"] = true;
        parameters["anonymous_chroot"] = true;
        parameters["anonymous_chroot_share"] = share;
        EXPECT_EQ(setSecurity(parameters.toStyledString()).code, shareNotAccessible) << share;
    }
    EXPECT_EQ(setSecurity(R"({"anonymous": true, "anonymous_chroot": true})").code, operationFailed);
    EXPECT_EQ(getSecurity()["anonymous"], false) << "nothing of a failed request is stored";
    EXPECT_EQ(anonymousLogin(), 530);
}

TEST_F(ModuleSecurity, showsUsersTheSharesOrTheirHomesOnly) {
    ASSERT_EQ(setSecurity(R"({"user_chroot": false})").code, 0);
    {
        FtpSession session = aliceAt();
        EXPECT_EQ(session.receive("RETR /music/about"), "music");
        EXPECT_EQ(session.command("MKD /made").code, 550);
    }
    ASSERT_EQ(setSecurity(R"({"user_chroot": true})").code, 0);
    EXPECT_EQ(getSecurity()["user_chroot"], true);
    FtpSession session = aliceAt();
    session.command("CDUP");
    EXPECT_EQ(namesIn(session), "home-of\r\n");
}

TEST_F(ModuleSecurity, appliesTheUmaskToUploads) {
    for (const bool enabled : {true, false}) {
        ASSERT_EQ(setSecurity(enabled ? R"({"enable_umask": true})" : R"({"enable_umask": false})").code, 0);
        EXPECT_EQ(getSecurity()["enable_umask"], enabled);
        FtpSession session = aliceAt();
        std::filesystem::remove("/mnt/home/alice/sent");
        EXPECT_EQ(session.send("STOR sent", "x"), 226);
        EXPECT_EQ(modeOf("/mnt/home/alice/sent"), enabled ? 0644U : 0666U);
    }
}

TEST_F(ModuleSecurity, listsTheSharesOfferedToFtp) {
    const ModuleAnswer answer =
        requestModule("VELT.Core.FileServ.FTP.Security", 1, "list_ftp_share", Json::objectValue);
    EXPECT_EQ(answer.code, 0) << answer.sentence;
    EXPECT_EQ(answer.data, json(R"({"share": ["public", "music", "upload", "closed"]})"));
}

} // namespace
} // namespace velt::test
