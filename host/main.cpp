// veltd: loads the modules over the platform and serves them.

#include "base/json_value.h"
#include "host/api/app.h"
#include "host/base/host_log.h"
#include "host/base/instance_lock.h"
#include "host/base/json.h"
#include "host/base/open_file_limit.h"
#include "host/config.h"
#include "host/http/server.h"
#include "host/module/module_table.h"
#include "host/trial/trial.h"
#include "standalone/standalone.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <exception>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using velt::host::App;
using velt::host::AppSettings;
using velt::host::Config;
using velt::host::HostLog;
using velt::host::HttpLimits;
using velt::host::HttpServer;
using velt::host::InstanceLock;
using velt::host::Listener;

constexpr int usageError = 2;

/// Blocks the signals that end the host, in every thread to come, for sigwait.
sigset_t blockEndSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGTERM);
    sigaddset(&signals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    // A client that disconnects early must not end the host.
    std::signal(SIGPIPE, SIG_IGN); // NOLINT(cert-err33-c)
    return signals;
}

/// Opens all listening sockets and returns what --print-ready shows.
Json::Value listenEverywhere(const Config& config, HttpServer& server, HostLog& log) {
    std::vector<Listener> listeners = Listener::inherited(config.allowRemote);
    if (listeners.empty()) {
        listeners.push_back(Listener::unixSocket(config.socketPath(), config.adminGroup));
    }
    for (const std::string& address : config.listen) {
        listeners.push_back(Listener::tcp(address, config.allowRemote));
    }
    Json::Value ready = velt::jsonObject({{"listen", Json::arrayValue}});
    for (Listener& listener : listeners) {
        log.write("listening on " + listener.name());
        if (listener.isUnixSocket()) {
            ready["socket"] = listener.name();
        } else {
            ready["listen"].append(listener.name());
        }
        server.add(std::move(listener));
    }
    return ready;
}

/// The configured limits, with no more connections than the process may have.
HttpLimits possibleLimits(const Config& config, HostLog& log) {
    HttpLimits limits = config.limits;
    limits.connections = velt::host::makeRoomForConnections(limits.connections);
    if (limits.connections < config.limits.connections) {
        log.write("the limit of open files allows only " + std::to_string(limits.connections) +
                  " connections");
    }
    // One that has all of its share leaves most of them to others.
    limits.connectionsOfOne = std::max<std::size_t>(1, limits.connections / 4);
    return limits;
}

/// While it lives, what sessions do is taken over and told.
class ActivityReading {
public:
    ActivityReading() { velt::startActivityReader(); }
    ~ActivityReading() { velt::stopActivityReader(); }
    ActivityReading(const ActivityReading&) = delete;
    ActivityReading& operator=(const ActivityReading&) = delete;
};

void serve(const Config& config, const sigset_t& signals, HostLog& log) {
    if (const auto opened = velt::openState(config.stateRoot); !opened) {
        throw velt::host::ConfigError(opened.error().message);
    }
    velt::host::ModuleTable table;
    for (const auto& module : config.modules) {
        table.load(module);
    }
    AppSettings settings;
    settings.access = {config.adminGroup, config.hostNames};
    settings.tokenFile = config.tokenFile();
    settings.workers = config.workers;
    App app(settings, table, log);
    HttpServer server(app, possibleLimits(config, log), config.tls);
    const Json::Value ready = listenEverywhere(config, server, log);
    if (const auto undone = velt::undoUnfinishedChange(); !undone) {
        log.write("a change that was cut off half-way cannot be undone: " + undone.error().message);
    } else if (*undone) {
        log.write("a change was cut off half-way: the settings are as they were before it");
    }
    app.begin();
    if (const auto started = velt::startServicesAtBoot(); !started) {
        log.write("some enabled services did not start: " + started.error().message);
    }
    if (const auto watched = velt::watchServices(); !watched) {
        log.write(watched.error().message);
    }
    const ActivityReading reading;
    server.start(config.ioThreads);
    if (config.printReady) {
        std::printf("%s\n", velt::host::toJson(ready).c_str());
        std::fflush(stdout);
    }
    int signal = 0;
    sigwait(&signals, &signal);
    log.write("stopping");
    server.stop(config.stopTime);
    app.stop();
    velt::unwatchServices();
    log.write("stopped");
}

/// Of what other libraries throw it makes one.
std::string sentenceOf(const std::exception& error) {
    const std::string text = error.what();
    return text.ends_with('.') ? text : "Cannot start: " + text + ".";
}

} // namespace

int main(int argc, char** argv) {
    // What it makes is for others to read at most, whatever it was started with.
    umask(022);
    const std::vector<std::string> words(argv + 1, argv + argc);
    if (!words.empty() && words[0] == "trial") {
        return velt::host::runTrial({words.begin() + 1, words.end()});
    }
    HostLog log;
    try {
        const Config config = velt::host::readConfig(words);
        if (config.help || config.version) {
            std::printf("%s", config.help ? velt::host::usage() : "veltd " VELT_VERSION "\n");
            return 0;
        }
        // The programs that it starts must not get the descriptors that this process inherited.
        close_range(STDERR_FILENO + 1, ~0U, CLOSE_RANGE_CLOEXEC);
        const auto lock = InstanceLock::take(config.stateRoot);
        if (!lock) {
            throw std::runtime_error(lock.error().message);
        }
        const sigset_t signals = blockEndSignals();
        serve(config, signals, log);
        return 0;
    } catch (const velt::host::ConfigError& error) {
        std::fprintf(stderr, "veltd: %s\n", error.what());
        return usageError;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "veltd: %s\n", sentenceOf(error).c_str());
        return 1;
    }
}
