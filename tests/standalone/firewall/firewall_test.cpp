#include "tests/standalone/firewall/firewall_test.h"

#include "base/file.h"
#include "ftp/ftp_library.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/firewall/ruleset_generation.h"
#include "tests/support/run_program.h"

#include <cstdio>

namespace velt::test {

std::string listTable() {
    return runProcess({"nft", "list", "table", "inet", "velt_fileserv"}).output;
}

std::uint32_t generation() {
    return rulesetGeneration().value_or(0);
}

void FirewallTest::SetUp() {
    DaemonTest::SetUp();
    network_.emplace();
    if (!network_->isThere() || runProcess({"nft", "list", "tables"}).exitCode != 0) {
        GTEST_SKIP() << "no private network here";
    }
    storeFtp(2121, VELT_FTP_SERVICE_PLAIN);
    setMode(""); // below this root no rule is touched without a file
}

void FirewallTest::TearDown() {
    network_.reset(); // its other host is a process of ours
    DaemonTest::TearDown();
}

void FirewallTest::storeFtp(int port, int flags, int passiveFirst, int passiveLast) {
    _tag_VELT_FTP_CONF_ record{};
    ASSERT_EQ(VELTFTPConfGet(&record), 0) << lastErrorSentence();
    std::snprintf(record.portnum, sizeof record.portnum, "%d", port);
    record.service_flags = flags;
    record.passive_port_min = passiveFirst;
    record.passive_port_max = passiveLast;
    ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
}

void FirewallTest::setMode(const std::string& lines) {
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/firewall.conf"), "version = 1\n" + lines + "\n", 0644));
}

std::string FirewallTest::warning() {
    return readFile(statePath("/run/velt/firewall.warning")).valueOr("");
}

} // namespace velt::test
