// The fake platform itself, on which the other tests rely: state, journal, scripted failures, system log.

#include "tests/support/fake_platform/fake_platform.h"

#include "platform/adminlog.h"
#include "platform/sdk_user.h"
#include "platform/service.h"
#include "platform/share.h"

#include <gtest/gtest.h>

#include <syslog.h>

#include <cstring>

extern "C" void __syslog_chk(int priority, int flag, const char* format, ...);

namespace {

using Lines = std::vector<std::string>;

class FakePlatform : public ::testing::Test {
protected:
    FakePlatform() { platform.reset(); }
    ~FakePlatform() override { platform.reset(); }

    fake::Platform& platform = fake::Platform::instance();
};

Lines textsOf(const VLIBCSzList* list) {
    Lines texts;
    for (int i = 0; i < list->count; ++i) {
        texts.emplace_back(VLIBCSzListGet(list, i));
    }
    return texts;
}

TEST_F(FakePlatform, StoresWhatASetterGets) {
    _tag_VELT_FTP_CONF_ conf{};
    ASSERT_EQ(VELTFTPConfGet(&conf), 0);
    EXPECT_STREQ(conf.portnum, "21");
    conf.user_chroot = 1;
    ASSERT_EQ(VELTFTPConfSet(conf), 0);
    _tag_VELT_FTP_CONF_ again{};
    ASSERT_EQ(VELTFTPConfGet(&again), 0);
    EXPECT_EQ(std::memcmp(&conf, &again, sizeof(conf)), 0);

    EXPECT_EQ(VELTFTPTimeOutSet(60), 0);
    EXPECT_EQ(VELTFTPTimeOutGet(), 60);
    EXPECT_EQ(VELTFTPUmaskEnabledSet(true), 0);
    EXPECT_EQ(VELTFTPUmaskEnabledGet(), 1);
    platform.services["ftpd"] = 1;
    EXPECT_EQ(VLIBServicecfgRunKeySet("ftpd", 2), 0);
    EXPECT_EQ(VLIBServiceIsEnabled("ftpd"), 1);
    platform.services["ftpd"] = 0;
    EXPECT_EQ(VLIBServicecfgRunKeySet("ftpd", 1), 0);
    EXPECT_EQ(VLIBServiceIsEnabled("ftpd"), 0);
    EXPECT_EQ(VELTSFTPConfigSet(1, 2222), 0);
    _tag_VELT_SFTP_CONFIG_ sftp{};
    ASSERT_EQ(VELTSFTPConfigGet(1, &sftp), 0);
    EXPECT_EQ(sftp.enable, 1);
    EXPECT_EQ(sftp.port, 2222);
    EXPECT_EQ(VLIBServiceStart("sftp", 0), 0);
    EXPECT_EQ(VELTSFTPIsAlive(), 1);
}

TEST_F(FakePlatform, BeginsAnewAtReset) {
    VELTFTPTimeOutSet(1);
    platform.fail("VELTFTPTimeOutSet");
    VLIBCSzListAlloc(4);
    syslog(LOG_ERR, "%s:%d gone", "ftp", 1);
    platform.reset();
    EXPECT_EQ(platform.timeout, 300);
    EXPECT_TRUE(platform.journal.empty());
    EXPECT_TRUE(platform.logLines.empty());
    EXPECT_TRUE(platform.handleErrors().empty());
    EXPECT_EQ(platform.count("VELTFTPTimeOutSet"), 0);
    EXPECT_EQ(VELTFTPTimeOutSet(2), 0);
}

TEST_F(FakePlatform, JournalsCallsWithTheirArguments) {
    VLIBServicectlStop("ftpd-pure", 0);
    VELTLogSet1(2, 1, 0x11B00012, "21", "2121", "", "");
    WebUtils::IsPortConflict("ftp", 21, 30);
    VELTFTPUmaskEnabledSet(false);
    VLIBCINFOSetKeyValue("ftp_ext_ip", "1\"2\\\n\x01\xC3\xA4");
    char buffer[4];
    EXPECT_EQ(VLIBCFileGetKeyValue("/etc/veltinfo.conf", "ftp_ext_ip", buffer, 4, 0), 1);
    EXPECT_STREQ(buffer, "1\"2");
    EXPECT_EQ(platform.journal, (Lines{
                                    R"(VLIBServicectlStop("ftpd-pure", 0))",
                                    R"(VELTLogSet1(2, 1, 0x11B00012, "21", "2121", "", ""))",
                                    R"(WebUtils::IsPortConflict("ftp", 21, 30))",
                                    R"(VELTFTPUmaskEnabledSet(false))",
                                    R"(VLIBCINFOSetKeyValue("ftp_ext_ip", "1\"2\\\n\x01ä"))",
                                    R"(VLIBCFileGetKeyValue("/etc/veltinfo.conf", "ftp_ext_ip", 4, 0))",
                                }));
    EXPECT_EQ(platform.callsTo("VLIBC").size(), 2U);
    EXPECT_EQ(fake::Platform::operationOf(platform.journal[0]), "VLIBServicectlStop");
}

