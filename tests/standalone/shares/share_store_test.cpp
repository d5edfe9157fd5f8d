#include "standalone/shares/share_store.h"

#include "platform/core.h"
#include "standalone/core/effects.h"
#include "standalone/core/last_error.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "tests/standalone/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/wait.h>
#include <unistd.h>

namespace velt {
namespace {

ShareEntry shareCalled(const std::string& name) {
    ShareEntry share;
    share.name = name;
    share.path = "/srv/" + name;
    return share;
}

class ShareStoreTest : public testing::Test {
protected:
    ShareStoreTest() {
        setStateRoot(folder_.path());
        clearLastError();
    }
    ~ShareStoreTest() override { setEffectHook({}); }

    test::TemporaryFolder folder_;
};

TEST_F(ShareStoreTest, HasNoSharesBeforeTheFirstStore) {
    const auto shares = allShares();
    ASSERT_TRUE(shares);
    EXPECT_TRUE(shares->empty());
}

TEST_F(ShareStoreTest, GivesBackWhatWasStoredInItsOrder) {
    ASSERT_EQ(saveShares({shareCalled("zebra"), shareCalled("alpha")}), 0) << lastErrorSentence();
    const auto shares = allShares();
    ASSERT_TRUE(shares);
    ASSERT_EQ(shares->size(), 2U);
    EXPECT_EQ((*shares)[0].name, "zebra");
    EXPECT_EQ((*shares)[1].name, "alpha");
}

TEST_F(ShareStoreTest, SeesEachStoreAtOnce) {
    for (int round = 0; round < 30; ++round) {
        ShareEntry share = shareCalled("a");
        share.users["ftp"] = round % 2 == 0 ? ShareGrant::none : ShareGrant::read;
        ASSERT_EQ(saveShares({share}), 0);
        ASSERT_EQ(allShares()->at(0).users.at("ftp"), share.users.at("ftp")) << round;
    }
}

TEST_F(ShareStoreTest, AFlawedShareIsNotStored) {
    ASSERT_EQ(saveShares({shareCalled("good")}), 0);
    const std::string before = folder_.read("/etc/velt/shares.json");
    EXPECT_LT(saveShares({shareCalled("good"), shareCalled("a/b")}), 0);
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::invalid));
    EXPECT_NE(lastErrorSentence().find("share 2 (\"a/b\")"), std::string::npos) << lastErrorSentence();
    EXPECT_LT(saveShares({shareCalled("twice"), shareCalled("twice")}), 0);
    EXPECT_EQ(folder_.read("/etc/velt/shares.json"), before);
}

TEST_F(ShareStoreTest, ADamagedFileIsAnErrorThatNamesIt) {
    folder_.write("/etc/velt/shares.json", R"({"version":1,"shares":[{"name":"a"}]})");
    EXPECT_FALSE(allShares());
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::damaged));
    EXPECT_EQ(lastErrorSentence(), (folder_.path() / "etc/velt/shares.json").string() +
                                       " is damaged: share 1 has no text \"path\".");
}

TEST_F(ShareStoreTest, AFileThatCannotBeReadIsAnError) {
    std::filesystem::create_directories(folder_.path() / "etc/velt/shares.json");
    EXPECT_FALSE(allShares());
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::store));
}

TEST_F(ShareStoreTest, AStoreThatIsRefusedLeavesTheFile) {
    ASSERT_EQ(saveShares({shareCalled("old")}), 0);
    std::string seen;
    setEffectHook([&seen](Effect effect, std::string_view subject) {
        seen = std::string(effectName(effect)) + " " + std::string(subject);
        return EffectDecision{false, -1};
    });
    EXPECT_LT(saveShares({shareCalled("new")}), 0);
    EXPECT_EQ(seen, "store shares");
    EXPECT_EQ(allShares()->at(0).name, "old");
}

TEST_F(ShareStoreTest, TwoProcessesThatAddSharesLoseNone) {
    constexpr int each = 20;
    const auto addAll = [](const std::string& prefix) {
        for (int i = 0; i < each; ++i) {
            const StateLock lock;
            std::optional<std::vector<ShareEntry>> shares = allShares();
            if (!lock || !shares) {
                return 1;
            }
            shares->push_back(shareCalled(prefix + std::to_string(i)));
            if (saveShares(*shares) < 0) {
                return 2;
            }
        }
        return 0;
    };
    const pid_t child = fork();
    if (child == 0) {
        _exit(addAll("child"));
    }
    ASSERT_GT(child, 0);
    EXPECT_EQ(addAll("parent"), 0);
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(allShares()->size(), 2U * each);
}

} // namespace
} // namespace velt
