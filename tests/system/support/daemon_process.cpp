#include "tests/system/support/daemon_process.h"
#include "tests/support/files.h"
#include "tests/support/waiting.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <fstream>
#include <iostream>
#include <sstream>
#include <string>
#include <vector>

namespace velt::test {
namespace {

constexpr const char* outputFile = "/mnt/daemon.output";

pid_t spawn(const DaemonOrder& order) {
    std::vector<char*> arguments;
    for (const auto& argument : order.arguments) {
        arguments.push_back(const_cast<char*>(argument.c_str()));
    }
    arguments.push_back(nullptr);
    std::string path = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
    char* environment[] = {path.data(), nullptr};
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 1, outputFile, O_WRONLY | O_CREAT | O_TRUNC | O_APPEND, 0600);
    posix_spawn_file_actions_adddup2(&actions, 1, 2);
    pid_t pid = -1;
    const int error = posix_spawn(&pid, arguments[0], &actions, nullptr, arguments.data(), environment);
    posix_spawn_file_actions_destroy(&actions);
    return error == 0 ? pid : -1;
}

} // namespace

bool isListening(int port) {
    char wanted[6];
    std::snprintf(wanted, sizeof wanted, ":%04X", static_cast<unsigned>(port));
    for (const char* table : {"/proc/net/tcp", "/proc/net/tcp6"}) {
        std::ifstream lines(table);
        for (std::string line; std::getline(lines, line);) {
            std::istringstream fields(line);
            std::string number, local, remote, state;
            fields >> number >> local >> remote >> state;
            if (state == "0A" && local.ends_with(wanted)) {
                return true;
            }
        }
    }
    return false;
}

bool DaemonProcess::start(const DaemonOrder& order) {
    pid_ = spawn(order);
    bool listens = false;
    const auto listensOrEnded = [&] {
        listens = pid_ > 0 && std::ranges::all_of(order.ports, isListening);
        if (!listens && pid_ > 0 && waitpid(pid_, nullptr, WNOHANG) == pid_) {
            pid_ = -1;
        }
        return listens || pid_ < 0;
    };
    waitUntil(listensOrEnded, patience);
    if (!listens) {
        std::cerr << contentsOf(outputFile);
    }
    return listens;
}

std::string DaemonProcess::output() {
    return contentsOf(outputFile);
}

void DaemonProcess::stop() {
    if (pid_ > 0) {
        kill(pid_, SIGTERM);
        waitpid(pid_, nullptr, 0);
        pid_ = -1;
    }
}

} // namespace velt::test
