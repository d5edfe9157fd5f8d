// What is enabled and does not serve.
#ifndef VELT_STANDALONE_CONTROL_SERVICES_DOWN_H
#define VELT_STANDALONE_CONTROL_SERVICES_DOWN_H

#include <string>
#include <vector>

namespace velt {

/// A service that the stored settings enable and that does not follow them.
struct ServiceDown {
    std::string service; ///< "ftp" (FTP and FTPS, one daemon) or "sftp"
    std::string reason;  ///< a sentence: the daemon's own words of its last start, where it had some
    bool servesFormerSettings = false; ///< it runs, with the settings that it had before the stored ones
    bool operator==(const ServiceDown&) const = default;
};

/// The enabled services that are down, or serve former settings since a restart with the stored ones was
/// refused: empty when all is well. startEnabledServices tries them once more. A service whose settings
/// cannot be read is listed, since nobody can tell that it is off. It is the state of this moment: between
/// the stop and the start of a change that somebody else makes, a service is down as well. Leaves the last
/// error alone.
std::vector<ServiceDown> servicesDown();

} // namespace velt

#endif
