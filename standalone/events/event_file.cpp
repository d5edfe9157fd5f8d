#include "standalone/events/event_file.h"

#include "standalone/core/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/core/unique_fd.h"

#include <fcntl.h>
#include <json/json.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>

namespace velt {

namespace {

constexpr std::size_t longestLine = 65536;

/// "2026-11-21T06:30:11.123Z"
std::string renderTime(std::chrono::system_clock::time_point time) {
    const auto seconds = std::chrono::floor<std::chrono::seconds>(time);
    const std::time_t clock = seconds.time_since_epoch().count();
    std::tm parts{};
    gmtime_r(&clock, &parts);
    char date[32];
    std::strftime(date, sizeof date, "%Y-%m-%dT%H:%M:%S", &parts);
    char text[48];
    std::snprintf(text, sizeof text, "%s.%03dZ", date,
                  static_cast<int>(std::chrono::floor<std::chrono::milliseconds>(time - seconds).count()));
    return text;
}

int failToWrite(const std::filesystem::path& path, const char* why) {
    return fail(ErrorNumber::event, "The event cannot be written to " + path.string() + ": " + why + ".");
}

/// A line that does not fit on the disk is taken back, or the next one would be lost with it. The lock keeps
/// other writers from adding theirs in between.
int writeLine(int fd, const std::string& line, const std::filesystem::path& path) {
    if (flock(fd, LOCK_EX) != 0) {
        return failToWrite(path, std::strerror(errno));
    }
    const off_t before = lseek(fd, 0, SEEK_END);
    const ssize_t written = write(fd, line.data(), line.size());
    if (written == static_cast<ssize_t>(line.size())) {
        return 0;
    }
    const int error = written < 0 ? errno : ENOSPC;
    if (before >= 0 && ftruncate(fd, before) != 0) {
        return failToWrite(path, "half a line is left in it");
    }
    return failToWrite(path, std::strerror(error));
}

} // namespace

std::string renderEvent(const SystemEvent& event) {
    Json::Value parameters(Json::objectValue);
    for (const auto& [key, value] : event.parameters) {
        parameters[key] = value;
    }
    Json::Value line(Json::objectValue);
    line["time"] = renderTime(event.time);
    line["event"] = event.name;
    line["parameters"] = std::move(parameters);
    line["actor"] = event.actor;
    line["address"] = event.address;
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = false;
    return Json::writeString(builder, line);
}

int appendEvent(const SystemEvent& event) {
    const std::filesystem::path path = statePath("/var/log/velt/events.jsonl");
    const std::string line = renderEvent(event) + "\n";
    if (line.size() > longestLine) {
        return failToWrite(path, "it is longer than 64 KiB");
    }
    std::error_code error;
    std::filesystem::create_directories(path.parent_path(), error);
    // Opened anew each time, so that the lines that follow a rotation go to the new file.
    const UniqueFd fd(::open(path.c_str(), O_WRONLY | O_APPEND | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0640));
    return fd ? writeLine(fd.get(), line, path) : failToWrite(path, std::strerror(errno));
}

} // namespace velt
