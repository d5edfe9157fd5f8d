// Starts, changes and stops of a daemon while one system call after another fails, in the process that asks
// and in the supervisor: it ends in time and says what is so, nothing is orphaned, and the next request
// works.
#include "standalone/standalone.h"
#include "tests/standalone/control/services_fixture.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/waiting.h"

#include <algorithm>
#include <memory>

namespace velt::test {
namespace {

std::string outcome(int result) {
    return result == 0 ? "done" : "failed: " + lastErrorSentence();
}

/// What is done to the service "sftp", which can do everything.
struct Operation {
    const char* name;
    bool runsBefore;
    int (*act)();
    bool servesAfter;
};

void PrintTo(const Operation& operation, std::ostream* out) {
    *out << operation.name;
}

int start() {
    return VLIBServiceStart("sftp", 0);
}
int stop() {
    return VLIBServiceStop("sftp", 0);
}
int pause() {
    return VLIBServicePause("sftp");
}
int resume() {
    return VLIBServiceResume("sftp");
}

class ServiceFaults : public ServicesTest, public testing::WithParamInterface<Operation> {
protected:
    void bringBack() {
        ASSERT_EQ(stop(), 0) << lastErrorSentence();
        sftpPort_ = former_;
        storeSftp(true);
        if (GetParam().runsBefore) {
            ASSERT_EQ(start(), 0) << lastErrorSentence();
        }
        if (GetParam().act == resume) {
            ASSERT_EQ(pause(), 0) << lastErrorSentence();
        }
        storeSftp(true);
    }

    /// Whether what is known agrees with what is so.
    void expectTruth(const SweptRun& run) const {
        const bool done = run.end.told == "done";
        const bool serves = accepts(former_);
        EXPECT_TRUE(done || (run.end.told.starts_with("failed: ") && run.end.told.ends_with(".")))
            << run.end.told;
        EXPECT_TRUE(!done || serves == GetParam().servesAfter) << run.end.told;
        const DaemonState state = serviceState("sftp");
        EXPECT_TRUE(!serves || state.state == RunState::running || state.state == RunState::failed);
        const auto down = servicesDown();
        EXPECT_TRUE(serves || !down.empty()) << "a service that is down is told";
    }

    int former_ = sftpPort_;
};

TEST_P(ServiceFaults, AreToldAndOrphanNothing) {
    FaultSweep sweep;
    sweep.prepare = [this] { bringBack(); };
    sweep.act = [] { return outcome(GetParam().act()); };
    sweep.counts = [](const SeenCall& call) {
        return (call.ofChild || call.program.starts_with("velt-superv")) && !isLoading(call);
    };
    sweep.check = [this](const SweptRun& run) {
        expectTruth(run);
        EXPECT_EQ(start(), 0) << "the next start: " << lastErrorSentence();
        EXPECT_TRUE(accepts(former_));
        EXPECT_EQ(stop(), 0) << "the next stop: " << lastErrorSentence();
        EXPECT_FALSE(accepts(former_));
        EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, std::chrono::seconds(2)));
    };
    EXPECT_GE(sweepFaults(sweep), 10);
}

const Operation operations[] = {
    {"AStart", false, start, true},
    {"AStop", true, stop, false},
    {"APause", true, pause, false},
    {"AResume", true, resume, true},
};

INSTANTIATE_TEST_SUITE_P(All, ServiceFaults, testing::ValuesIn(operations),
                         [](const auto& operation) { return operation.param.name; });

} // namespace
} // namespace velt::test
