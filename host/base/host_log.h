// The host's own log: one line per event, to standard error, or to where a test wants it.
#ifndef VELT_HOST_BASE_HOST_LOG_H
#define VELT_HOST_BASE_HOST_LOG_H

#include <functional>
#include <mutex>
#include <string>
#include <string_view>

namespace velt::host {

/// Thread-safe.
class HostLog {
public:
    using Sink = std::function<void(const std::string& line)>;

    /// Writes to standard error, each line beginning with the time.
    HostLog();
    explicit HostLog(Sink sink);

    /// Writes a line; what is not printable in `text` is escaped, so that nobody can write a line of his own.
    void write(std::string_view text);

    /// The same, under the id of the request that it belongs to.
    void write(std::string_view requestId, std::string_view text);

private:
    std::mutex mutex_;
    Sink sink_;
};

} // namespace velt::host

#endif
