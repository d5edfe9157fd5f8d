// The host's own log: one line per event, to standard error unless a test redirects it.
#ifndef VELT_HOST_BASE_HOST_LOG_H
#define VELT_HOST_BASE_HOST_LOG_H

#include "base/rate_limit.h"

#include <chrono>
#include <functional>
#include <mutex>
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
    std::mutex mutex_;
    Sink sink_;
    RateLimit refusals_{10, std::chrono::seconds(1)};
};

} // namespace velt::host

#endif
