#include "tests/host/fake_standalone.h"

#include "tests/support/fake_platform/fake_platform.h"

#include <algorithm>
#include <array>
#include <memory>
#include <mutex>
#include <set>
#include <utility>

namespace {

using velt::Effect;

/// Modules of the tests' own are called on several threads; those that call the fake platform are not.
std::mutex mutex;

/// The calling thread's request.
struct Request {
    std::string sentence = "The last error is that of an earlier request.";
};

Request& request() {
    thread_local Request instance;
    return instance;
}

/// The effect that an operation of the contract has, if it has one.
std::optional<Effect> effectOf(const std::string& operation) {
    static const std::set<std::string> storing{
        "VELTFTPConfSet",         "VELTFTPTimeOutSet",      "VELTFTPUseUTF8Set",    "VELTFTPFIPSEnabledSet",
        "VELTFTPASCIIEnabledSet", "VELTFTPUmaskEnabledSet", "VELTFTPAddChrootUser", "VELTFTPDeleteChrootUser",
        "VELTFTPChrootRuleSave",  "VELTSFTPConfigSet",      "VLIBCINFOSetKeyValue"};
    static const std::map<std::string, Effect> others{{"VLIBServiceStart", Effect::start},
                                                      {"VLIBServiceStop", Effect::stop},
                                                      {"VLIBServicecfgRunKeySet", Effect::runKey},
                                                      {"VELTLogSet1", Effect::logEntry},
                                                      {"VLIBSyseventEmit", Effect::event}};
    if (storing.contains(operation)) {
        return Effect::store;
    }
    const auto found = others.find(operation);
    return found == others.end() ? std::nullopt : std::optional(found->second);
}

void tellSubscribers(Effect effect) {
    FakeStandalone& fake = FakeStandalone::instance();
    if (effect == Effect::logEntry) {
        velt::LogEntry entry;
        entry.id = static_cast<std::int64_t>(fake.log.size()) + 1;
        entry.actor = fake.actor;
        entry.address = fake.address;
        fake.log.push_back(entry);
        if (fake.logSubscriber) {
            fake.logSubscriber(entry);
        }
    } else if (effect == Effect::event && fake.eventSubscriber) {
        fake.announce("ftpd", "start");
    }
}

/// What the calls of the contract since then would be steps of a change for.
velt::ChangeSteps stepsSince(std::size_t start) {
    const auto& journal = fake::Platform::instance().journal;
    velt::ChangeSteps steps;
    for (std::size_t i = start; i < journal.size(); ++i) {
        const auto effect = effectOf(fake::Platform::operationOf(journal[i]));
        if (effect == Effect::store || effect == Effect::runKey) {
            steps.push_back({velt::StepKind::store, "settings"});
        } else if (effect == Effect::start || effect == Effect::stop) {
            steps.push_back(
                {*effect == Effect::start ? velt::StepKind::start : velt::StepKind::stop, "sftp"});
        }
    }
    return steps;
}

/// The fake platform takes each call at once; what is not committed is taken back.
class FakeChange final : public velt::SettingsChange {
public:
    ~FakeChange() override {
        if (!committed_) {
            static_cast<fake::State&>(fake::Platform::instance()) = before_;
            FakeStandalone::instance().confinement = confinement_;
        }
    }

    velt::Result<velt::ChangeOutcome> plan(velt::SessionPolicy policy) override {
        const FakeStandalone& fake = FakeStandalone::instance();
        if (fake.planFails) {
            return velt::Error(fake.commitError, fake.sentence);
        }
        return velt::ChangeOutcome{steps(), std::nullopt, true, ended(policy)};
    }

    velt::ChangeOutcome commit(velt::SessionPolicy policy) override {
        FakeStandalone& fake = FakeStandalone::instance();
        if (auto failed = failure(fake)) {
            return std::move(*failed);
        }
        committed_ = true;
        const auto& journal = fake::Platform::instance().journal;
        for (std::size_t i = start_; i < journal.size(); ++i) {
            if (const auto effect = effectOf(fake::Platform::operationOf(journal[i]))) {
                tellSubscribers(*effect);
            }
        }
        return {steps(), std::nullopt, true, ended(policy), fake.warnings};
    }

private:
    static std::optional<velt::ChangeOutcome> failure(const FakeStandalone& fake) {
        const std::lock_guard lock(mutex);
        return fake.commitFails ? std::optional(velt::ChangeOutcome{
                                      {}, velt::Error(fake.commitError, fake.sentence), fake.undone})
                                : std::nullopt;
    }

