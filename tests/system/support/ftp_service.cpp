#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"

#include <sys/stat.h>

#include <cstdlib>
#include <cstring>

namespace velt::test {
namespace fs = std::filesystem;

void FtpService::SetUp() {
    if (!whyNoWorld().empty()) {
        GTEST_SKIP() << whyNoWorld();
    }
    setenv("VELT_LIBEXEC_DIR", VELT_BUILT_FOLDER, 1);
    setStateRoot(worldRoot);
    ASSERT_EQ(messageOf(makeRulesFile()), "");
    ASSERT_EQ(VELTFTPConfGet(&record), 0);
    std::strcpy(record.portnum, "2121");
    record.service_flags = VELT_FTP_SERVICE_PLAIN;
    record.user_chroot = 1;
    furnishHomes();
}

void FtpService::TearDown() {
    daemon_.stop();
    clearFolders();
}

void FtpService::letAnonymousIn(const std::string& share) {
    record.anonymous = 1;
    record.anonymous_chroot = share.empty() ? 0 : 1;
    std::snprintf(record.anonymous_chroot_share, sizeof record.anonymous_chroot_share, "%s", share.c_str());
}

fs::path FtpService::addShare(const std::string& name, const std::string& folder, Access anonymous,
                              bool offered) {
    const fs::path path = fs::path("/mnt/srv") / folder;
    fs::create_directories(path);
    EXPECT_EQ(chmod(path.c_str(), 0777), 0);
    ShareEntry share{name, "", path, offered, {}, {}};
    share.users = {
        {"ftp", anonymous}, {"alice", Access::write}, {"bob", Access::write}, {"carol", Access::write}};
    shares_.push_back(share);
    EXPECT_EQ(messageOf(storeShares(shares_)), "");
    return path;
}

void FtpService::start() {
    daemon_.stop();
    ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
    const auto plan = planFtpDaemon();
    ASSERT_EQ(messageOf(plan), "");
    ASSERT_TRUE(*plan);
    ASSERT_TRUE(daemon_.start((*plan)->order));
}

void FtpService::storeRules(const std::vector<std::string>& rules) {
    VLIBCSzList* list = VLIBCSzListAlloc(16);
    for (const auto& rule : rules) {
        ASSERT_EQ(VLIBCSzListPush(&list, rule.c_str()), 0);
    }
    EXPECT_EQ(VELTFTPChrootRuleSave(list), 0) << lastErrorSentence();
    VLIBCSzListFree(list);
}

ProcessResult FtpService::curl(std::vector<std::string> arguments) {
    arguments.insert(arguments.begin(), {"curl", "--silent", "--show-error", "--max-time", "20"});
    return runProcess(arguments, {}, std::chrono::seconds(30));
}

} // namespace velt::test