TEST_F(FakePlatform, ShowsTheFieldsThatAStoreChanges) {
    _tag_VELT_FTP_CONF_ conf{};
    VELTFTPConfGet(&conf);
    VELTFTPConfSet(conf);
    conf.user_chroot = 1;
    conf.service_flags = 3;
    std::strcpy(conf.portnum, "2121");
    VELTFTPConfSet(conf);
    std::strcpy(conf.anonymous_chroot_share, "photos");
    VELTFTPConfSet(conf);
    conf.anonymous_chroot_share[400] = 'x';
    VELTFTPConfSet(conf);
    EXPECT_EQ(platform.callsTo("VELTFTPConfSet"),
              (Lines{
                  "VELTFTPConfSet({})",
                  R"(VELTFTPConfSet({portnum: "2121", service_flags: 3, user_chroot: 1}))",
                  R"(VELTFTPConfSet({anonymous_chroot_share: "photos"}))",
                  R"(VELTFTPConfSet({anonymous_chroot_share: "photos" (other bytes after its end)}))",
              }));
}

TEST_F(FakePlatform, FailsTheNthCallWithoutItsEffect) {
    platform.fail("VELTFTPTimeOutSet", 2, -7);
    EXPECT_EQ(VELTFTPTimeOutSet(10), 0);
    EXPECT_EQ(VELTFTPTimeOutSet(20), -7);
    EXPECT_EQ(platform.timeout, 10);
    EXPECT_EQ(VELTFTPTimeOutSet(30), 0);
    EXPECT_EQ(platform.timeout, 30);
    EXPECT_EQ(platform.count("VELTFTPTimeOutSet"), 3);
    EXPECT_EQ(platform.journal.size(), 3U);
    EXPECT_TRUE(platform.unmetScripts().empty());
}

TEST_F(FakePlatform, FailsEveryCall) {
    platform.fail("VELTFTPFIPSEnabledGet", fake::Platform::everyCall, -3);
    EXPECT_EQ(VELTFTPFIPSEnabledGet(), -3);
    EXPECT_EQ(VELTFTPFIPSEnabledGet(), -3);
}

TEST_F(FakePlatform, KnowsWhatWasNotMetAndRefusesUnknownNames) {
    platform.fail("VELTFwRuleHup", 2);
    EXPECT_EQ(platform.unmetScripts(), Lines{"VELTFwRuleHup #2"});
    EXPECT_THROW(platform.fail("VELTFwRuleHop"), std::invalid_argument);
    EXPECT_THROW(platform.throwFrom("VELTFwRuleHop"), std::invalid_argument);
}

TEST_F(FakePlatform, GivesNullWhereAnAllocatorFails) {
    platform.users["bob"] = {"", 1000};
    platform.fail("VLIBCSzListAlloc");
    platform.fail("VLIBCSzHashAlloc");
    platform.fail("SDK::User::LoadUser");
    EXPECT_EQ(VLIBCSzListAlloc(1024), nullptr);
    EXPECT_EQ(VLIBCSzHashAlloc(1024), nullptr);
    EXPECT_EQ(SDK::User::LoadUser("bob"), nullptr);
    EXPECT_TRUE(platform.handleErrors().empty());
}

