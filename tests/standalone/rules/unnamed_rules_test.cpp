#include "standalone/rules/unnamed_rules.h"

#include "standalone/accounts/account_sources.h"
#include "standalone/core/state_root.h"
#include "standalone/rules/rule_store.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

class UnnamedRules : public testing::Test {
protected:
    void SetUp() override {
        setStateRoot(root_.path());
        AccountSources sources;
        sources.passwd = root_.write("passwd", "ann:x:1000:100::/home/ann:/bin/sh\n");
        sources.group = root_.write("group", "staff:x:100:\n");
        sources.nsswitch = root_.write("nsswitch.conf", "");
        setAccountSources(sources);
    }
    void TearDown() override {
        setAccountSources({});
        setStateRoot("/");
    }

    TemporaryFolder root_;
    const ChrootRule ann_{true, 1000, "/home"};
    const ChrootRule staff_{false, 100, "/docs"};
    const ChrootRule gone_{true, 4711, "/home"};
    const ChrootRule away_{false, 42, "/music"};
};

TEST_F(UnnamedRules, areFoundWithTheirPlaces) {
    ASSERT_EQ(messageOf(storeRules({gone_, ann_, away_, staff_})), "");
    const auto found = countRulesByName();
    ASSERT_TRUE(found);
    EXPECT_EQ(found->named, 2U);
    EXPECT_EQ(found->unnamed, (std::vector<UnnamedRule>{{0, gone_}, {2, away_}}));
}

TEST_F(UnnamedRules, arePutBackAmongTheOthers) {
    ASSERT_EQ(messageOf(storeRules({ann_, staff_})), "");
    ASSERT_EQ(messageOf(putUnnamedRules({{0, gone_}, {2, away_}})), "");
    EXPECT_EQ(loadRules(), (std::vector<ChrootRule>{gone_, ann_, away_, staff_}));
    ASSERT_EQ(messageOf(storeRules({ann_})), "");
    ASSERT_EQ(messageOf(putUnnamedRules({{7, gone_}})), "");
    EXPECT_EQ(loadRules(), (std::vector<ChrootRule>{ann_, gone_}));
}

TEST_F(UnnamedRules, ofADamagedFileAreNotCounted) {
    root_.write("etc/velt/chroot_rules", "nonsense\n");
    EXPECT_FALSE(countRulesByName());
    EXPECT_FALSE(putUnnamedRules({{0, gone_}}));
    EXPECT_EQ(messageOf(putUnnamedRules({})), "") << "nothing is to be done";
}

} // namespace
} // namespace velt::test
