#include "host/trial/trial_veltd.h"

#include "base/file.h"
#include "base/sha256.h"
#include "base/text.h"
#include "host/base/instance_lock.h"
#include "host/http/listener.h"
#include "host/trial/trial_error.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <string_view>
#include <system_error>
#include <thread>

extern "C" { // missing in the header of glibc 2.36
#include <sys/pidfd.h>
}

namespace velt::host {

namespace {

constexpr const char* logName = "veltd.log";
constexpr const char* socketName = "run/velt/veltd.sock";
constexpr const char* moduleName = "VELT.Core.FileServ.FTP.so";
constexpr std::array<const char*, 8> programNames{"veltd",
                                                  "veltctl",
                                                  "velt-supervise",
                                                  "velt-login-view",
                                                  moduleName,
                                                  "libvelt-standalone.so",
                                                  "mod_velt_login.so",
                                                  "velt-sftp-session.so"};
constexpr int firstHttpPort = 8080;
constexpr int lastHttpPort = 8099;

/// Whether veltd gives an answer, which it does once the enabled services are started.
bool answers() {
    constexpr std::string_view request = "GET /healthz HTTP/1.1\r\nHost: localhost\r\n\r\n";
    sockaddr_un address{AF_UNIX, {}};
    std::string_view(socketName).copy(static_cast<char*>(address.sun_path), sizeof address.sun_path - 1);
    const void* const name = &address;
    const UniqueFd socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    constexpr timeval longest{1, 0}; // for each step: a veltd that hangs accepts, or queues, and says nothing
    ::setsockopt(socket.get(), SOL_SOCKET, SO_SNDTIMEO, &longest, sizeof longest);
    ::setsockopt(socket.get(), SOL_SOCKET, SO_RCVTIMEO, &longest, sizeof longest);
    char first = 0;
    return ::connect(socket.get(), static_cast<const sockaddr*>(name), sizeof address) == 0 &&
           ::send(socket.get(), request.data(), request.size(), MSG_NOSIGNAL) > 0 &&
           ::recv(socket.get(), &first, 1, 0) == 1;
}

/// Waits until veltd answers. False when it ends before. Throws TrialError when it does neither in time.
bool waitForAnswer(const std::function<bool()>& runs) {
    constexpr std::chrono::seconds longestStart(60);
    const auto deadline = std::chrono::steady_clock::now() + longestStart;
    while (!answers()) {
        if (std::chrono::steady_clock::now() > deadline) {
            throw TrialError("veltd did not answer within " + std::to_string(longestStart.count()) +
                             " s. See " + std::filesystem::absolute(logName).string() + ".");
        }
        if (!runs()) {
            return false;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    return true;
}

/// Becomes veltd, in a session of its own: what ends the starting process does not end it.
[[noreturn]] void becomeVeltd(const std::filesystem::path& folder, const TrialPlace& place, int httpPort) {
    ::setsid();
    const int log = ::open(logName, O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_CLOEXEC, 0644);
    ::dup2(::open("/dev/null", O_RDWR | O_CLOEXEC), STDIN_FILENO);
    ::dup2(log, STDOUT_FILENO);
    ::dup2(log, STDERR_FILENO);
    // veltd keeps the lock. Until it runs, this process also holds the trial's lock, so that another start or
    // stop, which waits for that, finds veltd afterwards.
    const auto lock = InstanceLock::take(".");
    if (!lock) {
        std::fprintf(stderr, "%s\n", lock.error().message.c_str());
        ::_exit(1);
    }
    lock->keepOverExec();
    if (place.needsMounts && !mountPlace(folder, place)) {
        std::fprintf(stderr, "%s\n", cannot("mount", place.root).message.c_str());
        ::_exit(1);
    }
    const std::filesystem::path programs = programFolder();
    ::setenv("VELT_LIBEXEC_DIR", programs.c_str(), 1); // NOLINT(concurrency-mt-unsafe)
    const std::string program = programs / "veltd";
    const std::string module = programs / moduleName;
    const std::string address = "127.0.0.1:" + std::to_string(httpPort);
    ::execl(program.c_str(), "veltd", "--state-root", place.root.c_str(), "--module", module.c_str(),
            "--listen", address.c_str(), "--socket", socketName, nullptr);
    std::fprintf(stderr, "%s\n", cannot("run", program).message.c_str());
    ::_exit(1);
}

bool isFree(int port) {
    try {
        Listener::tcp("127.0.0.1:" + std::to_string(port), false);
        return true;
    } catch (const ListenError&) {
        return false;
    }
}

} // namespace

std::filesystem::path programFolder() {
    return std::filesystem::read_symlink("/proc/self/exe").parent_path();
}

std::string buildOf(const std::filesystem::path& programs) {
    std::string marks = programs.string();
    for (const char* name : programNames) {
        struct stat status {};
        if (::stat((programs / name).c_str(), &status) != 0) {
            throw TrialError((programs / name).string() + " is missing: build it first.");
        }
        marks += " " + std::to_string(status.st_ino) + " " + std::to_string(status.st_size) + " " +
                 std::to_string(status.st_mtim.tv_sec) + "." + std::to_string(status.st_mtim.tv_nsec);
    }
    return sha256(marks);
}

std::optional<pid_t> runningVeltd() {
    return InstanceLock::holder(".");
}

void linkPrograms() {
    std::error_code error;
    std::filesystem::remove("programs.new", error);
    std::filesystem::create_directory_symlink(programFolder(), "programs.new", error);
    if (!error) {
        std::filesystem::rename("programs.new", "programs", error);
    }
    if (error) {
        throw TrialError("Cannot make the link programs: " + error.message() + ".");
    }
}

pid_t launchVeltd(const std::filesystem::path& folder, const TrialPlace& place, int httpPort) {
    const pid_t child = ::fork();
    if (child < 0) {
        throw TrialError(cannot("start", "veltd"));
    }
    if (child == 0) {
        becomeVeltd(folder, place, httpPort);
    }
    if (!waitForAnswer([child] { return ::waitpid(child, nullptr, WNOHANG) == 0; })) {
        const auto log = readFile(logName);
        throw TrialError("veltd did not start:\n" +
                         std::string(trimmedEnd(log ? *log : log.error().message, "\n")));
    }
    return child;
}

bool waitForVeltd() {
    return waitForAnswer([] { return runningVeltd().has_value(); });
}

void endVeltd() {
    constexpr int longestEnd = 70; // seconds
    const auto process = runningVeltd();
    const UniqueFd handle(process ? ::pidfd_open(*process, 0) : -1);
    // The handle is of this process, and not of a later one with the same number, if it still holds the lock.
    if (!handle || runningVeltd() != process) {
        return;
    }
    pollfd ended{handle.get(), POLLIN, 0};
    const std::string number = std::to_string(*process);
    if (::pidfd_send_signal(handle.get(), SIGTERM, nullptr, 0) != 0 && errno != ESRCH) {
        throw TrialError(cannot("stop", "veltd (process " + number + ")"));
    }
    if (::poll(&ended, 1, longestEnd * 1000) != 1) {
        throw TrialError("veltd (process " + number + ") did not stop within " + std::to_string(longestEnd) +
                         " s. End it with kill -9 " + number + ", then try again.");
    }
}

int chooseHttpPort(int former) {
    if (former != 0 && isFree(former)) {
        return former;
    }
    for (int port = firstHttpPort; port <= lastHttpPort; ++port) {
        if (isFree(port)) {
            return port;
        }
    }
    throw TrialError("Ports " + std::to_string(firstHttpPort) + " to " + std::to_string(lastHttpPort) +
                     " of 127.0.0.1 are all in use. Free one of them and start again.");
}

} // namespace velt::host
