#include "standalone/journal/event_file.h"

#include "base/file.h"
#include "base/utc_text.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <fcntl.h>
#include <json/json.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace velt {

namespace {

constexpr std::size_t longestLine = 65536;

Error cannotWrite(const std::filesystem::path& path, const std::string& why) {
    return {ErrorNumber::event, "Cannot write the event to " + path.string() + ": " + why + "."};
}

/// Its lock keeps other writers from adding their lines in between. Opened again for each line: another
/// writer, or a program of the administrator's, may have renamed it meanwhile.
UniqueFd openLog(const std::filesystem::path& path) {
    return openLocked(path, O_RDWR | O_APPEND, 0640);
}

std::filesystem::path kept(const std::filesystem::path& path, int number) {
    return path.string() + "." + std::to_string(number);
}

/// From the oldest on, so that a process which is killed on the way leaves a number free, and no event lost.
/// Where a file cannot be renamed, the newest grows on: a limit is worth less than an event.
void rotate(const std::filesystem::path& path) {
    for (int number = keptEventFiles - 1; number >= 0; --number) {
        const std::filesystem::path from = number == 0 ? path : kept(path, number);
        if (::rename(from.c_str(), kept(path, number + 1).c_str()) != 0 && errno != ENOENT) {
            ::syslog(LOG_WARNING, "cannot rename %s: %s", from.c_str(), std::strerror(errno));
            return;
        }
    }
}

/// Half a line, as a crash of the machine leaves it, would take the next one with it.
bool endsInALine(int fd, off_t size) {
    char last = '\n';
    return size == 0 || ::pread(fd, &last, 1, size - 1) != 1 || last == '\n';
}

/// A line that does not fit on the disk is taken back, or the next one would be lost with it.
Result<> writeLine(int fd, off_t size, const std::string& line, const std::filesystem::path& path) {
    const ssize_t written = ::write(fd, line.data(), line.size());
    if (written == static_cast<ssize_t>(line.size())) {
        return {};
    }
    const int error = written < 0 ? errno : ENOSPC;
    if (::ftruncate(fd, size) != 0) {
        return cannotWrite(path, std::strerror(error) + std::string("; the last line is incomplete"));
    }
    return cannotWrite(path, std::strerror(error));
}

} // namespace

std::string renderEvent(const SystemEvent& event) {
    Json::Value parameters(Json::objectValue);
    for (const auto& [key, value] : event.parameters) {
        parameters[key] = value;
    }
    Json::Value line(Json::objectValue);
    line["time"] = timestamp(event.time);
    line["event"] = event.name;
    line["parameters"] = std::move(parameters);
    line["actor"] = event.actor;
    line["address"] = event.address;
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = false;
    return Json::writeString(builder, line);
}

Result<> appendEvent(const SystemEvent& event) {
    const std::filesystem::path path = statePath(paths::events);
    const std::string line = renderEvent(event) + "\n";
    if (line.size() > longestLine) {
        return cannotWrite(path, "the event is longer than 64 KiB");
    }
    std::error_code error;
    std::filesystem::create_directories(path.parent_path(), error);
    UniqueFd fd = openLog(path);
    off_t size = fd ? ::lseek(fd.get(), 0, SEEK_END) : -1;
    if (size > 0 && static_cast<std::size_t>(size) + line.size() > largestEventFile) {
        rotate(path);
        fd.reset(); // or the lock of a file that could not be renamed would be waited for
        fd = openLog(path);
        size = fd ? ::lseek(fd.get(), 0, SEEK_END) : -1;
    }
    if (size < 0) {
        return cannotWrite(path, std::strerror(errno));
    }
    return writeLine(fd.get(), size, endsInALine(fd.get(), size) ? line : "\n" + line, path);
}

} // namespace velt