TEST_F(FakePlatform, ThrowsFromTheNthCall) {
    fake::Request request;
    fake::Response response;
    platform.throwFrom("APIRequest::GetParam", 2);
    platform.throwFrom("APIResponse::SetSuccess");
    platform.throwFrom("VELTFTPTimeOutSet");
    EXPECT_EQ(request.GetParam("", Json::Value()), Json::Value(Json::objectValue));
    EXPECT_THROW(request.GetParam("", Json::Value()), fake::Thrown);
    EXPECT_THROW(response.SetSuccess(Json::Value()), fake::Thrown);
    EXPECT_TRUE(response.answers.empty());
    EXPECT_THROW(VELTFTPTimeOutSet(1), fake::Thrown);
    EXPECT_EQ(platform.timeout, 300);
}

TEST_F(FakePlatform, KeepsRequestsAndAnswers) {
    fake::Request request;
    fake::Response response;
    request.params["portnum"] = 22;
    request.params["enable"] = true;
    EXPECT_EQ(request.GetParam("", Json::Value()), request.params);
    EXPECT_EQ(request.GetParam("portnum", Json::Value()), Json::Value(22));
    EXPECT_EQ(request.GetParam("other", Json::Value(1)), Json::Value(1));
    response.SetSuccess(request.params);
    response.SetError(1902, Json::Value());
    ASSERT_EQ(response.answers.size(), 2U);
    EXPECT_TRUE(response.answers[0].success);
    EXPECT_EQ(response.answers[0].data, request.params);
    EXPECT_FALSE(response.answers[1].success);
    EXPECT_EQ(response.answers[1].code, 1902);
    EXPECT_EQ(platform.journal, (Lines{
                                    R"(APIRequest::GetParam("", null))",
                                    R"(APIRequest::GetParam("portnum", null))",
                                    R"(APIRequest::GetParam("other", 1))",
                                    R"(APIResponse::SetSuccess({"enable":true,"portnum":22}))",
                                    R"(APIResponse::SetError(1902, null))",
                                }));
}

TEST_F(FakePlatform, AnswersSharesAndPrivileges) {
    platform.shares["photos"] = {"All of them", "/volume1/photos", 4};
    VELT_SHARE* share = nullptr;
    ASSERT_EQ(VELTShareGet("photos", &share), 0);
    EXPECT_STREQ(share->name, "photos");
    EXPECT_STREQ(share->comment, "All of them");
    EXPECT_STREQ(share->path, "/volume1/photos");
    VELT_SHARE_PRIV priv{};
    EXPECT_EQ(VELTShareUGPrivGetLocal("ftp", share, &priv), 0);
    EXPECT_EQ(priv.effective, 4);
    VELTShareFree(share);
    EXPECT_EQ(platform.journal,
              (Lines{R"(VELTShareGet("photos", null))", R"(VELTShareUGPrivGetLocal("ftp", share1))",
                     "VELTShareFree(share1)"}));
}

TEST_F(FakePlatform, ReadsTheRulesItWrites) {
    platform.users["bob"] = {"Bob", 1000};
    char line[64];
    ASSERT_EQ(VELTFTPChrootRuleFormat(line, sizeof(line), 1, 1000, "/photos/a:b"), 0);
    EXPECT_STREQ(line, "user:1000:/photos/a:b");
    int isUser = 0;
    char name[16] = "";
    char path[16] = "";
    ASSERT_EQ(VELTFTPChrootRuleParseToName(line, &isUser, name, sizeof(name), path, sizeof(path)), 0);
    EXPECT_EQ(isUser, 1);
    EXPECT_STREQ(name, "bob");
    EXPECT_STREQ(path, "/photos/a:b");
    platform.userFlag = -1;
    ASSERT_EQ(VELTFTPChrootRuleParseToName(line, &isUser, name, sizeof(name), path, sizeof(path)), 0);
    EXPECT_EQ(isUser, -1);
    for (const char* bad : {"", "user:1000", "user:7:/x", "group:1000:/x", "user:bob:/x"}) {
        EXPECT_LT(VELTFTPChrootRuleParseToName(bad, &isUser, name, sizeof(name), path, sizeof(path)), 0)
            << bad;
    }
    EXPECT_LT(VELTFTPChrootRuleParseToName(line, &isUser, name, sizeof(name), path, 4), 0);
    EXPECT_LT(VELTFTPChrootRuleFormat(line, 8, 1, 1000, "/photos"), 0);
}

