// The FTP daemon's files below the state root.
#ifndef VELT_STANDALONE_DAEMONS_PROFTPD_PLACES_H
#define VELT_STANDALONE_DAEMONS_PROFTPD_PLACES_H

#include "standalone/daemons/proftpd/render.h"

#include <filesystem>
#include <memory>
#include <optional>
#include <string>

namespace velt {

class ScratchFolder;

/// Everything of the FTP daemon's that does not outlive a boot: "/run/velt/ftp" below the state root.
std::filesystem::path ftpRunFolder();

/// What goes into the configuration beside the settings, found out anew: places, certificate (made when it is
/// missing and needed), the rights of this process.
struct FtpSurroundings {
    ProftpdPlaces places;
    std::string certificateFingerprint;             ///< "" where FTPS is off
    std::shared_ptr<const ScratchFolder> throwAway; ///< keeps a certificate that is for a test only
};

/// Nothing, with the last error set, when the surroundings do not allow these settings: no account "ftp" for
/// anonymous users, no usable certificate, a damaged share store, a state root whose name cannot stand in the
/// configuration.
std::optional<FtpSurroundings> surveyFtp(const FtpSettings& settings);

} // namespace velt

#endif
