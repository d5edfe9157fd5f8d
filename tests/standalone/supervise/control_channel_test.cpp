// A supervisor's end of its channel, and who may speak there.
#include "standalone/supervise/control_channel.h"

#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <thread>

namespace velt::test {
namespace {

class ControlChannel : public testing::Test {
protected:
    void SetUp() override {
        auto listener = ControlListener::open(folder_.path(), "x");
        ASSERT_EQ(messageOf(listener), "");
        listener_.emplace(std::move(*listener));
    }

    /// Asks for a pause as another user; what comes back.
    std::optional<Result<SessionCount>> askAs(uid_t uid) {
        // Whoever could get at the socket, by a mistake of an administrator's.
        chmod(folder_.path().c_str(), 0755);
        for (const auto& file : std::filesystem::directory_iterator(folder_.path())) {
            chmod(file.path().c_str(), 0777);
        }
        std::optional<Result<SessionCount>> answer;
        // The system call, unlike the library's function, changes this thread alone.
        std::thread asking([&] {
            syscall(SYS_setresuid, uid, uid, uid);
            answer = askSupervisor(folder_.path(), "x", {Command::pause, {}}, std::chrono::seconds(10));
        });
        listener_->serve([this](const ControlRequest& request) {
            commands_.push_back(request.command);
            return Result<SessionCount>(SessionCount{1, 2});
        });
        asking.join();
        return answer;
    }

    TemporaryFolder folder_;
    std::optional<ControlListener> listener_;
    std::vector<Command> commands_;
};

TEST_F(ControlChannel, obeysItsOwnUser) {
    const auto answer = askAs(geteuid());
    ASSERT_TRUE(answer);
    EXPECT_EQ(messageOf(*answer), "");
    EXPECT_EQ(**answer, (SessionCount{1, 2}));
    EXPECT_EQ(commands_, std::vector<Command>{Command::pause});
}

TEST_F(ControlChannel, obeysNobodyElse) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "only root can be somebody else";
    }
    EXPECT_FALSE(askAs(54321));
    EXPECT_TRUE(commands_.empty());
}

} // namespace
} // namespace velt::test
