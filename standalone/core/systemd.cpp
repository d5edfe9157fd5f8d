#include "standalone/core/systemd.h"

#include "standalone/core/state_root.h"

#include <filesystem>
#include <system_error>

namespace velt {

bool systemdKeepsSupervisors() {
    // Units are the machine's, so an installation below another root keeps its daemons to itself.
    std::error_code error;
    return std::filesystem::is_directory("/run/systemd/system", error) && statePath("/") == "/";
}

} // namespace velt
