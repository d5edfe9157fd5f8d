#include "standalone/core/effects.h"

#include "standalone/core/last_error.h"

#include <optional>
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

int actAndReport(Effect effect, std::string_view subject, const std::function<int()>& act) {
    // A copy, since the effect may set another one while it runs.
    const EffectReport report = threadReport();
    if (!report)
        return act();
    const auto start = std::chrono::steady_clock::now();
    const auto tell = [&](int result) {
        report(effect, subject, result, std::chrono::steady_clock::now() - start);
    };
    int result = -1;
    try {
        result = act();
    } catch (...) {
        // Part of it may have been done.
        tell(-1);
        throw;
    }
    tell(result);
    return result;
}

ErrorNumber errorOf(Effect effect) {
    switch (effect) {
    case Effect::store:
    case Effect::runKey:
        return ErrorNumber::store;
    case Effect::firewall:
        return ErrorNumber::firewall;
    case Effect::stop:
    case Effect::start:
        return ErrorNumber::daemon;
    case Effect::event:
        return ErrorNumber::event;
    case Effect::logEntry:
        return ErrorNumber::log;
    }
    return ErrorNumber::invalid;
}

} // namespace

std::string_view effectName(Effect effect) {
    switch (effect) {
    case Effect::store:
        return "store";
    case Effect::firewall:
        return "firewall";
    case Effect::stop:
        return "stop";
    case Effect::start:
        return "start";
    case Effect::runKey:
        return "run key";
    case Effect::event:
        return "event";
    case Effect::logEntry:
        return "log";
    }
    return "";
}

int perform(Effect effect, std::string_view subject, const std::function<int()>& act) {
    // A copy, since the hook may replace itself while it runs.
    const EffectHook hook = threadHook();
    const EffectDecision decision = hook ? hook(effect, subject) : EffectDecision{};
    if (decision.doIt)
        return actAndReport(effect, subject, act);
    if (decision.result < 0)
        fail(errorOf(effect), "The effect \"" + std::string(effectName(effect)) + "\" on " +
                                  std::string(subject) + " was refused.");
    return decision.result;
}

Result<> perform(Effect effect, std::string_view subject, const std::function<Result<>()>& act) {
    std::optional<Result<>> outcome;
    const int result = perform(effect, subject, std::function<int()>([&] {
                                   outcome = act();
                                   return *outcome ? 0 : -1;
                               }));
    if (outcome)
        return *outcome;
    return result < 0 ? Result<>(lastErrorAsValue()) : Result<>();
}

void setEffectHook(EffectHook hook) {
    threadHook() = std::move(hook);
}

void setEffectReport(EffectReport report) {
    threadReport() = std::move(report);
}

} // namespace velt
