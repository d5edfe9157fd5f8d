// Every effect of the platform passes here, under a name, so that it can be listed, timed, refused, or failed
// by a test. What was done is reported; undoing it is up to the listener.
#ifndef VELT_STANDALONE_CORE_EFFECTS_H
#define VELT_STANDALONE_CORE_EFFECTS_H

#include "base/result.h"

#include <chrono>
#include <functional>
#include <optional>
#include <string_view>

namespace velt {

enum class Effect {
    store,
    firewall,
    stop,
    start,
    runKey,
    event,
    logEntry,
};

/// The effect's name, for tests: "store", "firewall", "stop", "start", "run key", "event", "log".
std::string_view effectName(Effect effect);

/// Does the effect by calling `act` and returns its outcome. `subject` says what it concerns ("ftp settings",
/// "ftpd", "velt.service.action"). The hook of the calling thread, when there is one, is asked first, and its
/// report, when there is one, is told after.
Result<> perform(Effect effect, std::string_view subject, const std::function<Result<>()>& act);

/// What a hook decides about one effect: nothing, so that it is done, or the outcome of leaving it undone.
using EffectDecision = std::optional<Result<>>;
using EffectHook = std::function<EffectDecision(Effect effect, std::string_view subject)>;

/// Sets the calling thread's hook in place of its former one; an empty function removes it. A change
/// that is staged sets one, and so do tests, which list effects, leave them undone or fail them.
void setEffectHook(EffectHook hook);

/// Told of each effect that was done, or tried, with its outcome (an error, too, when it threw) and what it
/// took. One that lies within another ("host keys" within a start) comes before it. Not told of those that
/// the hook left undone. Must not throw, nor change the last error.
using EffectReport = std::function<void(Effect effect, std::string_view subject, const Result<>& outcome,
                                        std::chrono::nanoseconds duration)>;

/// Sets the calling thread's report in place of its former one; an empty function removes it.
void setEffectReport(EffectReport report);

} // namespace velt

#endif
