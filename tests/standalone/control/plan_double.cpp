#include "tests/standalone/control/plan_double.h"

#include "standalone/core/error_number.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "standalone/daemons/proftpd/session_rights.h"
#include "standalone/daemons/sshd/sshd_plan.h"
#include "standalone/settings/settings.h"
#include "tests/standalone/supervise/daemon_test.h"

#include <atomic>

namespace velt::test {

PlanDouble& planDouble() {
    static PlanDouble plan;
    return plan;
}

namespace {

std::atomic<int> ftpPlansMade{0};

} // namespace

int ftpPlans() {
    return ftpPlansMade;
}

namespace {

Result<> refuseIfAsked() {
    if (planDouble().refuse) {
        return Error(ErrorNumber::daemon, "The configuration was refused.");
    }
    return {};
}

Result<std::optional<DaemonPlan>> makePlan(int port, const std::string& settings,
                                           const std::vector<std::string>& options) {
    if (const auto refused = refuseIfAsked(); !refused) {
        return refused.error();
    }
    std::string hash = settings;
    for (const std::string& option : options) {
        hash += " " + option;
    }
    return std::optional(DaemonPlan{testOrder(port, hash, options), {}});
}

} // namespace
} // namespace velt::test

namespace velt {

Result<std::optional<DaemonPlan>> planFtpDaemon() {
    ++test::ftpPlansMade;
    const auto settings = loadFtpSettings();
    if (!settings) {
        return settings.error();
    }
    const auto& record = settings->record;
    if (!enablesFtp(record)) {
        return std::optional<DaemonPlan>();
    }
    auto options = test::planDouble().ftpOptions;
    if (record.maxuploadrate == test::planDouble().crashingRate) {
        options.insert(options.end(), {"--refuse", "fatal: out of luck"});
    }
    return test::makePlan(controlPort(record),
                          std::string(record.portnum) + " " + std::to_string(record.service_flags) + " " +
                              std::to_string(record.maxuploadrate),
                          options);
}

Result<std::optional<DaemonPlan>> planSftpDaemon() {
    const auto settings = loadSftpSettings();
    if (!settings) {
        return settings.error();
    }
    return test::makePlan(settings->port, std::to_string(settings->port), test::planDouble().sftpOptions);
}

bool takesFtpRights(const std::filesystem::path&, const std::filesystem::path&) {
    return test::planDouble().takesRights;
}

Result<> testFtpCandidate(const FtpSettings&) {
    return test::refuseIfAsked();
}

Result<> testSftpCandidate(const SftpSettings&) {
    return test::refuseIfAsked();
}

} // namespace velt
