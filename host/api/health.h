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

/// Has the server judged on a thread of its own, and keeps the last judgement. Thread-safe.
class HealthMonitor {
public:
    using Judgement = std::shared_ptr<const Findings>;

    HealthMonitor();
    ~HealthMonitor();
    HealthMonitor(const HealthMonitor&) = delete;
    HealthMonitor& operator=(const HealthMonitor&) = delete;

    /// A judgement that is at most a second old; waits for it, which may take seconds.
    Judgement current();

    /// The last judgement; null when there is none, or none of the last two minutes. Does not wait: when it
    /// is older than ten seconds, the next one is begun.
    Judgement latest();

private:
    using Clock = std::chrono::steady_clock;

    void run();
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
