// What is found about the shares and the chroot rules.
#include "standalone/accounts/account_sources.h"
#include "standalone/health/named_accounts.h"
#include "standalone/rules/rule_store.h"
#include "standalone/settings/settings_store.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/call_watch.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <system_error>
#include <thread>

namespace velt::test {
namespace {

class FileHealth : public testing::Test {
protected:
    void SetUp() override {
        AccountSources sources;
        sources.passwd =
            root_.write("passwd", "root:x:0:0::/root:/bin/sh\nalice:x:1001:1001::/home/a:/bin/sh\n");
        sources.group = root_.write("group", "root:x:0:\nstaff:x:2001:alice\n");
        sources.nsswitch = root_.write("nsswitch", "passwd: files\ngroup: files\n");
        setAccountSources(sources);
        FtpSettings settings = defaultFtpSettings();
        settings.record.service_flags = VELT_FTP_SERVICE_PLAIN;
        ASSERT_EQ(messageOf(storeFtpSettings(settings)), "");
        ASSERT_EQ(messageOf(storeRules({})), "");
    }

    void TearDown() override { setAccountSources({}); }

    void writeShares(const std::string& users, const std::string& groups) const {
        root_.write("etc/velt/shares.json",
                    R"({"version": 1, "shares": [{"name": "docs", "path": "/srv", "users": {)" + users +
                        R"(}, "groups": {)" + groups + "}}]}");
    }

    std::filesystem::path rules() const { return root_.path() / "etc/velt/chroot_rules"; }

    StateFolder root_;
};

TEST_F(FileHealth, NothingIsWrongWithWhatLoginsCanRead) {
    EXPECT_EQ(fileFindings(), Findings());
    writeShares(R"("alice": "read", "ftp": "read")", R"("staff": "write")");
    ASSERT_EQ(messageOf(storeRules({{true, 1001, "/home"}, {false, 2001, "/docs"}})), "");
    EXPECT_EQ(fileFindings(), Findings());
}

TEST_F(FileHealth, DamagedSharesAreNamed) {
    root_.write("etc/velt/shares.json", R"({"version": 1, "shares": [)");
    const Findings found = fileFindings();
    EXPECT_EQ(summary(found), "error shares-damaged");
    EXPECT_EQ(found.at(0).mend,
              "Correct " + (root_.path() / "etc/velt/shares.json").string() + ", then run: veltctl doctor");
}

TEST_F(FileHealth, AccountsThatNobodyKnowsAreNamed) {
    writeShares(R"("alcie": "read", "alice": "read")", R"("stuff": "read")");
    ASSERT_EQ(messageOf(storeRules({{true, 4711, "/home"}})), "");
    const Findings found = fileFindings();
    EXPECT_EQ(summary(found), "warning shares-unknown-account, warning rules-unknown-account, "
                              "warning shares-unknown-account");
    EXPECT_EQ(found.at(0).sentence, "There is no group \"stuff\", which the share \"docs\" names.");
    EXPECT_EQ(found.at(1).sentence, "There is no user with the number 4711, which a chroot rule names.");
    EXPECT_EQ(found.at(2).sentence, "There is no user \"alcie\", which the share \"docs\" names.");
    root_.write("etc/velt/ftp.passwd", "alcie:x:4711:4711::/home/x:/bin/sh\n");
    root_.write("etc/velt/ftp.group", "stuff:x:4711:\n");
    EXPECT_EQ(fileFindings(), Findings()) << "the daemon's own accounts count";
}

TEST_F(FileHealth, AccountsThatCannotBeReadAreNotCalledUnknown) {
    writeShares(R"("dora": "read")", "");
    EXPECT_EQ(summary(fileFindings()), "warning shares-unknown-account");
    std::filesystem::remove(root_.path() / "passwd");
    std::filesystem::create_directory(root_.path() / "passwd");
    const Findings found = fileFindings();
    EXPECT_EQ(summary(found), "error accounts-unreadable");
    EXPECT_TRUE(found.at(0).sentence.starts_with("Cannot read ")) << found.at(0).sentence;
}

TEST_F(FileHealth, AMissingFileOfRulesIsNamedAndItsCommandMendsThat) {
    ASSERT_EQ(messageOf(expectRules()), "");
    std::filesystem::remove(rules());
    const Findings found = fileFindings();
    EXPECT_EQ(summary(found), "error rules-missing");
    EXPECT_NE(found.at(0).sentence.find("Nobody can log in"), std::string::npos);
    const std::string& mend = found.at(0).mend;
    ASSERT_EQ(runProcess({"sh", "-c", mend.substr(mend.find("run: ") + 5)}).exitCode, 0) << mend;
    EXPECT_EQ(fileFindings(), Findings());
    EXPECT_EQ(loadRules(), std::vector<ChrootRule>());
}

TEST_F(FileHealth, AFileOfRulesThatCannotBeLookedAtIsNotCalledMissing) {
    ASSERT_EQ(messageOf(expectRules()), "");
    std::filesystem::remove(rules());
    std::filesystem::create_symlink(rules(), rules());
    EXPECT_EQ(summary(fileFindings()), "error rules-untrusted") << "the link leads to itself";
}

TEST_F(FileHealth, RulesThatAnybodyMayWriteAreNamed) {
    ::chmod(rules().c_str(), 0666);
    const Findings found = fileFindings();
    EXPECT_EQ(summary(found), "error rules-untrusted");
    EXPECT_EQ(found.at(0).mend, "chown root " + rules().string() + " && chmod go-w " + rules().string());
}

TEST_F(FileHealth, DamagedRulesAreNamedWithTheLine) {
    root_.write("etc/velt/chroot_rules", "velt-chroot-rules 1\nnonsense\n");
    ::chmod(rules().c_str(), 0600);
    const Findings found = fileFindings();
    EXPECT_EQ(summary(found), "error rules-damaged");
    EXPECT_NE(found.at(0).sentence.find("line 2"), std::string::npos) << found.at(0).sentence;
}

TEST_F(FileHealth, AccountsAreNotWaitedForLongerThanTheLimit) {
    EXPECT_EQ(unknownAccounts({}, std::chrono::seconds(0))->size(), 0U);
    const auto known = unknownAccounts({{true, "alice"}, {true, "", 0}}, std::chrono::seconds(10));
    ASSERT_TRUE(known);
    EXPECT_EQ(known->size(), 0U);
}

TEST_F(FileHealth, AccountsAreAskedForAgainAfterAThreadThatCouldNotBeHad) {
    const auto ask = [] {
        try {
            const auto unknown =
                unknownAccounts({{true, "alice"}, {true, "alcie"}}, std::chrono::seconds(10));
            return unknown ? std::to_string(unknown->size()) + " unknown" : "no answer";
        } catch (const std::system_error&) {
            return std::string("no thread");
        }
    };
    constexpr const char* beginMark = "/begin of the faults";
    const auto askTwice = [&] {
        std::thread([] {}).join(); // a sanitizer starts one of its own with the first
        (void)::access(beginMark, F_OK);
        const std::string first = ask();
        return first + ", " + ask();
    };
    bool begun = false;
    CallWatch watch(askTwice, [&](const SeenCall& call) {
        begun = begun || call.subject == beginMark;
        return begun && call.name.starts_with("clone") ? call.error : 0;
    });
    EXPECT_EQ(watch.finish(std::chrono::seconds(30)).told, "no thread, 1 unknown");
}

} // namespace
} // namespace velt::test
