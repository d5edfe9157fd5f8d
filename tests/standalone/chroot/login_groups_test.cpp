// What the FTP daemon's module does when the daemon cannot tell who logs in.
#include "tests/standalone/support/temporary_folder.h"

#include <gtest/gtest.h>

extern "C" {
#include "tests/standalone/chroot/login_root.h"
}

namespace velt::test {
namespace {

constexpr const char* refused = "/dev/null/refused";

class LoginGroups : public testing::Test {
protected:
    std::string rootWithRules(const std::string& rules, bool knowsUser, bool knowsGroups) {
        const auto rulesFile = root_.write("rules", "velt-chroot-rules 1\n" + rules).string();
        const auto map = root_.write("map", "velt-share-map 1\n").string();
        const login_world world{rulesFile.c_str(), map.c_str(), knowsUser, knowsGroups};
        return root_of(&world);
    }

    TemporaryFolder root_;
};

TEST_F(LoginGroups, decideWhichRuleApplies) {
    EXPECT_EQ(rootWithRules("g:2001:/home\n", true, true), "~");
    EXPECT_EQ(rootWithRules("g:1001:/home\n", true, true), "~");
    EXPECT_EQ(rootWithRules("g:2002:/home\n", true, true), "") << "the general setting, which is none here";
}

TEST_F(LoginGroups, thatCannotBeToldRefuseTheLogin) {
    EXPECT_EQ(rootWithRules("g:2001:/home\n", true, false), refused);
    EXPECT_EQ(rootWithRules("", true, false), refused);
    EXPECT_EQ(rootWithRules("g:2001:/home\n", false, true), refused);
}

} // namespace
} // namespace velt::test
