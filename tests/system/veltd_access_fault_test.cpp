// veltd while it looks who asks, and one system call after another fails: a stranger stays one.
#include "tests/support/text.h"
#include "tests/system/support/watched_veltd.h"

#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <csignal>
#include <thread>

namespace velt::test {
namespace {

using VeltdAccessFaults = WatchedVeltd;

/// Over the Unix socket as a user of the world who administers nothing.
int askAsBob() {
    int status = -1;
    std::thread bob([&status] {
        // The calls themselves are of one thread; the library's are of all.
        if (::syscall(SYS_setgroups, 0, nullptr) == 0 && ::syscall(SYS_setresgid, bobId, bobId, bobId) == 0 &&
            ::syscall(SYS_setresuid, bobId, bobId, bobId) == 0) {
            Client client = Client::unixSocket(worldRoot / "run/velt/veltd.sock");
            status = client.connected() ? client.ask(requestText("GET", "/api/tokens")).status : -1;
        }
    });
    bob.join();
    return status;
}

TEST_F(VeltdAccessFaults, LetNobodyInWhoMayNot) {
    CallWatch veltd([] { return becomeVeltd({}); }, {});
    ASSERT_TRUE(answers(veltd.child())) << words();
    // As if somebody had opened it to all.
    ASSERT_EQ(::chmod((worldRoot / "run/velt/veltd.sock").c_str(), 0666), 0);
    FaultSweep sweep;
    sweep.server = &veltd;
    sweep.prepare = [] {};
    sweep.act = [] {
        Client nobody = Client::tcp(veltdPort);
        const int overTcp = nobody.ask(requestText("GET", "/api/tokens")).status;
        return std::to_string(overTcp) + " " + std::to_string(askAsBob());
    };
    sweep.counts = [](const SeenCall& call) {
        return isVeltds(call) && (call.subject.starts_with("/") || call.name == "getsockopt");
    };
    sweep.share = Share::all; // what is asked of a socket looks the same each time
    sweep.check = [](const SweptRun& run) {
        EXPECT_TRUE(run.end.told == "401 403" || run.call.error != 0) << run.end.told;
        EXPECT_FALSE(contains(run.end.told, "200")) << run.end.told;
        EXPECT_EQ(ask("GET", "/api/tokens").status, 200) << "and root is served";
    };
    EXPECT_GE(sweepFaults(sweep), 5);
    ::kill(veltd.child(), SIGTERM);
    EXPECT_TRUE(veltd.finish(std::chrono::seconds(10)).inTime);
}

} // namespace
} // namespace velt::test
