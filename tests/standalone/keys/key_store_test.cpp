// The files of users' keys.
#include "standalone/keys/key_store.h"

#include "base/text.h"
#include "tests/standalone/support/example_keys.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/standalone/support/text_breaker.h"
#include "tests/support/result.h"
#include "tests/support/text.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

const std::string when = "2026-11-23T04:00:00.000Z";

class KeyFiles : public testing::Test {
protected:
    static KeyFile fileOf(const std::string& user) {
        return {user, 1001, {{keyOf(aKey + " anna@desk"), when, "root"}, {keyOf(anotherKey), when, "t1"}}};
    }
    static std::string problemWith(const std::string& text) { return messageOf(parseKeyFile("anna", text)); }
    fs::path folder() const { return root_.path() / "etc/velt/keys"; }
    static unsigned modeOf(const fs::path& path) {
        struct stat facts {};
        return stat(path.c_str(), &facts) == 0 ? facts.st_mode & 07777 : 0;
    }
    std::string text() const { return root_.read("etc/velt/keys/anna"); }

    StateFolder root_;
};

TEST_F(KeyFiles, AreReadAsTheyWereWritten) {
    EXPECT_EQ(messageOf(loadKeyFile("anna")), "");
    EXPECT_EQ(*loadKeyFile("anna"), std::nullopt);
    ASSERT_EQ(messageOf(storeKeyFile(fileOf("anna"))), "");
    EXPECT_EQ(*loadKeyFile("anna"), fileOf("anna"));
    EXPECT_EQ(*loadKeyFile("Anna"), std::nullopt);
    EXPECT_EQ(modeOf(folder()), 0700U);
    EXPECT_EQ(modeOf(folder() / "anna"), 0600U);
    EXPECT_EQ(modeOf(folder().parent_path()), 0755U);
    EXPECT_EQ(*usersWithKeys(), std::vector<std::string>{"anna"});
}

TEST_F(KeyFiles, AreForOneAccount) {
    const KeyFile file = fileOf("anna");
    EXPECT_EQ(keysForDaemon(file, 1001), "restrict " + aKey + "\nrestrict " + anotherKey + "\n");
    EXPECT_EQ(keysForDaemon(file, 1002), "");
    EXPECT_EQ(keysForDaemon(file, 0), "");
}

TEST_F(KeyFiles, StayInTheirFolder) {
    const std::string names[] = {"..",    ".",         "../../shares.json", "/etc/passwd",
                                 "a/b",   ".anna.new", "DOM\\anna",         "anna@dom.example",
                                 "an na", "%61nna",    "\xc3\xa4",          "anna$"};
    std::vector<std::string> sorted;
    for (const std::string& name : names) {
        ASSERT_EQ(messageOf(storeKeyFile(fileOf(name))), "") << name;
        EXPECT_EQ(**loadKeyFile(name), fileOf(name)) << name;
        EXPECT_EQ(keyFileOf(name)->parent_path(), folder()) << name;
        EXPECT_FALSE(keyFileOf(name)->filename().string().starts_with(".")) << name;
        sorted.push_back(name);
    }
    std::ranges::sort(sorted);
    EXPECT_EQ(*usersWithKeys(), sorted);
    int entries = 0;
    for (const auto& entry : fs::recursive_directory_iterator(root_.path() / "etc")) {
        entries += entry.is_regular_file() ? 1 : 0;
    }
    EXPECT_EQ(entries, static_cast<int>(std::size(names)));
    EXPECT_NE(messageOf(keyFileOf("")), "");
    EXPECT_NE(messageOf(keyFileOf(std::string(241, 'a'))), "");
    EXPECT_NE(messageOf(keyFileOf(std::string(90, '/'))), "");
    EXPECT_EQ(messageOf(storeKeyFile(fileOf(std::string(240, 'a')))), "");
}

TEST_F(KeyFiles, OfNobodyArePassedOver) {
    ASSERT_EQ(messageOf(storeKeyFile(fileOf("anna"))), "");
    for (const char* name : {".anna.new", "anna~%", "an na", "%6", "%61nna", "ann%zz", "b\\c"}) {
        root_.write(std::string("etc/velt/keys/") + name, "x");
    }
    EXPECT_EQ(*usersWithKeys(), std::vector<std::string>{"anna"});
}

