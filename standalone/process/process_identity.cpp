#include "standalone/process/process_identity.h"

#include "base/number_text.h"
#include "base/unique_fd.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <thread>

namespace velt {
namespace {

struct ProcessStat {
    char state = 0;
    pid_t parent = 0;
    long threads = 0;
    unsigned long long startTime = 0;
};

struct StatReading {
    std::optional<ProcessStat> stat; ///< nothing when there is no such process, or when that cannot be told
    bool told = true;
};

std::optional<ProcessStat> parseStat(const std::string& line) {
    // The program's name is in parentheses and may itself contain blanks and parentheses.
    const auto nameEnd = line.rfind(')');
    if (nameEnd == std::string::npos) {
        return std::nullopt;
    }
    std::istringstream fields(line.substr(nameEnd + 1));
    ProcessStat stat;
    fields >> stat.state >> stat.parent;
    constexpr int fieldsBetweenParentAndThreads = 15;
    std::string skipped;
    for (int field = 0; field < fieldsBetweenParentAndThreads; ++field) {
        fields >> skipped;
    }
    fields >> stat.threads >> skipped >> stat.startTime;
    if (!fields) {
        return std::nullopt;
    }
    return stat;
}

StatReading readStat(pid_t pid) {
    const UniqueFd file(::open(("/proc/" + std::to_string(pid) + "/stat").c_str(), O_RDONLY | O_CLOEXEC));
    std::array<char, 1024> line{};
    const ssize_t length = file ? ::read(file.get(), line.data(), line.size()) : -1;
    if (length < 0) {
        return {std::nullopt, errno == ENOENT || errno == ESRCH};
    }
    return {parseStat(std::string(line.data(), static_cast<std::size_t>(length)))};
}

/// A process whose first thread has ended looks like one that has ended, but keeps its files, and its ports,
/// until the last of its threads has.
bool hasEnded(const ProcessStat& stat) {
    return stat.state == 'X' || (stat.state == 'Z' && stat.threads <= 1);
}

struct Relation {
    ProcessId process;
    pid_t parent;
};

std::vector<Relation> allProcesses() {
    std::vector<Relation> all;
    for (const pid_t pid : allPids()) {
        if (const auto stat = readStat(pid).stat; stat && !hasEnded(*stat)) {
            all.push_back({{pid, stat->startTime}, stat->parent});
        }
    }
    return all;
}

std::vector<ProcessId> descendantsAmong(const std::vector<Relation>& all, pid_t ancestor) {
    std::vector<ProcessId> found;
    std::vector<pid_t> open{ancestor};
    while (!open.empty()) {
        const pid_t parent = open.back();
        open.pop_back();
        for (const Relation& relation : all) {
            if (relation.parent == parent) {
                found.push_back(relation.process);
                open.push_back(relation.process.pid);
            }
        }
    }
    return found;
}

} // namespace

std::vector<pid_t> allPids() {
    std::vector<pid_t> pids;
    std::error_code error;
    for (std::filesystem::directory_iterator entry("/proc", error), end; !error && entry != end;
         entry.increment(error)) {
        if (const auto pid = parseNumber(entry->path().filename().string())) {
            pids.push_back(static_cast<pid_t>(*pid));
        }
    }
    std::sort(pids.begin(), pids.end());
    return pids;
}

std::string bootId() {
    std::ifstream file("/proc/sys/kernel/random/boot_id");
    std::string id;
    std::getline(file, id);
    return id;
}

std::optional<ProcessId> identifyProcess(pid_t pid) {
    const auto stat = readStat(pid).stat;
    if (!stat || hasEnded(*stat)) {
        return std::nullopt;
    }
    return ProcessId{pid, stat->startTime};
}

bool isAlive(const ProcessId& process) {
    if (!process) {
        return false;
    }
    const StatReading reading = readStat(process.pid);
    const bool isSame =
        reading.stat && !hasEnded(*reading.stat) && reading.stat->startTime == process.startTime;
    return isSame || !reading.told;
}

void signalProcess(const ProcessId& process, int signal) {
    if (!process) {
        return;
    }
    // The descriptor always means the same process. What is compared after it was opened is therefore what
    // the signal reaches, even when the pid changes hands meanwhile.
    const UniqueFd descriptor(static_cast<int>(::syscall(SYS_pidfd_open, process.pid, 0)));
    if (descriptor && identifyProcess(process.pid) == process) {
        ::syscall(SYS_pidfd_send_signal, descriptor.get(), signal, nullptr, 0);
    }
}

std::vector<ProcessId> descendantsOf(pid_t ancestor) {
    return descendantsAmong(allProcesses(), ancestor);
}

std::vector<ProcessId> childrenOf(pid_t parent) {
    std::vector<ProcessId> children;
    for (const Relation& relation : allProcesses()) {
        if (relation.parent == parent) {
            children.push_back(relation.process);
        }
    }
    return children;
}

bool isAsleep(const ProcessId& process) {
    const auto stat = readStat(process.pid).stat;
    return stat && stat->startTime == process.startTime && stat->state == 'S';
}

std::vector<ProcessId> livingTrees(const std::vector<ProcessId>& roots) {
    std::vector<ProcessId> living;
    const auto add = [&living](const ProcessId& process) {
        if (std::find(living.begin(), living.end(), process) == living.end()) {
            living.push_back(process);
        }
    };
    const std::vector<Relation> all = allProcesses();
    for (const ProcessId& root : roots) {
        if (!isAlive(root)) {
            continue;
        }
        add(root);
        for (const ProcessId& process : descendantsAmong(all, root.pid)) {
            add(process);
        }
    }
    return living;
}

bool endProcesses(const std::function<std::vector<ProcessId>()>& remaining,
                  std::chrono::milliseconds patience) {
    using Clock = std::chrono::steady_clock;
    const auto killTime = Clock::now() + patience;
    const auto giveUpTime = killTime + std::chrono::seconds(1);
    std::vector<ProcessId> asked;
    for (;;) {
        const std::vector<ProcessId> processes = remaining();
        if (processes.empty()) {
            return true;
        }
        const auto now = Clock::now();
        if (now >= giveUpTime) {
            return false;
        }
        for (const ProcessId& process : processes) {
            if (now >= killTime) {
                signalProcess(process, SIGKILL);
            } else if (std::find(asked.begin(), asked.end(), process) == asked.end()) {
                signalProcess(process, SIGTERM);
                asked.push_back(process);
            }
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
}

bool endTrees(std::vector<ProcessId> roots, std::chrono::milliseconds patience) {
    const auto remaining = [&roots] {
        // What was once seen below a process stays known when that ends first.
        roots = livingTrees(roots);
        return roots;
    };
    return endProcesses(remaining, patience);
}

} // namespace velt
