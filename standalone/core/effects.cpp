#include "standalone/core/effects.h"

#include <array>
#include <utility>

namespace velt {

namespace {

EffectHook& threadHook() {
    thread_local EffectHook hook;
    return hook;
}

} // namespace

std::string_view effectName(Effect effect) {
    // In the order of Effect.
    constexpr std::array<std::string_view, 8> names{"store",   "firewall", "stop",  "start",
                                                    "restart", "run key",  "event", "log"};
    return names.at(static_cast<std::size_t>(effect));
}

Result<> perform(Effect effect, std::string_view subject, const std::function<Result<>()>& act) {
    // A copy, since the hook may replace itself while it runs.
    const EffectHook hook = threadHook();
    const EffectDecision decision = hook ? hook(effect, subject) : std::nullopt;
    return decision ? *decision : act();
}

EffectHook setEffectHook(EffectHook hook) {
    return std::exchange(threadHook(), std::move(hook));
}

} // namespace velt
