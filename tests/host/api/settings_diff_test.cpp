// The settings as they were, and what differs between two states.
#include "host/base/json.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

class HostDiff : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        access = {};
        settings.workers = 1; // the fake platform knows one thread
        start();
    }

    void patch(const std::string& body, const std::string& query = "", int status = 200) const {
        const Answer answer = ask("PATCH", "/api/settings" + query, admin, body);
        EXPECT_EQ(answer.status, status) << answer.body;
    }
    /// What GET /api/settings answered at this moment.
    Json::Value document() const { return get("/api/settings").json(); }
    Json::Value documentAt(int id) const {
        return get("/api/history/" + std::to_string(id) + "/settings").json();
    }
    Answer diff(const std::string& from, const std::string& to) const {
        return post("/api/diff", R"({"from":)" + from + R"(,"to":)" + to + "}");
    }

    FakeStandalone& access = FakeStandalone::instance();
};

TEST_F(HostDiff, EachStateOfTheHistoryIsWhatItWas) {
    fake::Platform::instance().users["anna"].uid = 1001;
    std::vector<Json::Value> states{document()};
    for (const char* body :
         {R"({"ftp":{"timeout":400}})", R"({"chroot_rules":[{"type":"user","name":"anna","path":"/home"}]})",
          R"({"ftp":{"timeout":500},"sftp":{"enable":true,"portnum":2222}})", R"({"chroot_rules":[]})"}) {
        patch(body);
        states.push_back(document());
    }
    ASSERT_EQ(post("/api/history/3/undo").status, 200);
    states.push_back(document());
    for (std::size_t id = 0; id < states.size(); ++id) {
        EXPECT_EQ(documentAt(static_cast<int>(id)), states[id]) << id;
    }
    EXPECT_EQ(ask("GET", "/api/history/1/settings", viewer).status, 200);
    EXPECT_EQ(get("/api/history/6/settings").status, 404);
    EXPECT_EQ(get("/api/history/x/settings").status, 404);
}

TEST_F(HostDiff, AChangeThatWasNotDoneDoesNotCount) {
    patch(R"({"ftp":{"timeout":400}})");
    access.commitFails = true;
    access.sentence = "No luck.";
    patch(R"({"ftp":{"timeout":999}})", "?confirm_within=60", 500);
    access.commitFails = false;
    patch(R"({"ftp":{"timeout":500}})");
    EXPECT_EQ(documentAt(1)["ftp"]["timeout"], 400);
    EXPECT_EQ(documentAt(2)["ftp"]["timeout"], 400);
}

TEST_F(HostDiff, OfALongHistoryAllPagesAreTakenBack) {
    const Json::Value first = document();
    for (int i = 1; i <= 1500; ++i) {
        velt::ChangeRecord change;
        change.fields = R"([{"field":"/ftp/timeout","from":)" + std::to_string(300 + i - 1) + R"(,"to":)" +
                        std::to_string(300 + i) + "}]";
        ASSERT_TRUE(velt::recordChange(change)); // under its lock: the host looks at the history by itself
    }
    fake::Platform::instance().timeout = 1800;
    EXPECT_EQ(documentAt(0), first);
    EXPECT_EQ(documentAt(499)["ftp"]["timeout"], 799);
    EXPECT_EQ(documentAt(500)["ftp"]["timeout"], 800);
    EXPECT_EQ(documentAt(1499)["ftp"]["timeout"], 1799);
}

TEST_F(HostDiff, TwoStatesAreCompared) {
    patch(R"({"ftp":{"timeout":400}})");
    patch(R"({"ftp":{"timeout":500,"max_conn_per_ip":3}})");
    EXPECT_EQ(diff("0", "1").body, R"({"changes":[{"field":"/ftp/timeout","from":300,"to":400}]})");
    EXPECT_EQ(diff("2", "1").json()["changes"].size(), 2U);
    EXPECT_EQ(diff("2", R"("now")").body, R"({"changes":[]})");
    const std::string now = velt::host::toJson(document());
    EXPECT_EQ(diff(now, "2").body, R"({"changes":[]})");
    EXPECT_EQ(diff("0", now).json()["changes"][1]["field"], "/ftp/timeout");
    EXPECT_TRUE(access.audit.size() == 2) << "nothing is changed";
}

TEST_F(HostDiff, WhatADocumentDoesNotHaveIsNotCompared) {
    const std::string part = R"({"format":"velt-settings","format_version":1,"ftp":{"timeout":300}})";
    EXPECT_EQ(diff(part, R"("now")").body, R"({"changes":[]})");
    patch(R"({"ftp":{"timeout":400,"portnum":2121}})");
    EXPECT_EQ(diff(part, R"("now")").body, R"({"changes":[{"field":"/ftp/timeout","from":300,"to":400}]})");
}

TEST_F(HostDiff, WhatIsNoStateIsRefused) {
    for (const char* wrong :
         {"null", "true", R"("then")", "{}", "[]", "1.5", R"({"format":"velt-settings","ftp":7})",
          R"({"format":"velt-settings","chroot_rules":{}})"}) {
        const Answer answer = diff(R"("now")", wrong);
        EXPECT_EQ(answer.status, 422) << wrong;
        EXPECT_EQ(answer.json()["errors"][0]["field"], "to") << wrong;
    }
    EXPECT_EQ(diff("9", R"("now")").status, 404);
    EXPECT_EQ(diff("-1", R"("now")").status, 404);
    EXPECT_EQ(post("/api/diff", "[").status, 400);
    EXPECT_EQ(post("/api/diff", "{}").json()["errors"][0]["field"], "from");
}

} // namespace
