// The report of what a user's logins see, as the host hands it on.

#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

class HostAccessReport : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
    }
};

TEST_F(HostAccessReport, IsHandedOn) {
    start();
    FakeStandalone::instance().accessReport = R"({"ftp": {"allowed": true}})";
    const Answer answer = ask("GET", "/api/access?user=an%20na&path=%2Fsrv", admin);
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.json()["ftp"]["allowed"], true);
    EXPECT_EQ(FakeStandalone::instance().askedAccess, "an na /srv");
}

TEST_F(HostAccessReport, IsForAdministrators) {
    start();
    EXPECT_EQ(ask("GET", "/api/access?user=anna", viewer).status, 403);
    EXPECT_EQ(FakeStandalone::instance().askedAccess, "");
}

TEST_F(HostAccessReport, NeedsAUserAndAnAbsolutePath) {
    start();
    for (const char* const query : {"", "?user=", "?path=/srv", "?user=anna&path=srv", "?user=a&user=b",
                                    "?user=a%00b", "?user=%ff", "?user=a&x=1"}) {
        EXPECT_EQ(ask("GET", std::string("/api/access") + query, admin).status, 400) << query;
    }
    EXPECT_EQ(FakeStandalone::instance().askedAccess, "");
}

TEST_F(HostAccessReport, ThatFailsIsAProblem) {
    start();
    FakeStandalone& fake = FakeStandalone::instance();
    fake.sentence = "There is no user \"x\".";
    fake.error = velt::ErrorNumber::notFound;
    const Answer unknown = ask("GET", "/api/access?user=x", admin);
    EXPECT_EQ(unknown.status, 404);
    EXPECT_EQ(unknown.json()["detail"], "There is no user \"x\".");
    fake.error = velt::ErrorNumber::invalid;
    EXPECT_EQ(ask("GET", "/api/access?user=x", admin).status, 422);
    fake.error = velt::ErrorNumber::none;
    fake.accessReport = "{";
    EXPECT_EQ(ask("GET", "/api/access?user=x", admin).status, 500);
}

} // namespace
