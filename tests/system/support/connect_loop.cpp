#include "tests/system/support/connect_loop.h"

#include "base/unique_fd.h"
#include "tests/system/support/ftp_session.h"

#include <unistd.h>

namespace velt::test {

ConnectLoop::ConnectLoop(int port) : thread_([this, port] { run(port); }) {}

ConnectLoop::~ConnectLoop() {
    stop();
}

void ConnectLoop::stop() {
    ended_ = true;
    if (thread_.joinable()) {
        thread_.join();
    }
}

void ConnectLoop::run(int port) {
    while (!ended_) {
        const UniqueFd connection = connectTo("127.0.0.1", port);
        char first = 0;
        if (!connection) {
            ++refused;
        } else if (::read(connection.get(), &first, 1) == 1) {
            ++greeted;
        } else {
            ++dropped;
        }
    }
}

} // namespace velt::test
