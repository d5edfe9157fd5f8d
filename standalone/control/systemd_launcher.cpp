#include "standalone/control/systemd_launcher.h"
#include "base/file.h"
#include "base/text.h"

#include "standalone/control/systemd_unit.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"
#include "standalone/supervise/control_channel.h"
#include "standalone/supervise/daemon_state.h"

#include <utility>

namespace velt {
namespace {

bool succeeded(const Result<ProcessResult>& asked) {
    return asked && asked->exitCode == 0;
}

/// systemctl's own reason, where it has one.
Error reasonOf(const Result<ProcessResult>& failed) {
    return Error(reasonOfEnd(failed, "systemctl"));
}

} // namespace

SystemdLauncher::SystemdLauncher(const Daemon& daemon, SystemdPlaces places)
    : daemon_(daemon), unit_(unitName(daemon)), places_(std::move(places)) {}

Result<> SystemdLauncher::launch(const std::filesystem::path& folder, const DaemonOrder& order) {
    VELT_RETURN_IF_ERROR(keep(folder, order));
    VELT_RETURN_IF_ERROR(writeUnits(folder));
    // Not "start": after a killed supervisor systemd may be waiting to start it again, and a daemon of the
    // former settings with it.
    const auto started = runProcess({places_.systemctl, "restart", unit_}, {}, startLimit);
    if (!started) {
        return reasonOf(started);
    }
    if (succeeded(started)) {
        const auto now = loadDaemonState(stateFile(folder, daemon_.name));
        return now && isServing(*now) ? Result<>()
                                      : Error("systemd reports a start, but the daemon does not serve");
    }
    const std::string reason =
        started->ranTooLong ? "its supervisor did not report in time" : reasonOfFailure();
    (void)runProcess({places_.systemctl, "stop", "--no-block", unit_});
    return reason.empty() ? reasonOf(started) : Error(reason);
}

Result<> SystemdLauncher::keep(const std::filesystem::path& folder, const DaemonOrder& order) {
    const auto file = orderFile(folder, daemon_.name);
    return replaceFile(file, encodeRequest({Command::start, order}), 0600);
}

/// systemd reads all its units again for new ones, which it need not do for those that are as they were.
Result<> SystemdLauncher::writeUnits(const std::filesystem::path& folder) const {
    bool written = false;
    for (const UnitFile& unit : unitFiles(daemon_, folder)) {
        const std::filesystem::path file = places_.units / unit.name;
        if (readFile(file) == unit.text) {
            continue;
        }
        VELT_RETURN_IF_ERROR(replaceFile(file, unit.text, 0644));
        written = true;
    }
    if (!written) {
        return {};
    }
    const auto reloaded = runProcess({places_.systemctl, "daemon-reload"});
    return succeeded(reloaded) ? Result<>() : reasonOf(reloaded);
}

/// What the supervisor said last.
std::string SystemdLauncher::reasonOfFailure() const {
    const auto shown = runProcess({places_.systemctl, "show", "--value", "--property=StatusText", unit_});
    return shown ? std::string(trimmedEnd(shown->output, "\n")) : "";
}

Result<> SystemdLauncher::retire() {
    VELT_ASSIGN_OR_RETURN(const bool hasUnit, isThere(places_.units / unit_));
    if (!hasUnit) {
        return {};
    }
    const auto stopped = runProcess({places_.systemctl, "stop", unit_});
    // Until somebody switches it off, a daemon that did not start is a failure of the machine.
    (void)runProcess({places_.systemctl, "reset-failed", unit_});
    return succeeded(stopped) ? Result<>() : reasonOf(stopped);
}

/// Without an order a supervisor that is started ends at once.
Result<> SystemdLauncher::release(const std::filesystem::path& folder) {
    const auto file = orderFile(folder, daemon_.name);
    std::error_code error;
    std::filesystem::remove(file, error);
    return error ? Result<>(cannot("remove", file, error.value())) : Result<>();
}

} // namespace velt
