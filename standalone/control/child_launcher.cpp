#include "standalone/control/child_launcher.h"

#include "base/input_wait.h"
#include "base/pipe.h"
#include "base/spawning.h"
#include "standalone/core/installed_files.h"
#include "standalone/ports/port_range.h"

#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <optional>
#include <string_view>
#include <vector>

namespace velt {
namespace {

constexpr int reportDescriptor = 3;

/// Starts the program with `report` as its descriptor 3 and waits for its end, which comes at once: it goes
/// on in a child of its own.
Result<> spawnDetached(const std::vector<std::string>& arguments, int report) {
    Spawn program;
    program.pass(report, reportDescriptor);
    VELT_ASSIGN_OR_RETURN(const auto pid, program.start(arguments));
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
    VELT_ASSIGN_OR_RETURN(auto pipe, makePipe());
    std::vector<std::string> arguments{
        installedFile("velt-supervise").string(), folder.string(), daemon_, order.configurationHash,
        std::string(order.sharesPorts ? sharedPortsPrefix : "") + joinPorts(order.ports, ",")};
    arguments.insert(arguments.end(), order.arguments.begin(), order.arguments.end());
    VELT_RETURN_IF_ERROR(spawnDetached(arguments, pipe.writeEnd.get()));
    pipe.writeEnd.reset();
    const auto report = readReport(pipe.readEnd.get());
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
