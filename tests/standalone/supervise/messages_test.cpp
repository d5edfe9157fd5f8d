// The texts by which supervisors and their callers understand each other.

#include "standalone/supervise/control_channel.h"
#include "standalone/supervise/daemon_state.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

namespace velt {
namespace {

TEST(ControlRequests, ComeBackAsTheyWereSent) {
    const ControlRequest request{
        Command::start, {"hash with blanks", {21, 65535}, {"/bin/x", "", "two words", "line\nbreak"}}};
    const auto read = decodeRequest(encodeRequest(request));
    ASSERT_TRUE(read);
    EXPECT_EQ(read->command, Command::start);
    EXPECT_EQ(read->order.configurationHash, request.order.configurationHash);
    EXPECT_EQ(read->order.ports, request.order.ports);
    EXPECT_EQ(read->order.arguments, request.order.arguments);
    EXPECT_EQ(decodeRequest(encodeRequest({Command::pause, {}}))->command, Command::pause);
    EXPECT_EQ(decodeRequest(encodeRequest({Command::stop, {}}))->command, Command::stop);
}

TEST(ControlRequests, OfAnotherFormAreRefused) {
    using namespace std::string_literals;
    for (const std::string& message :
         {""s, "start"s, "restart\0"s, "start\0"s, "start\0hash\0"s, "start\0hash\0x\0/bin/x\0"s,
          "start\0hash\0-1\0/bin/x\0"s, "start\0hash\0002\00021\0"s, "start\0hash\0001\00021\0"s,
          "start\0hash\0002147483647\0/bin/x\0"s}) {
        EXPECT_FALSE(decodeRequest(message)) << testing::PrintToString(message);
    }
}

class StateFile : public testing::Test {
protected:
    void TearDown() override { std::filesystem::remove(file_); }

    std::filesystem::path file_ =
        std::filesystem::temp_directory_path() / ("velt-state-" + std::to_string(::getpid()));
};

TEST_F(StateFile, ComesBackAsItWasWritten) {
    const DaemonState state{RunState::failed,       {10, 100},   {11, 110},   "a hash", {21, 22},
                            {{12, 120}, {13, 130}}, {{14, 140}}, "two\nlines"};
    ASSERT_TRUE(storeDaemonState(file_, state));
    const auto read = loadDaemonState(file_);
    ASSERT_TRUE(read);
    EXPECT_EQ(read->state, state.state);
    EXPECT_EQ(read->supervisor, state.supervisor);
    EXPECT_EQ(read->daemon, state.daemon);
    EXPECT_EQ(read->configurationHash, state.configurationHash);
    EXPECT_EQ(read->ports, state.ports);
    EXPECT_EQ(read->sessions, state.sessions);
    EXPECT_EQ(read->retired, state.retired);
    EXPECT_EQ(read->reason, "two lines");
}

TEST_F(StateFile, IsNotMadeOfAnotherText) {
    EXPECT_FALSE(loadDaemonState(file_));
    std::ofstream(file_) << "state running\n";
    EXPECT_FALSE(loadDaemonState(file_));
    std::ofstream(file_) << "velt-supervise 2\nboot " << bootId() << "\nstate dancing\ndaemon x y\nport\n";
    const auto read = loadDaemonState(file_);
    ASSERT_TRUE(read);
    EXPECT_EQ(read->state, RunState::stopped);
    EXPECT_FALSE(read->daemon);
}

TEST_F(StateFile, OfAnotherBootIsNone) {
    const auto self = identifyProcess(::getpid());
    ASSERT_TRUE(self);
    ASSERT_FALSE(bootId().empty());
    for (const std::string& boot : {"boot " + bootId() + "\n", "boot 0" + bootId() + "\n", std::string()}) {
        std::ofstream(file_) << "velt-supervise 2\n"
                             << boot << "state running\ndaemon " << self->pid << ' ' << self->startTime
                             << '\n';
        EXPECT_EQ(loadDaemonState(file_).has_value(), boot == "boot " + bootId() + "\n") << boot;
    }
}

} // namespace
} // namespace velt
