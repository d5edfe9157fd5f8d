// /api/health, /healthz and /readyz: what is wrong with the server, and what mends it.
#ifndef VELT_HOST_API_HEALTH_H
#define VELT_HOST_API_HEALTH_H

#include "host/api/route.h"
#include "standalone/standalone.h"

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

namespace velt::host {

/// Has the server judged on a thread of its own, and keeps the last judgement. Between two of them it pauses
/// for as long as the former one took, a second at most, so that those who ask and ask leave the machine half
/// of that thread's time. Thread-safe.
class HealthMonitor {
public:
    using Judgement = std::shared_ptr<const Findings>;

    HealthMonitor();
    ~HealthMonitor();
    HealthMonitor(const HealthMonitor&) = delete;
    HealthMonitor& operator=(const HealthMonitor&) = delete;

    /// A judgement that was begun after this was called, so that it knows what the caller has mended; waits
    /// for it, which may take seconds. All who wait when one is begun get the same.
    Judgement current();

    /// The last judgement; null when there is none, or none of the last two minutes. Does not wait: when it
    /// is older than ten seconds, the next one is begun.
    Judgement latest();

private:
    using Clock = std::chrono::steady_clock;

    void run();
    void judgeOnce(std::unique_lock<std::mutex>& lock);
    bool isOlderThan(std::chrono::seconds age) const;

    std::mutex mutex_;
    std::condition_variable changed_;
    Judgement judgement_;
    Clock::time_point begun_; ///< of the last judgement
    bool asked_ = false;
    bool ended_ = false;
    std::thread thread_; // last: it uses the others
};

/// "ok" without findings above a notice, "failed" with an error, else "degraded".
const char* statusOf(const Findings& findings);

/// The monitor outlives the routes.
std::vector<Route> healthRoutes(HealthMonitor& health);

/// The answer to a request for /healthz or /readyz, which need no access since they tell next to nothing;
/// nothing for any other request. Does not wait.
std::optional<HttpResponse> probeAnswer(const HttpRequest& head, HealthMonitor& health);

} // namespace velt::host

#endif
