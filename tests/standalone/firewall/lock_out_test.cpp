// Rules that would keep the administrator out.

#include "platform/firewall.h"
#include "standalone/contract/last_error.h"
#include "tests/standalone/firewall/firewall_test.h"
#include "tests/standalone/health/health_test.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>

namespace velt::test {
namespace {

/// A process named after a program, which listens on the port.
class NamedListener {
public:
    NamedListener(const char* program, int port) {
        std::array<int, 2> ready{};
        EXPECT_EQ(::pipe2(ready.data(), O_CLOEXEC), 0);
        process_ = ::fork();
        if (process_ == 0) {
            ::prctl(PR_SET_PDEATHSIG, SIGKILL);
            ::prctl(PR_SET_NAME, program);
            const OpenPort open(port);
            (void)::write(ready[1], "", 1);
            ::pause();
            ::_exit(0);
        }
        char byte = 0;
        EXPECT_EQ(::read(ready[0], &byte, 1), 1);
        ::close(ready[0]);
        ::close(ready[1]);
    }
    ~NamedListener() {
        ::kill(process_, SIGKILL);
        ::waitpid(process_, nullptr, 0);
    }
    NamedListener(const NamedListener&) = delete;
    NamedListener& operator=(const NamedListener&) = delete;

private:
    pid_t process_ = -1;
};

TEST_F(FirewallTest, RulesThatLockTheAdministratorOutAreNotLoaded) {
    const NamedListener ssh("sshd", 2022);
    const NamedListener host("veltd", 8443);
    const NamedListener other("nginx", 8080);
    const std::string file = (root_ / "etc/velt/firewall.conf").string();
    setMode("mode = drop");
    EXPECT_LT(VELTFwRuleHup(), 0);
    EXPECT_STREQ(
        lastErrorSentence().c_str(),
        ("The firewall rules are not loaded: they would close port 2022, by which sshd is reached. Add "
         "2022 to \"ports\" in " +
         file + ", or, if you want it closed, a line \"force = 1\".")
            .c_str());
    EXPECT_TRUE(network_->neighbourReaches(2022));
    EXPECT_EQ(listTable(), "");
    setMode("mode = drop\nports = 2000-2030");
    EXPECT_LT(VELTFwRuleHup(), 0);
    EXPECT_NE(lastErrorSentence().find("8443, by which veltd"), std::string::npos) << lastErrorSentence();
    setMode("mode = drop\nports = 2022 8443");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_TRUE(network_->neighbourReaches(2022));
    EXPECT_TRUE(network_->neighbourReaches(8443));
    EXPECT_FALSE(network_->neighbourReaches(8080));
    setMode("mode = drop");
    EXPECT_LT(VELTFwRuleHup(), 0);
    EXPECT_TRUE(network_->neighbourReaches(2022)) << "the rules before stay";
    const Findings found = firewallFindings();
    ASSERT_FALSE(found.empty());
    EXPECT_EQ(found.at(0).id, "firewall-locks-out");
    EXPECT_EQ(found.at(0).mend, "Add 2022 to \"ports\" in " + file + ", then restart veltd.");
    setMode("mode = drop\nforce = 1");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_FALSE(network_->neighbourReaches(2022));
}

} // namespace
} // namespace velt::test
