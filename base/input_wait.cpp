#include "base/input_wait.h"

#include <poll.h>

#include <algorithm>
#include <cerrno>

namespace velt {

bool waitForInput(int descriptor, std::chrono::steady_clock::time_point deadline) {
    for (;;) {
        const auto left =
            std::chrono::ceil<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
        pollfd event{descriptor, POLLIN, 0};
        const int result = ::poll(&event, 1, static_cast<int>(std::max<long long>(left.count(), 0)));
        if (result >= 0 || errno != EINTR) {
            return result > 0;
        }
    }
}

} // namespace velt
