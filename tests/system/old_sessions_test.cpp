// Sessions that began before the shares or the chroot rules were changed, over each protocol.
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/each_protocol.h"

#include <functional>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr auto none = Access::none;
constexpr auto write = Access::write;

class OldSessions : public EachProtocol {
protected:
    void SetUp() override {
        EachProtocol::SetUp();
        outer = share("outer", {{"alice", write}});
        makeFolder("a");
        start();
    }

    void makeFolder(const std::string& name) const {
        fs::create_directories(outer / name);
        EXPECT_EQ(chmod((outer / name).c_str(), 0777), 0);
    }

    fs::path outer;
};

/// Whether that was refused, and ended the session.
bool ends(FileClient& client, bool done) {
    return !done && client.hasEnded();
}

TEST_P(OldSessions, openNothingOfALaterShareToLaterLogins) {
    std::vector<std::unique_ptr<FileClient>> sessions;
    for (int i = 0; i < 4; i++) {
        sessions.push_back(logIn());
    }
    share("inner", {{"alice", none}}, {}, outer / "a/inner");
    EXPECT_TRUE(ends(*sessions[0], sessions[0]->rename("/outer/a", "/outer/c")));
    EXPECT_TRUE(ends(*sessions[1], sessions[1]->makeFolder("/outer/a/b")));
    EXPECT_TRUE(ends(*sessions[2], sessions[2]->makeFolder("/outer/a/inner/b")));
    EXPECT_EQ(ends(*sessions[3], sessions[3]->replace("/outer/a", "/outer/c")), !overFtp());
    const auto later = logIn();
    EXPECT_EQ(namesIn(*later, "/outer"), "a file");
    EXPECT_FALSE(later->read("/outer/a/inner/file"));
    EXPECT_FALSE(later->read("/outer/c/inner/file"));
    EXPECT_FALSE(later->write("/outer/c/inner/new", "x"));
    EXPECT_EQ(contentsOf(outer / "a/inner/file"), "inner");
}

TEST_P(OldSessions, putNoOtherFolderInThePlaceOfARules) {
    makeFolder("b");
    writeFile(outer / "b/secret", "secret", aliceId);
    const auto first = logIn();
    const auto second = logIn();
    storeRules({"u:1001:/outer/a"});
    EXPECT_TRUE(ends(*first, first->rename("/outer/a", "/outer/c")));
    EXPECT_TRUE(ends(*second, second->rename("/outer/b", "/outer/a/b")));
    EXPECT_FALSE(logIn()->read("/secret"));
}

TEST_P(OldSessions, endWhereNamesWouldChange) {
    writeFile(outer / "old", "", aliceId);
    const std::vector<Change> changes{
        {"make a folder", true, [](auto& to, auto& at) { return to.makeFolder(at + "/new"); }},
        {"remove a folder", true, [](auto& to, auto& at) { return to.removeFolder(at + "/a"); }},
        {"remove", true, [](auto& to, auto& at) { return to.remove(at + "/old"); }},
        {"rename", true, [](auto& to, auto& at) { return to.rename(at + "/old", at + "/new"); }},
        {"replace", false, [](auto& to, auto& at) { return to.replace(at + "/old", at + "/new"); }},
        {"link", false, [](auto& to, auto& at) { return to.hardLink(at + "/old", at + "/new"); }},
        {"symlink", false, [](auto& to, auto& at) { return to.symbolicLink("old", at + "/new"); }},
    };
    for (const Change& change : changes) {
        const auto session = logIn();
        store();
        EXPECT_EQ(ends(*session, change.make(*session, "/outer")), change.overFtp || !overFtp())
            << change.name;
    }
    EXPECT_EQ(namesIn(*logIn(), "/outer"), "a file old");
    EXPECT_TRUE(
        contains(DaemonProcess::output(), "session of 'alice' ended: the shares or rules have changed"));
}

TEST_P(OldSessions, goOnReadingAndWritingFiles) {
    const auto session = logIn();
    entry("outer").users["alice"] = none;
    store();
    EXPECT_EQ(session->read("/outer/file"), "outer");
    EXPECT_TRUE(session->write("/outer/new", "x"));
    EXPECT_TRUE(session->append("/outer/new", "y"));
    EXPECT_TRUE(session->setMode("/outer/new", 0600));
    EXPECT_EQ(contentsOf(outer / "new"), "xy");
    EXPECT_TRUE(ends(*session, session->makeFolder("/outer/a/new")));
    EXPECT_EQ(rootOf("alice"), "");
}

TEST_P(OldSessions, areThoseFromBeforeAnyOfTheFilesWasTouched) {
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
        const auto session = logIn();
        change();
        EXPECT_TRUE(ends(*session, session->makeFolder("/outer/new"))) << &change - changes.data();
        EXPECT_FALSE(fs::exists(outer / "new"));
    }
}

TEST_P(OldSessions, areNoneWhileNothingChanges) {
    const auto session = logIn();
    writeFile(statePath(paths::shares).string() + ".new", "x");
    EXPECT_TRUE(session->makeFolder("/outer/new"));
    EXPECT_TRUE(session->rename("/outer/new", "/outer/newer"));
    EXPECT_TRUE(session->removeFolder("/outer/newer"));
    EXPECT_TRUE(session->remove("/outer/file"));
}

VELT_OVER_EACH_PROTOCOL(OldSessions);

// SFTP has no words for it, and the daemon's log does.
class OldFtpSessions : public SharedFolders {};

TEST_F(OldFtpSessions, areToldWhyTheyEnd) {
    share("outer", {{"alice", write}});
    FtpService::start();
    for (const char* command :
         {"MKD /outer/new", "XMKD /outer/new", "RMD /outer/a", "XRMD /outer/a", "DELE /outer/file"}) {
        FtpSession session(port);
        ASSERT_EQ(session.logIn("alice"), 230);
        store();
        const Reply reply = session.command(command);
        EXPECT_EQ(reply.code, 421) << command;
        EXPECT_TRUE(contains(reply.text, "The shares or rules have changed: log in again.")) << reply.text;
    }
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    store();
    ASSERT_EQ(session.command("CWD /outer").code, 250);
    EXPECT_EQ(session.send("STOU", "x"), 226) << "no name is changed";
}

} // namespace
} // namespace velt::test
