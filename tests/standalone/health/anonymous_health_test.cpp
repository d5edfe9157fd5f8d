// What is found about the share that anonymous users are confined to.
#include "standalone/accounts/account_sources.h"
#include "standalone/settings/settings_store.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <string>

namespace velt::test {
namespace {

class AnonymousHealth : public testing::Test {
protected:
    void SetUp() override {
        if (::geteuid() != 0) {
            GTEST_SKIP() << "without root's rights nobody is confined";
        }
        AccountSources sources;
        sources.passwd = root_.write("passwd", "root:x:0:0::/root:/bin/sh\nftp:x:4242:4242::/:/bin/false\n");
        sources.group = root_.write("group", "root:x:0:\nftp:x:4242:\n");
        sources.nsswitch = root_.write("nsswitch", "passwd: files\ngroup: files\n");
        setAccountSources(sources);
        ASSERT_EQ(::chmod(root_.path().c_str(), 0755), 0);
        std::filesystem::create_directory(guests_.path);
        admit(true);
        share(guests_);
    }

    void TearDown() override { setAccountSources({}); }

    static void admit(bool anonymous) {
        FtpSettings settings = defaultFtpSettings();
        settings.record.service_flags = VELT_FTP_SERVICE_PLAIN;
        settings.record.anonymous = anonymous ? 1 : 0;
        settings.record.anonymous_chroot = 1;
        std::snprintf(settings.record.anonymous_chroot_share, sizeof settings.record.anonymous_chroot_share,
                      "guests");
        ASSERT_EQ(messageOf(storeFtpSettings(settings)), "");
    }

    static void share(const ShareEntry& entry) { ASSERT_EQ(messageOf(storeShares({entry})), ""); }

    /// What keeps guests out, which has to be one thing; "" for nothing.
    static Finding only() {
        const Findings found = anonymousFindings();
        EXPECT_EQ(summary(found), "error anonymous-kept-out");
        return found.empty() ? Finding() : found.front();
    }

    StateFolder root_;
    ShareEntry guests_{"guests", "", (root_.path() / "a folder").string(), true, {{"ftp", Access::read}}, {}};
};

TEST_F(AnonymousHealth, AShareThatLetsThemInIsWell) {
    EXPECT_EQ(anonymousFindings(), Findings());
}

TEST_F(AnonymousHealth, AShareThatGrantsThemNothingKeepsThemOut) {
    guests_.users = {};
    share(guests_);
    EXPECT_EQ(only().sentence,
              "The share \"guests\", which anonymous FTP users are confined to, is closed to "
              "their account ftp. Every anonymous login is refused.");
    EXPECT_EQ(only().mend, "Write \"ftp\": \"read\" into the users of the share in " +
                               (root_.path() / "etc/velt/shares.json").string() +
                               ", then run: veltctl doctor");
    guests_.users = {{"ftp", Access::none}};
    guests_.groups = {{"ftp", Access::write}};
    share(guests_);
    EXPECT_NE(only().sentence.find("is closed"), std::string::npos);
    admit(false);
    EXPECT_EQ(anonymousFindings(), Findings()) << "nobody is let in anyway";
}

TEST_F(AnonymousHealth, AShareThatIsGoneOrNotOfferedKeepsThemOut) {
    guests_.offeredToFtp = false;
    share(guests_);
    EXPECT_NE(only().sentence.find("is not offered over FTP"), std::string::npos);
    guests_.name = "others";
    share(guests_);
    EXPECT_NE(only().sentence.find("does not exist"), std::string::npos);
}

TEST_F(AnonymousHealth, AFolderThatIsGoneOrClosedKeepsThemOut) {
    ASSERT_EQ(::chmod(guests_.path.c_str(), 0700), 0);
    EXPECT_NE(only().sentence.find("is closed to the account ftp"), std::string::npos);
    std::filesystem::remove(guests_.path);
    EXPECT_NE(only().sentence.find("is missing"), std::string::npos);
    EXPECT_EQ(only().mend,
              "Put your copy back, or, for an empty one, run: install -d '" + guests_.path + "'");
}

} // namespace
} // namespace velt::test