    velt::ChangeSteps steps() const {
        velt::ChangeSteps all = stepsSince(start_);
        if (FakeStandalone::instance().confinement != confinement_) {
            all.push_back({velt::StepKind::store, "confinement settings"});
        }
        return all;
    }
    static int ended(velt::SessionPolicy policy) { return policy == velt::SessionPolicy::keep ? 0 : 3; }

    const fake::State before_ = static_cast<const fake::State&>(fake::Platform::instance());
    const velt::ConfinementSettings confinement_ = FakeStandalone::instance().confinement;
    const std::size_t start_ = fake::Platform::instance().journal.size();
    bool committed_ = false;
};

} // namespace

FakeStandalone& FakeStandalone::instance() {
    static FakeStandalone fake;
    return fake;
}

void FakeStandalone::announce(const std::string& service, const std::string& action) const {
    velt::SystemEvent event;
    event.name = "velt.service.action";
    event.parameters = {{"SERVICE_NAME", service}, {"SERVICE_ACTION", action}};
    eventSubscriber(event);
}

void FakeStandalone::reset() {
    const std::lock_guard lock(mutex);
    *this = {};
}

void FakeStandalone::failCommits(const std::string& why) {
    const std::lock_guard lock(mutex);
    commitFails = true;
    sentence = why;
}

