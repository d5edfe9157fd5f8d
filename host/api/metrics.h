// /metrics: requests and their durations by row and outcome, services up, daemon starts and restarts, health,
// what users do.
#ifndef VELT_HOST_API_METRICS_H
#define VELT_HOST_API_METRICS_H

#include "host/api/events.h"
#include "host/api/health.h"
#include "host/api/route.h"
#include "host/module/module_call.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

namespace velt::host {

/// Thread-safe.
class Metrics {
public:
    Metrics();
    ~Metrics();
    Metrics(const Metrics&) = delete;
    Metrics& operator=(const Metrics&) = delete;

    /// Counts a served request under "success", the module's code, "taken_back" or "defect".
    void countRequest(const Row& row, const Outcome& outcome);

    /// Counts, by its status, an answer that no module took part in.
    void countRefusal(int status);

    void setService(const std::string& service, bool wanted, bool running);

    /// Counts a start that a request asked for.
    void countDaemonStart(const std::string& service);

    /// How often a daemon was restarted after it ended by itself. The count is kept elsewhere and may begin
    /// at 0 again.
    void setDaemonRestarts(const std::string& daemon, std::uint64_t count);

    void setEventReaders(std::size_t count);

    /// Counts what was found by identifier and severity; what is not found any more has a count of 0.
    void setFindings(const Findings& findings);

    /// `lost` records could not be written since the machine began.
    void setActivity(const ActivityTotals& totals, std::uint64_t lost);

    /// The text format of Prometheus.
    std::string text() const;

private:
    struct Families;

    std::unique_ptr<Families> families_;
};

/// All of these outlive the route.
Route metricsRoute(Metrics& metrics, const ModuleTable& table, EventHub& events, HealthMonitor& health);

} // namespace velt::host

#endif
