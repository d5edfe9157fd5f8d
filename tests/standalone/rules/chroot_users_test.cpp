// The lists of users themselves are tested through the contract.
#include "standalone/rules/chroot_users.h"

#include "standalone/accounts/account_sources.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/rules/rule_store.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <chrono>
#include <future>

namespace velt::test {
namespace {

TEST(ChrootUsers, areAddedUnderTheLock) {
    const TemporaryFolder root;
    setStateRoot(root.path());
    AccountSources sources;
    sources.passwd = root.write("passwd", "ann:x:1000:100::/home/ann:/bin/sh\n");
    sources.group = root.write("group", "");
    sources.nsswitch = root.write("nsswitch.conf", "");
    setAccountSources(sources);
    std::future<std::string> added;
    {
        const auto lock = StateLock::take();
        ASSERT_TRUE(lock);
        added = std::async(std::launch::async, [] { return messageOf(addChrootUsers({"ann"})); });
        // An addition that did not wait for the lock would read the rules as they are now.
        EXPECT_EQ(added.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
        EXPECT_EQ(messageOf(storeRules({{false, 100, "/share"}})), "");
    }
    EXPECT_EQ(added.get(), "");
    EXPECT_EQ(loadRules(), (std::vector<ChrootRule>{{false, 100, "/share"}, {true, 1000, "/home"}}));
    setAccountSources({});
    setStateRoot("/");
}

} // namespace
} // namespace velt::test
