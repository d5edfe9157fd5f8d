// What grants let be changed in shares, over each protocol.
#include "tests/support/files.h"
#include "tests/system/support/each_protocol.h"

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr auto none = Access::none;
constexpr auto read = Access::read;
constexpr auto write = Access::write;

class ShareChanges : public EachProtocol {
protected:
    /// With what each change needs.
    fs::path furnished(const std::string& name, const Grants& users, const std::string& path = {}) {
        const auto folder = share(name, users, {}, path);
        fs::create_directory(folder / "sub");
        EXPECT_EQ(chmod((folder / "sub").c_str(), 0777), 0);
        return folder;
    }
    static void expectUntouched(const fs::path& folder) {
        EXPECT_EQ(contentsOf(folder / "file"), folder.filename());
        EXPECT_EQ(modeOf(folder / "file"), 0666U);
        EXPECT_EQ(std::distance(fs::directory_iterator(folder), {}), 2);
        EXPECT_TRUE(fs::is_empty(folder / "sub"));
        EXPECT_GT(fs::last_write_time(folder / "file"),
                  fs::file_time_type::clock::now() - std::chrono::hours(1));
    }
};

TEST_P(ShareChanges, areAllMadeWhereWritingIsGranted) {
    const auto folder = furnished("rw", {{"alice", write}});
    start();
    const auto session = logIn();
    for (const Change& change : allChanges()) {
        EXPECT_EQ(change.make(*session, "/rw"), change.overFtp || !overFtp()) << change.name;
    }
    EXPECT_FALSE(fs::exists(folder / "file"));
    EXPECT_FALSE(fs::exists(folder / "sub"));
    EXPECT_EQ(fs::exists(folder / "twin"), !overFtp());
}

TEST_P(ShareChanges, areNoneWhereReadingIsGranted) {
    const auto folder = furnished("ro", {{"alice", read}});
    start();
    const auto session = logIn();
    for (const Change& change : allChanges()) {
        EXPECT_FALSE(change.make(*session, "/ro")) << change.name;
    }
    EXPECT_EQ(session->read("/ro/file"), "ro");
    expectUntouched(folder);
}

TEST_P(ShareChanges, areNoneWhereNothingIsGranted) {
    const auto folder = furnished("no", {{"alice", none}});
    const auto silent = furnished("silent", {});
    furnished("outer", {{"alice", write}});
    const auto inner = furnished("inner", {{"alice", none}}, "/mnt/srv/outer/a/inner");
    start();
    const auto session = logIn();
    for (const char* path : {"/no", "/silent", "/inner", "/outer/a/inner"}) {
        for (const Change& change : allChanges()) {
            EXPECT_FALSE(change.make(*session, path)) << change.name << " in " << path;
        }
    }
    for (const fs::path& closed : {folder, silent, inner}) {
        expectUntouched(closed);
    }
}

TEST_P(ShareChanges, areNoneInTheFolderOfAnInnerShareForReading) {
    furnished("outer", {{"alice", write}});
    const auto inner = furnished("inner", {{"alice", read}}, "/mnt/srv/outer/a/inner");
    start();
    const auto session = logIn();
    for (const char* path : {"/inner", "/outer/a/inner"}) {
        for (const Change& change : allChanges()) {
            EXPECT_FALSE(change.make(*session, path)) << change.name << " in " << path;
        }
        EXPECT_EQ(session->read(std::string(path) + "/file"), "inner");
    }
    expectUntouched(inner);
}

TEST_P(ShareChanges, moveFilesFromAShareOnlyWhereTheyMayBeRemoved) {
    const auto writable = share("rw", {{"alice", write}});
    const auto readable = share("ro", {{"alice", read}});
    const auto other = share("rw2", {{"alice", write}});
    start();
    const auto session = logIn();
    for (const auto move : {&FileClient::rename, &FileClient::replace, &FileClient::hardLink}) {
        EXPECT_FALSE((*session.*move)("/rw/file", "/ro/stolen"));
        EXPECT_FALSE((*session.*move)("/ro/file", "/rw/taken"));
    }
    EXPECT_FALSE(fs::exists(readable / "stolen"));
    EXPECT_FALSE(fs::exists(writable / "taken")) << "not even a copy";
    EXPECT_EQ(contentsOf(readable / "file"), "ro");
    // FTP copies what the kernel cannot move, and its daemon then removes it; that of SFTP leaves it alone.
    EXPECT_EQ(session->rename("/rw/file", "/rw2/moved"), overFtp());
    EXPECT_EQ(fs::exists(writable / "file"), !overFtp());
    EXPECT_EQ(contentsOf(other / "moved"), overFtp() ? "rw" : "");
    EXPECT_FALSE(session->hardLink("/rw2/file", "/rw/twin"));
}

