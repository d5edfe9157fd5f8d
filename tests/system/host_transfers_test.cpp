// Changes while files are fetched: with VELT_LOAD=long, fifty of them and 1 GB by each protocol.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/connect_loop.h"
#include "tests/system/support/host_service.h"

#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <thread>

namespace velt::test {
namespace {

using std::chrono::milliseconds;
using std::chrono::minutes;

constexpr int sftpPort = 2222;

bool isLong() {
    const char* const load = std::getenv("VELT_LOAD");
    return load != nullptr && std::string(load) == "long";
}

/// The digest of what a command line writes, or what went wrong.
std::string digestOf(const std::string& command) {
    const ProcessResult result =
        runProcess({"bash", "-c", "set -o pipefail; " + command + " | sha256sum"}, {}, minutes(10));
    return result.exitCode == 0 ? result.output : command + ": " + result.errors;
}

/// A setting that takes nobody's rights; each number gives another value.
std::string changeNumber(int number) {
    const std::string text = std::to_string(number);
    const std::string settings[] = {
        R"({"ftp": {"timeout": )" + std::to_string(400 + number) + "}}",
        R"({"ftp": {"max_conn_per_ip": )" + std::to_string(100 + number) + "}}",
        R"({"sftp": {"portnum": )" + std::to_string(2300 + number) + "}}",
        R"({"ftp": {"enable_flow_ctrl": true, "maxuploadrate": )" + std::to_string(1000 + number) + "}}",
        R"({"ftp": {"utf8_mode": )" + std::to_string(number / 10 % 2 == 0 ? 1 : 0) + "}}",
        R"({"ftp": {"enable_ascii": )" + std::string(number / 10 % 2 == 0 ? "true" : "false") + "}}",
        R"({"ftp": {"use_ext_ip": true, "ext_ip": "192.0.2.)" + std::to_string(number + 1) + "\"}}",
        R"({"ftp": {"custom_port_range": true, "custom_port": "3000:)" + std::to_string(3100 + number) +
            "\"}}",
        R"({"ftp": {"enable_flow_ctrl": true, "maxdownloadrate": )" + std::to_string(2000 + number) + "}}",
        R"({"ftp": {"timeout": )" + std::to_string(400 + number) + R"(, "utf8_mode": 2}})",
    };
    return settings[static_cast<std::size_t>(number) % std::size(settings)];
}

TEST_F(HostService, aChangeCutsNoTransferAndRefusesNobody) {
    const int changes = isLong() ? 50 : 12;
    const std::string size = isLong() ? "1000000000" : "20000000";
    const std::string rate = isLong() ? "20M" : "4M";
    furnishSftp();
    const std::string file = "/mnt/home/alice/large";
    digestOf("openssl enc -aes-128-ctr -pass pass:a -pbkdf2 </dev/zero 2>/dev/null | head -c " + size + " >" +
             file + "; cat " + file);
    const std::string expected = digestOf("cat " + file);
    done({"security", "set", "user_chroot=on"});
    done({"ftp", "set", "enable_ftp=on", "enable_ftps=on"});
    done({"sftp", "set", "enable=on", "portnum=" + std::to_string(sftpPort)});

    const std::string fetch =
        "curl --silent --show-error --user alice:alice-secret --limit-rate " + rate + " ";
    std::string got[3];
    std::thread clients[] = {
        std::thread([&] { got[0] = digestOf(fetch + "ftp://127.0.0.1:2121/large"); }),
        std::thread([&] { got[1] = digestOf(fetch + "--ssl-reqd --insecure ftp://127.0.0.1:2121/large"); }),
        std::thread([&] {
            got[2] =
                digestOf(fetch + "--insecure --key /mnt/srv/key --pubkey /mnt/srv/key.pub sftp://127.0.0.1:" +
                         std::to_string(sftpPort) + "/~/large");
        })};
    std::this_thread::sleep_for(milliseconds(1500));
    ConnectLoop loop(ftpTestPort);
    for (int number = 0; number < changes; ++number) {
        const std::string body = changeNumber(number);
        const HttpResult done = curl("/api/settings", body, {"--request", "PATCH"});
        EXPECT_EQ(done.status, 200) << body << done.body;
        EXPECT_FALSE(done.json["changes"].empty()) << body;
        EXPECT_EQ(done.json["sessions_ended"], 0) << body << done.body;
        EXPECT_NE(done.body.find("hand over"), std::string::npos) << body << done.body;
    }
    loop.stop();
    for (std::thread& client : clients) {
        client.join();
    }
    for (const std::string& digest : got) {
        EXPECT_EQ(digest, expected);
    }
    EXPECT_GT(loop.greeted, changes);
    EXPECT_EQ(loop.refused, 0);
    EXPECT_EQ(loop.dropped, 0);
}

} // namespace
} // namespace velt::test
