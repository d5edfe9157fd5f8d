// The history of the settings.
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/waiting.h"

namespace {

using velt::ChangeState;

class HostHistory : public HostTest {
protected:
    void SetUp() override {
        platform.reset();
        access = {};
        settings.workers = 1; // the fake platform knows one thread
        start();
    }

    Answer setTimeOut(int seconds, const std::string& query = "") const {
        return ask("PATCH", "/api/settings" + query, admin,
                   R"({"ftp":{"timeout":)" + std::to_string(seconds) + "}}");
    }
    int timeOut() const { return get("/api/settings").json()["ftp"]["timeout"].asInt(); }

    fake::Platform& platform = fake::Platform::instance();
    FakeStandalone& access = FakeStandalone::instance();
};

TEST_F(HostHistory, IsPagedFromTheNewest) {
    for (const int seconds : {400, 500, 600}) {
        ASSERT_EQ(setTimeOut(seconds).status, 200);
    }
    const Json::Value page = get("/api/history?limit=2").json();
    ASSERT_EQ(page["changes"].size(), 2U);
    EXPECT_EQ(page["changes"][0]["id"], 3);
    EXPECT_EQ(page["changes"][0]["changes"][0]["to"], 600);
    EXPECT_EQ(page["changes"][0]["state"], "done");
    const Json::Value rest = get("/api/history?before=" + page["next"].asString()).json();
    EXPECT_EQ(rest["changes"].size(), 1U);
    EXPECT_TRUE(rest["next"].isNull());
    EXPECT_EQ(get("/api/history/2").json()["changes"][0]["from"], 400);
    EXPECT_EQ(get("/api/history/7").status, 404);
    EXPECT_EQ(get("/api/history/x").status, 404);
    EXPECT_EQ(get("/api/history?limit=0").json()["errors"][0]["field"], "limit");
    EXPECT_EQ(get("/api/history?since=1").status, 400);
}

TEST_F(HostHistory, AChangeIsUndoneOnce) {
    ASSERT_EQ(setTimeOut(600).status, 200);
    const Answer dry = post("/api/history/1/undo?dry_run=true");
    EXPECT_EQ(dry.json()["changes"][0]["to"], 300) << dry.body;
    EXPECT_EQ(timeOut(), 600);
    EXPECT_EQ(post("/api/history/1/undo").status, 200);
    EXPECT_EQ(timeOut(), 300);
    EXPECT_EQ(access.history[0].state, ChangeState::undone);
    EXPECT_EQ(access.history[1].way, "undo 1");
    EXPECT_EQ(post("/api/history/1/undo").status, 409);
    EXPECT_EQ(post("/api/history/2/undo").status, 200) << "an undo can be undone";
    EXPECT_EQ(timeOut(), 600);
    EXPECT_EQ(post("/api/history/9/undo").status, 404);
    EXPECT_EQ(ask("POST", "/api/history/1/undo", viewer).status, 403);
}

TEST_F(HostHistory, AnUndoingCanBeUndoneAndTheChangeOnceMore) {
    ASSERT_EQ(setTimeOut(600).status, 200);
    ASSERT_EQ(post("/api/history/1/undo").status, 200);
    ASSERT_EQ(post("/api/history/2/undo").status, 200);
    EXPECT_EQ(timeOut(), 600);
    EXPECT_EQ(get("/api/history/1").json()["state"], "done");
    EXPECT_EQ(get("/api/history/2").json()["state"], "undone");
    EXPECT_EQ(post("/api/history/1/undo").status, 200);
    EXPECT_EQ(timeOut(), 300);
}

TEST_F(HostHistory, WhatWasChangedAgainIsNotUndone) {
    ASSERT_EQ(setTimeOut(600).status, 200);
    ASSERT_EQ(setTimeOut(700).status, 200);
    const Answer answer = post("/api/history/1/undo");
    EXPECT_EQ(answer.status, 409);
    EXPECT_EQ(answer.json()["errors"][0]["field"], "/ftp/timeout");
    EXPECT_EQ(answer.json()["detail"], "/ftp/timeout was changed again since. Nothing was changed.");
    EXPECT_EQ(timeOut(), 700);
}

TEST_F(HostHistory, AnUnconfirmedChangeIsTakenBack) {
    const Answer made = setTimeOut(600, "?confirm_within=1");
    ASSERT_EQ(made.status, 200);
    EXPECT_EQ(made.json()["confirm_by"], get("/api/history/1").json()["confirm_by"]);
    EXPECT_EQ(access.history[0].state, ChangeState::waiting);
    EXPECT_TRUE(velt::test::waitUntil([&] { return timeOut() == 300; }, velt::test::patience));
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/1").json()["state"] == "undone"; },
                                      velt::test::patience));
    EXPECT_EQ(get("/api/history/2").json()["way"], "undo 1");
    EXPECT_EQ(get("/api/history/2").json()["actor"], "");
}

