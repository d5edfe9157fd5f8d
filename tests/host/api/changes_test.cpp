// Changes that the module accepts or refuses, as a whole.
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

const std::string sftp = "/api/VELT.Core.FileServ.FTP.SFTP/v1/";

class HostChanges : public HostTest {
protected:
    void SetUp() override {
        platform.reset();
        access = {};
        settings.workers = 1; // the fake platform knows one thread
        start();
    }

    fake::Platform& platform = fake::Platform::instance();
    FakeStandalone& access = FakeStandalone::instance();
};

TEST_F(HostChanges, AFailedChangeIsNone) {
    platform.fail("VELTSFTPConfigSet");
    Answer answer = post(sftp + "set", R"({"enable":true,"portnum":2222})");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["code"], 1902);
    EXPECT_EQ(answer.json()["detail"], "Failed to set SFTP config. Nothing was changed.");
    EXPECT_EQ(answer.json()["changed"], false);
    platform.reset();
    platform.fail("VLIBServiceStart");
    access.sentence = "The SFTP daemon does not start: bad luck.";
    const std::string detail =
        post(sftp + "set", R"({"enable":true,"portnum":2222})").json()["detail"].asString();
    EXPECT_EQ(detail, "The SFTP daemon does not start: bad luck. Nothing was changed.");
    platform.reset();
    platform.fail("VELTSFTPConfigGet");
    EXPECT_FALSE(get(sftp + "get").json().isMember("changed")) << "a read changes nothing anyway";
}

TEST_F(HostChanges, AChangeThatCannotBeDoneIsTakenBack) {
    access.commitFails = true;
    access.sentence = "The SFTP daemon does not start: bad luck.";
    const Answer answer = post(sftp + "set", R"({"enable":true,"portnum":2222})");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["title"], "The operation failed");
    EXPECT_EQ(answer.json()["detail"], "The SFTP daemon does not start: bad luck. All is as it was before.");
    EXPECT_EQ(answer.json()["changed"], false);
    EXPECT_TRUE(access.history.empty());
    EXPECT_NE(get("/metrics").body.find(R"(outcome="taken_back")"), std::string::npos);
    platform.reset();
    access.commitError = velt::ErrorNumber::portTaken;
    const Answer taken = post(sftp + "set", R"({"enable":true,"portnum":2222})");
    EXPECT_EQ(taken.status, 409);
    access.planFails = true;
    const Answer plan = post(sftp + "set?dry_run=true", R"({"enable":true,"portnum":2222})");
    EXPECT_EQ(plan.status, 409);
    EXPECT_EQ(plan.json()["title"], taken.json()["title"]);
    platform.reset();
    access.undone = false;
    const Answer half = post(sftp + "set", R"({"enable":true,"portnum":2222})");
    EXPECT_EQ(half.status, 500) << "nobody who asks again would mend that";
    EXPECT_EQ(half.json()["title"], "The change could be taken back only in part");
    EXPECT_EQ(half.json()["changed"], true);
    EXPECT_EQ(access.audit,
              std::vector<std::string>{
                  "VELT.Core.FileServ.FTP.SFTP v1 set: The SFTP daemon does not start: bad luck"});
}

TEST_F(HostChanges, WhatDidNotWorkBesideAChangeIsInTheAnswer) {
    access.warnings = {"The administrator log cannot be written."};
    const Answer ofRow = post(sftp + "set", R"({"enable":true,"portnum":2222})");
    EXPECT_EQ(ofRow.status, 200) << "204 has no room for it";
    EXPECT_EQ(ofRow.json()["warnings"][0], "The administrator log cannot be written.");
    access.logFails = true;
    access.sentence = "The disk is full.";
    const Answer ofDocument = ask("PATCH", "/api/settings", admin, R"({"sftp":{"portnum":2223}})");
    EXPECT_EQ(ofDocument.status, 200);
    EXPECT_EQ(ofDocument.json()["warnings"].size(), 2U);
    EXPECT_EQ(ofDocument.json()["warnings"][1],
              "The change is not in the administrator log. The disk is full.");
}

TEST_F(HostChanges, WhatThePlatformRefusesIsTheCallersToMend) {
    const auto statusFor = [this](velt::ErrorNumber error) {
        platform.reset();
        platform.fail("VLIBServiceStart");
        access.error = error;
        return post(sftp + "set", R"({"enable":true,"portnum":2222})").status;
    };
    EXPECT_EQ(statusFor(velt::ErrorNumber::invalid), 422);
    EXPECT_EQ(statusFor(velt::ErrorNumber::notFound), 422);
    EXPECT_EQ(statusFor(velt::ErrorNumber::portTaken), 409);
    EXPECT_EQ(statusFor(velt::ErrorNumber::certificate), 409);
    EXPECT_EQ(statusFor(velt::ErrorNumber::store), 500);
    EXPECT_EQ(statusFor(velt::ErrorNumber::daemon), 500);
}

TEST_F(HostChanges, ADryRunSaysWhatItWouldDo) {
    const Answer answer = post(sftp + "set?dry_run=true", R"({"enable":true,"portnum":2222})");
    EXPECT_EQ(answer.status, 200);
    const Json::Value plan = answer.json();
    EXPECT_EQ(plan["dry_run"], true);
    EXPECT_EQ(plan["effects"][0]["effect"], "store");
    EXPECT_EQ(plan["sessions_ended"], 3);
    EXPECT_EQ(post(sftp + "set?dry_run=true&sessions=keep", R"({"enable":true})").json()["sessions_ended"],
              0);
    EXPECT_TRUE(access.history.empty());
    EXPECT_TRUE(access.log.empty());
    EXPECT_EQ(post(sftp + "set?dry_run=true", R"({"enable":"yes"})").status, 422);
}

TEST_F(HostChanges, OptionsOfAChangeAreChecked) {
    const std::map<std::string, std::string> wrong{{"dry_run=maybe", "dry_run"},
                                                   {"sessions=some", "sessions"},
                                                   {"confirm_within=0", "confirm_within"},
                                                   {"confirm_within=86401", "confirm_within"},
                                                   {"dryrun=1", "dryrun"},
                                                   {"sessions=%zz", "sessions"}};
    for (const auto& [query, field] : wrong) {
        const Answer answer = post(sftp + "set?" + query, R"({"enable":true})");
        EXPECT_EQ(answer.status, 400) << query;
        EXPECT_EQ(answer.json()["errors"][0]["field"], field);
    }
    EXPECT_EQ(platform.count("VELTSFTPConfigSet"), 0);
}

} // namespace
