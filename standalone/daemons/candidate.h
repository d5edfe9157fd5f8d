// Whether the daemons themselves take settings that are about to be stored.
#ifndef VELT_STANDALONE_DAEMONS_CANDIDATE_H
#define VELT_STANDALONE_DAEMONS_CANDIDATE_H

#include "standalone/settings/settings.h"

namespace velt {

/// Passes the configuration that would follow from these settings through the daemon's own test. Nothing that
/// a running daemon uses is touched. Negative when it is refused, with the daemon's own words in the last
/// error's sentence.
int testFtpCandidate(const FtpSettings& settings);
int testSftpCandidate(const SftpSettings& settings);

} // namespace velt

#endif
