// Changes of real services: what the plan says is what happens.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"
#include "tests/system/support/host_service.h"

#include <filesystem>
#include <map>

namespace velt::test {
namespace {

namespace fs = std::filesystem;

class HostChange : public HostService {
protected:
    HttpResult patch(const std::string& body, const std::string& query = "") const {
        return curl("/api/settings" + query, body, {"--request", "PATCH"});
    }

    /// What every file below the state root holds, but for the database, which a reader touches as well; and
    /// which sockets listen.
    static std::map<std::string, std::string> everything() {
        std::map<std::string, std::string> files;
        for (const auto& entry : fs::recursive_directory_iterator(worldRoot)) {
            const std::string name = entry.path().string();
            if (entry.is_regular_file() && !contains(name, "log.db")) {
                files[name] = contentsOf(name);
            }
        }
        files["listening"] = runProcess({"ss", "-Hltn"}).output;
        files["processes"] = runProcess({"pgrep", "-x", "proftpd|sshd|velt-supervise"}).output;
        files["log"] = done({"log"});
        files["history"] = done({"history"});
        return files;
    }

    /// The same, once a former daemon that shares its port with the new one is gone.
    static std::map<std::string, std::string> settled() {
        EXPECT_TRUE(waitUntil(
            [] {
                return runProcess({"bash", "-c", "ss -Hltn | awk '{print $4}' | sort | uniq -d"})
                    .output.empty();
            },
            patience));
        return everything();
    }

    /// The dry run does nothing, and the change does what it said.
    void expectAsPlanned(const std::string& body) {
        const testing::ScopedTrace trace(__FILE__, __LINE__, body);
        const auto before = settled();
        const HttpResult plan = patch(body, "?dry_run=true");
        ASSERT_EQ(plan.status, 200) << plan.body;
        EXPECT_FALSE(plan.json["changes"].empty()) << plan.body;
        for (const auto& [name, contents] : everything()) {
            const auto former = before.find(name);
            EXPECT_TRUE(former != before.end() && former->second == contents) << name << " was changed";
        }
        const HttpResult done = patch(body);
        ASSERT_EQ(done.status, 200) << done.body;
        EXPECT_EQ(done.json["changes"], plan.json["changes"]);
        EXPECT_EQ(done.json["effects"], plan.json["effects"]);
        const HttpResult again = patch(body);
        EXPECT_TRUE(again.json["changes"].empty()) << again.body;
        EXPECT_TRUE(again.json["effects"].empty()) << again.body;
    }
};

TEST_F(HostChange, happensAsThePlanSays) {
    for (
        const char* body :
        {R"({"ftp": {"enable_ftp": true}})", R"({"ftp": {"enable_ftps": true}})",
         R"({"ftp": {"timeout": 400}})", R"({"ftp": {"portnum": 2007}})",
         R"({"ftp": {"custom_port_range": true, "custom_port": "3000:3100"}})",
         R"({"ftp": {"use_ext_ip": true, "ext_ip": "192.0.2.7"}})", R"({"ftp": {"utf8_mode": 1}})",
         R"({"ftp": {"enable_fxp": true, "enable_ascii": true}})", R"({"ftp": {"enable_fips": true}})",
         R"({"ftp": {"enable_flow_ctrl": true, "maxuploadrate": 7, "maxdownloadrate": 8, "max_conn_per_ip": 9}})",
         R"({"security": {"user_chroot": false}})", R"({"security": {"enable_umask": false}})",
         R"({"security": {"anonymous": true, "anonymous_chroot": true, "anonymous_chroot_share": "public"}})",
         R"({"sftp": {"enable": true}})", R"({"sftp": {"portnum": 2008}})",
         R"({"chroot_rules": [{"type": "user", "name": "alice", "path": "/public"}]})",
         R"({"ftp": null, "security": null, "sftp": null, "chroot_rules": null})"}) {
        expectAsPlanned(body);
    }
}

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
    expectAsPlanned(R"({"ftp": {"portnum": 2021, "custom_port_range": true, "custom_port": "2001:2020"}})");
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

TEST_F(HostChange, whatWasReadAndSentBackCutsNobody) {
    done({"ftp", "set", "enable_ftp=on"});
    const auto before = settled();
    EXPECT_EQ(done({"import", "-"}, exported()), "Nothing changed.\n");
    EXPECT_EQ(everything(), before);
}

} // namespace
} // namespace velt::test
