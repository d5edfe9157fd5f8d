// A client that does nothing but connect.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_CONNECT_LOOP_H
#define VELT_TESTS_SYSTEM_SUPPORT_CONNECT_LOOP_H

#include <atomic>
#include <thread>

namespace velt::test {

/// Connects to the port on loopback again and again, on a thread of its own, and waits for a greeting.
class ConnectLoop {
public:
    explicit ConnectLoop(int port);
    ~ConnectLoop();
    ConnectLoop(const ConnectLoop&) = delete;
    ConnectLoop& operator=(const ConnectLoop&) = delete;

    /// The counts may be read after it.
    void stop();

    int greeted = 0;
    int refused = 0; ///< no connection
    int dropped = 0; ///< a connection without a greeting

private:
    void run(int port);

    std::atomic<bool> ended_ = false;
    std::thread thread_; // last: it uses the others
};

} // namespace velt::test

#endif
