// The host's own log: one line per event, to standard error unless a test redirects it.
#ifndef VELT_HOST_BASE_HOST_LOG_H
#define VELT_HOST_BASE_HOST_LOG_H

#include <chrono>
#include <cstddef>
#include <functional>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>

namespace velt::host {

/// Thread-safe.
class HostLog {
public:
    using Sink = std::function<void(const std::string& line)>;

    /// Writes to standard error; each line begins with the time.
    HostLog();
    explicit HostLog(Sink sink);

    /// Writes a line. Escapes what is not printable, so that nobody can forge a line.
    void write(std::string_view text);

    /// The same, under a request's id.
    void write(std::string_view requestId, std::string_view text);

    /// The same for a refusal, which anybody can cause as often as he likes: at most ten lines in a second,
    /// and the next line tells how many were left out.
    void writeRefusal(std::string_view requestId, std::string_view text);

private:
    /// How many refusals were left out before this one; nothing when it is to be left out, too.
    std::optional<std::size_t> admitRefusal();

    std::mutex mutex_;
    Sink sink_;
    std::chrono::steady_clock::time_point second_; ///< the beginning of the current one
    unsigned refusals_ = 0;                        ///< written in it
    std::size_t leftOut_ = 0;                      ///< refusals since the last that was written
};

} // namespace velt::host

#endif
