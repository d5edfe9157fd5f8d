#include "host/base/file_text.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <utility>

namespace velt::host {

std::optional<std::string> readFileText(const std::filesystem::path& file) {
    // Not a stream: these throw, or say nothing, when a read fails that comes after the opening.
    const int descriptor = ::open(file.c_str(), O_RDONLY | O_CLOEXEC);
    if (descriptor < 0) {
        return std::nullopt;
    }
    std::string text;
    std::array<char, 4096> buffer{};
    ssize_t count = 0;
    do {
        count = ::read(descriptor, buffer.data(), buffer.size());
        text.append(buffer.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
    } while (count > 0 || (count < 0 && errno == EINTR));
    const int error = errno;
    ::close(descriptor);
    errno = error;
    return count == 0 ? std::optional(std::move(text)) : std::nullopt;
}

} // namespace velt::host
