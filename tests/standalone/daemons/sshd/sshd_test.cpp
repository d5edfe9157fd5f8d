#include "standalone/core/effects.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/sshd/host_keys.h"
#include "standalone/daemons/sshd/sshd_configuration.h"
#include "standalone/daemons/sshd/sshd_plan.h"
#include "tests/standalone/support/golden.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <sys/stat.h>

#include <thread>

namespace velt::test {
namespace {

const SshdPlaces examplePlaces{{"/var/lib/velt/ssh/host_ed25519_key", "/var/lib/velt/ssh/host_rsa_key"},
                               "/usr/libexec/velt/velt-authorized-keys",
                               "/",
                               "root",
                               true};

TEST(SshdRendering, isAsRecorded) {
    expectGolden(GOLDEN_FOLDER "/sftp.conf", renderSshd({true, 2222}, {}, examplePlaces));
}

TEST(SshdRendering, isAsRecordedWithoutRootsRights) {
    SshdPlaces places = examplePlaces;
    places.privileged = false;
    expectGolden(GOLDEN_FOLDER "/sftp_unprivileged.conf", renderSshd({true, 2222}, {}, places));
}

TEST(SshdRendering, isAsRecordedForTheLoopbackOnly) {
    SshdPlaces places = examplePlaces;
    places.loopbackOnly = true;
    expectGolden(GOLDEN_FOLDER "/sftp_loopback.conf", renderSshd({true, 2222}, {}, places));
}

TEST(SshdRendering, isAsRecordedForConfinedSessions) {
    SshdPlaces places = examplePlaces;
    places.sessionRoot = "/run/sshd/.";
    expectGolden(GOLDEN_FOLDER "/sftp_confined.conf", renderSshd({true, 2222}, {}, places));
}

TEST(SshdRendering, isAsRecordedWithOtherSettingsOfFtp) {
    expectGolden(GOLDEN_FOLDER "/sftp_fips.conf",
                 renderSshd({true, 2222}, {.umask = false, .fipsOnly = true}, examplePlaces));
}

class SftpCandidate : public testing::Test {
protected:
    void SetUp() override {
        if (!std::filesystem::exists("/usr/sbin/sshd")) {
            GTEST_SKIP() << "the OpenSSH server is not installed";
        }
        setStateRoot(root_.path());
    }
    void TearDown() override { setStateRoot("/"); }

    TemporaryFolder root_;
};

TEST_F(SftpCandidate, isTakenAndLeavesNothingButTheKeys) {
    EXPECT_EQ(messageOf(testSftpCandidate({true, 2222}, {})), "");
    EXPECT_TRUE(std::filesystem::is_empty(root_.path() / "run/velt"));
}

TEST_F(SftpCandidate, isRefusedInTheDaemonsOwnWords) {
    const std::string refusal = messageOf(testSftpCandidate({true, 65536}, {}));
    EXPECT_NE(refusal.find("Badly formatted port number"), std::string::npos) << refusal;
}

TEST_F(SftpCandidate, isTestedWithThrowAwayKeysWhereNothingMayBeStored) {
    std::vector<std::string> effects;
    std::thread([&] {
        setEffectHook([&](Effect effect, std::string_view subject) {
            effects.push_back(std::string(effectName(effect)) + " " + std::string(subject));
            return EffectDecision(Result<>());
        });
        EXPECT_EQ(messageOf(testSftpCandidate({true, 2222}, {})), "");
        EXPECT_NE(messageOf(testSftpCandidate({true, 65536}, {})), "");
    }).join();
    EXPECT_EQ(effects, (std::vector<std::string>{"store host keys", "store host keys"}));
    EXPECT_FALSE(std::filesystem::exists(root_.path() / "var/lib/velt/ssh"));
    EXPECT_TRUE(std::filesystem::is_empty(root_.path() / "run/velt"));
}

TEST_F(SftpCandidate, isTestedOnceMoreBeforeItIsPlanned) {
    const auto keys = hostKeys();
    ASSERT_EQ(messageOf(keys), "");
    root_.write("var/lib/velt/ssh/host_ed25519_key", "damaged");
    root_.write("var/lib/velt/ssh/host_rsa_key", "damaged");
    const std::string refusal = messageOf(planSftpDaemon());
    EXPECT_NE(refusal.find("The SFTP daemon refuses its configuration"), std::string::npos) << refusal;
}

TEST_F(SftpCandidate, keepsItsKeys) {
    const auto keys = hostKeys();
    ASSERT_EQ(messageOf(keys), "");
    ASSERT_EQ(keys->files.size(), 2U);
    const std::string first = root_.read("var/lib/velt/ssh/host_ed25519_key");
    EXPECT_NE(first, "");
    for (const auto& key : keys->files) {
        struct stat facts {};
        ASSERT_EQ(stat(key.c_str(), &facts), 0);
        EXPECT_EQ(facts.st_mode & 07777, 0600U);
    }
    ASSERT_TRUE(hostKeys());
    EXPECT_EQ(root_.read("var/lib/velt/ssh/host_ed25519_key"), first);
}

} // namespace
} // namespace velt::test
