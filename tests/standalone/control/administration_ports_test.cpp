// Where the machine's own OpenSSH listens.
#include "standalone/control/administration_ports.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

using Ports = std::vector<int>;

TEST(SshConfiguration, NamesItsPortsBeforeAnyMatch) {
    EXPECT_EQ(portsOfSshConfiguration(""), Ports{});
    EXPECT_EQ(portsOfSshConfiguration("#Port 22\nPermitRootLogin no\n"), Ports{});
    EXPECT_EQ(portsOfSshConfiguration("Port 2022\n  port\t2023\nMatch User x\nPort 9\n"),
              (Ports{2022, 2023}));
    EXPECT_EQ(portsOfSshConfiguration("Port abc\nPort 0\nPort 65536\nPort\nPort -1\n"), Ports{});
    EXPECT_EQ(portsOfSshConfiguration("PORT 65535"), Ports{65535});
}

} // namespace
} // namespace velt
