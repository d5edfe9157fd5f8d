// The switch by which SFTP is confined, as an administrator turns it.
#include "tests/support/text.h"
#include "tests/system/support/host_service.h"
#include "tests/system/support/sftp_session.h"

namespace velt::test {
namespace {

constexpr int sftpPort = 2023;

class HostConfinement : public HostService {
protected:
    void SetUp() override {
        HostService::SetUp();
        if (!IsSkipped() && !HasFatalFailure()) {
            done({"confinement", "set", "sftp=off"});
            done({"sftp", "set", "enable=on", "portnum=" + std::to_string(sftpPort)});
        }
    }

    static bool seesTheServer() {
        SftpSession session(sftpPort, "alice");
        EXPECT_TRUE(session.isOpen());
        return session.receive("/etc/passwd").has_value();
    }
};

TEST_F(HostConfinement, isSwitchedOnAndOffAndTakenBack) {
    EXPECT_TRUE(seesTheServer());
    SftpSession before(sftpPort, "alice");
    ASSERT_TRUE(before.isOpen());

    const ProcessResult planned = veltctl({"confinement", "set", "sftp=on", "--dry-run"});
    EXPECT_EQ(planned.output, "sftp: off -> on\n"
                              "  stores the confinement settings\n"
                              "  hands the port of sftp over to a new daemon\n"
                              "  ends the sessions of sftp\n"
                              "Nothing was changed: this was a dry run.\n"
                              "1 session would be ended.\n");
    EXPECT_TRUE(seesTheServer());

    EXPECT_EQ(done({"confinement", "set", "sftp=on"}), "sftp: off -> on\n1 session ended.\n");
    EXPECT_EQ(before.receive("/etc/passwd"), std::nullopt) << "its rights are taken away";
    EXPECT_FALSE(seesTheServer());
    EXPECT_FALSE(contains(veltctl({"doctor"}).output, "SFTP is not confined"));

    SftpSession confined(sftpPort, "alice");
    ASSERT_TRUE(confined.isOpen());
    EXPECT_EQ(done({"undo"}), "confinement/sftp: on -> off\n");
    EXPECT_TRUE(confined.list("/")) << "it has no more rights than those who log in now";
    EXPECT_TRUE(seesTheServer());
    EXPECT_TRUE(contains(veltctl({"doctor"}).output, "veltctl confinement set sftp=on"));
}

TEST_F(HostConfinement, keepsSessionsWhereThatIsAsked) {
    SftpSession before(sftpPort, "alice");
    ASSERT_TRUE(before.isOpen());
    EXPECT_EQ(done({"confinement", "set", "sftp=on", "--keep-sessions"}), "sftp: off -> on\n");
    EXPECT_TRUE(before.receive("/etc/passwd"));
    EXPECT_FALSE(seesTheServer());
}

} // namespace
} // namespace velt::test
