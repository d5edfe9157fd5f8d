#include "tests/standalone/settings/fake_candidate.h"

#include "standalone/core/error_number.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "standalone/daemons/sshd/sshd_plan.h"

namespace velt {

namespace {

Result<std::string> answer() {
    if (!test::fakeCandidate().refuses) {
        return std::string("hash");
    }
    return Error(ErrorNumber::daemon, "The daemon does not take it.");
}

} // namespace

test::FakeCandidate& test::fakeCandidate() {
    static FakeCandidate candidate;
    return candidate;
}

Result<std::string> testFtpCandidate(const FtpSettings& settings) {
    test::fakeCandidate().ftp.push_back(settings);
    return answer();
}

Result<std::string> testSftpCandidate(const SftpSettings& settings, const ConfinementSettings&) {
    test::fakeCandidate().sftp.push_back(settings);
    return answer();
}

// No daemon runs that could follow a change.
Result<std::optional<DaemonPlan>> planFtpDaemon() {
    return std::nullopt;
}

Result<std::optional<DaemonPlan>> planSftpDaemon() {
    return std::nullopt;
}

} // namespace velt
