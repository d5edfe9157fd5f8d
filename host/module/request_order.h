// The order in which requests reach the modules: the callers in turn, reads side by side, writes alone.
#ifndef VELT_HOST_MODULE_REQUEST_ORDER_H
#define VELT_HOST_MODULE_REQUEST_ORDER_H

#include "host/module/waiting_requests.h"

#include <condition_variable>
#include <cstddef>
#include <functional>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace velt::host {

/// The callers take turns, so nobody waits for all that another has asked. What one caller asks is begun in
/// the order in which it came. A write runs alone; from the turn of its caller on, reads wait for it, so that
/// writes do not starve. Requests that need no module have threads of their own, so modules that block do not
/// delay them; and those among them that may take long have another one.
class RequestOrder {
public:
    using Kind = RequestKind;

    /// Tasks must not throw.
    using Task = std::function<void()>;

    /// `threads` are for reads and writes. Of these, of unordered requests and of searches, at most
    /// `maxWaiting` each may wait for one caller, and hold at most `maxWaitingBytes`; one may always wait.
    RequestOrder(unsigned threads, std::size_t maxWaiting, std::size_t maxWaitingBytes);

    /// Calls stop().
    ~RequestOrder();
    RequestOrder(const RequestOrder&) = delete;
    RequestOrder& operator=(const RequestOrder&) = delete;

    /// The task holds so many bytes while it waits. False when too many of this caller's are waiting or
    /// stop() was called; the task is then dropped.
    bool submit(Kind kind, const std::string& caller, Task task, std::size_t bytes = 0);

    /// Finishes what was submitted, then ends the threads. May be called again.
    void stop();

private:
    struct Pool {
        WaitingRequests waiting;
        std::condition_variable changed{};
    };

    Pool& poolOf(Kind kind);
    void start(Pool& pool, unsigned threads);
    void work(Pool& pool);
    bool mayStart(Kind kind) const;
    void note(Kind kind, bool runs);

    std::mutex mutex_;
    Pool ordered_;
    Pool unordered_;
    Pool searches_;
    int reading_ = 0;
    bool writing_ = false;
    bool stopping_ = false;
    std::vector<std::thread> threads_;
};

} // namespace velt::host

#endif
