// velt-supervise: keeps one daemon running.
//
//     velt-supervise FOLDER DAEMON CONFIGURATION PORTS PROGRAM [ARGUMENT...]
//     velt-supervise FOLDER DAEMON
//
// FOLDER holds the state file, the lock and the control socket of DAEMON; PORTS are separated by commas, with
// "shared" before them where a successor can have them at the same time; CONFIGURATION identifies what the
// daemon is started for. The process that was started ends at once; its child goes on and writes "ready", or
// "failed" and the reason, to descriptor 3.
//
// In the second form it is a service manager's: it stays in the foreground, finds what to start in
// FOLDER's order file, and says how that went as sd_notify(3) describes it.

#include "base/number_text.h"
#include "base/text.h"
#include "schema/settings_table.h"
#include "standalone/supervise/control_channel.h"
#include "standalone/supervise/login_watch.h"
#include "standalone/supervise/service_manager.h"
#include "standalone/supervise/supervisor.h"

#include <fcntl.h>
#include <linux/close_range.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <exception>
#include <fstream>
#include <iterator>
#include <optional>
#include <string>
#include <string_view>

namespace {

using velt::DaemonOrder;
using velt::Error;
using velt::Result;

constexpr int reportDescriptor = 3;

std::optional<std::vector<int>> parsePorts(std::string_view text) {
    std::vector<int> ports;
    while (!text.empty()) {
        const auto port = velt::parseNumber(velt::cut(text, ','));
        if (!port || *port < 1 || *port > velt::schema::highestPort) {
            return std::nullopt;
        }
        ports.push_back(static_cast<int>(*port));
    }
    return ports;
}

Result<DaemonOrder> readOrder(const std::string& folder, const std::string& daemon) {
    std::ifstream file(velt::orderFile(folder, daemon), std::ios::binary);
    const auto request = velt::decodeRequest({std::istreambuf_iterator<char>(file), {}});
    if (!request || request->command != velt::Command::start) {
        return Error(folder + " has no valid order for " + daemon);
    }
    return request->order;
}

void reportToManager(const Result<>& started) {
    velt::tellServiceManager(started ? "READY=1" : "STATUS=" + started.error().message);
}

void reportToCaller(const Result<>& started) {
    const std::string text = started ? "ready" : "failed " + started.error().message;
    if (::write(reportDescriptor, text.data(), text.size()) < 0) {
        ::syslog(LOG_WARNING, "cannot report to the caller: %s (%s)", std::strerror(errno), text.c_str());
    }
    ::close(reportDescriptor);
}

/// Leaves everything that came from the process which started this one, and returns in the child.
void detach() {
    const pid_t child = ::fork();
    if (child != 0) {
        ::_exit(child < 0 ? 1 : 0);
    }
    ::setsid();
    ::umask(S_IWGRP | S_IWOTH);
    if (::chdir("/") != 0) {
        ::syslog(LOG_WARNING, "cannot leave the working folder: %s", std::strerror(errno));
    }
    ::close_range(reportDescriptor + 1, ~0U, 0);
    ::fcntl(reportDescriptor, F_SETFD, FD_CLOEXEC);
    const int null = ::open("/dev/null", O_RDWR | O_CLOEXEC);
    for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        ::dup2(null, standard);
    }
    ::close(null);
    ::signal(SIGPIPE, SIG_IGN);
}

int supervise(const std::string& folder, const std::string& daemon, const DaemonOrder& order,
              void (*report)(const Result<>&)) {
    velt::Supervisor supervisor(folder, daemon, velt::watchLogins(folder, daemon));
    const Result<> started = supervisor.begin(order);
    report(started);
    if (!started) {
        return 1;
    }
    supervisor.run();
    return 0;
}

int superviseForManager(const std::string& folder, const std::string& daemon) {
    const auto order = readOrder(folder, daemon);
    if (!order) {
        reportToManager(order.error());
        return 1;
    }
    ::umask(S_IWGRP | S_IWOTH);
    ::signal(SIGPIPE, SIG_IGN);
    return supervise(folder, daemon, *order, reportToManager);
}

int superviseDetached(int argc, char** argv) {
    std::string_view portText = argv[4];
    const bool shared = portText.starts_with(velt::sharedPortsPrefix);
    portText.remove_prefix(shared ? velt::sharedPortsPrefix.size() : 0);
    const auto ports = parsePorts(portText);
    if (!ports) {
        std::fprintf(stderr, "velt-supervise: PORTS: expected numbers from 1 to 65535, not \"%s\"\n",
                     argv[4]);
        return 2;
    }
    const DaemonOrder order{argv[3], *ports, {argv + 5, argv + argc}, shared};
    detach();
    return supervise(argv[1], argv[2], order, reportToCaller);
}

/// What the daemon writes goes to syslog as well, the reasons of refused logins among it, so it is logged
/// under the daemon's name: "velt-ftpd", "velt-sftpd".
std::string logName(const std::string& daemon) {
    return "velt-" + daemon + (daemon.ends_with('d') ? "" : "d");
}

} // namespace

int main(int argc, char** argv) {
    constexpr int managedArguments = 3;
    constexpr int fewestArguments = 6;
    if (argc != managedArguments && argc < fewestArguments) {
        std::fputs("usage: velt-supervise FOLDER DAEMON [CONFIGURATION PORTS PROGRAM [ARGUMENT...]]\n",
                   stderr);
        return 2;
    }
    const std::string name = logName(argv[2]);
    ::openlog(name.c_str(), LOG_PID, LOG_DAEMON);
    try {
        const int status =
            argc == managedArguments ? superviseForManager(argv[1], argv[2]) : superviseDetached(argc, argv);
        ::_exit(status); // the thread that counts failed logins may be in the middle of something
    } catch (const std::exception& error) {
        ::syslog(LOG_CRIT, "%s", error.what());
        ::_exit(1);
    }
}
