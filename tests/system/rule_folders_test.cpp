// What nobody moves, over either protocol: the folders that chroot rules of others lead to.
#include "tests/support/files.h"
#include "tests/system/support/each_protocol.h"

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr Access write = Access::write;

class RuleFolders : public EachProtocol {
protected:
    void SetUp() override {
        EachProtocol::SetUp();
        pub_ = share("pub", {{"alice", write}, {"bob", write}, {"ftp", write}});
        makeFolder("a/x", 0777);
        makeFolder("a", 0777);
        makeFolder("dept", 0700);
        writeFile(pub_ / "dept/secret", "secret", bobId);
        letAnonymousIn();
        storeRules({"u:1002:/pub/a/x"});
        start();
    }

    void makeFolder(const std::string& name, mode_t mode) const {
        fs::create_directories(pub_ / name);
        EXPECT_EQ(chown((pub_ / name).c_str(), bobId, bobId), 0);
        EXPECT_EQ(chmod((pub_ / name).c_str(), mode), 0);
    }
    static void expectToStay(FileClient& client, const std::string& path, const std::string& to) {
        EXPECT_FALSE(client.rename(path, to)) << path;
        EXPECT_FALSE(client.replace(path, to)) << path;
        EXPECT_FALSE(client.removeFolder(path)) << path;
        EXPECT_FALSE(client.remove(path)) << path;
    }

    fs::path pub_;
};

TEST_P(RuleFolders, stayWhereTheyAre) {
    std::vector<std::unique_ptr<FileClient>> sessions;
    sessions.push_back(logIn());
    if (overFtp()) {
        sessions.push_back(logIn("ftp")); // guests come over FTP alone
    }
    for (const auto& session : sessions) {
        for (const char* const folder : {"/pub/a/x", "/pub/a"}) {
            expectToStay(*session, folder, "/pub/away");
        }
        EXPECT_TRUE(session->write("/pub/a/x/new", "x")) << "what is in it is free";
        EXPECT_TRUE(session->rename("/pub/a/x/new", "/pub/a/new"));
        EXPECT_TRUE(session->remove("/pub/a/new"));
        ASSERT_TRUE(session->makeFolder("/pub/free"));
        EXPECT_TRUE(session->rename("/pub/free", "/pub/freed"));
        EXPECT_TRUE(session->removeFolder("/pub/freed"));
    }
}

TEST_P(RuleFolders, areNotPutInPlaceWhileTheyAreMissing) {
    fs::remove(pub_ / "a/x");
    const auto alice = logIn();
    // Some file systems know no difference.
    for (const char* const place : {"/pub/a/x", "/pub/a/X"}) {
        EXPECT_FALSE(alice->rename("/pub/dept", place)) << place;
        EXPECT_FALSE(alice->replace("/pub/dept", place)) << place;
        EXPECT_FALSE(alice->makeFolder(place)) << place;
        EXPECT_FALSE(alice->write(place, "x")) << place;
        EXPECT_FALSE(alice->symbolicLink("../dept", place)) << place;
        EXPECT_FALSE(alice->hardLink("/pub/file", place)) << place;
    }
    EXPECT_TRUE(alice->makeFolder("/pub/a/y"));
    EXPECT_TRUE(isRefused("bob"));
}

TEST_P(RuleFolders, areReachedByLinksThatStay) {
    fs::rename(pub_ / "a/x", pub_ / "real");
    fs::create_directory_symlink("real", pub_ / "x");
    storeRules({"u:1002:/pub/x"});
    const auto alice = logIn();
    expectToStay(*alice, "/pub/x", "/pub/y");
    expectToStay(*alice, "/pub/real", "/pub/y");
    EXPECT_FALSE(alice->replace("/pub/file", "/pub/x")) << "what would take the link's place";
    EXPECT_FALSE(isRefused("bob"));
}

TEST_P(RuleFolders, areReachedByLinksThatLeadUpAndStay) {
    makeFolder("deep", 0777);
    makeFolder("real/end", 0777);
    makeFolder("real", 0777);
    fs::create_directory_symlink("../real", pub_ / "deep/link");
    storeRules({"u:1002:/pub/deep/link/end"});
    const auto alice = logIn();
    for (const std::string folder : {"/pub/real/end", "/pub/real", "/pub/deep/link", "/pub/deep"}) {
        expectToStay(*alice, folder, "/pub/away");
    }
    EXPECT_FALSE(isRefused("bob"));
}

TEST_P(RuleFolders, areReachedByLinksFromBesideTheView) {
    makeFolder("sub/real", 0777);
    makeFolder("sub", 0777);
    makeFolder("deep", 0755);
    fs::create_directory_symlink("../sub/real", pub_ / "deep/link");
    storeRules({"u:1001:/pub/sub", "u:1002:/pub/deep/link"});
    const auto alice = logIn();
    expectToStay(*alice, "/real", "/away");
    EXPECT_TRUE(alice->makeFolder("/free"));
    EXPECT_FALSE(isRefused("bob"));
}

TEST_P(RuleFolders, stayWhenOthersExchangeThem) {
    const auto alice = logIn();
    for (const char* const folder : {"a/x", "a"}) {
        fs::rename(pub_ / folder, pub_ / "former");
        makeFolder("a/x", 0777);
        makeFolder("a", 0777);
        for (const std::string name : {"/pub/a/x", "/pub/a"}) {
            expectToStay(*alice, name, "/pub/away");
        }
        EXPECT_TRUE(alice->write("/pub/a/x/new", "x")) << "what is in it is free";
        fs::remove_all(pub_ / "former");
    }
}

TEST_P(RuleFolders, stayWhenTheyAreMadeLater) {
    storeRules({"u:1002:/pub/later/y/z"});
    const auto alice = logIn();
    makeFolder("later/y/z", 0777);
    makeFolder("later/y", 0777);
    makeFolder("later", 0777);
    for (const std::string folder : {"/pub/later/y/z", "/pub/later/y", "/pub/later"}) {
        expectToStay(*alice, folder, "/pub/away");
    }
    fs::remove(pub_ / "later/y/z");
    EXPECT_FALSE(alice->rename("/pub/dept", "/pub/later/y/z"));
    EXPECT_FALSE(alice->replace("/pub/dept", "/pub/later/y/z"));
    EXPECT_FALSE(alice->makeFolder("/pub/later/y/z"));
    EXPECT_TRUE(alice->write("/pub/later/y/new", "x"));
}

VELT_OVER_EACH_PROTOCOL(RuleFolders);

} // namespace
} // namespace velt::test
