// The chroot operations of the contract over accounts and a state root of their own.
#include "ftp/ftp_library.h"
#include "standalone/accounts/account_sources.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/effects.h"
#include "standalone/core/state_root.h"
#include "standalone/rules/rule_store.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <array>
#include <ctime>
#include <memory>

namespace velt::test {
namespace {

using Names = std::vector<std::string>;

class List {
public:
    explicit List(const Names& names = {}) : list_(VLIBCSzListAlloc(1024)) {
        for (const auto& name : names) {
            EXPECT_EQ(VLIBCSzListPush(&list_, name.c_str()), 0);
        }
    }
    ~List() { VLIBCSzListFree(list_); }
    List(const List&) = delete;
    List& operator=(const List&) = delete;

    VLIBCSzList* get() { return list_; }
    VLIBCSzList** address() { return &list_; }
    Names names() const {
        Names names;
        for (int i = 0; i < list_->count; i++) {
            names.emplace_back(VLIBCSzListGet(list_, i));
        }
        return names;
    }

private:
    VLIBCSzList* list_;
};

class ChrootContract : public testing::Test {
protected:
    void SetUp() override {
        setStateRoot(root_.path());
        useUsers("root:x:0:0::/root:/bin/sh\ndaemon:x:1:1::/:/bin/false\nann:x:1000:100::/home/ann:/bin/sh\n"
                 "ben:x:1001:100::/home/ben:/bin/sh\nBennet:x:1002:100::/home/bennet:/bin/sh\n");
    }
    void TearDown() override {
        setAccountSources({});
        setStateRoot("/");
    }

    void useUsers(const std::string& passwd) {
        AccountSources sources;
        sources.passwd = root_.write("accounts/passwd", passwd);
        sources.group = root_.write("accounts/group", "users:x:100:\nstaff:x:50:ann\n");
        sources.loginDefs = root_.write("accounts/login.defs", "UID_MIN 1000\nUID_MAX 200000\n");
        sources.nsswitch = root_.write("accounts/nsswitch.conf", "passwd: files\ngroup: files\n");
        sources.moduleFolder = root_.path();
        setAccountSources(sources);
    }

    static Names chrootUsers(const char* substr = nullptr, int source = 1, const char* domain = nullptr) {
        List list;
        EXPECT_EQ(VELTFTPChrootUserEnum(list.address(), source, substr, domain), 0) << lastErrorSentence();
        return list.names();
    }
    static Names otherUsers(const char* substr = nullptr, int source = 1) {
        List list;
        EXPECT_EQ(VELTFTPNonChrootUserEnum(list.address(), source, substr, nullptr), 0)
            << lastErrorSentence();
        return list.names();
    }
    static int add(const Names& names) { return VELTFTPAddChrootUser(List(names).get()); }
    static int remove(const Names& names) { return VELTFTPDeleteChrootUser(List(names).get()); }

