// What the FTP daemon's configuration needs to know beside the settings.
#ifndef VELT_STANDALONE_DAEMONS_PROFTPD_PROFTPD_SURROUNDINGS_H
#define VELT_STANDALONE_DAEMONS_PROFTPD_PROFTPD_SURROUNDINGS_H

#include "base/result.h"
#include "standalone/daemons/proftpd/proftpd_configuration.h"

#include <memory>
#include <string>

namespace velt {

class ScratchFolder;

/// What goes into the configuration beside the settings, determined at each call: places, certificate (made
/// when it is missing and needed), the rights of this process.
struct FtpSurroundings {
    ProftpdPlaces places;
    std::string certificateFingerprint;             ///< "" where FTPS is off
    std::shared_ptr<const ScratchFolder> throwAway; ///< keeps a certificate that is for a test only
};

/// Fails when the surroundings do not allow these settings: no account "ftp" for anonymous users, no usable
/// certificate, a damaged share store, a state root whose name cannot be written into the configuration.
Result<FtpSurroundings> surveyFtp(const FtpSettings& settings);

} // namespace velt

#endif
