#include "tests/system/support/leftovers.h"

#include "tests/support/files.h"
#include "tests/support/waiting.h"
#include "tests/system/support/files.h"

#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <chrono>
#include <filesystem>

namespace velt::test {
namespace fs = std::filesystem;

namespace {

std::string processesLeft() {
    // Whoever loses its parent here becomes the test's child.
    while (waitpid(-1, nullptr, WNOHANG) > 0) {
    }
    std::string left;
    for (const auto& entry : fs::directory_iterator("/proc")) {
        const std::string name = entry.path().filename();
        if (std::ranges::all_of(name, [](unsigned char c) { return std::isdigit(c) != 0; }) &&
            std::stoi(name) != getpid()) {
            left += name + " " + contentsOf(entry.path() / "comm");
        }
    }
    return left;
}

} // namespace

std::string lastingProcesses() {
    std::string left;
    waitUntil([&] { return (left = processesLeft()).empty(); }, std::chrono::seconds(3));
    return left;
}

bool somethingListens() {
    constexpr const char* listenState = " 0A ";
    const std::string sockets = contentsOf("/proc/net/tcp") + contentsOf("/proc/net/tcp6");
    return sockets.find(listenState) != std::string::npos;
}

} // namespace velt::test