TEST_F(HostHistory, AConfirmedChangeStays) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=2").status, 200);
    EXPECT_EQ(post("/api/history/1/confirm?dry_run=true").json()["effects"][0]["subject"], "history");
    EXPECT_EQ(access.history[0].state, ChangeState::waiting);
    EXPECT_EQ(post("/api/history/1/confirm").status, 204);
    EXPECT_EQ(access.audit.back(), "1");
    EXPECT_EQ(access.history[0].state, ChangeState::confirmed);
    EXPECT_EQ(post("/api/history/1/confirm").status, 409);
    EXPECT_EQ(setTimeOut(601, "?confirm_within=1").status, 200);
    EXPECT_TRUE(velt::test::waitUntil([&] { return timeOut() == 600; }, velt::test::patience))
        << "the other is taken back to it";
    EXPECT_EQ(post("/api/history/5/confirm").status, 404);
}

TEST_F(HostHistory, WhatWaitedAtTheEndOfVeltdIsTakenBackByTheNext) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=1").status, 200);
    stop();
    start();
    EXPECT_TRUE(velt::test::waitUntil([&] { return timeOut() == 300; }, velt::test::patience));
}

TEST_F(HostHistory, AnUnconfirmedChangeThatCannotBeTakenBackIsNotSaidToBe) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=1").status, 200);
    access.failCommits("No luck.");
    EXPECT_TRUE(velt::test::waitUntil([&] { return logged("cannot take back the unconfirmed change 1: "); },
                                      velt::test::patience));
    EXPECT_EQ(get("/api/history/1").json()["state"], "waiting");
    EXPECT_EQ(access.audit.size(), 1U) << access.audit.back();
}

TEST_F(HostHistory, AnUnconfirmedChangeThatIsChangedAgainIsSuperseded) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=1").status, 200);
    ASSERT_EQ(setTimeOut(601).status, 200);
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/1").json()["state"] == "superseded"; },
                                      velt::test::patience));
    EXPECT_EQ(access.audit.back(), "1: /ftp/timeout was");
    EXPECT_EQ(timeOut(), 601);
    EXPECT_EQ(access.history.size(), 2U) << "nothing was undone";
}

TEST_F(HostHistory, WhatIsLeftOfAnUnconfirmedChangeIsTakenBack) {
    ASSERT_EQ(ask("PATCH", "/api/settings?confirm_within=1", admin,
                  R"({"ftp":{"timeout":600},"sftp":{"portnum":2222}})")
                  .status,
              200);
    ASSERT_EQ(setTimeOut(601).status, 200);
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/1").json()["state"] == "undone"; },
                                      velt::test::patience));
    EXPECT_EQ(access.audit.back(), "1: , but for /ftp/timeout, changed again since");
    EXPECT_EQ(timeOut(), 601);
    EXPECT_EQ(get("/api/settings").json()["sftp"]["portnum"], 22);
}

TEST_F(HostHistory, AnUnconfirmedChangeThatIsDamagedEndsNothing) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=1").status, 200);
    access.damageChange(1);
    EXPECT_TRUE(velt::test::waitUntil([&] { return logged("cannot take back the unconfirmed change 1: "); },
                                      velt::test::patience));
    EXPECT_EQ(get("/api/history/1").json()["state"], "waiting");
}

TEST_F(HostHistory, AFailedChangeDoesNotWait) {
    access.commitFails = true;
    access.sentence = "No luck.";
    EXPECT_EQ(setTimeOut(600, "?confirm_within=60").status, 500);
    EXPECT_TRUE(access.history.empty());
}

TEST_F(HostHistory, UnconfirmedChangesOnEachOtherAreAllTakenBack) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=1").status, 200);
    ASSERT_EQ(setTimeOut(700, "?confirm_within=2").status, 200);
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/2").json()["state"] == "undone"; },
                                      velt::test::patience));
    EXPECT_EQ(timeOut(), 300) << "nobody confirmed 600 either";
    EXPECT_EQ(get("/api/history/1").json()["state"], "superseded");
}

