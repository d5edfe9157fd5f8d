#include "host/api/metrics.h"

#include "host/api/service_status.h"

#include <prometheus/counter.h>
#include <prometheus/gauge.h>
#include <prometheus/histogram.h>
#include <prometheus/registry.h>
#include <prometheus/text_serializer.h>

#include <array>
#include <map>
#include <mutex>

namespace velt::host {

namespace {

// Reads take milliseconds; a change restarts daemons, which takes seconds.
const prometheus::Histogram::BucketBoundaries durations{0.001, 0.003, 0.01, 0.03, 0.1, 0.3, 1, 3, 10, 30};

constexpr std::array<SessionProtocol, 3> protocols{SessionProtocol::ftp, SessionProtocol::ftps,
                                                   SessionProtocol::sftp};
/// All that the platform counts, so that each is there from the start, as 0.
constexpr std::array<const char*, 6> loginOutcomes{"accepted", "password", "configuration",
                                                   "banned",   "limit",    "other"};

/// What the map has at the key; 0 where it has nothing.
template<class Map> typename Map::mapped_type valueAt(const Map& map, const typename Map::key_type& key) {
    const auto found = map.find(key);
    return found == map.end() ? typename Map::mapped_type{} : found->second;
}

/// A total that is counted elsewhere. It never becomes less.
void raise(prometheus::Counter& counter, std::uint64_t total) {
    const double more = static_cast<double>(total) - counter.Value();
    if (more > 0) {
        counter.Increment(more);
    }
}

std::map<std::string, std::string> labelsOf(const Row& row, const Outcome& outcome) {
    std::string result = outcome.takenBack ? "taken_back" : "success";
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
    using Counters = prometheus::Family<prometheus::Counter>&;
    using Gauges = prometheus::Family<prometheus::Gauge>&;

    Counters counter(const char* name, const char* help) {
        return prometheus::BuildCounter().Name(name).Help(help).Register(registry);
    }
    Gauges gauge(const char* name, const char* help) {
        return prometheus::BuildGauge().Name(name).Help(help).Register(registry);
    }

    prometheus::Registry registry;
    Counters requests = counter("velt_requests_total", "Requests served by a module");
    prometheus::Family<prometheus::Histogram>& durations = prometheus::BuildHistogram()
                                                               .Name("velt_request_duration_seconds")
                                                               .Help("Time a module took for a request")
                                                               .Register(registry);
    Counters refusals =
        counter("velt_refused_requests_total", "Requests refused before they reached a module");
    Gauges wanted = gauge("velt_service_enabled", "Whether a service is switched on");
    Gauges up = gauge("velt_service_up", "Whether a service runs");
    Counters starts = counter("velt_daemon_starts_total", "Service starts that requests asked for");
    Counters restarts = counter("velt_daemon_restarts_total", "Restarts of a daemon that ended by itself");
    Gauges findings = gauge("velt_health_findings", "What /api/health finds wrong");
    prometheus::Gauge& eventReaders = gauge("velt_event_readers", "Open streams of events").Add({});
    Gauges sessions = gauge("velt_sessions", "Sessions that are open");
    Counters octets = counter("velt_transfer_octets_total", "Octets moved by uploads and downloads");
    Counters logins = counter("velt_logins_total", "Logins, by what became of them");
    prometheus::Counter& lost =
        counter("velt_records_lost_total", "Records of what sessions did that could not be written").Add({});
    prometheus::Counter& damaged =
        counter("velt_records_damaged_total", "Lines that sessions wrote and that were no records").Add({});
    std::mutex mutex;
    std::map<std::string, std::uint64_t> seenRestarts;
    std::map<std::map<std::string, std::string>, double> seenFindings; ///< by their labels
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

void Metrics::setService(const std::string& service, bool wanted, bool running) {
    families_->wanted.Add({{"service", service}}).Set(wanted ? 1 : 0);
    families_->up.Add({{"service", service}}).Set(running ? 1 : 0);
}

void Metrics::setDaemonRestarts(const std::string& daemon, std::uint64_t count) {
    const std::lock_guard lock(families_->mutex);
    std::uint64_t& seen = families_->seenRestarts[daemon];
    // Less than before: the count began at 0 again.
    families_->restarts.Add({{"daemon", daemon}})
        .Increment(static_cast<double>(count >= seen ? count - seen : count));
    seen = count;
}

void Metrics::countDaemonStart(const std::string& service) {
    families_->starts.Add({{"service", service}}).Increment();
}

void Metrics::setEventReaders(std::size_t count) {
    families_->eventReaders.Set(static_cast<double>(count));
}

void Metrics::setFindings(const Findings& findings) {
    const std::lock_guard lock(families_->mutex);
    for (auto& [labels, count] : families_->seenFindings) {
        count = 0;
    }
    for (const Finding& each : findings) {
        ++families_->seenFindings[{{"id", each.id}, {"severity", std::string(severityName(each.severity))}}];
    }
    for (const auto& [labels, count] : families_->seenFindings) {
        families_->findings.Add(labels).Set(count);
    }
}

void Metrics::setActivity(const ActivityTotals& totals, std::uint64_t lost) {
    const std::lock_guard lock(families_->mutex);
    for (const SessionProtocol protocol : protocols) {
        const std::string name(protocolName(protocol));
        families_->sessions.Add({{"protocol", name}})
            .Set(static_cast<double>(valueAt(totals.sessions, protocol)));
        const MovedOctets octets = valueAt(totals.octets, protocol);
        raise(families_->octets.Add({{"protocol", name}, {"direction", "upload"}}), octets.in);
        raise(families_->octets.Add({{"protocol", name}, {"direction", "download"}}), octets.out);
        for (const char* const outcome : loginOutcomes) {
            raise(families_->logins.Add({{"protocol", name}, {"outcome", outcome}}),
                  valueAt(totals.logins, {protocol, outcome}));
        }
    }
    raise(families_->lost, lost);
    raise(families_->damaged, totals.damaged);
}

std::string Metrics::text() const {
    return prometheus::TextSerializer().Serialize(families_->registry.Collect());
}

Route metricsRoute(Metrics& metrics, const ModuleTable& table, EventHub& events, HealthMonitor& health) {
    return {"GET", {"metrics"}, false, RequestOrder::Kind::read, [&](const Call& call) {
                for (const Service& each : listServices(table, call.principal)) {
                    metrics.setService(each.name, each.wanted.value_or(true), each.running);
                }
                for (const auto& [daemon, count] : daemonRestarts()) {
                    metrics.setDaemonRestarts(daemon, count);
                }
                metrics.setEventReaders(events.readers());
                metrics.setActivity(activityTotals(), lostRecords());
                if (const auto judgement = health.latest()) {
                    metrics.setFindings(*judgement);
                }
                return HttpResponse{200, "text/plain; version=0.0.4; charset=utf-8", metrics.text(), {}};
            }};
}

} // namespace velt::host