    TemporaryFolder root_;
};

TEST_F(ChrootContract, usersAreOneOrTheOther) {
    EXPECT_EQ(chrootUsers(), Names());
    EXPECT_EQ(otherUsers(), (Names{"ann", "ben", "Bennet"}));
    ASSERT_EQ(add({"ben", "ben"}), 0) << lastErrorSentence();
    EXPECT_EQ(chrootUsers(), Names{"ben"});
    EXPECT_EQ(otherUsers(), (Names{"ann", "Bennet"}));
    ASSERT_EQ(remove({"ben", "ann"}), 0) << lastErrorSentence();
    EXPECT_EQ(chrootUsers(), Names());
}

TEST_F(ChrootContract, listsAreNarrowed) {
    ASSERT_EQ(add({"ann", "ben", "Bennet"}), 0);
    EXPECT_EQ(chrootUsers("ben"), (Names{"ben", "Bennet"}));
    EXPECT_EQ(chrootUsers(nullptr, 8), Names()) << "nobody comes from LDAP";
    EXPECT_EQ(chrootUsers(nullptr, 11), (Names{"ann", "ben", "Bennet"}));
    EXPECT_EQ(chrootUsers(nullptr, 11, "ELSEWHERE"), Names());
    ASSERT_EQ(remove({"ann"}), 0);
    EXPECT_EQ(otherUsers("nn"), Names{"ann"});
}

TEST_F(ChrootContract, anUnknownNameChangesNothing) {
    EXPECT_LT(add({"ann", "nobody-like-this"}), 0);
    EXPECT_EQ(lastErrorSentence(), "There is no user \"nobody-like-this\".");
    EXPECT_EQ(chrootUsers(), Names());
    ASSERT_EQ(add({"ann"}), 0);
    EXPECT_LT(remove({"ann", "x\ny"}), 0);
    EXPECT_EQ(chrootUsers(), Names{"ann"});
}

TEST_F(ChrootContract, aSystemAccountIsListedOnceItIsConfined) {
    ASSERT_EQ(add({"daemon"}), 0) << lastErrorSentence();
    EXPECT_EQ(chrootUsers(), Names{"daemon"});
}

TEST_F(ChrootContract, addingTakesTheUserFromAShareAndLeavesGroupsAlone) {
    ASSERT_EQ(messageOf(storeRules(
                  {{false, 1000, "/g"}, {true, 1000, "/share"}, {true, 1000, "/other"}, {true, 1001, "/b"}})),
              "");
    EXPECT_EQ(chrootUsers(), Names());
    ASSERT_EQ(add({"ann"}), 0);
    EXPECT_EQ(loadRules(),
              (std::vector<ChrootRule>{{false, 1000, "/g"}, {true, 1000, "/home"}, {true, 1001, "/b"}}));
    ASSERT_EQ(remove({"ann", "ben"}), 0);
    EXPECT_EQ(loadRules(), (std::vector<ChrootRule>{{false, 1000, "/g"}, {true, 1001, "/b"}}));
}

TEST_F(ChrootContract, nothingIsStoredWhenNothingChanges) {
    ASSERT_EQ(add({"ann"}), 0);
    setEffectHook([](Effect, std::string_view) -> EffectDecision {
        ADD_FAILURE() << "an effect";
        return {};
    });
    EXPECT_EQ(add({"ann"}), 0);
    EXPECT_EQ(remove({"ben"}), 0);
    setEffectHook({});
}

TEST_F(ChrootContract, storingIsAnEffectThatCanFail) {
    setEffectHook([](Effect effect, std::string_view subject) -> EffectDecision {
        EXPECT_EQ(effect, Effect::store);
        EXPECT_EQ(subject, "chroot rules");
        return Error("Refused.");
    });
    EXPECT_LT(add({"ann"}), 0);
    EXPECT_EQ(lastErrorSentence(), "Refused.");
    setEffectHook({});
    EXPECT_EQ(chrootUsers(), Names());
}

TEST_F(ChrootContract, rulesAreStoredAsTheyStandInTheList) {
    const Names lines = {"u:1000:/share/below", "g:100:/home", "u:1000:/share/below"};
    ASSERT_EQ(VELTFTPChrootRuleSave(List(lines).get()), 0);
    List list;
    ASSERT_EQ(VELTFTPChrootRuleEnum(list.address()), 0);
    EXPECT_EQ(list.names(), lines);
    EXPECT_LT(VELTFTPChrootRuleSave(List({"g:100:/home", "nonsense"}).get()), 0);
    EXPECT_EQ(lastErrorSentence(),
              "Chroot rule 2: expected a rule like \"u:1000:/share/folder\" or \"g:100:/home\".");
    EXPECT_EQ(loadRules()->size(), 3U);
    ASSERT_EQ(VELTFTPChrootRuleSave(List().get()), 0);
    EXPECT_EQ(loadRules()->size(), 0U);
}

TEST_F(ChrootContract, aDamagedStoreIsAnErrorOfEveryOperation) {
    root_.write("etc/velt/chroot_rules", "velt-chroot-rules 1\nnonsense\n");
    List list;
    EXPECT_LT(VELTFTPChrootRuleEnum(list.address()), 0);
    EXPECT_LT(VELTFTPChrootUserEnum(list.address(), 1, nullptr, nullptr), 0);
    EXPECT_LT(VELTFTPNonChrootUserEnum(list.address(), 1, nullptr, nullptr), 0);
    EXPECT_LT(add({"ann"}), 0);
    EXPECT_EQ(VLIBCErrGet(), 0x0301);
    EXPECT_EQ(root_.read("etc/velt/chroot_rules"), "velt-chroot-rules 1\nnonsense\n");
}

TEST_F(ChrootContract, aFormattedRuleIsReadBackWithItsName) {
    std::array<char, 2048> line{};
    std::array<char, 492> name{};
    std::array<char, 4096> path{};
    int isUser = -1;
    ASSERT_GE(VELTFTPChrootRuleFormat(line.data(), line.size(), 1, 1001, "/share/be low"), 0);
    ASSERT_GE(VELTFTPChrootRuleParseToName(line.data(), &isUser, name.data(), name.size(), path.data(),
                                           path.size()),
              0);
    EXPECT_NE(isUser, 0);
    EXPECT_STREQ(name.data(), "ben");
    EXPECT_STREQ(path.data(), "/share/be low");
    ASSERT_GE(VELTFTPChrootRuleFormat(line.data(), line.size(), 0, 50, "/share/"), 0);
    ASSERT_GE(VELTFTPChrootRuleParseToName(line.data(), &isUser, name.data(), name.size(), path.data(),
                                           path.size()),
              0);
    EXPECT_EQ(isUser, 0);
    EXPECT_STREQ(name.data(), "staff");
    EXPECT_STREQ(path.data(), "/share");
}

TEST_F(ChrootContract, aRuleThatCannotHoldIsRefused) {
    std::array<char, 2048> line{};
    for (const char* path : {"", "/", "share", "/../etc", "/a/../b", "/a\nu:0:/b", "/a//b", "\"/a"}) {
        EXPECT_LT(VELTFTPChrootRuleFormat(line.data(), line.size(), 1, 1000, path), 0) << path;
    }
    EXPECT_LT(VELTFTPChrootRuleFormat(line.data(), line.size(), 1, -1, "/a"), 0);
    EXPECT_LT(VELTFTPChrootRuleFormat(line.data(), line.size(), 1, 1000, nullptr), 0);
    const std::string longest = '/' + std::string(longestRule - std::string("u:1000:/").size(), 'a');
    EXPECT_GE(VELTFTPChrootRuleFormat(line.data(), line.size(), 1, 1000, longest.c_str()), 0);
    EXPECT_LT(VELTFTPChrootRuleFormat(line.data(), line.size(), 1, 1000, (longest + 'a').c_str()), 0);
    EXPECT_LT(VELTFTPChrootRuleFormat(line.data(), 8, 1, 1000, "/share"), 0);
}

TEST_F(ChrootContract, aLineThatCannotBeToldIsNotParsed) {
    std::array<char, 492> name{'k', 'e', 'p', 't'};
    std::array<char, 16> path{'k', 'e', 'p', 't'};
    int isUser = 7;
    const auto parse = [&](const char* line, int nameSize) {
        return VELTFTPChrootRuleParseToName(line, &isUser, name.data(), nameSize, path.data(), path.size());
    };
    EXPECT_LT(parse("nonsense", 492), 0);
    EXPECT_LT(parse("u:4000:/share", 492), 0) << "nobody has this number";
    EXPECT_LT(parse("u:1000:/a-path-that-is-too-long", 492), 0);
    EXPECT_LT(parse("u:1000:/share", 3), 0) << "the name does not fit";
    EXPECT_LT(parse(nullptr, 492), 0);
    EXPECT_EQ(isUser, 7);
    EXPECT_STREQ(name.data(), "kept");
}

TEST_F(ChrootContract, aHundredThousandUsersAreChangedAndListedInOneGo) {
    const auto secondsFor = [this](int count) {
        std::string passwd;
        Names names;
        for (int i = 0; i < count; i++) {
            names.push_back("user" + std::to_string(i));
            passwd += names.back() + ":x:" + std::to_string(1000 + i) + ":100::/home/u:/bin/sh\n";
        }
        useUsers(passwd);
        List list(names);
        // The processor's time: other processes on the machine lengthen the clock's.
        const std::clock_t begin = std::clock();
        EXPECT_EQ(VELTFTPAddChrootUser(list.get()), 0) << lastErrorSentence();
        EXPECT_EQ(chrootUsers().size(), static_cast<std::size_t>(count));
        EXPECT_EQ(otherUsers().size(), 0U);
        EXPECT_EQ(VELTFTPDeleteChrootUser(list.get()), 0) << lastErrorSentence();
        EXPECT_EQ(chrootUsers().size(), 0U);
        return static_cast<double>(std::clock() - begin) / CLOCKS_PER_SEC;
    };
    EXPECT_LT(secondsFor(100000), 30 * secondsFor(10000))
        << "one look-up per user would take a hundred times";
}

} // namespace
} // namespace velt::test
