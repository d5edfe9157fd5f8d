// What veltctl tells of a user's logins is what the logins see.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/host_service.h"

#include <set>
#include <sstream>

namespace velt::test {
namespace {

class HostAccessReports : public HostService {
protected:
    void SetUp() override {
        HostService::SetUp();
        if (!IsSkipped() && !HasFatalFailure()) {
            done({"ftp", "set", "enable_ftp=on"});
        }
    }

    static Json::Value report(const std::string& user) {
        return jsonOf(done({"access", user, "--json"}))["ftp"];
    }
};

TEST_F(HostAccessReports, agreeWithTheLogins) {
    const Json::Value confined = report("alice");
    EXPECT_EQ(confined["reasons"][0], "No chroot rule applies, and users are confined to their homes.");
    ASSERT_EQ(confined["folders"].size(), 1U);
    EXPECT_EQ(confined["folders"][0]["folder"], "/mnt/home/alice");

    done({"security", "set", "user_chroot=off"});
    const Json::Value open = report("alice");
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    std::set<std::string> names;
    for (const Json::Value& folder : open["folders"]) {
        names.insert(folder["path"].asString().substr(1) + "\r");
        const bool writes = session.send("STOR " + folder["path"].asString() + "/probe", "x") == 226;
        EXPECT_EQ(writes, folder["access"] == "write") << textOf(folder);
    }
    std::istringstream listed(namesIn(session));
    std::set<std::string> seen;
    for (std::string line; std::getline(listed, line);) {
        seen.insert(line);
    }
    EXPECT_EQ(seen, names);
    EXPECT_GE(names.size(), 2U);
}

TEST_F(HostAccessReports, tellOfSftpTheSameWhereItIsConfined) {
    const auto both = [] { return jsonOf(done({"access", "alice", "/etc/passwd", "--json"})); };
    writeFile(worldRoot / "etc/velt/confinement.conf", "version = 1\nsftp = 1\n");
    EXPECT_EQ(both()["sftp"], both()["ftp"]);
    EXPECT_EQ(both()["path"]["sftp"]["access"], "none");
    writeFile(worldRoot / "etc/velt/confinement.conf", "version = 1\nsftp = 0\n");
    EXPECT_EQ(both()["sftp"]["whole_server"], true);
    EXPECT_EQ(both()["path"]["sftp"]["path"], "/etc/passwd");
    EXPECT_EQ(both()["path"]["sftp"]["access"], "read");
}

TEST_F(HostAccessReports, tellWhyALoginWouldBeRefused) {
    done({"chroot", "rules", "add", "user", "alice", "/no-such-share"});
    EXPECT_EQ(report("alice")["refused"], "There is no share for the path /no-such-share.");
    FtpSession session(port);
    EXPECT_EQ(session.logIn("alice"), 530);
}

TEST_F(HostAccessReports, findAFile) {
    const std::string home = done({"access", "alice", "/mnt/home/alice"});
    EXPECT_TRUE(home.starts_with("FTP: read and write, as /. alice may read and change /mnt/home/alice"))
        << home;
    EXPECT_TRUE(done({"access", "alice", "/etc/passwd"}).starts_with("FTP: nothing. It is in no folder"));
    EXPECT_EQ(veltctl({"access", "alice", "/etc/none"}).exitCode, 3);
    EXPECT_EQ(veltctl({"access", "no-such-user"}).exitCode, 3);
    EXPECT_EQ(report("root")["refused"], "The services let no account with the user number 0 log in.");
}

} // namespace
} // namespace velt::test
