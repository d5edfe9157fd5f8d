#include "platform/account.h"
#include "platform/core.h"
#include "platform/sdk_user.h"
#include "standalone/accounts/account_sources.h"
#include "standalone/contract/last_error.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

class UserRecordTest : public testing::Test {
protected:
    UserRecordTest() {
        folder_.write("passwd", "anna:x:1000:1000:Anna Example,1:/home/anna:/bin/sh\n"
                                "huge:x:4000000000:1:::\nplain:x:1001:1001::/:/\n");
        folder_.write("group", "staff:x:50:anna\nhuge:x:4000000000:\n");
        AccountSources sources;
        sources.passwd = folder_.path() / "passwd";
        sources.group = folder_.path() / "group";
        sources.nsswitch = folder_.path() / "nsswitch.conf";
        setAccountSources(sources);
        clearLastError();
    }
    ~UserRecordTest() override { setAccountSources({}); }

    test::TemporaryFolder folder_;
};

TEST_F(UserRecordTest, AUserHasNameDescriptionAndNumber) {
    VELT_USER* user = nullptr;
    ASSERT_EQ(VELTUserGet("anna", &user), 0);
    EXPECT_STREQ(user->name, "anna");
    EXPECT_STREQ(user->description, "Anna Example");
    EXPECT_EQ(user->uid, 1000);
}

TEST_F(UserRecordTest, AGroupHasNameAndNumber) {
    VELT_GROUP* group = nullptr;
    ASSERT_EQ(VELTGroupGet("staff", &group), 0);
    EXPECT_STREQ(group->name, "staff");
    EXPECT_EQ(group->gid, 50);
}

TEST_F(UserRecordTest, AnUnknownNameFailsAndLeavesTheHandleAlone) {
    VELT_USER marker{};
    VELT_USER* user = &marker;
    EXPECT_LT(VELTUserGet("nobody here", &user), 0);
    EXPECT_EQ(user, &marker);
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::notFound));
    EXPECT_EQ(lastErrorSentence(), "There is no user \"nobody here\".");
    VELT_GROUP* group = nullptr;
    EXPECT_LT(VELTGroupGet("nobody here", &group), 0);
    EXPECT_EQ(lastErrorSentence(), "There is no group \"nobody here\".");
}

TEST_F(UserRecordTest, ANumberThatTheRecordCannotHoldFails) {
    VELT_USER* user = nullptr;
    VELT_GROUP* group = nullptr;
    EXPECT_LT(VELTUserGet("huge", &user), 0);
    EXPECT_LT(VELTGroupGet("huge", &group), 0);
    EXPECT_EQ(user, nullptr);
    EXPECT_EQ(group, nullptr);
}

TEST_F(UserRecordTest, LookingUpTheSameAccountAgainMakesNoNewRecord) {
    VELT_USER* first = nullptr;
    VELT_USER* second = nullptr;
    ASSERT_EQ(VELTUserGet("anna", &first), 0);
    ASSERT_EQ(VELTUserGet("anna", &second), 0);
    EXPECT_EQ(first, second);
}

TEST_F(UserRecordTest, ARecordInUseOutlivesAChangeOfTheAccount) {
    VELT_USER* before = nullptr;
    VELT_USER* after = nullptr;
    ASSERT_EQ(VELTUserGet("anna", &before), 0);
    folder_.write("passwd", "anna:x:2000:1:Anna Other:/:/\n");
    ASSERT_EQ(VELTUserGet("anna", &after), 0);
    EXPECT_EQ(before->uid, 1000);
    EXPECT_STREQ(before->description, "Anna Example");
    EXPECT_EQ(after->uid, 2000);
}

TEST_F(UserRecordTest, NullArgumentsFail) {
    VELT_USER* user = nullptr;
    VELT_GROUP* group = nullptr;
    EXPECT_LT(VELTUserGet(nullptr, &user), 0);
    EXPECT_LT(VELTUserGet("anna", nullptr), 0);
    EXPECT_LT(VELTGroupGet(nullptr, &group), 0);
    EXPECT_LT(VELTGroupGet("staff", nullptr), 0);
}

TEST_F(UserRecordTest, ALoadedUserHasADescription) {
    SDK::User* user = SDK::User::LoadUser("anna");
    ASSERT_NE(user, nullptr);
    EXPECT_EQ(user->GetDesc(), "Anna Example");
    SDK::User::Release(user);
    user = SDK::User::LoadUser("plain");
    ASSERT_NE(user, nullptr);
    EXPECT_EQ(user->GetDesc(), "");
    SDK::User::Release(user);
    EXPECT_EQ(SDK::User::LoadUser("unknown"), nullptr);
}

} // namespace
} // namespace velt
