// Wrong tokens are counted, and their addresses banned, beside the requests.
#ifndef VELT_HOST_API_WRONG_TOKENS_H
#define VELT_HOST_API_WRONG_TOKENS_H

#include "base/turn_queue.h"
#include "host/base/host_log.h"

#include <cstddef>
#include <string>

namespace velt::host {

/// Has a thread of its own, since a ban may wait for whoever changes settings. Thread-safe.
class WrongTokens {
public:
    /// No settings allow more.
    static constexpr int mostOfOne = 1000;

    /// Those of at most `maxSources` sources wait to be counted. The log outlives it.
    explicit WrongTokens(HostLog& log, std::size_t maxSources = 1000);

    /// A wrong token came from this address. Does not block. It is not counted after stop(), when too many
    /// sources wait, or too many tokens of its source do: nobody keeps those of others from being counted.
    void note(const std::string& address);

    /// Finishes the one that is being counted, drops those that wait, and ends the thread. May be called
    /// again; the destructor calls it, too.
    void stop() { waiting_.stop(); }

private:
    void count(const std::string& address);

    HostLog& log_;
    TurnQueue waiting_; // last: its thread uses the log
};

} // namespace velt::host

#endif
