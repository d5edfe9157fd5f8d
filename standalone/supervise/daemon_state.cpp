#include "standalone/supervise/daemon_state.h"

#include "base/file.h"
#include "standalone/process/listening_sockets.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string_view>
#include <utility>

namespace velt {
namespace {

constexpr std::string_view firstLine = "velt-supervise 2";
constexpr std::string_view bootKey = "boot ";

/// In the order of RunState.
constexpr std::array<std::string_view, 5> stateNames{"stopped", "running", "paused", "failed", "closed"};

RunState stateNamed(std::string_view text) {
    const auto* const found = std::ranges::find(stateNames, text);
    return found == stateNames.end() ? RunState::stopped : static_cast<RunState>(found - stateNames.begin());
}

std::string oneLine(std::string text) {
    std::replace(text.begin(), text.end(), '\n', ' ');
    return text;
}

ProcessId readProcess(std::istream& fields) {
    ProcessId process;
    fields >> process.pid >> process.startTime;
    return fields ? process : ProcessId{};
}

void takeLine(const std::string& line, DaemonState& state) {
    std::istringstream fields(line);
    std::string key;
    fields >> key >> std::ws;
    if (key == "state") {
        std::string name;
        fields >> name;
        state.state = stateNamed(name);
    } else if (key == "supervisor") {
        state.supervisor = readProcess(fields);
    } else if (key == "daemon") {
        state.daemon = readProcess(fields);
    } else if (key == "session") {
        state.sessions.push_back(readProcess(fields));
    } else if (key == "retired") {
        state.retired.push_back(readProcess(fields));
    } else if (key == "port") {
        int port = 0;
        fields >> port;
        state.ports.push_back(port);
    } else if (key == "restarts") {
        fields >> state.restarts;
    } else if (key == "configuration") {
        std::getline(fields, state.configurationHash);
    } else if (key == "reason") {
        std::getline(fields, state.reason);
    }
}

std::string render(const DaemonState& state) {
    std::ostringstream text;
    const auto processLine = [&text](std::string_view key, const ProcessId& process) {
        if (process) {
            text << key << ' ' << process.pid << ' ' << process.startTime << '\n';
        }
    };
    text << firstLine << '\n'
         << bootKey << bootId() << '\n'
         << "state " << stateNames.at(static_cast<std::size_t>(state.state)) << '\n';
    processLine("supervisor", state.supervisor);
    processLine("daemon", state.daemon);
    text << "configuration " << oneLine(state.configurationHash) << '\n';
    text << "restarts " << state.restarts << '\n';
    for (const int port : state.ports) {
        text << "port " << port << '\n';
    }
    for (const ProcessId& session : state.sessions) {
        processLine("session", session);
    }
    for (const ProcessId& daemon : state.retired) {
        processLine("retired", daemon);
    }
    if (!state.reason.empty()) {
        text << "reason " << oneLine(state.reason) << '\n';
    }
    return text.str();
}

} // namespace

std::filesystem::path stateFile(const std::filesystem::path& folder, std::string_view daemon) {
    return folder / (std::string(daemon) + ".state");
}

std::filesystem::path lockFile(const std::filesystem::path& folder, std::string_view daemon) {
    return folder / (std::string(daemon) + ".lock");
}

std::filesystem::path orderFile(const std::filesystem::path& folder, std::string_view daemon) {
    return folder / (std::string(daemon) + ".order");
}

Result<std::optional<DaemonState>> readDaemonState(const std::filesystem::path& file) {
    const std::string boot = bootId();
    if (boot.empty()) {
        return Error("cannot tell since when the machine runs");
    }
    VELT_ASSIGN_OR_RETURN(const auto text, readOptionalFile(file));
    std::istringstream input(text.value_or(""));
    std::string line;
    if (!std::getline(input, line) || line != firstLine) {
        return std::nullopt;
    }
    if (!std::getline(input, line) || line != std::string(bootKey) + boot) {
        return std::nullopt;
    }
    DaemonState state;
    while (std::getline(input, line)) {
        takeLine(line, state);
    }
    return std::optional(std::move(state));
}

std::optional<DaemonState> loadDaemonState(const std::filesystem::path& file) {
    return readDaemonState(file).valueOr(std::nullopt);
}

Result<> storeDaemonState(const std::filesystem::path& file, const DaemonState& state) {
    std::filesystem::path fresh = file;
    fresh += ".new";
    std::ofstream output(fresh, std::ios::trunc);
    output << render(state);
    output.close();
    // Without fsync: the file describes processes, which do not outlive the machine either.
    if (!output || std::rename(fresh.c_str(), file.c_str()) != 0) {
        return Error("cannot write " + file.string() + ": " + std::strerror(errno));
    }
    return {};
}

bool isServing(const DaemonState& state) {
    if (state.state != RunState::running || !isAlive(state.daemon)) {
        return false;
    }
    return std::all_of(state.ports.begin(), state.ports.end(),
                       [&state](int port) { return listensOn(state.daemon.pid, port); });
}

std::vector<ProcessId> sessionsOf(const DaemonState& state) {
    if (!isAlive(state.supervisor)) {
        return {};
    }
    std::vector<ProcessId> sessions = childrenOf(state.supervisor.pid);
    std::vector<ProcessId> daemons = state.retired;
    daemons.push_back(state.daemon);
    for (const ProcessId& daemon : daemons) {
        std::erase(sessions, daemon);
        const auto own = isAlive(daemon) ? childrenOf(daemon.pid) : std::vector<ProcessId>();
        sessions.insert(sessions.end(), own.begin(), own.end());
    }
    return sessions;
}

bool endLeftovers(const DaemonState& state) {
    std::vector<ProcessId> known = state.sessions;
    known.push_back(state.daemon);
    return endTrees(std::move(known), std::chrono::seconds(1));
}

} // namespace velt
