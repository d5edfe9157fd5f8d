// A stand-in for the daemons' own tests of their configuration.
#ifndef VELT_TESTS_STANDALONE_SETTINGS_FAKE_CANDIDATE_H
#define VELT_TESTS_STANDALONE_SETTINGS_FAKE_CANDIDATE_H

#include "standalone/settings/settings.h"

#include <vector>

namespace velt::test {

struct FakeCandidate {
    std::vector<FtpSettings> ftp; ///< what was tested, in order
    std::vector<SftpSettings> sftp;
    bool refuses = false;
};

/// The one of this process.
FakeCandidate& fakeCandidate();

} // namespace velt::test

#endif
