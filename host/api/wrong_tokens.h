// Wrong tokens are counted, and their addresses banned, beside the requests.
#ifndef VELT_HOST_API_WRONG_TOKENS_H
#define VELT_HOST_API_WRONG_TOKENS_H

#include "host/base/host_log.h"

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <mutex>
#include <string>
#include <thread>

namespace velt::host {

/// Has a thread of its own, since a ban may wait for whoever changes settings. Thread-safe.
class WrongTokens {
public:
    /// At most `maxWaiting` wait to be counted. The log outlives it.
    explicit WrongTokens(HostLog& log, std::size_t maxWaiting = 1000);

    /// Calls stop().
    ~WrongTokens();
    WrongTokens(const WrongTokens&) = delete;
    WrongTokens& operator=(const WrongTokens&) = delete;

    /// A wrong token came from this address. Does not block; when too many wait, or after stop(), it is not
    /// counted.
    void note(const std::string& address);

    /// Finishes the one that is being counted, drops those that wait, and ends the thread. May be called
    /// again.
    void stop();

private:
    void run();
    void count(const std::string& address);

    HostLog& log_;
    const std::size_t maxWaiting_;
    std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<std::string> waiting_;
    bool stopping_ = false;
    std::thread thread_; // last: it uses the others
};

} // namespace velt::host

#endif