TEST_F(KeyFiles, ThatAreDamagedGiveNoKey) {
    ASSERT_EQ(messageOf(storeKeyFile(fileOf("anna"))), "");
    const std::string good = text();
    const auto with = [&](const std::string& from, const std::string& to) {
        std::string changed = good;
        const auto at = changed.find(from);
        EXPECT_NE(at, std::string::npos) << from;
        return changed.replace(at, from.size(), to);
    };
    EXPECT_EQ(problemWith(good), "");
    for (const std::string& bad : {std::string(),
                                   std::string("{"),
                                   std::string("[]"),
                                   std::string("{}"),
                                   good + "x",
                                   good.substr(0, good.size() / 2),
                                   with("\"version\" : 1", "\"version\" : 2"),
                                   with("\"version\" : 1", "\"version\" : true"),
                                   with("\"anna\"", "\"ben\""),
                                   with("1001", "-1"),
                                   with("1001", "\"1001\""),
                                   with("1001", "4294967296"),
                                   with("1001", "1.5"),
                                   with("\"uid\"", "\"gid\""),
                                   with("\"by\" : \"t1\"", "\"by\" : 1"),
                                   with("\"t1\"", "\"t\\u0000\""),
                                   with("\"added\"", "\"addedd\""),
                                   with(anotherKey, aKey),
                                   with(anotherKey, "ssh-dss AAAA"),
                                   with(anotherKey, "command=\\\"x\\\" " + anotherKey),
                                   with(anotherKey, anotherKey + "\\n" + aKey),
                                   with("\"version\"", "\"more\" : 1, \"version\"")}) {
        const std::string problem = problemWith(bad);
        EXPECT_TRUE(contains(problem, (folder() / "anna").string())) << bad << problem;
        EXPECT_TRUE(problem.ends_with(".")) << problem;
    }
}

TEST_F(KeyFiles, BrokenAtRandomGiveTheirOwnKeysOrNone) {
    ASSERT_EQ(messageOf(storeKeyFile(fileOf("anna"))), "");
    const std::string good = text();
    const std::string lines = keysForDaemon(fileOf("anna"), 1001);
    TextBreaker breaker;
    int refused = 0;
    for (int i = 0; i < 5000; ++i) {
        const std::string broken = breaker.broken(good);
        const auto file = parseKeyFile("anna", broken);
        refused += file ? 0 : 1;
        if (file) {
            EXPECT_EQ(file->user, "anna");
            EXPECT_FALSE(contains(lowerCase(keysForDaemon(*file, file->uid)), "command")) << broken;
        }
    }
    EXPECT_GT(refused, 2500);
}

TEST_F(KeyFiles, ThatOthersCouldHaveWrittenAreRefused) {
    ASSERT_EQ(messageOf(storeKeyFile(fileOf("anna"))), "");
    const fs::path path = folder() / "anna";
    for (const mode_t mode : {0620U, 0602U}) {
        ASSERT_EQ(chmod(path.c_str(), mode), 0);
        EXPECT_TRUE(
            contains(messageOf(loadKeyFile("anna")), "The file of the keys of anna cannot be used: "));
    }
    ASSERT_EQ(chmod(path.c_str(), 0600), 0);
    if (geteuid() == 0) {
        ASSERT_EQ(chown(path.c_str(), 54321, 0), 0);
        EXPECT_NE(messageOf(loadKeyFile("anna")), "");
        ASSERT_EQ(chown(path.c_str(), 0, 0), 0);
    }
    fs::rename(path, root_.path() / "elsewhere");
    fs::create_symlink(root_.path() / "elsewhere", path);
    EXPECT_NE(messageOf(loadKeyFile("anna")), "") << "a link";
    fs::remove(path);
    ASSERT_EQ(mkfifo(path.c_str(), 0600), 0);
    EXPECT_NE(messageOf(loadKeyFile("anna")), "");
}

} // namespace
} // namespace velt::test
