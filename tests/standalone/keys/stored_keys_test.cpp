// What administrators do with keys.
#include "standalone/keys/stored_keys.h"

#include "standalone/accounts/account_sources.h"
#include "standalone/core/error_number.h"
#include "standalone/journal/request_actor.h"
#include "tests/standalone/support/example_keys.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"
#include "tests/support/text.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

class UserKeys : public testing::Test {
protected:
    void SetUp() override {
        setAccounts("anna:x:1001:100::/home/anna:/bin/sh\nben:x:1002:100::/home/ben:/bin/sh\n");
        setRequestActor("token desk", "192.0.2.1");
    }
    void TearDown() override {
        setAccountSources({});
        setRequestActor("", "");
    }
    void setAccounts(const std::string& people) const {
        AccountSources sources;
        sources.passwd = root_.write("accounts/passwd", "root:x:0:0::/root:/bin/sh\n" + people);
        sources.group = root_.write("accounts/group", "users:x:100:\n");
        sources.loginDefs = root_.write("accounts/login.defs", "UID_MIN 1000\nUID_MAX 200000\n");
        sources.nsswitch = root_.write("accounts/nsswitch.conf", "passwd: files\ngroup: files\n");
        sources.moduleFolder = root_.path();
        setAccountSources(sources);
    }
    static std::string add(const std::string& user, const std::string& line,
                           KeyChange change = KeyChange::make) {
        const auto added = addKey(user, keyOf(line), change);
        return added ? (added->isNew ? "added" : "present") : added.error().message;
    }
    static std::string remove(const std::string& user, const std::string& fingerprint,
                              KeyChange change = KeyChange::make) {
        const auto removed = removeKey(user, fingerprint, change);
        return !removed ? removed.error().message : *removed ? "removed" : "none";
    }
    /// "USER COMMENT ...".
    static std::string all() {
        std::string text;
        for (const StoredKey& each : storedKeys().valueOr({}).keys) {
            text += each.user + ' ' + each.entry.key.comment + (each.ofAccount ? " " : "(former) ");
        }
        return text;
    }

    StateFolder root_;
};

TEST_F(UserKeys, AreAddedListedAndRemoved) {
    EXPECT_EQ(all(), "");
    EXPECT_EQ(add("ben", aKey + " desk"), "added");
    EXPECT_EQ(add("anna", aKey + " phone"), "added") << "of two users, too";
    EXPECT_EQ(add("anna", anotherKey + " desk"), "added");
    EXPECT_EQ(all(), "anna phone anna desk ben desk ");
    const auto annas = storedKeys("anna");
    ASSERT_EQ(annas->keys.size(), 2U);
    EXPECT_EQ(annas->keys[0].entry.by, "token desk");
    EXPECT_EQ(annas->keys[0].entry.added.size(), std::string("2026-11-23T04:00:00.000Z").size());
    EXPECT_EQ(remove("anna", aFingerprint), "removed");
    EXPECT_EQ(remove("anna", aFingerprint), "none");
    EXPECT_EQ(remove("carla", aFingerprint), "none");
    EXPECT_EQ(all(), "anna desk ben desk ");
    EXPECT_EQ(remove("anna", anotherFingerprint), "removed");
    EXPECT_EQ(messageOf(storedKeys("anna")), "");
    EXPECT_EQ(all(), "ben desk ");
}

TEST_F(UserKeys, StandThereOnce) {
    EXPECT_EQ(add("anna", aKey + " desk"), "added");
    EXPECT_EQ(add("anna", "from=\"192.0.2.1\" " + aKey + " other"), "present");
    EXPECT_EQ(all(), "anna desk ");
}

TEST_F(UserKeys, AreOfUsersWhoCanLogIn) {
    EXPECT_EQ(add("carla", aKey), "a user of this server");
    EXPECT_EQ(add("", aKey), "a user of this server");
    EXPECT_EQ(add("../anna", aKey), "a user of this server");
    EXPECT_EQ(add("root", aKey), "a user other than root, who cannot log in over SFTP");
    EXPECT_EQ(storedKeys("carla").error().number, ErrorNumber::notFound);
    EXPECT_EQ(storedKeys(std::string(300, 'a')).error().number, ErrorNumber::notFound);
    EXPECT_FALSE(std::filesystem::exists(root_.path() / "etc/velt/keys"));
}

TEST_F(UserKeys, AreLimited) {
    KeyFile full{"anna", 1001, {}};
    for (std::size_t i = 0; i < mostKeys; ++i) {
        PublicKey key = keyOf(anotherKey);
        key.base64 = "AAAAC3NzaC1lZDI1NTE5AAAAIG6o8kw9HXo7MMRTNqpwImZIpCtgXHP+yTaiesMo" +
                     std::string{static_cast<char>('A' + i / 26), static_cast<char>('A' + i % 26)} + "qn";
        key.type = "ssh-ed25519";
        full.keys.push_back({key, "now", "root"});
    }
    ASSERT_EQ(messageOf(storeKeyFile(full)), "");
    ASSERT_EQ((*loadKeyFile("anna"))->keys.size(), mostKeys);
    EXPECT_EQ(add("anna", anotherKey), "a user with fewer than 100 keys");
    EXPECT_EQ(remove("anna", storedKeys("anna")->keys[7].entry.key.fingerprint), "removed");
    EXPECT_EQ(add("anna", anotherKey), "added");
}

TEST_F(UserKeys, GiveALaterAccountOfTheNameNothing) {
    ASSERT_EQ(add("anna", aKey + " desk"), "added");
    setAccounts("anna:x:1005:100::/home/anna:/bin/sh\n");
    EXPECT_EQ(all(), "anna desk(former) ");
    EXPECT_EQ(add("anna", anotherKey),
              "a user without keys of a former account of this name; remove those first");
    setAccounts("");
    EXPECT_EQ(all(), "anna desk(former) ") << "there is no such account";
    EXPECT_EQ(remove("anna", aFingerprint), "removed") << "all the same";
    setAccounts("anna:x:1005:100::/home/anna:/bin/sh\n");
    EXPECT_EQ(add("anna", anotherKey + " phone"), "added");
    EXPECT_EQ(all(), "anna phone ");
    EXPECT_EQ(loadKeyFile("anna")->value_or(KeyFile{}).uid, 1005U);
}

TEST_F(UserKeys, OfADamagedFileAreNeitherUsedNorLost) {
    ASSERT_EQ(add("ben", aKey + " desk"), "added");
    root_.write("etc/velt/keys/anna", "{");
    const auto stored = storedKeys();
    EXPECT_EQ(stored->keys.size(), 1U);
    ASSERT_EQ(stored->damaged.size(), 1U);
    EXPECT_TRUE(contains(stored->damaged[0], "etc/velt/keys/anna")) << stored->damaged[0];
    EXPECT_EQ(storedKeys("anna")->damaged, stored->damaged);
    EXPECT_EQ(add("anna", aKey), stored->damaged[0]);
    EXPECT_EQ(remove("anna", aFingerprint), stored->damaged[0]);
    EXPECT_EQ(root_.read("etc/velt/keys/anna"), "{");
}

TEST_F(UserKeys, AreOnlyTriedOut) {
    EXPECT_EQ(add("anna", aKey, KeyChange::tryOut), "added");
    EXPECT_EQ(all(), "");
    ASSERT_EQ(add("anna", aKey + " desk"), "added");
    EXPECT_EQ(remove("anna", aFingerprint, KeyChange::tryOut), "removed");
    EXPECT_EQ(all(), "anna desk ");
}

} // namespace
} // namespace velt::test
