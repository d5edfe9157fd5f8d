// The order in which requests reach the modules: reads side by side, writes alone, in the order of their
// arrival.
#ifndef VELT_HOST_REQUEST_ORDER_H
#define VELT_HOST_REQUEST_ORDER_H

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

namespace velt::host {

/// A pool of threads. No read runs while a write runs, and no two writes run at once; a read that comes after
/// a waiting write waits for it too, so that writes do not starve. No thread waits in a lock for another's
/// turn.
class RequestOrder {
public:
    enum class Kind {
        read,
        write,
        unordered, ///< needs no module: runs beside anything
    };

    /// Tasks must not throw.
    using Task = std::function<void()>;

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

    void work();
    bool mayStart(Kind kind) const;
    std::deque<Waiting>* nextQueue();
    void started(Kind kind);
    void finished(Kind kind);

    const std::size_t maxWaiting_;
    std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Waiting> ordered_;
    std::deque<Waiting> unordered_;
    int reading_ = 0;
    bool writing_ = false;
    bool stopping_ = false;
    std::vector<std::thread> threads_;
};

} // namespace velt::host

#endif
