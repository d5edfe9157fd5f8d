#include "tests/standalone/settings/fake_candidate.h"

#include "standalone/core/last_error.h"
#include "standalone/daemons/candidate.h"

namespace velt {

namespace {

int answer() {
    if (!test::fakeCandidate().refuses)
        return 0;
    return fail(ErrorNumber::daemon, "The daemon does not take it.");
}

} // namespace

test::FakeCandidate& test::fakeCandidate() {
    static FakeCandidate candidate;
    return candidate;
}

int testFtpCandidate(const FtpSettings& settings) {
    test::fakeCandidate().ftp.push_back(settings);
    return answer();
}

int testSftpCandidate(const SftpSettings& settings) {
    test::fakeCandidate().sftp.push_back(settings);
    return answer();
}

} // namespace velt
