// What the host asks of the platform beside the contract: the one place where it knows which platform it runs
// on.
//
// May be called from any thread unless it says otherwise.
#ifndef VELT_HOST_PLATFORM_ACCESS_H
#define VELT_HOST_PLATFORM_ACCESS_H

#include <array>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace velt::host {

/// An entry of the administrator log.
struct AdminLogEntry {
    std::int64_t id = 0;           ///< grows with each entry
    std::int64_t milliseconds = 0; ///< since 1970, UTC
    int category = 0;
    int level = 0;
    std::uint32_t event = 0;
    std::array<std::string, 4> arguments;
    std::string text;
    std::string actor;
    std::string address;
};

/// Which entries of the administrator log are wanted; what is not set does not narrow.
struct AdminLogQuery {
    std::optional<std::int64_t> sinceMilliseconds; ///< this moment or later
    std::optional<std::uint32_t> event;
    std::optional<std::string> actor;
    std::optional<std::int64_t> beforeId; ///< older than this entry
    int limit = 100;
};

/// What the platform tells about itself, as it happens, on the thread on which it happens. What they throw is
/// dropped.
struct PlatformObserver {
    std::function<void(const std::string& service, const std::string& action)> serviceAction;
    std::function<void(const AdminLogEntry&)> logEntry;
    std::function<void(const std::string& service)> daemonStarted; ///< at the request of somebody
};

/// What the platform knows of the request that this thread has served.
struct PlatformReport {
    bool changed = false;     ///< something was stored, started or stopped
    bool stored = false;      ///< something was stored
    bool storeFailed = false; ///< something could not be stored
    std::string sentence;     ///< of the last error; "" when there was none
    std::string holder;       ///< of the port that was found taken; "" when none was
    int port = 0;             ///< that port
};

/// Opens the platform's state below the root. Before any other call, while the process has one thread. False,
/// with the reason in `error`, when that fails.
bool openPlatform(const std::filesystem::path& stateRoot, std::string& error);

/// Starts the services that the settings enable. False, with the reason in `error`, when one does not start;
/// the others run.
bool startEnabledServices(std::string& error);

/// Brings daemons back whose supervisors were killed, from now on until unwatchServices. False, with the
/// reason in `error`, when that is impossible.
bool watchServices(std::string& error);
void unwatchServices();

/// A service that the settings enable and that does not follow them.
struct ServiceDown {
    std::string service;               ///< "ftp" (with FTPS) or "sftp"
    std::string reason;                ///< a sentence
    bool servesFormerSettings = false; ///< it runs, but not with the settings that are stored now
};

/// All of them, at this moment: while a change restarts a service, that one is down as well.
std::vector<ServiceDown> servicesDown();

/// How often each daemon ("ftp", "sftp") was started again after it had ended by itself. Begins anew at 0
/// when the service is switched off and on.
std::map<std::string, std::uint64_t> daemonRestarts();

/// Observes the platform until unobservePlatform, after which no observer is running.
void observePlatform(PlatformObserver observer);
void unobservePlatform();

/// This thread begins to serve a request of the actor, who sent it from the address.
void beginPlatformRequest(const std::string& actor, const std::string& address);

/// This thread has served its request.
PlatformReport endPlatformRequest();

/// The newest entries of the administrator log that the query lets through, newest first. Nothing, with the
/// reason in `error`, when the log cannot be read.
std::optional<std::vector<AdminLogEntry>> queryAdminLog(const AdminLogQuery& query, std::string& error);

} // namespace velt::host

#endif
