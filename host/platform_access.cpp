#include "host/platform_access.h"

#include "standalone/standalone.h"

#include <chrono>
#include <memory>
#include <mutex>
#include <utility>

namespace velt::host {

namespace {

/// The observer, and what ties it to the platform.
struct Observation {
    std::mutex mutex;
    std::shared_ptr<const PlatformObserver> observer;
    Subscription events = 0;
    Subscription log = 0;
};

Observation& observation() {
    static Observation instance;
    return instance;
}

std::shared_ptr<const PlatformObserver> currentObserver() {
    const std::lock_guard lock(observation().mutex);
    return observation().observer;
}

thread_local PlatformReport report;

/// Takes note of an effect of this thread's request.
void noteEffect(Effect effect, std::string_view subject, int result, std::chrono::nanoseconds) {
    const bool done = result >= 0;
    if (effect == Effect::store) {
        report.stored = report.stored || done;
        report.storeFailed = report.storeFailed || !done;
    }
    // A daemon whose start or stop failed half-way is not what it was either.
    const bool daemon = effect == Effect::start || effect == Effect::stop;
    report.changed =
        report.changed || daemon || (done && (effect == Effect::store || effect == Effect::runKey));
    const auto observer = currentObserver();
    if (effect == Effect::start && done && observer != nullptr && observer->daemonStarted) {
        observer->daemonStarted(std::string(subject));
    }
}

AdminLogEntry toEntry(const LogEntry& entry) {
    const auto time = entry.time.time_since_epoch();
    return {entry.id,       std::chrono::duration_cast<std::chrono::milliseconds>(time).count(),
            entry.category, entry.level,
            entry.event,    entry.texts,
            entry.sentence, entry.actor,
            entry.address};
}

std::string valueOf(const SystemEvent& event, const char* key) {
    const auto found = event.parameters.find(key);
    return found == event.parameters.end() ? "" : found->second;
}

} // namespace

bool openPlatform(const std::filesystem::path& stateRoot, std::string& error) {
    if (openState(stateRoot) < 0) {
        error = lastErrorSentence();
        return false;
    }
    return true;
}

bool startEnabledServices(std::string& error) {
    if (velt::startEnabledServices() < 0) {
        error = lastErrorSentence();
        return false;
    }
    return true;
}

bool watchServices(std::string& error) {
    if (velt::watchServices() < 0) {
        error = lastErrorSentence();
        return false;
    }
    return true;
}

void unwatchServices() {
    velt::unwatchServices();
}

void observePlatform(PlatformObserver observer) {
    const auto shared = std::make_shared<const PlatformObserver>(std::move(observer));
    {
        const std::lock_guard lock(observation().mutex);
        observation().observer = shared;
    }
    observation().events = subscribeEvents([shared](const SystemEvent& event) {
        if (event.name == "velt.service.action") {
            shared->serviceAction(valueOf(event, "SERVICE_NAME"), valueOf(event, "SERVICE_ACTION"));
        }
    });
    observation().log = subscribeLog([shared](const LogEntry& entry) { shared->logEntry(toEntry(entry)); });
}

void unobservePlatform() {
    unsubscribe(std::exchange(observation().events, 0));
    unsubscribe(std::exchange(observation().log, 0));
    const std::lock_guard lock(observation().mutex);
    observation().observer = nullptr;
}

void beginPlatformRequest(const std::string& actor, const std::string& address) {
    clearLastError();
    setRequestActor(actor, address);
    report = {};
    setEffectReport(noteEffect);
}

PlatformReport endPlatformRequest() {
    setEffectReport({});
    setRequestActor("", "");
    const PortConflict conflict = lastPortConflict();
    report.sentence = lastErrorSentence();
    report.holder = conflict.holder;
    report.port = conflict.port;
    return std::exchange(report, {});
}

std::vector<ServiceDown> servicesDown() {
    std::vector<ServiceDown> down;
    for (const velt::ServiceDown& each : velt::servicesDown()) {
        down.push_back({each.service, each.reason, each.servesFormerSettings});
    }
    return down;
}

std::map<std::string, std::uint64_t> daemonRestarts() {
    return {{"ftp", velt::daemonRestarts("ftpd")}, {"sftp", velt::daemonRestarts("sftp")}};
}

std::optional<std::vector<AdminLogEntry>> queryAdminLog(const AdminLogQuery& query, std::string& error) {
    LogFilter filter;
    if (query.sinceMilliseconds) {
        filter.since =
            std::chrono::system_clock::time_point(std::chrono::milliseconds(*query.sinceMilliseconds));
    }
    filter.event = query.event;
    filter.actor = query.actor;
    filter.beforeId = query.beforeId;
    filter.limit = query.limit;
    const auto entries = queryLog(filter);
    if (!entries) {
        error = lastErrorSentence();
        return std::nullopt;
    }
    std::vector<AdminLogEntry> converted;
    converted.reserve(entries->size());
    for (const LogEntry& entry : *entries) {
        converted.push_back(toEntry(entry));
    }
    return converted;
}

} // namespace velt::host
