#include "standalone/control/systemd_launcher.h"

#include "base/file.h"
#include "standalone/control/systemd_unit.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"
#include "standalone/supervise/control_channel.h"
#include "standalone/supervise/service_state.h"

#include <chrono>
#include <utility>

namespace velt {
namespace {

// A start is promised to be over within five seconds, of which the supervisor allows itself a little less.
constexpr std::chrono::milliseconds startLimit{4900};

std::string withoutLineEnd(std::string text) {
    while (!text.empty() && text.back() == '\n') {
        text.pop_back();
    }
    return text;
}

/// systemctl's own reason, where it has one.
std::string reasonOf(const ProcessResult& failed) {
    const std::string words = lastWords(failed.errors);
    return words.empty() ? "systemctl ended with status " + std::to_string(failed.exitCode) : words;
}

} // namespace

SystemdLauncher::SystemdLauncher(std::string daemon, SystemdPlaces places)
    : daemon_(std::move(daemon)), places_(std::move(places)) {}

std::string SystemdLauncher::launch(const std::filesystem::path& directory, const DaemonPlan& plan) {
    if (std::string reason = keep(directory, plan); !reason.empty()) {
        return reason;
    }
    if (std::string reason = writeUnits(directory); !reason.empty()) {
        return reason;
    }
    // Not "start": after a killed supervisor systemd may be waiting to start it again, and a daemon of the
    // former settings with it.
    const ProcessResult started =
        runProcess({places_.systemctl, "restart", unitName(daemon_)}, {}, startLimit);
    if (started.exitCode == 0) {
        const auto now = readServiceState(stateFile(directory, daemon_));
        return now && isServing(*now) ? std::string()
                                      : "systemd says that it has started it, but it does not serve";
    }
    std::string reason = started.exitCode < 0 ? "its supervisor does not report in time" : reasonOfFailure();
    runProcess({places_.systemctl, "stop", "--no-block", unitName(daemon_)});
    return reason.empty() ? reasonOf(started) : reason;
}

std::string SystemdLauncher::keep(const std::filesystem::path& directory, const DaemonPlan& plan) {
    const ControlRequest order{Command::start, {plan.configurationHash, plan.listenPorts, plan.arguments}};
    const auto written = replaceFile(orderFile(directory, daemon_), encodeRequest(order), 0600);
    return written ? std::string() : written.error().message;
}

/// systemd reads all its units again for new ones, which it need not do for those that are as they were.
std::string SystemdLauncher::writeUnits(const std::filesystem::path& directory) const {
    bool written = false;
    for (const UnitFile& unit : unitFiles(daemon_, directory)) {
        const std::filesystem::path file = places_.units / unit.name;
        if (readFile(file) == unit.text) {
            continue;
        }
        if (const auto replaced = replaceFile(file, unit.text, 0644); !replaced) {
            return replaced.error().message;
        }
        written = true;
    }
    if (!written) {
        return {};
    }
    const ProcessResult reloaded = runProcess({places_.systemctl, "daemon-reload"});
    return reloaded.exitCode == 0 ? std::string() : reasonOf(reloaded);
}

/// What the supervisor said last.
std::string SystemdLauncher::reasonOfFailure() const {
    return withoutLineEnd(
        runProcess({places_.systemctl, "show", "--value", "--property=StatusText", unitName(daemon_)})
            .output);
}

std::string SystemdLauncher::retire() {
    std::error_code error;
    if (!std::filesystem::exists(places_.units / unitName(daemon_), error)) {
        return {};
    }
    const ProcessResult stopped = runProcess({places_.systemctl, "stop", unitName(daemon_)});
    // A daemon that did not start is a failure of the machine's until somebody switches it off.
    runProcess({places_.systemctl, "reset-failed", unitName(daemon_)});
    return stopped.exitCode == 0 ? std::string() : reasonOf(stopped);
}

} // namespace velt
