#include "standalone/change/change_step.h"

#include <array>

namespace velt {

std::string_view stepName(StepKind kind) {
    // In the order of StepKind.
    constexpr std::array<std::string_view, 11> names{"store",      "start", "hand over",    "pause",
                                                     "stop",       "close", "end sessions", "open port",
                                                     "close port", "event", "log"};
    return names.at(static_cast<std::size_t>(kind));
}

} // namespace velt
