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
    if (planDouble().refuse.isOn()) {
        return Error(ErrorNumber::daemon, "The configuration was refused.");
    }
    return {};
}

/// What an order follows from.
struct Rendering {
    int port;
    std::string settings;
    std::vector<std::string> options;

    std::string hash() const {
        std::string text = settings;
        for (const std::string& option : options) {
            text += " " + option;
        }
        return text;
    }
};

Rendering render(const FtpSettings& settings) {
    const auto& record = settings.record;
    auto options = planDouble().ftpOptions;
    if (record.maxuploadrate == planDouble().crashingRate) {
        options.insert(options.end(), {"--refuse", "fatal: out of luck"});
    }
    return {controlPort(record),
            std::string(record.portnum) + " " + std::to_string(record.service_flags) + " " +
                std::to_string(record.maxuploadrate),
            options};
}

Rendering render(const SftpSettings& settings) {
    return {settings.port, std::to_string(settings.port), planDouble().sftpOptions};
}

Result<std::string> testRendering(const Rendering& rendering) {
    VELT_RETURN_IF_ERROR(refuseIfAsked());
    return rendering.hash();
}

Result<std::optional<DaemonPlan>> makePlan(const Rendering& rendering) {
    VELT_ASSIGN_OR_RETURN(const auto hash, testRendering(rendering));
    return std::optional(DaemonPlan{testOrder(rendering.port, hash, rendering.options), {}});
}

} // namespace
} // namespace velt::test

namespace velt {

Result<std::optional<DaemonPlan>> planFtpDaemon() {
    ++test::ftpPlansMade;
    VELT_ASSIGN_OR_RETURN(const auto settings, loadFtpSettings());
    return enablesFtp(settings.record) ? test::makePlan(test::render(settings)) : std::optional<DaemonPlan>();
}

Result<std::optional<DaemonPlan>> planSftpDaemon() {
    VELT_ASSIGN_OR_RETURN(const auto settings, loadSftpSettings());
    return test::makePlan(test::render(settings));
}

bool takesFtpRights(const std::filesystem::path&, const std::filesystem::path&) {
    return test::planDouble().takesRights;
}

Result<std::string> testFtpCandidate(const FtpSettings& settings) {
    return test::testRendering(test::render(settings));
}

Result<std::string> testSftpCandidate(const SftpSettings& settings, const ConfinementSettings&) {
    return test::testRendering(test::render(settings));
}

} // namespace velt
