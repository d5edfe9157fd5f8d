#include "tests/standalone/control/plan_double.h"

#include "standalone/core/last_error.h"
#include "standalone/daemons/candidate.h"
#include "standalone/daemons/daemon_plan.h"
#include "standalone/settings/settings.h"
#include "tests/standalone/supervise/daemon_test.h"

namespace velt::test {

PlanDouble& planDouble() {
    static PlanDouble plan;
    return plan;
}

namespace {

int refuseIfAsked() {
    return planDouble().refuse ? fail(ErrorNumber::daemon, "The configuration was refused.") : 0;
}

std::optional<DaemonPlan> makePlan(int port, const std::string& settings,
                                   const std::vector<std::string>& options) {
    if (refuseIfAsked() < 0) {
        return std::nullopt;
    }
    std::string hash = settings;
    for (const std::string& option : options) {
        hash += " " + option;
    }
    return testPlan(port, hash, options);
}

} // namespace
} // namespace velt::test

namespace velt {

std::optional<DaemonPlan> planFtpDaemon() {
    const auto settings = orLastError(loadFtpSettings());
    if (!settings) {
        return std::nullopt;
    }
    const auto& record = settings->record;
    return test::makePlan(controlPort(record),
                          std::string(record.portnum) + " " + std::to_string(record.service_flags) + " " +
                              std::to_string(record.maxuploadrate),
                          test::planDouble().ftpOptions);
}

std::optional<DaemonPlan> planSftpDaemon() {
    const auto settings = orLastError(loadSftpSettings());
    return settings ? test::makePlan(settings->port, std::to_string(settings->port),
                                     test::planDouble().sftpOptions)
                    : std::nullopt;
}

int testFtpCandidate(const FtpSettings&) {
    return test::refuseIfAsked();
}

int testSftpCandidate(const SftpSettings&) {
    return test::refuseIfAsked();
}

} // namespace velt
