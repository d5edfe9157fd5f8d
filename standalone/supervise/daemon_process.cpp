#include "standalone/supervise/daemon_process.h"

#include "base/printable.h"
#include "base/text.h"
#include "standalone/ports/port_range.h"
#include "standalone/process/last_words.h"
#include "standalone/process/listening_sockets.h"
#include "standalone/supervise/announced_start.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <climits>
#include <csignal>
#include <cstring>
#include <string_view>
#include <utility>

namespace velt {
namespace {

constexpr std::size_t keptLines = 20; // the reason comes first, and advice after it
constexpr std::size_t longestLine = 400;
// More than a pipe holds: a daemon that writes faster than it is read must not keep its supervisor from
// everything else.
constexpr int messagesAtOnce = 64;

} // namespace

// A message may hold a line break of a client's choosing, so the lines alone do not tell where one begins.
DaemonProcess::DaemonProcess(Listener listener) : listener_(std::move(listener)) {
    if (auto pipe = makePacketPipe()) {
        output_ = std::move(*pipe);
        // Only the reading side: a daemon does not expect its standard error to refuse a line.
        ::fcntl(output_.readEnd.get(), F_SETFL, O_NONBLOCK);
    }
}

Result<> DaemonProcess::start(const DaemonOrder& order, Clock::time_point deadline,
                              const std::function<Result<>()>& announce) {
    readOutput(); // what a former daemon left says nothing about this one
    lastLines_.clear();
    partialLine_.clear();
    serves_ = false;
    VELT_RETURN_IF_ERROR(spawn(order, announce));
    auto started = waitUntilListening(order, deadline);
    serves_ = bool(started);
    return started;
}

Result<> DaemonProcess::spawn(const DaemonOrder& order, const std::function<Result<>()>& announce) {
    if (order.arguments.empty()) {
        return Error("there is no program to start");
    }
    VELT_ASSIGN_OR_RETURN(const auto pid, startAnnounced(order.arguments, output_.writeEnd.get(), announce));
    // A child that has ended already cannot be identified any more, but keeps its pid until it is reaped.
    id_ = identifyProcess(pid).value_or(ProcessId{pid, 0});
    siginfo_t ended{};
    if (id_.startTime == 0 &&
        ::waitid(P_PID, static_cast<id_t>(pid), &ended, WEXITED | WNOHANG | WNOWAIT) == 0 &&
        ended.si_pid == 0) {
        ::kill(pid, SIGKILL); // what cannot be told from other processes could not be ended later
        ::waitpid(pid, nullptr, 0);
        id_ = {};
        return Error("its process cannot be watched");
    }
    return {};
}

Result<> DaemonProcess::waitUntilListening(const DaemonOrder& order, Clock::time_point deadline) {
    for (;;) {
        readOutput();
        int status = 0;
        if (::waitpid(id_.pid, &status, WNOHANG) == id_.pid) {
            return ended(status);
        }
        if (std::ranges::all_of(order.ports, [this](int port) { return listensOn(id_.pid, port); })) {
            return {};
        }
        if (Clock::now() >= deadline) {
            ::kill(id_.pid, SIGKILL); // our child, not reaped yet: the pid is its own
            ::waitpid(id_.pid, &status, 0);
            readOutput();
            id_ = {};
            const std::string words = takeLastWords();
            return Error("it did not listen on port " + joinPorts(order.ports, ", ") + " in time" +
                         (words.empty() ? "" : ": " + words));
        }
        pollfd output{output_.readEnd.get(), POLLIN, 0};
        ::poll(&output, 1, 2);
    }
}

Error DaemonProcess::ended(int waitStatus) {
    readOutput();
    id_ = {};
    std::string words = takeLastWords();
    if (WIFSIGNALED(waitStatus)) { // its output does not explain a signal
        return Error("it was ended by signal " + std::to_string(WTERMSIG(waitStatus)));
    }
    return Error(reasonOfEnd(std::move(words), WEXITSTATUS(waitStatus)));
}

std::string DaemonProcess::takeLastWords() {
    if (!partialLine_.empty()) {
        takeLine(std::exchange(partialLine_, {}));
    }
    std::string lines;
    for (const std::string& line : lastLines_) {
        lines += line + '\n';
    }
    return lastWords(lines);
}

void DaemonProcess::readOutput() {
    std::array<char, PIPE_BUF> buffer{};
    for (int left = messagesAtOnce; left > 0; --left) {
        const ssize_t length = ::read(output_.readEnd.get(), buffer.data(), buffer.size());
        if (length <= 0) {
            silent_ = length == 0;
            return;
        }
        const std::string_view message(buffer.data(), static_cast<std::size_t>(length));
        if (listener_) {
            listener_(message);
        }
        // Its clients choose parts of what a daemon says once it serves, and line breaks may be among them.
        const std::size_t end = serves_ ? message.find_last_not_of("\r\n") : 0;
        for (std::size_t i = 0; i < message.size(); ++i) {
            const char character = i < end && message[i] == '\n' ? ' ' : message[i];
            if (character == '\n') {
                takeLine(std::exchange(partialLine_, {}));
            } else if (partialLine_.size() < longestLine) {
                partialLine_ += character;
            } else if (partialLine_.size() == longestLine) {
                partialLine_ += "…"; // marks the cut; "..." would be trimmed as full stops
            }
        }
    }
}

void DaemonProcess::log(const std::string& line) {
    const auto leftOut = logged_.admit();
    if (!leftOut) {
        return;
    }
    if (*leftOut > 0) {
        ::syslog(LOG_WARNING, "%zu lines before the next one are not logged", *leftOut);
    }
    ::syslog(LOG_NOTICE, "%s", line.c_str());
}

void DaemonProcess::takeLine(std::string line) {
    // The lines reach state files, logs and answers; nothing in them may steer who reads them.
    std::erase_if(line, isControl);
    line = printable(line);
    if (line.empty()) {
        return;
    }
    log(line);
    lastLines_.push_back(std::move(line));
    if (lastLines_.size() > keptLines) {
        lastLines_.pop_front();
    }
}

} // namespace velt
