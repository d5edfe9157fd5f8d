// The order in which requests reach the modules: in the order of arrival, reads side by side, writes alone.
#ifndef VELT_HOST_MODULE_REQUEST_ORDER_H
#define VELT_HOST_MODULE_REQUEST_ORDER_H

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

namespace velt::host {

/// A write runs alone; a read that comes after a waiting write waits for it, so that writes do not starve.
/// Requests that need no module have threads of their own, so modules that block do not delay them; and those
/// among them that may take long have another one.
class RequestOrder {
public:
    enum class Kind {
        read,
        write,
        unordered, ///< needs no module: runs beside anything
        search,    ///< the same, but may take long: one at a time
    };

    /// Tasks must not throw.
    using Task = std::function<void()>;

    /// `threads` are for reads and writes. Of these, of unordered requests and of searches, at most
    /// `maxWaiting` each may wait, and hold at most `maxWaitingBytes`.
    RequestOrder(unsigned threads, std::size_t maxWaiting, std::size_t maxWaitingBytes);

    /// Calls stop().
    ~RequestOrder();
    RequestOrder(const RequestOrder&) = delete;
    RequestOrder& operator=(const RequestOrder&) = delete;

    /// The task holds so many bytes while it waits. False when too many are waiting or stop() was called; the
    /// task is then dropped.
    bool submit(Kind kind, Task task, std::size_t bytes = 0);

    /// Finishes what was submitted, then ends the threads. May be called again.
    void stop();

private:
    struct Waiting {
        Kind kind;
        Task task;
        std::size_t bytes;
    };

    struct Pool {
        std::deque<Waiting> queue;
        std::size_t bytes = 0; ///< that the waiting ones hold
        std::condition_variable changed;
    };

    Pool& poolOf(Kind kind);
    void start(Pool& pool, unsigned threads);
    void work(Pool& pool);
    bool mayStart(Kind kind) const;
    void note(Kind kind, bool runs);

    const std::size_t maxWaiting_;
    const std::size_t maxWaitingBytes_;
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
