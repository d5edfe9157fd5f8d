// What is found about the ports and the address that FTP gives to its clients.
#include "standalone/core/key_value_file.h"
#include "standalone/settings/settings_store.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>
#include <unistd.h>

namespace velt::test {
namespace {

class NetworkHealth : public testing::Test {
protected:
    static void store(int first, int last, int flags = VELT_FTP_SERVICE_PLAIN) {
        FtpSettings settings = defaultFtpSettings();
        settings.record.service_flags = flags;
        settings.record.passive_port_min = first;
        settings.record.passive_port_max = last;
        settings.record.use_ext_ip = 1;
        ASSERT_EQ(messageOf(storeFtpSettings(settings)), "");
    }

    Findings foundFor(const std::string& address) const {
        root_.write("etc/veltinfo.conf", "ftp_ext_ip=" + address + "\n");
        return externalAddressFindings();
    }

    StateFolder root_;
};

TEST_F(NetworkHealth, AListenerInThePassiveRangeIsNamed) {
    const int port = freePorts(3);
    store(port, port + 2);
    EXPECT_EQ(passiveRangeFindings(), Findings());
    const Listener listener(port + 1);
    const Findings found = passiveRangeFindings();
    EXPECT_EQ(summary(found), "warning passive-port-taken");
    EXPECT_NE(found.at(0).sentence.find("(process " + std::to_string(::getpid()) + ") listens on port " +
                                        std::to_string(port + 1)),
              std::string::npos)
        << found.at(0).sentence;
    store(port, port + 2, 0);
    EXPECT_EQ(passiveRangeFindings(), Findings()) << "FTP is off";
    store(port + 2, port + 3);
    EXPECT_EQ(passiveRangeFindings(), Findings());
}

TEST_F(NetworkHealth, AFewPortsAmongThoseOfTheKernelAreTooFew) {
    store(40000, 40010);
    EXPECT_EQ(summary(passiveRangeFindings()), "notice passive-range-small");
    store(40000, 40100);
    EXPECT_EQ(passiveRangeFindings(), Findings());
}

TEST_F(NetworkHealth, AnAddressThatNobodyReachesIsAnError) {
    store(0, 0);
    EXPECT_EQ(summary(foundFor("")), "notice external-address-missing");
    EXPECT_EQ(foundFor("203.0.113.7"), Findings());
    EXPECT_EQ(summary(foundFor("127.0.0.1")), "error external-address-unreachable");
    EXPECT_EQ(summary(foundFor("192.168.1.1")), "notice external-address-private");
    EXPECT_EQ(summary(foundFor("172.16.0.1")), "notice external-address-private");
    EXPECT_EQ(foundFor("172.32.0.1"), Findings());
}

} // namespace
} // namespace velt::test
