// The security, chroot and SFTP settings by veltctl and by curl, seen by clients.
#include "tests/support/waiting.h"
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/setting_table.h"

#include <filesystem>

namespace velt::test {
namespace {

constexpr const char* homeOnly = "home-of\r\n";

class HostOther : public SettingTable {
protected:
    void SetUp() override {
        SettingTable::SetUp();
        if (!IsSkipped() && !HasFatalFailure()) {
            done({"ftp", "set", "enable_ftp=on"});
        }
    }

    static std::string anonymousRoot() {
        FtpSession session(port);
        EXPECT_EQ(session.logIn("anonymous", "a@b"), 230);
        return namesIn(session);
    }
};

TEST_F(HostOther, anonymousUsers) {
    check({
        {"security",
         "anonymous",
         true,
         false,
         [](const Json::Value& on) { EXPECT_EQ(anonymousLogin(), on.asBool() ? 230 : 530); },
         {},
         {}},
        {"security",
         "anonymous_chroot",
         true,
         false,
         [](const Json::Value& on) { EXPECT_EQ(anonymousRoot() == "about\r\n", on.asBool()); },
         {"anonymous=on", "anonymous_chroot_share=public"},
         {}},
        {"security",
         "anonymous_chroot_share",
         "upload",
         "public",
         [](const Json::Value& share) {
             FtpSession session(port);
             EXPECT_EQ(session.logIn("anonymous", "a@b"), 230);
             EXPECT_EQ(session.receive("RETR /about"), share.asString());
         },
         {"anonymous_chroot=on"},
         {}},
    });
}

TEST_F(HostOther, usersAndTheirFiles) {
    check({
        {"security",
         "user_chroot",
         false,
         true,
         [](const Json::Value& on) { EXPECT_EQ(rootOf("alice") == homeOnly, on.asBool()); },
         {},
         {}},
        {"security",
         "enable_umask",
         false,
         true,
         [](const Json::Value& on) {
             FtpSession session = aliceAt();
             std::filesystem::remove("/mnt/home/alice/sent");
             EXPECT_EQ(session.send("STOR sent", "x"), 226);
             EXPECT_EQ(modeOf("/mnt/home/alice/sent"), on.asBool() ? 0644U : 0666U);
         },
         {},
         {}},
    });
}

TEST_F(HostOther, shares) {
    const Json::Value expected = jsonOf(R"({"share": ["public", "music", "upload", "closed"]})");
    EXPECT_EQ(jsonOf(done({"shares", "--json"})), expected);
    EXPECT_EQ(curl(securityApi + std::string("list_ftp_share")).json, expected);
    EXPECT_EQ(done({"shares"}), "SHARE\npublic\nmusic\nupload\nclosed\n");
}

TEST_F(HostOther, confinedUsers) {
    done({"security", "set", "user_chroot=off"});
    const std::string open = rootOf("alice");
    EXPECT_NE(open, homeOnly);
    // A session of before may be about to end.
    EXPECT_EQ(done({"chroot", "users", "add", "alice", "--keep-sessions"}),
              "chroot_rules: add user alice /home\n");
    EXPECT_EQ(rootOf("alice"), homeOnly);
    EXPECT_EQ(curl(usersApi + std::string("add"), R"({"id": ["bob"]})").status, 200);
    EXPECT_EQ(rootOf("bob"), homeOnly);
    Json::Value listed = curl(usersApi + std::string("list"), R"({"chroot": true})").json;
    EXPECT_EQ(listed["total"], 2);
    listed["user_chroot"] = false;
    EXPECT_EQ(listed, jsonOf(done({"chroot", "users", "list", "--json"})));
    EXPECT_EQ(
        jsonOf(done({"chroot", "users", "list", "--others", "--filter", "car", "--json"}))["user"][0]["name"],
        "carol");
    EXPECT_EQ(curl(usersApi + std::string("delete"), R"({"id": ["alice"]})").status, 204);
    EXPECT_EQ(rootOf("alice"), open);
    EXPECT_EQ(done({"chroot", "users", "delete", "bob", "--keep-sessions"}),
              "chroot_rules: remove user bob /home\n");
    EXPECT_EQ(rootOf("bob"), open);
}

TEST_F(HostOther, aDryRunCountsTheSessionsOfNow) {
    const auto wouldEnd = [](int sessions) {
        const ProcessResult plan = veltctl({"chroot", "users", "add", "bob", "--dry-run", "--json"});
        return jsonOf(plan.output)["sessions_ended"] == sessions;
    };
    const auto settlesAt = [&](int sessions) {
        return waitUntil([&] { return wouldEnd(sessions); }, patience); // one of before may be about to end
    };
    EXPECT_TRUE(settlesAt(0));
    const FtpSession first = aliceAt();
    EXPECT_TRUE(settlesAt(1));
    const FtpSession second = aliceAt();
    EXPECT_TRUE(wouldEnd(2));
}

TEST_F(HostOther, aChangeOfRulesEndsTheSessionsUnlessToldNotTo) {
    const auto survives = [](const Words& change) {
        FtpSession session = aliceAt();
        EXPECT_EQ(session.command("NOOP").code, 200);
        done(change);
        return session.command("NOOP").code == 200;
    };
    EXPECT_TRUE(survives({"chroot", "users", "add", "bob", "--keep-sessions"}));
    EXPECT_FALSE(survives({"chroot", "users", "delete", "bob"}));
    EXPECT_FALSE(survives({"chroot", "users", "add", "bob", "--end-sessions"}));
}

TEST_F(HostOther, rules) {
    done({"security", "set", "user_chroot=off"});
    const std::string open = rootOf("bob");
    done({"chroot", "rules", "add", "group", "staff", "/public"});
    done({"chroot", "rules", "add", "user", "alice", "/home"});
    EXPECT_EQ(rootOf("bob"), "about\r\n");
    EXPECT_EQ(rootOf("alice"), homeOnly);
    EXPECT_EQ(rootOf("carol"), open);
    const Json::Value loaded = curl(rulesApi + std::string("load")).json;
    EXPECT_EQ(loaded["total"], 2);
    EXPECT_EQ(loaded, jsonOf(done({"chroot", "rules", "load", "--json"})));
    EXPECT_EQ(curl(rulesApi + std::string("save"),
                   R"({"rules": [{"type": "user", "name": "carol", "path": "/upload"}]})")
                  .status,
              204);
    EXPECT_EQ(rootOf("carol"), "about\r\n");
    EXPECT_EQ(rootOf("bob"), open);
    done({"chroot", "rules", "save", "-"}, R"([{"type": "user", "name": "bob", "path": "/home"}])");
    EXPECT_EQ(rootOf("bob"), homeOnly);
    EXPECT_EQ(rootOf("carol"), open);
    done({"chroot", "rules", "remove", "user", "bob"});
    EXPECT_EQ(rootOf("bob"), open);
}

TEST_F(HostOther, sftp) {
    furnishSftp();
    check({
        {"sftp",
         "enable",
         true,
         false,
         [](const Json::Value& on) { EXPECT_EQ(servesSftp(2222), on.asBool()); },
         {},
         {}},
        {"sftp",
         "portnum",
         2223,
         2224,
         [](const Json::Value& at) {
             EXPECT_TRUE(servesSftp(at.asInt()));
             EXPECT_FALSE(isListening(2222));
             EXPECT_FALSE(isListening(at == 2223 ? 2224 : 2223));
         },
         {"enable=on"},
         {}},
    });
}

} // namespace
} // namespace velt::test
