// Work that strangers can cause, done beside those who hear of it.
#ifndef VELT_BASE_TURN_QUEUE_H
#define VELT_BASE_TURN_QUEUE_H

#include <condition_variable>
#include <cstddef>
#include <functional>
#include <list>
#include <mutex>
#include <string>
#include <thread>

namespace velt {

/// Calls the work for one item after the other, in a thread of its own. The sources of the items take turns,
/// and what waits has a limit: nobody keeps the items of others from their turn. Thread-safe.
class TurnQueue {
public:
    /// Must not throw.
    using Work = std::function<void(const std::string& item)>;

    struct Limits {
        std::size_t sources = 1000;
        int itemsOfOne = 1000;
    };

    TurnQueue(Work work, Limits limits);

    /// Calls stop().
    ~TurnQueue();
    TurnQueue(const TurnQueue&) = delete;
    TurnQueue& operator=(const TurnQueue&) = delete;

    /// Does not wait for the work. The item is dropped after stop(), when too many sources wait, or too many
    /// items of its source do. Those of one source are taken to be alike: the work is called for the first of
    /// them that waits as many times as there are.
    void add(const std::string& source, const std::string& item);

    /// Waits for the work that is being done, drops what waits, and ends the thread. May be called again.
    void stop();

private:
    struct Waiting {
        std::string source;
        std::string item;
        int times = 0;
    };

    void run();
    std::string takeNext();

    const Work work_;
    const Limits limits_;
    std::mutex mutex_;
    std::condition_variable changed_;
    std::list<Waiting> waiting_; ///< in the order of their turns
    bool stopping_ = false;
    std::thread thread_; // last: it uses the others
};

} // namespace velt

#endif
