#include "standalone/shares/share_store.h"

#include "platform/core.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/effects.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/wait.h>
#include <unistd.h>

namespace velt {
namespace {

using test::messageOf;

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
    const auto shares = loadShares();
    ASSERT_TRUE(shares);
    EXPECT_TRUE(shares->empty());
}

TEST_F(ShareStoreTest, GivesBackWhatWasStoredInItsOrder) {
    ASSERT_EQ(messageOf(storeShares({shareCalled("zebra"), shareCalled("alpha")})), "");
    const auto shares = loadShares();
    ASSERT_TRUE(shares);
    ASSERT_EQ(shares->size(), 2U);
    EXPECT_EQ((*shares)[0].name, "zebra");
    EXPECT_EQ((*shares)[1].name, "alpha");
}

TEST_F(ShareStoreTest, SeesEachStoreAtOnce) {
    for (int round = 0; round < 30; ++round) {
        ShareEntry share = shareCalled("a");
        share.users["ftp"] = round % 2 == 0 ? Access::none : Access::read;
        ASSERT_EQ(messageOf(storeShares({share})), "");
        ASSERT_EQ(loadShares()->at(0).users.at("ftp"), share.users.at("ftp")) << round;
    }
}

TEST_F(ShareStoreTest, AFlawedShareIsNotStored) {
    ASSERT_EQ(messageOf(storeShares({shareCalled("good")})), "");
    const std::string before = folder_.read("/etc/velt/shares.json");
    const auto refused = storeShares({shareCalled("good"), shareCalled("a/b")});
    ASSERT_FALSE(refused);
    EXPECT_EQ(refused.error().number, ErrorNumber::invalid);
    EXPECT_NE(refused.error().message.find("share 2, \"name\": expected 1 to 255 bytes"), std::string::npos)
        << messageOf(refused);
    EXPECT_FALSE(storeShares({shareCalled("twice"), shareCalled("twice")}));
    EXPECT_EQ(folder_.read("/etc/velt/shares.json"), before);
}

TEST_F(ShareStoreTest, ADamagedFileIsAnErrorThatNamesIt) {
    folder_.write("/etc/velt/shares.json", R"({"version":1,"shares":[{"name":"a"}]})");
    const auto shares = loadShares();
    ASSERT_FALSE(shares);
    EXPECT_EQ(shares.error().number, ErrorNumber::damaged);
    EXPECT_EQ(shares.error().message,
              (folder_.path() / "etc/velt/shares.json").string() + ": share 1, \"path\": expected a string.");
}

TEST_F(ShareStoreTest, AFileThatCannotBeReadIsAnError) {
    std::filesystem::create_directories(folder_.path() / "etc/velt/shares.json");
    const auto shares = loadShares();
    ASSERT_FALSE(shares);
    fail(shares.error());
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::store));
}

TEST_F(ShareStoreTest, AStoreThatIsRefusedLeavesTheFile) {
    ASSERT_EQ(messageOf(storeShares({shareCalled("old")})), "");
    std::string seen;
    setEffectHook([&seen](Effect effect, std::string_view subject) {
        seen = std::string(effectName(effect)) + " " + std::string(subject);
        return EffectDecision(Error("Refused."));
    });
    EXPECT_EQ(messageOf(storeShares({shareCalled("new")})), "Refused.");
    EXPECT_EQ(seen, "store shares");
    EXPECT_EQ(loadShares()->at(0).name, "old");
}

TEST_F(ShareStoreTest, TwoProcessesThatAddSharesLoseNone) {
    constexpr int each = 20;
    const auto addAll = [](const std::string& prefix) {
        for (int i = 0; i < each; ++i) {
            const auto lock = StateLock::take();
            auto shares = loadShares();
            if (!lock || !shares) {
                return 1;
            }
            shares->push_back(shareCalled(prefix + std::to_string(i)));
            if (!storeShares(*shares)) {
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
    EXPECT_EQ(loadShares()->size(), 2U * each);
}

} // namespace
} // namespace velt
