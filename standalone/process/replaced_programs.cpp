#include "standalone/process/replaced_programs.h"

#include "base/file.h"
#include "base/text.h"

#include <filesystem>

namespace velt {
namespace {

constexpr std::string_view deletedMark = " (deleted)";

/// Memory that has a name and never was a file that somebody replaces.
bool isMemory(std::string_view path) {
    return path.starts_with("/memfd:") || path.starts_with("/dev/") || path.starts_with("/SYSV");
}

std::string withoutMark(std::string_view path) {
    return std::string(path.substr(0, path.size() - deletedMark.size()));
}

} // namespace

std::optional<std::string> replacedLibraryIn(std::string_view maps) {
    constexpr std::string_view runnable = "x";
    constexpr std::size_t permissionsLength = 4;
    while (!maps.empty()) {
        const std::string_view line = cut(maps, '\n');
        const auto permissions = line.find(' ') + 1;
        const auto path = line.find('/');
        if (permissions == 0 || path == std::string_view::npos || !line.ends_with(deletedMark)) {
            continue;
        }
        const bool runs =
            line.substr(permissions, permissionsLength).find(runnable) != std::string_view::npos;
        if (runs && !isMemory(line.substr(path))) {
            return withoutMark(line.substr(path));
        }
    }
    return std::nullopt;
}

std::optional<std::string> replacedFileOf(pid_t pid) {
    const std::filesystem::path process = "/proc/" + std::to_string(pid);
    std::error_code error;
    const std::string program = std::filesystem::read_symlink(process / "exe", error).string();
    if (!error && program.ends_with(deletedMark)) {
        return withoutMark(program);
    }
    const auto maps = readFile(process / "maps");
    return maps ? replacedLibraryIn(*maps) : std::nullopt;
}

} // namespace velt
