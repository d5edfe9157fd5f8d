// Changes that nobody confirms in time are taken back.
#ifndef VELT_HOST_API_CONFIRMATION_WATCH_H
#define VELT_HOST_API_CONFIRMATION_WATCH_H

#include "host/api/history.h"
#include "host/module/request_order.h"

#include <condition_variable>
#include <mutex>
#include <thread>

namespace velt::host {

/// Looks after the changes that wait, those from before its start included, on a thread of its own, which
/// sleeps while nothing waits.
class ConfirmationWatch {
public:
    /// Both outlive it.
    ConfirmationWatch(History& history, RequestOrder& order);
    ~ConfirmationWatch();
    ConfirmationWatch(const ConfirmationWatch&) = delete;
    ConfirmationWatch& operator=(const ConfirmationWatch&) = delete;

    /// A change was made that waits for its confirmation. Thread-safe.
    void wake();

private:
    void run();
    bool takeBack();

    History& history_;
    RequestOrder& order_;
    std::mutex mutex_;
    std::condition_variable changed_;
    bool stopping_ = false;
    bool woken_ = false;
    std::thread thread_; // last: it uses the others
};

} // namespace velt::host

#endif
