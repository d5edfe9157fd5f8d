#include "standalone/core/effects.h"

#include <array>
#include <utility>

namespace velt {

namespace {

EffectHook& threadHook() {
    thread_local EffectHook hook;
    return hook;
}

EffectReport& threadReport() {
    thread_local EffectReport report;
    return report;
}

Result<> actAndReport(Effect effect, std::string_view subject, const std::function<Result<>()>& act) {
    // A copy, since the effect may set another one while it runs.
    const EffectReport report = threadReport();
    if (!report)
        return act();
    const auto start = std::chrono::steady_clock::now();
    const auto tell = [&](const Result<>& outcome) {
        report(effect, subject, outcome, std::chrono::steady_clock::now() - start);
    };
    try {
        Result<> outcome = act();
        tell(outcome);
        return outcome;
    } catch (...) {
        // Part of it may have been done.
        tell(Error("Unexpected exception."));
        throw;
    }
}

} // namespace

std::string_view effectName(Effect effect) {
    // In the order of Effect.
    constexpr std::array<std::string_view, 7> names{"store",   "firewall", "stop", "start",
                                                    "run key", "event",    "log"};
    return names.at(static_cast<std::size_t>(effect));
}

Result<> perform(Effect effect, std::string_view subject, const std::function<Result<>()>& act) {
    // A copy, since the hook may replace itself while it runs.
    const EffectHook hook = threadHook();
    const EffectDecision decision = hook ? hook(effect, subject) : std::nullopt;
    return decision ? *decision : actAndReport(effect, subject, act);
}

void setEffectHook(EffectHook hook) {
    threadHook() = std::move(hook);
}

void setEffectReport(EffectReport report) {
    threadReport() = std::move(report);
}

} // namespace velt
