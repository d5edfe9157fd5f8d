#include "host/base/random_text.h"

#include "base/text.h"

#include <sys/random.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <system_error>

namespace velt::host {

std::string randomHexadecimal(std::size_t bytes) {
    std::string buffer(bytes, '\0');
    std::size_t filled = 0;
    while (filled < bytes) {
        const ssize_t count = getrandom(buffer.data() + filled, bytes - filled, 0);
        if (count < 0 && errno != EINTR) {
            throw std::system_error(errno, std::generic_category(), "getrandom");
        }
        filled += count > 0 ? static_cast<std::size_t>(count) : 0;
    }
    return hexadecimal(buffer);
}

std::string nextRequestId() {
    static const std::string run = randomHexadecimal(4);
    static std::atomic<std::uint64_t> count{0};
    std::array<char, 24> number{};
    std::snprintf(number.data(), number.size(), "-%06llx", static_cast<unsigned long long>(++count));
    return run + number.data();
}

} // namespace velt::host