namespace velt {

Result<std::vector<ServiceSessions>> restartServices(SessionPolicy policy, std::string_view service) {
    FakeStandalone& fake = FakeStandalone::instance();
    fake.askedRestarts.push_back(std::string(service) + (policy == SessionPolicy::end ? " end" : " keep"));
    if (fake.restartFails) {
        return Error(fake.sentence);
    }
    return fake.sessions;
}

ServiceRequest::ServiceRequest(SessionPolicy) {}

ServiceRequest::~ServiceRequest() = default;

Result<std::vector<ServiceSessions>> ServiceRequest::finish() {
    open_ = false;
    return FakeStandalone::instance().sessions;
}

Result<ConfinementSettings> loadConfinementSettings() {
    const FakeStandalone& fake = FakeStandalone::instance();
    return fake.confinementFails ? Result<ConfinementSettings>(Error(fake.sentence)) : fake.confinement;
}

Result<> changeConfinement(const ConfinementSettings& settings) {
    FakeStandalone& fake = FakeStandalone::instance();
    if (fake.confinementFails) {
        return Error(fake.sentence);
    }
    fake.confinement = settings;
    return {};
}

Result<> startEnabledServices() {
    FakeStandalone& fake = FakeStandalone::instance();
    ++fake.starts;
    if (fake.startHelps) {
        fake.down.clear();
    }
    return fake.down.empty() ? Result<>() : Error(fake.down.front().reason);
}

std::vector<ServiceDown> servicesDown() {
    return FakeStandalone::instance().down;
}

std::vector<StoredService> storedServices() {
    const auto& platform = fake::Platform::instance();
    const auto ifReadable = [](bool on) {
        return FakeStandalone::instance().settingsFail ? std::nullopt : std::optional(on);
    };
    return {{"ftp", "ftp", ifReadable((platform.conf.service_flags & VELT_FTP_SERVICE_PLAIN) != 0), 21},
            {"ftps", "ftp", ifReadable((platform.conf.service_flags & VELT_FTP_SERVICE_TLS) != 0), 21},
            {"sftp", "sftp", ifReadable(platform.sftp.enable != 0), 22}};
}

std::map<std::string, std::uint64_t> daemonRestarts() {
    return FakeStandalone::instance().restarts;
}

Findings judgeHealth() {
    FakeStandalone& fake = FakeStandalone::instance();
    if (fake.whileJudged) {
        fake.whileJudged();
    }
    const std::lock_guard lock(mutex);
    ++fake.judgements;
    return fake.findings;
}

Findings judgeSettings() {
    return {};
}

std::string_view severityName(Severity severity) {
    constexpr std::array<std::string_view, 3> names{"notice", "warning", "error"};
    return names.at(static_cast<std::size_t>(severity));
}

void holdServiceWatch() {
    const std::lock_guard lock(mutex);
    ++FakeStandalone::instance().watchHolds;
    ++FakeStandalone::instance().watchHeld;
}

void releaseServiceWatch() {
    const std::lock_guard lock(mutex);
    --FakeStandalone::instance().watchHolds;
}

void clearLastError() {
    const std::lock_guard lock(mutex);
    request().sentence = FakeStandalone::instance().sentence;
}

const std::string& lastErrorSentence() {
    return request().sentence;
}

PortConflict lastPortConflict() {
    return FakeStandalone::instance().conflict;
}

// Between requests it is the system's turn, which no test looks at.
void setRequestActor(const std::string& actor, const std::string& address) {
    const std::lock_guard lock(mutex);
    if (!actor.empty()) {
        FakeStandalone::instance().actor = actor;
        FakeStandalone::instance().address = address;
    }
}

const RequestActor& requestActor() {
    thread_local RequestActor actor;
    return actor;
}

ErrorNumber lastErrorNumber() {
    return FakeStandalone::instance().error;
}

Result<std::unique_ptr<SettingsChange>> SettingsChange::begin(const IntendedPorts& ports) {
    FakeStandalone::instance().intended = ports;
    return std::unique_ptr<SettingsChange>(std::make_unique<FakeChange>());
}

std::string_view stepName(StepKind kind) {
    switch (kind) {
    case StepKind::store:
        return "store";
    case StepKind::start:
        return "start";
    case StepKind::logEntry:
        return "log";
    default:
        return "stop";
    }
}

std::string sentenceOf(std::uint32_t /*event*/, const std::array<std::string, 4>& texts) {
    std::string sentence;
    for (const std::string& text : texts) {
        sentence += (sentence.empty() || text.empty() ? "" : ": ") + text;
    }
    return sentence;
}

Result<> logEvent(int category, int level, unsigned event, const std::array<const char*, 4>& texts) {
    LogEntry entry;
    entry.category = category;
    entry.level = level;
    entry.event = event;
    for (std::size_t i = 0; i < texts.size(); ++i) {
        entry.texts[i] = texts[i] == nullptr ? "" : texts[i];
    }
    FakeStandalone& fake = FakeStandalone::instance();
    const std::lock_guard lock(mutex);
    fake.audit.push_back(sentenceOf(event, entry.texts));
    return fake.logFails ? Result<>(Error(fake.sentence)) : Result<>();
}

Subscription subscribeEvents(EventSubscriber subscriber) {
    FakeStandalone::instance().eventSubscriber = std::move(subscriber);
    return 1;
}

Subscription subscribeLog(LogSubscriber subscriber) {
    FakeStandalone::instance().logSubscriber = std::move(subscriber);
    return 2;
}

void unsubscribe(Subscription subscription) {
    if (subscription == 1) {
        FakeStandalone::instance().eventSubscriber = nullptr;
    } else {
        FakeStandalone::instance().logSubscriber = nullptr;
    }
}

Result<std::vector<LogEntry>> queryLog(const LogFilter& filter) {
    FakeStandalone& fake = FakeStandalone::instance();
    fake.largestLimit = std::max(fake.largestLimit, filter.limit);
    if (fake.logFails) {
        return Error(fake.sentence);
    }
    std::vector<LogEntry> found;
    for (auto entry = fake.log.rbegin(); entry != fake.log.rend(); ++entry) {
        const bool wanted = (!filter.since || entry->time >= *filter.since) &&
                            (!filter.event || entry->event == *filter.event) &&
                            (!filter.actor || entry->actor == *filter.actor) &&
                            (!filter.beforeId || entry->id < *filter.beforeId);
        if (wanted && found.size() < static_cast<std::size_t>(filter.limit)) {
            found.push_back(*entry);
        }
    }
    return found;
}

} // namespace velt
