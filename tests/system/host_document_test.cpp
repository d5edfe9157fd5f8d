// Export and import: a document brings back every setting.
#include "tests/support/text.h"
#include "tests/system/support/host_service.h"

namespace velt::test {
namespace {

class HostDocument : public HostService {
protected:
    /// Every setting of the document has another value in the other one.
    static void expectAllDifferent(const Json::Value& one, const Json::Value& other) {
        int settings = 0;
        for (const char* section : {"ftp", "security", "sftp"}) {
            for (const std::string& key : one[section].getMemberNames()) {
                EXPECT_NE(one[section][key], other[section][key]) << section << "." << key;
                settings++;
            }
        }
        EXPECT_EQ(settings, 16 + 5 + 2);
        EXPECT_NE(one["chroot_rules"], other["chroot_rules"]);
    }
};

const std::vector<std::string> changeFtp{"ftp",
                                         "set",
                                         "enable_ftp=on",
                                         "enable_ftps=on",
                                         "timeout=77",
                                         "portnum=2001",
                                         "use_ext_ip=on",
                                         "ext_ip=203.0.113.7",
                                         "utf8_mode=1",
                                         "enable_fxp=on",
                                         "enable_ascii=on",
                                         "enable_fips=on",
                                         "enable_flow_ctrl=on",
                                         "maxuploadrate=11",
                                         "maxdownloadrate=12",
                                         "max_conn_per_ip=13"};

TEST_F(HostDocument, bringsBackEverySetting) {
    const std::string before = exported();
    done(changeFtp);
    // Over the port that the document brings back, and the port of SFTP in the range of the document.
    done({"ftp", "set", "custom_port=2100:2200"});
    done({"security", "set", "user_chroot=off", "anonymous=on", "anonymous_chroot=on",
          "anonymous_chroot_share=public", "enable_umask=off"});
    done({"sftp", "set", "enable=on", "portnum=55600"});
    done({"chroot", "rules", "add", "user", "alice", "/public"});
    const std::string changed = exported();
    expectAllDifferent(jsonOf(before), jsonOf(changed));

    const std::string plan = done({"import", "--dry-run", "-"}, before);
    EXPECT_TRUE(contains(plan, "ftp  ext_ip: 203.0.113.7 -> (empty)\n")) << plan;
    EXPECT_EQ(exported(), changed) << "a dry run";
    done({"import", "-"}, before);
    EXPECT_EQ(exported(), before);
    EXPECT_EQ(done({"import", "-"}, before), "Nothing to change.\n");
    done({"import", "-"}, changed);
    EXPECT_EQ(exported(), changed);
    EXPECT_EQ(fetchHome(2001), "");
    done({"import", "-"}, before);
    EXPECT_EQ(exported(), before);
}

TEST_F(HostDocument, aRefusedSectionIsNamedWithThoseThatWereApplied) {
    Json::Value document = jsonOf(exported());
    document["security"]["anonymous"] = true;
    document["ftp"]["ext_ip"] = "gateway";
    document["sftp"]["portnum"] = 2233;
    const ProcessResult result = veltctl({"import", "-"}, textOf(document));
    EXPECT_EQ(result.exitCode, 5);
    for (const char* text :
         {"The external address is \"gateway\"", "ftp: failed", "security: applied", "sftp: not applied"}) {
        EXPECT_TRUE(contains(result.errors, text)) << result.errors;
    }
    const Json::Value now = jsonOf(exported());
    EXPECT_EQ(now["security"]["anonymous"], true);
    EXPECT_EQ(now["sftp"]["portnum"], 2222);
}

} // namespace
} // namespace velt::test
