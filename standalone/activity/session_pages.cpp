#include "standalone/activity/session_pages.h"

#include "base/file.h"
#include "base/number_text.h"
#include "base/unique_fd.h"
#include "base/utf8.h"
#include "standalone/activity/ended_session.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstddef>
#include <cstring>

namespace velt {
namespace {

static_assert(paths::sessions == VELT_SESSIONS_FOLDER);
static_assert(paths::lostRecords == VELT_LOST_FILE);

std::optional<unsigned long long> shortNumber(std::string_view text) {
    unsigned long long number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number, 36);
    return error == std::errc() && end == text.data() + text.size() ? std::optional(number) : std::nullopt;
}

/// Read, not mapped: whatever becomes of the file, reading it ends nobody.
bool readAt(int file, void* place, std::size_t size, std::size_t offset) {
    return ::pread(file, place, size, static_cast<off_t>(offset)) == static_cast<ssize_t>(size);
}

/// The page at one moment; one that is written to all the time, as it is.
std::optional<velt_session_page> readPage(int file) {
    constexpr int mostTries = 100;
    velt_session_page page{};
    for (int i = 0; i < mostTries; ++i) {
        std::uint32_t before = 0;
        std::uint32_t after = 0;
        if (!readAt(file, &before, sizeof before, offsetof(velt_session_page, changes)) ||
            !readAt(file, &page, sizeof page, 0) ||
            !readAt(file, &after, sizeof after, offsetof(velt_session_page, changes))) {
            return std::nullopt;
        }
        if (before % 2 == 0 && before == after) {
            break;
        }
    }
    return page;
}

/// Nothing when it cannot be told.
std::optional<off_t> sizeOf(int file) {
    struct stat status {};
    return ::fstat(file, &status) == 0 && S_ISREG(status.st_mode) ? std::optional(status.st_size)
                                                                  : std::nullopt;
}

/// A session holds its lock as long as one of its processes lives. Shared, so that two who ask at once get
/// the same answer.
bool isAbandoned(int file) {
    return ::flock(file, LOCK_SH | LOCK_NB) == 0;
}

void visitOne(int folder, const SessionName& name,
              const std::function<void(const SessionName&, const velt_session_page&)>& visit) {
    const UniqueFd file(::openat(folder, name.text.c_str(), O_RDWR | O_NOFOLLOW | O_CLOEXEC));
    if (!file) {
        return;
    }
    const bool abandoned = isAbandoned(file.get());
    const auto page = sizeOf(file.get()) == velt_page_size ? readPage(file.get()) : std::nullopt;
    const bool shown = page && page->form == velt_page_form;
    if (shown && !abandoned) {
        if (page->closed == 0) {
            visit(name, *page);
        }
    } else if (sizeOf(file.get()) == 0 ||
               (abandoned && (!shown || page->closed != 0 || recordEndedSession(name, *page)))) {
        ::unlinkat(folder, name.text.c_str(), 0);
    }
}

} // namespace

std::optional<SessionName> parseSessionName(std::string_view text) {
    const auto first = text.find('-');
    const auto second = first == std::string_view::npos ? first : text.find('-', first + 1);
    if (second == std::string_view::npos || text.size() >= velt_session_name_size) {
        return std::nullopt;
    }
    const auto pid = shortNumber(text.substr(0, first));
    const auto start = shortNumber(text.substr(first + 1, second - first - 1));
    const auto boot = text.substr(second + 1);
    const bool isBoot = boot.size() == 8 && boot.find_first_not_of("0123456789abcdef") == boot.npos;
    if (!pid || *pid == 0 || *pid > INT32_MAX || !start || !isBoot) {
        return std::nullopt;
    }
    return SessionName{std::string(text), {static_cast<pid_t>(*pid), *start}, std::string(boot)};
}

std::string pageText(std::string_view field) {
    constexpr std::string_view digits = "0123456789ABCDEF";
    field = field.substr(0, field.find('\0'));
    std::string text;
    while (!field.empty()) {
        const std::size_t length = firstUtf8Character(field).length;
        if (length > 0) {
            text += field.substr(0, length);
        } else {
            const auto octet = static_cast<unsigned char>(field.front());
            text += {'%', digits[octet / 16], digits[octet % 16]};
        }
        field.remove_prefix(std::max<std::size_t>(length, 1));
    }
    return text;
}

std::chrono::system_clock::time_point pageTime(std::int64_t microseconds) {
    constexpr std::int64_t last = 9'000'000'000'000'000; ///< in the year 2255; a clock counts nanoseconds
    return std::chrono::system_clock::time_point(
        std::chrono::microseconds(std::clamp<std::int64_t>(microseconds, 0, last)));
}

Result<>
visitSessionPages(const std::function<void(const SessionName& name, const velt_session_page& page)>& visit) {
    const auto path = statePath(paths::sessions);
    const UniqueFd folder(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder) {
        return errno == ENOENT ? Result<>() : cannot("open", path);
    }
    std::error_code error;
    for (std::filesystem::directory_iterator entry(path, error), end; !error && entry != end;
         entry.increment(error)) {
        if (const auto name = parseSessionName(entry->path().filename().string())) {
            visitOne(folder.get(), *name, visit);
        }
    }
    return error ? cannot("list", path, error.value()) : Result<>();
}

Result<bool> noteSessionEnd(const SessionName& name, const std::string& by, const std::string& reason) {
    const auto path = statePath(paths::sessions) / name.text;
    const UniqueFd file(::open(path.c_str(), O_RDWR | O_NOFOLLOW | O_CLOEXEC));
    if (!file) {
        return errno == ENOENT ? Result<bool>(false) : cannot("open", path);
    }
    if (sizeOf(file.get()) != velt_page_size) {
        return false;
    }
    const auto note = [&file](const std::string& text, std::size_t size, std::size_t place) {
        std::string field = text.substr(0, size - 1);
        field.resize(size);
        return ::pwrite(file.get(), field.data(), size, static_cast<off_t>(place)) ==
               static_cast<ssize_t>(size);
    };
    const bool noted =
        note(reason, sizeof(velt_session_page::end_reason), offsetof(velt_session_page, end_reason)) &&
        note(by, sizeof(velt_session_page::ended_by), offsetof(velt_session_page, ended_by));
    return noted ? Result<bool>(true) : cannot("write", path);
}

} // namespace velt
