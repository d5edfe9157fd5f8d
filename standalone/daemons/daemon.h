// The daemons that serve files, in one table: all that the rest of the system knows about each of them.
#ifndef VELT_STANDALONE_DAEMONS_DAEMON_H
#define VELT_STANDALONE_DAEMONS_DAEMON_H

#include "base/result.h"
#include "ftp/ftp_library.h"
#include "standalone/supervise/daemon_order.h"

#include <chrono>
#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// Ports of one daemon.
struct DaemonPorts {
    VELT_FTP_PORT_RANGE range{};
    bool ofSessions = false; ///< each session takes one of the range; else the daemon listens on its one port
    std::string use;         ///< in words: "the FTP service"
};

/// A service that an administrator switches on and off; one daemon may serve several.
struct ServiceSwitch {
    std::string_view service; ///< its name in the API: "ftp", "ftps", "sftp"
    bool on = false;
};

/// What the stored settings say of a daemon.
struct DaemonSettings {
    std::vector<ServiceSwitch> services;
    std::vector<DaemonPorts> ports; ///< in force as soon as one of the services is on

    /// Whether one of the services is on, so that the daemon is to run.
    bool enabled() const;
};

/// A name by which the contract calls a service.
struct ServiceName {
    std::string_view inContract; ///< "ftpd-ssl"
    std::string_view service;    ///< its name in the API: "ftps"
};

/// A file beside a unit of systemd's.
struct UnitDropIn {
    std::string_view file; ///< below the folder of units
    std::string_view text;
};

/// A configuration that was written, and how the daemon runs with it.
struct DaemonPlan {
    DaemonOrder order;
    std::filesystem::path folder; ///< holds what this configuration alone uses; its siblings are former ones'
};

/// A row of the table. Its functions are thread-safe.
struct Daemon {
    std::string_view name;     ///< of its files and its unit: "ftpd"
    std::string_view label;    ///< for people: "FTP"
    std::string_view apiName;  ///< "ftp"
    std::string_view portName; ///< by which the contract asks for its ports: "ftp", "ssh"
    std::span<const ServiceName> serviceNames;
    bool canPause = false; ///< its sessions go on without their listener
    std::span<const UnitDropIn> dropIns = {};

    /// Reads what is stored.
    Result<DaemonSettings> (*settings)();

    /// Renders, tests and writes the configuration that follows from the stored settings, and all that it
    /// needs, such as keys. A configuration has a folder of its own, so that a daemon which runs with a
    /// former one can be started again with that one; what all of them read at logins is replaced atomically.
    /// So this may be called while the daemon runs. Fails when the settings cannot be read, or the daemon's
    /// own test refuses them.
    ///
    /// Whether the services are on is for the caller to ask: the contract starts a service by name, and SFTP
    /// then runs although its setting is off. Nothing only where a daemon has nothing to serve with all of
    /// them off, as FTP's; a start by name stops it then.
    Result<std::optional<DaemonPlan>> (*plan)();

    /// Whether a session that began with the configuration in the former folder may do what the one in the
    /// other would not let it; true also when that cannot be told. Folders are those of plans.
    bool (*takesRights)(const std::filesystem::path& former, const std::filesystem::path& next);

    /// Puts the stored settings to the daemon's own test, and returns the hash of the configuration that a
    /// plan of them would have. Nothing that a running daemon uses is touched. Where a start would first make
    /// keys or a certificate, the hash is one that no plan has.
    Result<std::string> (*test)();
};

extern const Daemon ftpDaemon;  ///< one process for FTP and FTPS
extern const Daemon sftpDaemon; ///< a listener and its sessions

/// All rows.
std::span<const Daemon* const> allDaemons();

/// The daemon that serves what the contract calls by this name; none for a name that is not ours.
const Daemon* daemonServing(std::string_view nameInContract);

/// Whether the settings of this daemon switch on what the contract calls by this name.
bool isOn(const Daemon& daemon, const DaemonSettings& settings, std::string_view nameInContract);

/// Removes what former configurations left beside the folder of this one. To be called when its daemon
/// serves: until then the former one may be needed again. Those that were written or set aside less than so
/// long ago stay: who connected to the former daemon may be about to log in.
void removeFormerPlans(const DaemonPlan& plan, std::chrono::seconds spared = {});

/// Notes that the plan in this folder has a successor from now on.
void setAside(const std::filesystem::path& plan);

/// "The FTP daemon": how sentences begin.
std::string titleOf(const Daemon& daemon);

} // namespace velt

#endif