TEST_F(FakePlatform, NarrowsAndMovesChrootUsers) {
    platform.nonChrootUsers = {"bob", "bobby", "eve"};
    VLIBCSzList* list = VLIBCSzListAlloc(8);
    ASSERT_EQ(VELTFTPNonChrootUserEnum(&list, 1, "bob", nullptr), 0);
    EXPECT_EQ(textsOf(list), (Lines{"bob", "bobby"}));
    ASSERT_EQ(VELTFTPAddChrootUser(list), 0);
    EXPECT_EQ(platform.chrootUsers, (Lines{"bob", "bobby"}));
    EXPECT_EQ(platform.nonChrootUsers, Lines{"eve"});
    ASSERT_EQ(VELTFTPDeleteChrootUser(list), 0);
    EXPECT_TRUE(platform.chrootUsers.empty());
    VLIBCSzListFree(list);
    EXPECT_EQ(platform.journal[1], R"(VELTFTPNonChrootUserEnum(list1, 1, "bob", null))");
}

TEST_F(FakePlatform, NarrowsByTheSourceAndDomainOfTheUsersItKnows) {
    platform.users = {{"ann", {"", 1000, fake::sourceLocal, ""}}, {"LAB\\eve", {"", 1001, 2, "LAB"}}};
    platform.chrootUsers = {"ann", "bob", "LAB\\eve"};
    VLIBCSzList* list = VLIBCSzListAlloc(8);
    ASSERT_EQ(VELTFTPChrootUserEnum(&list, 2, nullptr, nullptr), 0);
    EXPECT_EQ(textsOf(list), (Lines{"bob", "LAB\\eve"}));
    ASSERT_EQ(VELTFTPChrootUserEnum(&list, fake::everySource, nullptr, "LAB"), 0);
    EXPECT_EQ(textsOf(list), (Lines{"bob", "LAB\\eve"}));
    ASSERT_EQ(VELTFTPChrootUserEnum(&list, 1, nullptr, nullptr), 0);
    EXPECT_EQ(textsOf(list), (Lines{"ann", "bob"}));
    VLIBCSzListFree(list);
}

TEST_F(FakePlatform, SetsTheLastErrorOfALookUpUnlessTheTestDid) {
    VELT_SHARE* share = nullptr;
    EXPECT_LT(VELTShareGet("nowhere", &share), 0);
    EXPECT_NE(VLIBCErrGet(), 0);
    platform.lastError = {0x2A, "share.c", 7};
    EXPECT_LT(VELTShareGet("nowhere", &share), 0);
    EXPECT_EQ(VLIBCErrGet(), 0x2A);
    EXPECT_STREQ(VLIBCErrorGetFile(), "share.c");
    platform.lastError = {};
    platform.fail("VELTShareGet", 3);
    EXPECT_LT(VELTShareGet("nowhere", &share), 0);
    EXPECT_EQ(VLIBCErrGet(), 0) << "what a test makes fail has the error that the test sets";
}

TEST_F(FakePlatform, FindsPortsThatOthersHold) {
    platform.takenPorts = {{"http", {80, 8080}}, {"ftp", {21}}};
    EXPECT_EQ(WebUtils::IsPortConflict("ftp", 21, 21), 0);
    EXPECT_NE(WebUtils::IsPortConflict("ssh", 21, 21), 0);
    EXPECT_NE(WebUtils::IsPortConflict("ftp", 81, 8080), 0);
    EXPECT_EQ(WebUtils::IsPortConflict("ftp", 81, 8079), 0);
}

