#include "tests/system/support/running_program.h"
#include "tests/support/waiting.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <stdexcept>
#include <utility>

namespace velt::test {
namespace {

std::vector<char*> pointersTo(const std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    pointers.reserve(texts.size() + 1);
    for (const std::string& text : texts) {
        pointers.push_back(const_cast<char*>(text.c_str()));
    }
    pointers.push_back(nullptr);
    return pointers;
}

} // namespace

RunningProgram RunningProgram::start(const std::vector<std::string>& arguments,
                                     const std::vector<std::string>& environment,
                                     const std::string& errorFile) {
    std::array<int, 2> ends{-1, -1};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
        throw std::runtime_error("no pipe");
    }
    RunningProgram program;
    program.output_ = UniqueFd(ends[0]);
    const UniqueFd writeEnd(ends[1]);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_adddup2(&actions, writeEnd.get(), 1);
    posix_spawn_file_actions_addopen(&actions, 2, errorFile.c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
    const int error = posix_spawn(&program.pid_, arguments[0].c_str(), &actions, nullptr,
                                  pointersTo(arguments).data(), pointersTo(environment).data());
    posix_spawn_file_actions_destroy(&actions);
    if (error != 0) {
        program.pid_ = -1;
        throw std::runtime_error(arguments[0] + " cannot be started");
    }
    return program;
}

RunningProgram::RunningProgram(RunningProgram&& other) noexcept
    : pid_(std::exchange(other.pid_, -1)), output_(std::move(other.output_)),
      pending_(std::move(other.pending_)) {}

RunningProgram& RunningProgram::operator=(RunningProgram&& other) noexcept {
    std::swap(pid_, other.pid_);
    std::swap(output_, other.output_);
    std::swap(pending_, other.pending_);
    return *this;
}

RunningProgram::~RunningProgram() {
    if (pid_ > 0) {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
}

std::string RunningProgram::readUntil(const std::string& text) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    std::size_t place = pending_.find(text);
    while (place == std::string::npos) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
            deadline - std::chrono::steady_clock::now());
        pollfd waiting{output_.get(), POLLIN, 0};
        std::array<char, 4096> buffer{};
        const bool ready = left.count() > 0 && poll(&waiting, 1, static_cast<int>(left.count())) == 1;
        const ssize_t count = ready ? read(output_.get(), buffer.data(), buffer.size()) : 0;
        if (count <= 0) {
            return std::exchange(pending_, {});
        }
        pending_.append(buffer.data(), static_cast<std::size_t>(count));
        place = pending_.find(text);
    }
    std::string seen = pending_.substr(0, place + text.size());
    pending_.erase(0, seen.size());
    return seen;
}

void RunningProgram::signal(int number) const {
    if (pid_ > 0) {
        kill(pid_, number);
    }
}

int RunningProgram::wait(std::chrono::milliseconds limit) {
    int status = 0;
    if (pid_ <= 0 || !waitUntil([&] { return waitpid(pid_, &status, WNOHANG) == pid_; }, limit)) {
        return -1;
    }
    pid_ = -1;
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

} // namespace velt::test
