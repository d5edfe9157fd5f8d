// Programs that were replaced while they run.
#ifndef VELT_STANDALONE_PROCESS_REPLACED_PROGRAMS_H
#define VELT_STANDALONE_PROCESS_REPLACED_PROGRAMS_H

#include <sys/types.h>

#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// The file of the process's program, or of a library or module whose code it runs, that is not the one under
/// that name any more, as after a security update. Nothing when all are, and when this process may not look.
std::optional<std::string> replacedFileOf(pid_t pid);

/// The same, from the text of a process's /proc/PID/maps.
std::optional<std::string> replacedLibraryIn(std::string_view maps);

} // namespace velt

#endif
