// Wrong tokens are counted, and their addresses banned, beside the requests.
#ifndef VELT_HOST_API_WRONG_TOKENS_H
#define VELT_HOST_API_WRONG_TOKENS_H

#include "host/base/host_log.h"

#include <condition_variable>
#include <cstddef>
#include <list>
#include <mutex>
#include <string>
#include <thread>

namespace velt::host {

/// Has a thread of its own, since a ban may wait for whoever changes settings. Thread-safe.
class WrongTokens {
public:
    /// No settings allow more.
    static constexpr int mostOfOne = 1000;

    /// Those of at most `maxSources` sources wait to be counted. The log outlives it.
    explicit WrongTokens(HostLog& log, std::size_t maxSources = 1000);

    /// Calls stop().
    ~WrongTokens();
    WrongTokens(const WrongTokens&) = delete;
    WrongTokens& operator=(const WrongTokens&) = delete;

    /// A wrong token came from this address. Does not block. It is not counted after stop(), when too many
    /// sources wait, or too many tokens of its source do: nobody keeps those of others from being counted.
    void note(const std::string& address);

    /// Finishes the one that is being counted, drops those that wait, and ends the thread. May be called
    /// again.
    void stop();

private:
    struct Waiting {
        std::string source;
        std::string address; ///< one of the source
        int tokens = 0;
    };

    void run();
    std::string takeNext();
    void count(const std::string& address);

    HostLog& log_;
    const std::size_t maxSources_;
    std::mutex mutex_;
    std::condition_variable changed_;
    std::list<Waiting> waiting_; ///< in the order of their turns
    bool stopping_ = false;
    std::thread thread_; // last: it uses the others
};

} // namespace velt::host

#endif
