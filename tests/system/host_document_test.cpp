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

    const ProcessResult plan = veltctl({"import", "--dry-run", "-"}, before);
    EXPECT_EQ(plan.exitCode, 7) << plan.errors;
    EXPECT_TRUE(contains(plan.output, "ftp/ext_ip: 203.0.113.7 -> (empty)\n")) << plan.output;
    EXPECT_TRUE(contains(plan.output, "  stores the ftp settings\n")) << plan.output;
    EXPECT_EQ(exported(), changed) << "a dry run";
    done({"import", "-"}, before);
    EXPECT_EQ(exported(), before);
    EXPECT_EQ(done({"import", "-"}, before), "Nothing changed.\n");
    done({"import", "-"}, changed);
    EXPECT_EQ(exported(), changed);
    EXPECT_EQ(fetchHome(2001), "");
    done({"import", "-"}, before);
    EXPECT_EQ(exported(), before);
}

TEST_F(HostDocument, aRefusedPartRefusesAll) {
    const std::string before = exported();
    Json::Value document = jsonOf(before);
    document["security"]["anonymous"] = true;
    document["ftp"]["portnum"] = 2233;
    document["sftp"]["portnum"] = 2233;
    document["ftp"]["enable_ftp"] = true;
    document["sftp"]["enable"] = true;
    const ProcessResult result = veltctl({"import", "-"}, textOf(document));
    EXPECT_EQ(result.exitCode, 3);
    EXPECT_TRUE(contains(result.errors, "/ftp/portnum: expected another port than SFTP's")) << result.errors;
    EXPECT_EQ(exported(), before);
}

} // namespace
} // namespace velt::test
