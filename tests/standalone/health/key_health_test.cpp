// What is found about the keys of users.
#include "standalone/accounts/account_sources.h"
#include "standalone/keys/key_store.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/example_keys.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <sys/stat.h>

namespace velt::test {
namespace {

class KeyHealth : public testing::Test {
protected:
    void SetUp() override { setAccounts("anna:x:1001:100::/home/anna:/bin/sh\n"); }
    void TearDown() override { setAccountSources({}); }

    void setAccounts(const std::string& people) const {
        AccountSources sources;
        sources.passwd = root_.write("accounts/passwd", people);
        sources.group = root_.write("accounts/group", "users:x:100:\n");
        sources.loginDefs = root_.write("accounts/login.defs", "UID_MIN 1000\nUID_MAX 200000\n");
        sources.nsswitch = root_.write("accounts/nsswitch.conf", "passwd: files\ngroup: files\n");
        sources.moduleFolder = root_.path();
        setAccountSources(sources);
    }
    std::string path() const { return (root_.path() / "etc/velt/keys/anna").string(); }

    StateFolder root_;
    const KeyFile annas_{"anna", 1001, {{keyOf(aKey), "then", "root"}, {keyOf(anotherKey), "then", "root"}}};
};

TEST_F(KeyHealth, NothingIsWrongWithKeysOfAnAccount) {
    EXPECT_EQ(keyFindings(), Findings());
    ASSERT_EQ(messageOf(storeKeyFile(annas_)), "");
    EXPECT_EQ(keyFindings(), Findings());
}

TEST_F(KeyHealth, ADamagedFileIsNamed) {
    root_.write("etc/velt/keys/anna", "{");
    const Findings found = keyFindings();
    ASSERT_EQ(summary(found), "warning keys-unusable");
    EXPECT_TRUE(found[0].sentence.starts_with("The file of the keys of anna, " + path() + ", is damaged: "))
        << found[0].sentence;
    EXPECT_TRUE(found[0].sentence.ends_with(" None of the keys in it opens anything."));
    EXPECT_EQ(found[0].mend, "Correct the file or put your copy back, then run: chown root " + path() +
                                 " && chmod 600 " + path());
}

TEST_F(KeyHealth, AFileThatOthersCouldHaveWrittenIsNamed) {
    ASSERT_EQ(messageOf(storeKeyFile(annas_)), "");
    ASSERT_EQ(chmod(path().c_str(), 0666), 0);
    EXPECT_EQ(summary(keyFindings()), "warning keys-unusable");
}

TEST_F(KeyHealth, KeysOfAnAccountThatIsGoneAreNamed) {
    ASSERT_EQ(messageOf(storeKeyFile(annas_)), "");
    for (const char* people :
         {"", "anna:x:1005:100::/home/anna:/bin/sh\n", "ben:x:1001:100::/home/b:/bin/sh\n"}) {
        setAccounts(people);
        const Findings found = keyFindings();
        ASSERT_EQ(summary(found), "warning keys-former-account") << people;
        EXPECT_EQ(found[0].sentence, "There is no user \"anna\" with the number 1001, whose keys are stored. "
                                     "They open nothing.");
        EXPECT_EQ(found[0].mend, "veltctl keys remove anna " + aFingerprint +
                                     " && veltctl keys remove anna " + anotherFingerprint);
    }
    ASSERT_EQ(messageOf(storeKeyFile({"anna", 1001, {}})), "");
    EXPECT_EQ(keyFindings(), Findings()) << "none is left";
}

TEST_F(KeyHealth, KeysAreNotCalledUselessWhileNobodyKnowsTheAccounts) {
    ASSERT_EQ(messageOf(storeKeyFile(annas_)), "");
    AccountSources sources;
    sources.passwd = root_.path() / "accounts";
    sources.moduleFolder = root_.path();
    setAccountSources(sources);
    EXPECT_EQ(keyFindings(), Findings());
}

} // namespace
} // namespace velt::test
