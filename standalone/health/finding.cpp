#include "standalone/health/finding.h"

#include <array>

namespace velt {

std::string_view severityName(Severity severity) {
    static constexpr std::array<std::string_view, 3> names{"notice", "warning", "error"};
    return names.at(static_cast<std::size_t>(severity));
}

} // namespace velt
