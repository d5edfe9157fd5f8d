// Sessions that began before the shares or the chroot rules were changed.
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/shared_folders.h"

#include <functional>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr auto none = Access::none;
constexpr auto write = Access::write;

class OldSessions : public SharedFolders {
protected:
    void SetUp() override {
        SharedFolders::SetUp();
        outer = share("outer", {{"alice", write}});
        makeFolder("a");
        start();
    }

    void makeFolder(const std::string& name) const {
        fs::create_directories(outer / name);
        EXPECT_EQ(chmod((outer / name).c_str(), 0777), 0);
    }
    /// What two commands, sent one after the other, come to in the end.
    static int move(FtpSession& session, const std::string& from, const std::string& to) {
        const int known = session.command("RNFR " + from).code;
        return known == 350 ? session.command("RNTO " + to).code : known;
    }
    /// The code for a command in a session that was older than the last change of the shares.
    Reply oldSessionSays(const std::string& command) {
        FtpSession session(port);
        EXPECT_EQ(session.logIn("alice"), 230);
        store();
        return session.command(command);
    }

    fs::path outer;
};

TEST_F(OldSessions, openNothingOfALaterShareToLaterLogins) {
    std::vector<FtpSession> sessions;
    for (int i = 0; i < 3; i++) {
        ASSERT_EQ(sessions.emplace_back(port).logIn("alice"), 230);
    }
    share("inner", {{"alice", none}}, {}, outer / "a/inner");
    EXPECT_EQ(move(sessions[0], "/outer/a", "/outer/c"), 421);
    EXPECT_EQ(sessions[1].command("MKD /outer/a").code, 421);
    EXPECT_EQ(sessions[2].command("MKD /outer/a/inner").code, 421);
    EXPECT_EQ(seenBy("alice", "/outer"), "a file");
    FtpSession later(port);
    ASSERT_EQ(later.logIn("alice"), 230);
    EXPECT_FALSE(later.receive("RETR /outer/a/inner/file"));
    EXPECT_FALSE(later.receive("RETR /outer/c/inner/file"));
    EXPECT_EQ(later.send("STOR /outer/c/inner/new", "x"), 550);
    EXPECT_EQ(contentsOf(outer / "a/inner/file"), "inner");
}

TEST_F(OldSessions, putNoOtherFolderInThePlaceOfARules) {
    makeFolder("b");
    writeFile(outer / "b/secret", "secret", aliceId);
    FtpSession first(port);
    FtpSession second(port);
    ASSERT_EQ(first.logIn("alice"), 230);
    ASSERT_EQ(second.logIn("alice"), 230);
    storeRules({"u:1001:/outer/a"});
    EXPECT_EQ(move(first, "/outer/a", "/outer/c"), 421);
    EXPECT_EQ(move(second, "/outer/b", "/outer/a"), 421);
    FtpSession later(port);
    ASSERT_EQ(later.logIn("alice"), 230);
    EXPECT_FALSE(later.receive("RETR secret"));
}

TEST_F(OldSessions, endWhereNamesWouldChange) {
    writeFile(outer / "old", "", aliceId);
    for (const char* command :
         {"MKD /outer/new", "XMKD /outer/new", "RMD /outer/a", "XRMD /outer/a", "DELE /outer/old"}) {
        const Reply reply = oldSessionSays(command);
        EXPECT_EQ(reply.code, 421) << command;
        EXPECT_TRUE(contains(reply.text, "The shares or rules have changed: log in again.")) << reply.text;
    }
    EXPECT_EQ(seenBy("alice", "/outer"), "a file old");
    EXPECT_TRUE(
        contains(DaemonProcess::output(), "session of 'alice' ended: the shares or rules have changed"));
}

TEST_F(OldSessions, goOnReadingAndWritingFiles) {
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    entry("outer").users["alice"] = none;
    store();
    EXPECT_EQ(session.receive("RETR /outer/file"), "outer");
    EXPECT_EQ(session.send("STOR /outer/new", "x"), 226);
    EXPECT_EQ(session.send("APPE /outer/new", "y"), 226);
    EXPECT_EQ(session.command("SITE CHMOD 600 /outer/new").code, 200);
    ASSERT_EQ(session.command("CWD /outer/a").code, 250);
    EXPECT_EQ(session.send("STOU", "x"), 226);
    EXPECT_EQ(contentsOf(outer / "new"), "xy");
    EXPECT_EQ(session.command("MKD new").code, 421);
    EXPECT_EQ(seenBy("alice"), "");
}

TEST_F(OldSessions, areThoseFromBeforeAnyOfTheFilesWasTouched) {
    const fs::path shares = statePath(paths::shares);
    const fs::path rules = statePath(paths::chrootRules);
    const std::string text = contentsOf(rules);
    const std::vector<std::function<void()>> changes{
        [&] { fs::last_write_time(shares, fs::file_time_type::clock::now()); },
        [&] { fs::remove(shares); },
        [&] { store(); },
        [&] { writeFile(rules, text); },
        [&] {
            const fs::path folder = shares.parent_path();
            fs::rename(folder, folder.string() + ".away");
            fs::copy(folder.string() + ".away", folder, fs::copy_options::recursive);
        },
        [&] { fs::rename(rules, rules.string() + ".away"); },
    };
    for (const auto& change : changes) {
        FtpSession session(port);
        ASSERT_EQ(session.logIn("alice"), 230);
        change();
        const int code = session.command("MKD /outer/new").code;
        EXPECT_EQ(code, 421) << &change - changes.data();
        EXPECT_FALSE(fs::exists(outer / "new"));
    }
}

TEST_F(OldSessions, areNoneWhileNothingChanges) {
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    writeFile(statePath(paths::shares).string() + ".new", "x");
    EXPECT_EQ(session.command("MKD /outer/new").code, 257);
    EXPECT_EQ(move(session, "/outer/new", "/outer/newer"), 250);
    EXPECT_EQ(session.command("RMD /outer/newer").code, 250);
    EXPECT_EQ(session.command("DELE /outer/file").code, 250);
}

} // namespace
} // namespace velt::test