TEST_F(FakePlatform, JournalsListAndErrorReadsOnlyOnDemand) {
    platform.lastError = {0x1900, "share.c", 42};
    VLIBCSzList* list = VLIBCSzListAlloc(8);
    VLIBCSzListGet(list, 0);
    EXPECT_EQ(VLIBCErrGet(), 0x1900);
    EXPECT_STREQ(VLIBCErrorGetFile(), "share.c");
    EXPECT_EQ(VLIBCErrorGetLine(), 42);
    EXPECT_EQ(platform.journal, Lines{"VLIBCSzListAlloc(8)"});
    EXPECT_EQ(platform.count("VLIBCSzListGet"), 1);
    platform.journalListGets = true;
    platform.journalErrorGets = true;
    VLIBCSzListGet(list, 0);
    VLIBCErrGet();
    EXPECT_EQ(platform.journal, (Lines{"VLIBCSzListAlloc(8)", "VLIBCSzListGet(list1, 0)", "VLIBCErrGet()"}));
    VLIBCSzListFree(list);
}

TEST_F(FakePlatform, CapturesSyslog) {
    syslog(LOG_ERR, "%s:%d Failed to set FTP timeout.", "ftp", 17);
    syslog(LOG_ERR, "%s:%d Failed to VELTUserGet(). [%s][0x%04X %s:%d]", "chroot", 18, "bob", 0x19, "user.c",
           9);
    syslog(LOG_ERR, "%s:%d Request: %s", "handler", 19, "{}\n");
    syslog(LOG_INFO, "plain 100%% %u %c", 7U, 'x');
    EXPECT_EQ(platform.journal, (Lines{
                                    R"(syslog(3, "%s:%d Failed to set FTP timeout.", "ftp"))",
                                    R"(syslog(3, "%s:%d Failed to VELTUserGet(). [%s][0x%04X %s:%d]", )"
                                    R"("chroot", "bob", 0x19, "user.c", 9))",
                                    R"(syslog(3, "%s:%d Request: %s", "handler", "{}\n"))",
                                    R"(syslog(6, "plain 100%% %u %c", 7, "x"))",
                                }));
    ASSERT_EQ(platform.logLines.size(), 4U);
    const fake::LogLine& line = platform.logLines[1];
    EXPECT_EQ(line.priority, LOG_ERR);
    EXPECT_EQ(line.source, "chroot");
    EXPECT_EQ(line.line, 18);
    EXPECT_EQ(line.format, "%s:%d Failed to VELTUserGet(). [%s][0x%04X %s:%d]");
    EXPECT_EQ(line.rendered, "chroot:18 Failed to VELTUserGet(). [bob][0x0019 user.c:9]");
    EXPECT_EQ(platform.logLines[2].rendered, "handler:19 Request: {}\n");
    EXPECT_EQ(platform.logLines[3].rendered, "plain 100% 7 x");
}

TEST_F(FakePlatform, CapturesFortifiedSyslog) {
    __syslog_chk(LOG_ERR, 1, "%s:%d Failed to emit service action event for [%s]", "ftp", 4, "ftpd");
    EXPECT_EQ(platform.journal,
              Lines{R"(syslog(3, "%s:%d Failed to emit service action event for [%s]", "ftp", "ftpd"))"});
    ASSERT_EQ(platform.logLines.size(), 1U);
    EXPECT_EQ(platform.logLines[0].rendered, "ftp:4 Failed to emit service action event for [ftpd]");
}

TEST_F(FakePlatform, ShowsALineNumberThatIsNone) {
    syslog(LOG_ERR, "%s:%d Port conflict.", "sftp", 0);
    EXPECT_EQ(platform.journal, Lines{R"(syslog(3, "%s:%d Port conflict.", "sftp", line 0))"});
}

} // namespace
