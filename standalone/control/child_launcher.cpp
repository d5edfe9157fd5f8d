#include "standalone/control/child_launcher.h"

#include "base/input_wait.h"
#include "base/spawn_setup.h"
#include "base/unique_fd.h"
#include "standalone/core/installed_files.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <optional>
#include <string_view>
#include <vector>

namespace velt {
namespace {

// A start is promised to be over within five seconds, of which the supervisor allows itself a little less.
constexpr std::chrono::milliseconds startLimit{4900};
constexpr int reportDescriptor = 3;

std::string joinPorts(const std::vector<int>& ports) {
    std::string text;
    for (const int port : ports) {
        text += (text.empty() ? "" : ",") + std::to_string(port);
    }
    return text;
}

/// Starts the program with `report` as its descriptor 3 and waits for its end, which comes at once: it goes
/// on in a child of its own.
Result<> spawnDetached(std::vector<std::string>& arguments, int report) {
    std::vector<char*> pointers;
    pointers.reserve(arguments.size() + 1);
    for (std::string& argument : arguments) {
        pointers.push_back(argument.data());
    }
    pointers.push_back(nullptr);
    std::string path = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
    std::array<char*, 2> environment{path.data(), nullptr};
    SpawnSetup setup;
    ::posix_spawn_file_actions_adddup2(&setup.actions, report, reportDescriptor);
    pid_t pid = 0;
    const int error = ::posix_spawn(&pid, pointers[0], &setup.actions, &setup.attributes, pointers.data(),
                                    environment.data());
    if (error != 0) {
        return Error("cannot start " + arguments[0] + ": " + std::strerror(error));
    }
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
    }
    return {};
}

/// What comes out of the pipe until its end; nothing when that does not come within the limit.
std::optional<std::string> readReport(int descriptor) {
    const auto deadline = std::chrono::steady_clock::now() + startLimit;
    std::string report;
    std::array<char, 4096> buffer{};
    while (waitForInput(descriptor, deadline)) {
        const ssize_t length = ::read(descriptor, buffer.data(), buffer.size());
        if (length <= 0) {
            return report;
        }
        report.append(buffer.data(), static_cast<std::size_t>(length));
    }
    return std::nullopt;
}

} // namespace

Result<> ChildLauncher::launch(const std::filesystem::path& folder, const DaemonOrder& order) {
    std::array<int, 2> ends{-1, -1};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        return Error(std::strerror(errno));
    }
    const UniqueFd readEnd(ends[0]);
    UniqueFd writeEnd(ends[1]);
    std::vector<std::string> arguments{installedFile("velt-supervise").string(), folder.string(), daemon_,
                                       order.configurationHash, joinPorts(order.ports)};
    arguments.insert(arguments.end(), order.arguments.begin(), order.arguments.end());
    if (auto spawned = spawnDetached(arguments, writeEnd.get()); !spawned) {
        return spawned;
    }
    writeEnd.reset();
    const auto report = readReport(readEnd.get());
    constexpr std::string_view failure = "failed ";
    if (!report) {
        return Error("its supervisor did not report in time");
    }
    if (*report == "ready") {
        return {};
    }
    return Error(report->starts_with(failure) ? report->substr(failure.size())
                                              : "its supervisor ended without giving a reason");
}

} // namespace velt