TEST_F(HostHistory, AnUndoingThatNobodyConfirmsLeavesItsChangeItsOwnDeadline) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=2").status, 200);
    ASSERT_EQ(post("/api/history/1/undo?confirm_within=1").status, 200);
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/2").json()["state"] == "undone"; },
                                      velt::test::patience));
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/1").json()["state"] == "undone"; },
                                      velt::test::patience));
    EXPECT_EQ(timeOut(), 300) << "nobody confirmed 600";
}

TEST_F(HostHistory, AnUndoingThatNobodyConfirmsLeavesAConfirmedChange) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=60").status, 200);
    ASSERT_EQ(post("/api/history/1/confirm").status, 204);
    ASSERT_EQ(post("/api/history/1/undo?confirm_within=1").status, 200);
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/1").json()["state"] == "done"; },
                                      velt::test::patience));
    EXPECT_EQ(timeOut(), 600);
}

TEST_F(HostHistory, OfTwoUnconfirmedChangesTheConfirmedOneStays) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=1").status, 200);
    ASSERT_EQ(setTimeOut(700, "?confirm_within=60").status, 200);
    ASSERT_EQ(post("/api/history/2/confirm").status, 204);
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/1").json()["state"] == "superseded"; },
                                      velt::test::patience));
    EXPECT_EQ(timeOut(), 700);
}

TEST_F(HostHistory, WhatSomebodyWantedForGoodStaysAlsoWhenItIsTheSameValue) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=1").status, 200);
    ASSERT_EQ(setTimeOut(700).status, 200);
    ASSERT_EQ(setTimeOut(600).status, 200);
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/1").json()["state"] == "superseded"; },
                                      velt::test::patience));
    EXPECT_EQ(timeOut(), 600);
}

TEST_F(HostHistory, AChangeThatWasUndoneDoesNotStandInTheWay) {
    ASSERT_EQ(setTimeOut(600, "?confirm_within=1").status, 200);
    ASSERT_EQ(setTimeOut(700).status, 200);
    ASSERT_EQ(post("/api/history/2/undo").status, 200);
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/1").json()["state"] == "undone"; },
                                      velt::test::patience));
    EXPECT_EQ(timeOut(), 300);
}

TEST_F(HostHistory, TheStatesFollowEachUndoingOfAnUndoing) {
    ASSERT_EQ(setTimeOut(600).status, 200);
    for (const char* id : {"1", "2", "3"}) {
        ASSERT_EQ(post(std::string("/api/history/") + id + "/undo").status, 200);
    }
    EXPECT_EQ(timeOut(), 300);
    std::string states;
    for (const velt::ChangeRecord& each : access.history) {
        states += velt::changeStateName(each.state) + " ";
    }
    EXPECT_EQ(states, "undone done undone done ");
}

TEST_F(HostHistory, AChangeThatACrashCutOffIsSettledAtTheNextStart) {
    ASSERT_EQ(setTimeOut(600).status, 200);
    ASSERT_EQ(setTimeOut(700, "?confirm_within=1").status, 200);
    stop();
    access.audit.clear();
    for (velt::ChangeRecord& each : access.history) {
        each.state = ChangeState::begun;
    }
    start();
    EXPECT_TRUE(velt::test::waitUntil([&] { return get("/api/history/2").json()["state"] == "undone"; },
                                      velt::test::patience))
        << "it was done, and nobody has confirmed it";
    EXPECT_EQ(get("/api/history/1").status, 404) << "it is not in force, so it was not done";
    EXPECT_TRUE(logged("the change 2 was done when veltd ended"));
}

TEST_F(HostHistory, AChangeIsWrittenDownBeforeItIsDone) {
    access.commitFails = true;
    access.sentence = "No luck.";
    access.keepsRemovedChanges = true;
    EXPECT_EQ(setTimeOut(600).status, 500);
    ASSERT_EQ(access.history.size(), 1U);
    EXPECT_EQ(access.history[0].state, ChangeState::begun);
    EXPECT_EQ(post("/api/history/1/undo").status, 409);
    EXPECT_EQ(post("/api/history/1/confirm").status, 409);
}

} // namespace
