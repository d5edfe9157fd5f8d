// Tests of the firewall in force, seen from another host.
#ifndef VELT_TESTS_STANDALONE_FIREWALL_FIREWALL_TEST_H
#define VELT_TESTS_STANDALONE_FIREWALL_FIREWALL_TEST_H

#include "tests/standalone/firewall/private_network.h"
#include "tests/standalone/supervise/daemon_test.h"

#include <cstdint>
#include <optional>
#include <string>

namespace velt::test {

/// The table as nft lists it; "" when there is none.
std::string listTable();

/// Counts the changes of the rules, whoever makes them.
std::uint32_t generation();

class FirewallTest : public DaemonTest {
protected:
    void SetUp() override;
    void TearDown() override;

    static void storeFtp(int port, int flags, int passiveFirst = 0, int passiveLast = 0);

    /// Writes these lines as the settings of the firewall.
    static void setMode(const std::string& lines);

    static std::string warning();

    std::optional<PrivateNetwork> network_;
};

} // namespace velt::test

#endif
