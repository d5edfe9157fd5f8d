// Changes of real services: ports that change hands, refusals, and changes that nobody confirms.
#include "tests/support/text.h"
#include "tests/support/waiting.h"
#include "tests/system/support/plan_service.h"

namespace velt::test {
namespace {

using HostChange = PlanService;

TEST_F(HostChange, twoServicesExchangeTheirPorts) {
    done({"ftp", "set", "enable_ftp=on", "portnum=2011"});
    done({"sftp", "set", "enable=on", "portnum=2012"});
    expectAsPlanned(R"({"ftp": {"portnum": 2012}, "sftp": {"portnum": 2011}})");
    const std::string greetings = runProcess({"bash", "-c",
                                              "for port in 2011 2012; do exec 3<>/dev/tcp/127.0.0.1/$port; "
                                              "head -c 4 <&3; exec 3>&-; done"})
                                      .output;
    EXPECT_EQ(greetings, "SSH-220 ");
}

TEST_F(HostChange, aRangeMayTakeThePortThatIsLeft) {
    done({"ftp", "set", "enable_ftp=on", "portnum=2011"});
    expectAsPlanned(R"({"ftp": {"portnum": 2021, "custom_port_range": true, "custom_port": "2001:2019"}})");
}

TEST_F(HostChange, aTakenPortIsFoundByTheDryRunToo) {
    done({"sftp", "set", "enable=on", "portnum=2012"});
    const std::string body = R"({"ftp": {"enable_ftp": true, "portnum": )" + std::to_string(tcpPort) + "}}";
    const HttpResult dry = patch(body, "?dry_run=true");
    EXPECT_EQ(dry.status, 409) << dry.body;
    EXPECT_EQ(dry.json["errors"][0]["field"], "/ftp/portnum");
    const HttpResult real = patch(body);
    EXPECT_EQ(real.status, 409);
    EXPECT_EQ(real.json["detail"], dry.json["detail"]);
}

TEST_F(HostChange, anUnconfirmedChangeIsTakenBackByTheNextVeltd) {
    done({"ftp", "set", "enable_ftp=on"});
    const std::string before = exported();
    done({"ftp", "set", "timeout=444", "--confirm-within", "3"});
    killHost();
    startHost();
    EXPECT_TRUE(contains(exported(), "444"));
    EXPECT_TRUE(waitUntil([&] { return exported() == before; }, std::chrono::seconds(60)));
}

} // namespace
} // namespace velt::test
