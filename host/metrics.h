// What /metrics shows: requests and their durations by row and outcome, services up, daemon starts.
#ifndef VELT_HOST_METRICS_H
#define VELT_HOST_METRICS_H

#include "host/module_call.h"

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

    /// Counts a served request under "success", the module's code, or "defect".
    void countRequest(const Row& row, const Outcome& outcome);

    /// Counts an answer that no module had a part in, by its status.
    void countRefusal(int status);

    void setServiceUp(const std::string& service, bool up);
    void countDaemonStart(const std::string& service);

    /// The text format of Prometheus.
    std::string text() const;

private:
    struct Families;

    std::unique_ptr<Families> families_;
};

} // namespace velt::host

#endif
