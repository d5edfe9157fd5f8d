#include "host/metrics.h"

#include <prometheus/counter.h>
#include <prometheus/gauge.h>
#include <prometheus/histogram.h>
#include <prometheus/registry.h>
#include <prometheus/text_serializer.h>

namespace velt::host {

namespace {

// Reads take milliseconds; a change restarts daemons, which takes seconds.
const prometheus::Histogram::BucketBoundaries durations{0.001, 0.003, 0.01, 0.03, 0.1, 0.3, 1, 3, 10, 30};

std::map<std::string, std::string> labelsOf(const Row& row, const Outcome& outcome) {
    std::string result = "success";
    if (outcome.kind != Outcome::Kind::success) {
        result = outcome.kind == Outcome::Kind::refused ? std::to_string(outcome.code) : "defect";
    }
    return {{"api", row.api},
            {"version", std::to_string(row.version)},
            {"method", row.method},
            {"outcome", result}};
}

} // namespace

struct Metrics::Families {
    prometheus::Registry registry;
    prometheus::Family<prometheus::Counter>& requests = prometheus::BuildCounter()
                                                            .Name("velt_requests_total")
                                                            .Help("Requests served by a module")
                                                            .Register(registry);
    prometheus::Family<prometheus::Histogram>& durations = prometheus::BuildHistogram()
                                                               .Name("velt_request_duration_seconds")
                                                               .Help("Time that a module took for a request")
                                                               .Register(registry);
    prometheus::Family<prometheus::Counter>& refusals =
        prometheus::BuildCounter()
            .Name("velt_refused_requests_total")
            .Help("Requests refused before they reached a module")
            .Register(registry);
    prometheus::Family<prometheus::Gauge>& services =
        prometheus::BuildGauge().Name("velt_service_up").Help("Whether a service is on").Register(registry);
    prometheus::Family<prometheus::Counter>& starts =
        prometheus::BuildCounter()
            .Name("velt_daemon_starts_total")
            .Help("Starts and restarts of a daemon since the host started")
            .Register(registry);
};

Metrics::Metrics() : families_(std::make_unique<Families>()) {}

Metrics::~Metrics() = default;

void Metrics::countRequest(const Row& row, const Outcome& outcome) {
    const auto labels = labelsOf(row, outcome);
    families_->requests.Add(labels).Increment();
    families_->durations.Add(labels, durations).Observe(outcome.seconds);
}

void Metrics::countRefusal(int status) {
    families_->refusals.Add({{"status", std::to_string(status)}}).Increment();
}

void Metrics::setServiceUp(const std::string& service, bool up) {
    families_->services.Add({{"service", service}}).Set(up ? 1 : 0);
}

void Metrics::countDaemonStart(const std::string& service) {
    families_->starts.Add({{"service", service}}).Increment();
}

std::string Metrics::text() const {
    return prometheus::TextSerializer().Serialize(families_->registry.Collect());
}

} // namespace velt::host
