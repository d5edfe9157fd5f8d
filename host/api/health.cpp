#include "host/api/health.h"

#include "base/json_value.h"
#include "host/api/problem.h"

#include <algorithm>

namespace velt::host {

namespace {

constexpr std::chrono::seconds longestPause{1};
constexpr std::chrono::seconds goodForProbes{10};
constexpr std::chrono::seconds stale{120};

bool hasAny(const Findings& findings, Severity severity) {
    return std::ranges::find(findings, severity, &Finding::severity) != findings.end();
}

Json::Value toObject(const Finding& finding) {
    return jsonObject({{"id", finding.id},
                       {"severity", std::string(severityName(finding.severity))},
                       {"subject", finding.subject},
                       {"sentence", finding.sentence},
                       {"mend", finding.mend}});
}

HttpResponse answer(const Findings& findings) {
    const auto describe = [](const Finding& finding) { return toObject(finding); };
    return jsonResponse(
        200, jsonObject({{"status", statusOf(findings)}, {"findings", jsonArray(findings, describe)}}));
}

HttpResponse bare(int status, const char* word) {
    return jsonResponse(status, jsonObject({{"status", word}}));
}

HttpResponse readiness(const HealthMonitor::Judgement& judgement) {
    if (!judgement) {
        return bare(503, "unknown");
    }
    return hasAny(*judgement, Severity::error) ? bare(503, "failed") : bare(200, "ok");
}

} // namespace

HealthMonitor::HealthMonitor() : thread_([this] { run(); }) {}

HealthMonitor::~HealthMonitor() {
    {
        const std::lock_guard lock(mutex_);
        ended_ = true;
    }
    changed_.notify_all();
    thread_.join();
}

bool HealthMonitor::isOlderThan(std::chrono::seconds age) const {
    return !judgement_ || Clock::now() - begun_ > age;
}

HealthMonitor::Judgement HealthMonitor::current() {
    std::unique_lock lock(mutex_);
    const auto called = Clock::now();
    // More than once where the one that was being made had begun too early.
    while (!ended_ && (!judgement_ || begun_ < called)) {
        const Judgement former = judgement_;
        asked_ = true;
        changed_.notify_all();
        changed_.wait(lock, [&] { return ended_ || judgement_ != former; });
    }
    return judgement_ ? judgement_ : std::make_shared<const Findings>();
}

HealthMonitor::Judgement HealthMonitor::latest() {
    const std::lock_guard lock(mutex_);
    if (isOlderThan(goodForProbes)) {
        asked_ = true;
        changed_.notify_all();
    }
    return isOlderThan(stale) ? nullptr : judgement_;
}

void HealthMonitor::judgeOnce(std::unique_lock<std::mutex>& lock) {
    asked_ = false;
    lock.unlock();
    const auto begun = Clock::now();
    auto judgement = std::make_shared<const Findings>(judgeHealth());
    lock.lock();
    judgement_ = std::move(judgement);
    begun_ = begun;
    changed_.notify_all();
}

void HealthMonitor::run() {
    std::unique_lock lock(mutex_);
    const auto isEnded = [this] { return ended_; };
    for (;;) {
        changed_.wait(lock, [this] { return ended_ || asked_; });
        if (ended_) {
            return;
        }
        judgeOnce(lock);
        const auto took = Clock::now() - begun_;
        changed_.wait_for(lock, std::min<Clock::duration>(took, longestPause), isEnded);
    }
}

const char* statusOf(const Findings& findings) {
    if (hasAny(findings, Severity::error)) {
        return "failed";
    }
    return hasAny(findings, Severity::warning) ? "degraded" : "ok";
}

std::vector<Route> healthRoutes(HealthMonitor& health) {
    using Kind = RequestOrder::Kind;
    return {
        // Like a search, since it may take long.
        {"GET",
         {"api", "health"},
         false,
         Kind::search,
         [&health](const Call&) { return answer(*health.current()); }},
        // For those who show a token although they need none.
        {"GET", {"healthz"}, false, Kind::unordered, [](const Call&) { return bare(200, "ok"); }},
        {"GET",
         {"readyz"},
         false,
         Kind::unordered,
         [&health](const Call&) { return readiness(health.latest()); }},
    };
}

std::optional<HttpResponse> probeAnswer(const HttpRequest& head, HealthMonitor& health) {
    if (!head.wellFormed || head.method != "GET") {
        return std::nullopt;
    }
    if (head.path() == "/healthz") {
        return bare(200, "ok");
    }
    return head.path() == "/readyz" ? std::optional(readiness(health.latest())) : std::nullopt;
}

} // namespace velt::host
