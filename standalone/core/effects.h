// Every effect of the platform passes here, under a name, so that it can be listed, held back, or failed by a
// test.
#ifndef VELT_STANDALONE_CORE_EFFECTS_H
#define VELT_STANDALONE_CORE_EFFECTS_H

#include "base/result.h"

#include <functional>
#include <optional>
#include <string_view>

namespace velt {

enum class Effect {
    store,
    firewall,
    stop,
    start,
    restart, ///< also of what runs as it should
    runKey,
    event,
    logEntry,
};

/// The effect's name, for tests: "store", "firewall", "stop", "start", "restart", "run key", "event", "log".
std::string_view effectName(Effect effect);

/// Does the effect by calling `act` and returns its outcome. `subject` says what it concerns ("ftp settings",
/// "ftpd", "velt.service.action"). The hook of the calling thread, when there is one, is asked first.
Result<> perform(Effect effect, std::string_view subject, const std::function<Result<>()>& act);

/// What a hook decides about one effect: nothing, so that it is done, or the outcome of leaving it undone.
using EffectDecision = std::optional<Result<>>;
using EffectHook = std::function<EffectDecision(Effect effect, std::string_view subject)>;

/// Sets the calling thread's hook in place of its former one, which it returns; an empty function removes it.
/// A change that is staged sets one, and so do tests, which list effects, leave them undone or fail them.
EffectHook setEffectHook(EffectHook hook);

} // namespace velt

#endif
