// What tests with real processes have in common.
#ifndef VELT_TESTS_STANDALONE_SUPERVISE_DAEMON_TEST_H
#define VELT_TESTS_STANDALONE_SUPERVISE_DAEMON_TEST_H

#include "standalone/process/process_identity.h"
#include "standalone/supervise/daemon_order.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

namespace velt::test {

/// Whether somebody answers on the loopback port.
bool accepts(int port);

/// A connection to the test daemon, that is, one of its sessions.
class Client {
public:
    explicit Client(int port);
    ~Client();
    Client(const Client&) = delete;
    Client& operator=(const Client&) = delete;

    /// Whether the session still answers.
    bool isServed();

private:
    int descriptor_ = -1;
};

/// A socket of this process that listens on a loopback port.
class Listener {
public:
    explicit Listener(int port);
    ~Listener();
    Listener(const Listener&) = delete;
    Listener& operator=(const Listener&) = delete;

private:
    int descriptor_ = -1;
};

/// What starts the test daemon on this port.
DaemonOrder testOrder(int port, const std::string& hash, const std::vector<std::string>& options = {});

/// A state root of the test's own, and the promise that no process outlives the test: whatever detached
/// itself is inherited, and its being there is a failure.
class DaemonTest : public testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;

    /// Reaps what has ended; the processes below this one that remain.
    static std::vector<ProcessId> leftProcesses();

    std::filesystem::path root_;
};

} // namespace velt::test

#endif
