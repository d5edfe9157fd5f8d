// The order in which requests reach the modules: reads side by side, writes alone, in the order of their
// arrival.
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

/// Two pools of threads. No read runs while a write runs, and no two writes run at once; a read that comes
/// after a waiting write waits for it too, so that writes do not starve. What needs no module has threads of
/// its own: modules that block all of theirs do not delay it. No thread waits in a lock for another's turn.
class RequestOrder {
public:
    enum class Kind {
        read,
        write,
        unordered, ///< needs no module: runs beside anything
    };

    /// Tasks must not throw.
    using Task = std::function<void()>;

    /// With so many threads for reads and writes. Of each kind, ordered and unordered, as many as said may
    /// wait.
    RequestOrder(unsigned threads, std::size_t maxWaiting);

    /// Stops as stop() does.
    ~RequestOrder();
    RequestOrder(const RequestOrder&) = delete;
    RequestOrder& operator=(const RequestOrder&) = delete;

    /// False when too many wait, or when stop() was called: the task is dropped then.
    bool submit(Kind kind, Task task);

    /// Finishes what was submitted, then ends the threads. Later calls do nothing.
    void stop();

private:
    struct Waiting {
        Kind kind;
        Task task;
    };

    struct Pool {
        std::deque<Waiting> queue;
        std::condition_variable changed;
    };

    void work(Pool& pool);
    bool mayStart(Kind kind) const;
    void started(Kind kind);
    void finished(Kind kind);

    const std::size_t maxWaiting_;
    std::mutex mutex_;
    Pool ordered_;
    Pool unordered_;
    int reading_ = 0;
    bool writing_ = false;
    bool stopping_ = false;
    std::vector<std::thread> threads_;
};

} // namespace velt::host

#endif
