#include "standalone/control/child_launcher.h"

#include "base/input_wait.h"
#include "base/pipe.h"
#include "base/spawning.h"
#include "standalone/core/installed_files.h"
#include "standalone/ports/port_range.h"

#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <optional>
#include <string_view>
#include <thread>
#include <vector>

namespace velt {
namespace {

constexpr int reportDescriptor = 3;

using Clock = std::chrono::steady_clock;

/// Whether the process has ended by then; else it is killed. Nothing here can fail, so that no program is
/// taken for one that hangs.
bool endsInTime(pid_t pid, Clock::time_point deadline) {
    auto pause = std::chrono::microseconds(100);
    int status = 0;
    while (::waitpid(pid, &status, WNOHANG) == 0) {
        if (Clock::now() >= deadline) {
            ::kill(pid, SIGKILL);
            while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
            }
            return false;
        }
        std::this_thread::sleep_for(pause);
        pause = std::min(pause * 2, std::chrono::microseconds(5000));
    }
    return true;
}

/// Starts the program with `report` as its descriptor 3 and waits for its end, which comes at once: it goes
/// on in a child of its own. False when it does not come.
Result<bool> spawnDetached(const std::vector<std::string>& arguments, int report,
                           Clock::time_point deadline) {
    Spawn program;
    program.pass(report, reportDescriptor);
    VELT_ASSIGN_OR_RETURN(const auto pid, program.start(arguments));
    return endsInTime(pid, deadline);
}

/// What comes out of the pipe until its end; nothing when that does not come within the limit.
std::optional<std::string> readReport(int descriptor, Clock::time_point deadline) {
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
    VELT_ASSIGN_OR_RETURN(auto pipe, makePipe());
    std::vector<std::string> arguments{
        installedFile("velt-supervise").string(), folder.string(), daemon_, order.configurationHash,
        std::string(order.sharesPorts ? sharedPortsPrefix : "") + joinPorts(order.ports, ",")};
    arguments.insert(arguments.end(), order.arguments.begin(), order.arguments.end());
    const auto deadline = Clock::now() + startLimit;
    VELT_ASSIGN_OR_RETURN(const bool detached, spawnDetached(arguments, pipe.writeEnd.get(), deadline));
    pipe.writeEnd.reset();
    const auto report = detached ? readReport(pipe.readEnd.get(), deadline) : std::nullopt;
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
