#include "base/utc_text.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/health/checks.h"
#include "standalone/health/mends.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <set>

namespace velt {
namespace {

constexpr std::uint64_t mebibyte = std::uint64_t{1024} * 1024;
constexpr std::uint64_t tooFew = 8 * mebibyte;
constexpr std::uint64_t few = 100 * mebibyte;
constexpr std::uint64_t fewFiles = 100;
constexpr std::uint64_t tenth = 10;

/// A clock may be off by its time zone.
constexpr std::chrono::hours tolerated{24};

Findings diskFindingsOf(const std::filesystem::path& folder, const struct statvfs& disk) {
    const std::uint64_t left = std::uint64_t{disk.f_bavail} * disk.f_frsize;
    const std::uint64_t size = std::uint64_t{disk.f_blocks} * disk.f_frsize;
    const bool noFiles = disk.f_files > 0 && disk.f_favail < fewFiles;
    const bool full = left < tooFew || noFiles;
    if (!full && (left >= few || left >= size / tenth)) {
        return {};
    }
    const std::string room =
        noFiles ? "room for hardly any further file" : std::to_string(left / mebibyte) + " MiB";
    return {{full ? "disk-full" : "disk-space", full ? Severity::error : Severity::warning, "host",
             "Below " + folder.string() + ", where this system keeps its state, there is " + room + " left.",
             "df -h " + folder.string() + " && df -i " + folder.string()}};
}

std::optional<TimePoint> writtenAt(const std::filesystem::path& file) {
    struct stat facts {};
    return ::stat(file.c_str(), &facts) == 0
               ? std::optional(std::chrono::system_clock::from_time_t(facts.st_mtim.tv_sec))
               : std::nullopt;
}

/// One file of each folder in which this system keeps its state.
constexpr std::array stateFiles{paths::ftpSettings, paths::logDatabase, paths::events, paths::loadedRules};

} // namespace

Findings readOnlyFindings() {
    Findings findings;
    for (const std::string_view file : stateFiles) {
        const std::filesystem::path folder = statePath(file).parent_path();
        if (::faccessat(AT_FDCWD, folder.c_str(), W_OK, AT_EACCESS) == 0 || errno != EROFS) {
            continue; // what belongs to others is told where it is needed
        }
        const std::string word = shellWord(folder.string());
        findings.push_back({"state-read-only", Severity::error, "host",
                            "The folder " + folder.string() +
                                ", where this system keeps its state, is mounted read-only: nothing that "
                                "belongs there can be stored.",
                            "mount -o remount,rw \"$(findmnt -n -o TARGET -T " + word + ")\""});
    }
    return findings;
}

Findings diskFindings() {
    Findings findings;
    std::set<unsigned long> seen;
    for (const std::string_view file : stateFiles) {
        const std::filesystem::path folder = statePath(file).parent_path();
        struct statvfs disk {};
        if (::statvfs(folder.c_str(), &disk) == 0 && seen.insert(disk.f_fsid).second) {
            for (Finding& each : diskFindingsOf(folder, disk)) {
                findings.push_back(std::move(each));
            }
        }
    }
    return findings;
}

Findings clockFindings(TimePoint now) {
    const std::array files{std::filesystem::path("/proc/self/exe"), statePath(paths::ftpSettings),
                           statePath(paths::sftpSettings), statePath(paths::chrootRules),
                           statePath(paths::logDatabase)};
    for (const std::filesystem::path& file : files) {
        const auto written = writtenAt(file);
        if (written && *written > now + tolerated) {
            std::error_code error;
            const std::filesystem::path name =
                file == "/proc/self/exe" ? std::filesystem::read_symlink(file, error) : file;
            return {{"clock-wrong", Severity::error, "host",
                     "The clock of this server is wrong: it says " + utcText(now, "%Y-%m-%d %H:%M UTC") +
                         ", but " + name.string() + " was written on " +
                         utcText(*written, "%Y-%m-%d %H:%M UTC") + ".",
                     "timedatectl set-ntp true"}};
        }
    }
    return {};
}

} // namespace velt