TEST_P(ShareChanges, giveNoSecondNameToAFileThatMayNotBeChanged) {
    const auto folder = share("rw", {{"alice", write}});
    writeFile(folder / "theirs", "theirs", bobId);
    EXPECT_EQ(chmod((folder / "theirs").c_str(), 0644), 0);
    start();
    const auto session = logIn();
    EXPECT_FALSE(session->hardLink("/rw/theirs", "/rw/twin"));
    EXPECT_TRUE(session->rename("/rw/theirs", "/rw/renamed")) << "the folder is hers";
    EXPECT_EQ(contentsOf(folder / "renamed"), "theirs");
}

TEST_P(ShareChanges, leadNowhereByLinks) {
    const auto folder = share("rw", {{"alice", write}});
    share("ro", {{"alice", read}});
    share("no", {{"alice", none}});
    start();
    const auto session = logIn();
    for (const char* target : {"/etc/passwd", "/mnt/srv/no/file", "../../no/file", "/no/file"}) {
        // FTP makes none, so an administrator does.
        if (!session->symbolicLink(target, "/rw/link")) {
            ASSERT_TRUE(overFtp());
            fs::create_symlink(target, folder / "link");
        }
        EXPECT_EQ(fs::read_symlink(folder / "link"), target);
        EXPECT_FALSE(session->read("/rw/link")) << target;
        EXPECT_FALSE(session->enter("/rw/link")) << target;
        fs::remove(folder / "link");
    }
    fs::create_symlink("/ro/file", folder / "within");
    EXPECT_EQ(session->read("/rw/within"), "ro") << "what she may read anyway";
    EXPECT_FALSE(session->write("/rw/within", "x"));
    EXPECT_FALSE(session->setMode("/rw/within", 0600));
    EXPECT_FALSE(session->cut("/rw/within"));
    EXPECT_EQ(contentsOf("/mnt/srv/ro/file") + contentsOf("/mnt/srv/no/file"), "rono");
}

TEST_P(ShareChanges, leaveInnerSharesWhereTheyAre) {
    share("outer", {{"alice", write}, {"bob", write}});
    share("inner", {{"alice", none}, {"bob", write}}, {}, "/mnt/srv/outer/a/inner");
    EXPECT_EQ(chmod("/mnt/srv/outer/a", 0777), 0);
    start();
    for (const char* user : {"alice", "bob"}) {
        const auto session = logIn(user);
        for (const char* folder : {"/outer/a", "/outer/a/inner"}) {
            EXPECT_FALSE(session->rename(folder, "/outer/b")) << user << folder;
            EXPECT_FALSE(session->replace(folder, "/outer/b")) << user << folder;
            EXPECT_FALSE(session->removeFolder(folder)) << user << folder;
        }
        EXPECT_FALSE(logIn()->read("/outer/b/file"));
        EXPECT_FALSE(logIn()->read("/outer/b/inner/file"));
        EXPECT_FALSE(logIn()->read("/outer/a/inner/file"));
    }
    EXPECT_FALSE(fs::exists("/mnt/srv/outer/b"));
}

TEST_P(ShareChanges, goByTheGrantsOfTheLogin) {
    share("data", {{"alice", write}});
    start();
    const auto session = logIn();
    entry("data").users["alice"] = read;
    store();
    EXPECT_TRUE(session->write("/data/still", "x"));
    EXPECT_FALSE(logIn()->write("/data/new", "x"));
    entry("data").users["alice"] = none;
    store();
    EXPECT_EQ(rootOf("alice"), "");
    EXPECT_EQ(session->read("/data/file"), "data");
}

VELT_OVER_EACH_PROTOCOL(ShareChanges);

} // namespace
} // namespace velt::test
