#include "standalone/shares/share_store.h"

#include "base/file.h"
#include "platform/core.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/error_number.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <thread>

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

    test::TemporaryFolder folder_;
};

TEST_F(ShareStoreTest, HasNoSharesWithoutTheFile) {
    const auto shares = loadShares();
    ASSERT_TRUE(shares);
    EXPECT_TRUE(shares->empty());
}

TEST_F(ShareStoreTest, GivesTheFileInItsOrder) {
    ASSERT_EQ(messageOf(test::storeShares({shareCalled("zebra"), shareCalled("alpha")})), "");
    const auto shares = loadShares();
    ASSERT_TRUE(shares);
    ASSERT_EQ(shares->size(), 2U);
    EXPECT_EQ((*shares)[0].name, "zebra");
    EXPECT_EQ((*shares)[1].name, "alpha");
}

// The old file is a pipe, so that it can be exchanged in the very middle of its reading.
TEST_F(ShareStoreTest, SeesAChangeThatCameWhileTheFormerFileWasRead) {
    ASSERT_EQ(messageOf(test::storeShares({shareCalled("new")})), "");
    const auto file = folder_.path() / "etc/velt/shares.json";
    const auto aside = folder_.path() / "aside";
    std::filesystem::rename(file, aside);
    ASSERT_EQ(mkfifo(file.c_str(), 0600), 0);
    std::thread writer([&] {
        const UniqueFd pipe(open(file.c_str(), O_WRONLY | O_CLOEXEC));
        EXPECT_TRUE(
            writeAll(pipe.get(), R"({"version": 1, "shares": [{"name": "old", "path": "/srv/old"}]})"));
        std::filesystem::rename(aside, file);
    });
    const auto former = loadShares();
    writer.join();
    ASSERT_EQ(messageOf(former), "");
    EXPECT_EQ(former->at(0).name, "old");
    EXPECT_EQ(loadShares()->at(0).name, "new");
}

TEST_F(ShareStoreTest, SeesEachChangeAtOnce) {
    for (int round = 0; round < 30; ++round) {
        ShareEntry share = shareCalled("a");
        share.users["ftp"] = round % 2 == 0 ? Access::none : Access::read;
        ASSERT_EQ(messageOf(test::storeShares({share})), "");
        ASSERT_EQ(loadShares()->at(0).users.at("ftp"), share.users.at("ftp")) << round;
    }
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
            if (!test::storeShares(*shares)) {
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
