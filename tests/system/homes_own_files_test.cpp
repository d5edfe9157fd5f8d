// What nobody changes over either protocol: the files of a home that logins, mail and shells obey.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/each_protocol.h"

namespace velt::test {
namespace {
namespace fs = std::filesystem;

const fs::path home = "/mnt/home/alice";

class HomesOwnFiles : public EachProtocol {
protected:
    static void makeFolder(const fs::path& folder) {
        fs::create_directories(folder);
        EXPECT_EQ(chown(folder.c_str(), aliceId, aliceId), 0);
    }
    /// Has links in the home lead to what else lies there.
    static void layLinks() {
        for (const char* folder : {"dots/fish", "dots", ".ssh", ".config"}) {
            makeFolder(home / folder);
        }
        for (const char* name : {"keys", "rc", "fish/config"}) {
            writeFile(home / "dots" / name, name, aliceId);
        }
        fs::create_symlink("../dots/keys", home / ".ssh/authorized_keys");
        fs::create_symlink("dots/rc", home / ".bashrc.local");
        fs::create_directory_symlink("../dots/fish", home / ".config/fish");
    }
    static void expectNoMove(FileClient& client, const std::string& from, const std::string& to) {
        EXPECT_FALSE(client.rename(from, to)) << from << " to " << to;
        EXPECT_FALSE(client.replace(from, to)) << from << " to " << to;
    }
    static void expectNotMade(FileClient& client, const std::string& path) {
        EXPECT_FALSE(client.write(path, "x")) << path;
        EXPECT_FALSE(client.append(path, "x")) << path;
        EXPECT_FALSE(client.makeFolder(path)) << path;
        EXPECT_FALSE(client.open(path, FileClient::Opening::toWrite)) << path;
        EXPECT_FALSE(client.symbolicLink("/home-of", path)) << path;
        EXPECT_FALSE(client.hardLink("/home-of", path)) << path;
        expectNoMove(client, "/home-of", path);
    }
    static void expectNotChanged(FileClient& client, const std::string& path) {
        EXPECT_FALSE(client.setMode(path, 0777)) << path;
        EXPECT_FALSE(client.setTimes(path, 1000)) << path;
        EXPECT_FALSE(client.cut(path)) << path;
        EXPECT_FALSE(client.remove(path)) << path;
        EXPECT_FALSE(client.removeFolder(path)) << path;
        EXPECT_FALSE(client.hardLink(path, "/twin")) << path;
        expectNoMove(client, path, "/moved");
        EXPECT_FALSE(client.open(path, FileClient::Opening::toRead) && client.setModeOfOpen(0777)) << path;
    }
};

TEST_P(HomesOwnFiles, areNeitherMadeNorChanged) {
    makeFolder(home / ".ssh");
    makeFolder(home / ".empty");
    writeFile(home / ".ssh/authorized_keys", "key", aliceId);
    EXPECT_EQ(chmod((home / ".ssh/authorized_keys").c_str(), 0644), 0);
    fs::create_directory_symlink(".ssh", home / "keys");
    fs::create_symlink(".ssh/authorized_keys", home / "key");
    record.user_chroot = 1;
    start();
    const auto session = logIn();
    EXPECT_EQ(session->read("/.ssh/authorized_keys"), "key");
    EXPECT_EQ(session->read("/keys/authorized_keys"), "key");
    EXPECT_EQ(namesIn(*session, "/.ssh"), "authorized_keys");
    for (const char* path : {"/.ssh/authorized_keys", "/.ssh/new", "/keys/authorized_keys", "/keys/new",
                             "/.profile", "/.BASHRC", "/.config", "/bin", "/etc", "/lib", "/x/../.rhosts"}) {
        expectNotMade(*session, path);
    }
    for (const char* path : {"/.ssh/authorized_keys", "/.ssh", "/.empty", "/keys/authorized_keys"}) {
        expectNotChanged(*session, path);
    }
    EXPECT_FALSE(session->write("/key", "x"));
    EXPECT_FALSE(session->cut("/key"));
    EXPECT_FALSE(session->setMode("/key", 0777));
    EXPECT_EQ(contentsOf(home / ".ssh/authorized_keys"), "key");
    EXPECT_EQ(modeOf(home / ".ssh/authorized_keys"), 0644U);
    EXPECT_EQ(std::distance(fs::directory_iterator(home), {}), 5);
}

// A name that is free is as good as any other.
TEST_P(HomesOwnFiles, leaveTheRestOfTheHomeAlone) {
    record.user_chroot = 1;
    start();
    const auto session = logIn();
    for (const std::string path : {"/profile", "/sshx", "/.letter.part", "/._letter"}) {
        EXPECT_TRUE(session->write(path, "x")) << path;
        EXPECT_TRUE(session->append(path, "y")) << path;
        EXPECT_TRUE(session->setMode(path, 0600)) << path;
        EXPECT_EQ(contentsOf(home / path.substr(1)), "xy") << path;
        EXPECT_TRUE(session->rename(path, "/2")) << path;
        EXPECT_TRUE(session->remove("/2")) << path;
    }
    EXPECT_TRUE(session->makeFolder("/site"));
    EXPECT_TRUE(session->write("/site/.profile", "x")) << "only the home's own";
}

TEST_P(HomesOwnFiles, areKeptBehindLinks) {
    makeFolder(home / "dots/ssh");
    makeFolder(home / "dots");
    writeFile(home / "dots/bashrc", "start", aliceId);
    fs::create_symlink("dots/bashrc", home / ".bashrc");
    fs::create_directory_symlink("way", home / ".ssh");
    fs::create_directory_symlink("dots/ssh", home / "way");
    record.user_chroot = 1;
    start();
    const auto session = logIn();
    EXPECT_FALSE(session->write("/dots/bashrc", "x"));
    EXPECT_FALSE(session->write("/dots/ssh/authorized_keys", "x"));
    EXPECT_FALSE(session->write("/way/authorized_keys", "x"));
    EXPECT_FALSE(session->remove("/way"));
    EXPECT_FALSE(session->remove("/dots/bashrc"));
    expectNoMove(*session, "/way", "/away");
    expectNoMove(*session, "/dots", "/away");
    expectNoMove(*session, "/home-of", "/dots/bashrc");
    EXPECT_TRUE(session->write("/dots/other", "x"));
    EXPECT_EQ(contentsOf(home / "dots/bashrc"), "start");
}

TEST_P(HomesOwnFiles, areKeptWhereAShareHoldsTheHome) {
    const auto homes = share("homes", {{"alice", Access::write}}, {}, "/mnt/home");
    share("rw", {{"alice", Access::write}});
    makeFolder(home / ".config");
    share("config", {{"alice", Access::write}}, {}, home / ".config");
    start();
    const auto session = logIn();
    EXPECT_FALSE(session->write("/homes/alice/.bashrc", "x"));
    EXPECT_FALSE(session->makeFolder("/homes/alice/.ssh"));
    expectNoMove(*session, "/rw/file", "/homes/alice/.bashrc");
    EXPECT_FALSE(session->write("/config/new", "x"));
    EXPECT_FALSE(session->makeFolder("/config/new"));
    expectNoMove(*session, "/homes/alice", "/homes/away");
    EXPECT_FALSE(session->removeFolder("/homes/alice"));
    EXPECT_TRUE(session->write("/homes/alice/new", "x"));
    EXPECT_TRUE(session->write("/homes/.bashrc", "x")) << "no home";
    EXPECT_TRUE(session->write("/rw/.bashrc", "x"));
    EXPECT_TRUE(fs::is_directory(home));
    for (const char* made : {".bashrc", "file"}) {
        fs::remove(homes / made);
    }
}

TEST_P(HomesOwnFiles, areNotMadeInAHomeThatWasMissingAtTheLogin) {
    share("homes", {{"alice", Access::write}}, {}, "/mnt/home");
    fs::rename(home, "/mnt/away");
    start();
    const auto session = logIn();
    ASSERT_TRUE(session->makeFolder("/homes/prepared"));
    ASSERT_TRUE(session->makeFolder("/homes/prepared/.ssh")) << "no home";
    ASSERT_TRUE(session->write("/homes/prepared/.ssh/authorized_keys", "key"));
    expectNoMove(*session, "/homes/prepared", "/homes/alice");
    EXPECT_FALSE(session->makeFolder("/homes/alice"));
    EXPECT_FALSE(fs::exists(home));
    makeFolder(home);
    EXPECT_FALSE(session->makeFolder("/homes/alice/.ssh"));
    expectNoMove(*session, "/homes/prepared/.ssh", "/homes/alice/.ssh");
    expectNoMove(*session, "/homes/prepared", "/homes/alice");
    EXPECT_FALSE(session->write("/homes/alice/.profile", "x"));
    EXPECT_TRUE(session->write("/homes/alice/new", "x"));
    EXPECT_EQ(std::distance(fs::directory_iterator(home), {}), 1);
    fs::remove_all("/mnt/away");
    fs::remove_all("/mnt/home/prepared");
}

TEST_P(HomesOwnFiles, areNotMadeInAHomeThatIsExchanged) {
    share("homes", {{"alice", Access::write}}, {}, "/mnt/home");
    start();
    const auto session = logIn();
    EXPECT_FALSE(session->makeFolder("/homes/alice/.ssh"));
    fs::rename(home, "/mnt/home/former");
    makeFolder(home);
    EXPECT_FALSE(session->makeFolder("/homes/alice/.ssh"));
    EXPECT_FALSE(session->write("/homes/alice/.bashrc", "x"));
    expectNoMove(*session, "/homes/alice", "/homes/away");
    EXPECT_TRUE(fs::is_empty(home));
    EXPECT_TRUE(session->write("/homes/alice/new", "x"));
    fs::remove_all("/mnt/home/former");
}

TEST_P(HomesOwnFiles, areKnownWhereTheUserCannotLook) {
    share("rw", {{"alice", Access::write}});
    share("homes", {{"alice", Access::write}}, {}, home);
    start();
    const auto session = logIn();
    fs::permissions("/mnt/home", fs::perms(0700));
    fs::permissions(worldRoot / "etc/velt", fs::perms(0700));
    EXPECT_TRUE(session->write("/rw/new", "x"));
    EXPECT_TRUE(session->makeFolder("/rw/made"));
    EXPECT_FALSE(session->makeFolder("/homes/.ssh"));
    fs::permissions("/mnt/home", fs::perms(0755));
}

TEST_P(HomesOwnFiles, areThoseOfTheHomeOnly) {
    const auto outer = share("outer", {{"alice", Access::write}});
    makeFolder(home / ".ssh");
    start();
    storeRules({"u:1001:/outer"});
    fs::create_directory_symlink("/mnt/home/alice/.ssh", outer / "out");
    const auto session = logIn();
    EXPECT_TRUE(session->write("/.bashrc", "x")) << "a rule leads elsewhere than home";
    EXPECT_FALSE(session->write("/out/authorized_keys", "x"));
}

TEST_P(HomesOwnFiles, areKnownInAHomeThatHoldsManyFiles) {
    layLinks();
    for (int i = 0; i < 100001; i++) { // more than may be looked at
        const std::string number = std::to_string(i);
        writeFile(home / ("junk" + number), "", aliceId);
        writeFile(home / ("._junk" + number), "", aliceId);
    }
    record.user_chroot = 1;
    start();
    const auto session = logIn();
    for (const std::string name : {"keys", "rc"}) {
        EXPECT_FALSE(session->write("/dots/" + name, "x")) << name;
        EXPECT_EQ(contentsOf(home / "dots" / name), name);
    }
    EXPECT_FALSE(session->rename("/dots", "/away"));
    EXPECT_TRUE(session->write("/dots/free", "x"));
}

TEST_P(HomesOwnFiles, keepALoginOutWhereTheyCannotAllBeLookedAt) {
    makeFolder(home / ".config/crowded");
    for (int i = 0; i < 100001; i++) {
        writeFile(home / ".config/crowded" / std::to_string(i), "", aliceId);
    }
    record.user_chroot = 1;
    start();
    EXPECT_TRUE(isRefused("alice"));
    EXPECT_TRUE(contains(DaemonProcess::output(), "more than 100000 entries in /mnt/home/alice/.config"))
        << DaemonProcess::output();
    EXPECT_FALSE(isRefused("bob"));
    fs::remove_all(home / ".config");
    EXPECT_FALSE(isRefused("alice"));
}

TEST_P(HomesOwnFiles, areKeptAsTheirOwnerSavesThem) {
    layLinks();
    record.user_chroot = 1;
    start();
    const auto session = logIn();
    const auto expectKept = [&](const std::string& when) {
        for (const std::string name : {"keys", "rc", "fish/config"}) {
            EXPECT_FALSE(session->write("/dots/" + name, "x")) << name << when;
            expectNoMove(*session, "/dots/" + name, "/away");
            expectNoMove(*session, "/home-of", "/dots/" + name);
        }
        expectNoMove(*session, "/dots", "/away");
    };
    expectKept(" at first");
    for (const char* name : {"keys", "rc"}) {
        writeFile(home / "dots/new", name, aliceId);
        fs::rename(home / "dots/new", home / "dots" / name);
    }
    fs::rename(home / "dots/fish", home / "dots/former");
    makeFolder(home / "dots/fish");
    writeFile(home / "dots/fish/config", "fish", aliceId);
    expectKept(" when they are replaced");
    EXPECT_TRUE(session->write("/dots/free", "x"));
    fs::rename(home / "dots", home / "former");
    fs::copy(home / "former", home / "dots", fs::copy_options::recursive);
    for (const auto& entry : fs::recursive_directory_iterator(home / "dots")) {
        EXPECT_EQ(chown(entry.path().c_str(), aliceId, aliceId), 0);
    }
    EXPECT_EQ(chown((home / "dots").c_str(), aliceId, aliceId), 0);
    expectKept(" when the folder around them is exchanged");
}

VELT_OVER_EACH_PROTOCOL(HomesOwnFiles);

} // namespace
} // namespace velt::test
