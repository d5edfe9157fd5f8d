// The services as a whole: which there are, what the stored settings say of them, and which are down.
#ifndef VELT_STANDALONE_CONTROL_SERVICE_OVERVIEW_H
#define VELT_STANDALONE_CONTROL_SERVICE_OVERVIEW_H

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// A service as an administrator switches it.
struct StoredService {
    std::string name;            ///< "ftp", "ftps", "sftp"
    std::string daemon;          ///< whose it is: "ftp" (FTP and FTPS, one daemon) or "sftp"
    std::optional<bool> enabled; ///< nothing when the settings cannot be read
    std::optional<int> port;     ///< on which the daemon listens; the same
};

/// All services.
std::vector<StoredService> storedServices();

/// A daemon that the stored settings enable and that does not follow them.
struct ServiceDown {
    std::string service; ///< "ftp" or "sftp"
    std::string reason;  ///< a sentence: the daemon's own words of its last start, where it had some
    bool servesFormerSettings = false; ///< it runs, with the settings that it had before the stored ones
    std::string label;                 ///< for people: "FTP"
    bool operator==(const ServiceDown&) const = default;
};

/// The enabled services that are down, or serve former settings since a restart with the stored ones was
/// refused: empty when all is well. startEnabledServices tries them once more. A service whose settings
/// cannot be read is listed, since nobody can tell that it is off. It is the state of this moment: between
/// the stop and the start of a change that somebody else makes, a service is down as well. Leaves the last
/// error alone.
std::vector<ServiceDown> servicesDown();

/// How often each daemon ("ftp", "sftp") was started again after it had ended by itself, since its
/// supervisor, or the machine, began. 0 for one that is off.
std::map<std::string, std::uint64_t> daemonRestarts();

} // namespace velt

#endif
