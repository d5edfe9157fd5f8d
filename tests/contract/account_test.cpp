#include "platform/account.h"
#include "platform/sdk_user.h"
#include "tests/contract/contract_test.h"

namespace contract {
namespace {

class AccountContract : public ContractTest {};

TEST_F(AccountContract, AUserHasNameDescriptionAndNumber) {
    VELT_USER* user = nullptr;
    ASSERT_GE(VELTUserGet("ann", &user), 0) << lastError();
    ASSERT_NE(user, nullptr);
    EXPECT_STREQ(user->name, "ann");
    EXPECT_STREQ(user->description, "Ann Example");
    EXPECT_EQ(user->uid, 1000);
}

TEST_F(AccountContract, ALookUpMayBeHandedTheRecordOfTheLast) {
    VELT_USER* user = nullptr;
    ASSERT_GE(VELTUserGet("ann", &user), 0) << lastError();
    ASSERT_GE(VELTUserGet("ben", &user), 0) << lastError();
    EXPECT_STREQ(user->name, "ben");
    EXPECT_STREQ(user->description, "");
    EXPECT_EQ(user->uid, 1001);
    ASSERT_GE(VELTUserGet("ftp", &user), 0) << "a system account: " << lastError();
    EXPECT_EQ(user->uid, 200);

    VELT_GROUP* group = nullptr;
    ASSERT_GE(VELTGroupGet("staff", &group), 0) << lastError();
    EXPECT_STREQ(group->name, "staff");
    EXPECT_EQ(group->gid, 50);
    ASSERT_GE(VELTGroupGet("users", &group), 0) << lastError();
    EXPECT_STREQ(group->name, "users");
    EXPECT_EQ(group->gid, 100);
}

TEST_F(AccountContract, RecordsOfTheirOwnStandSideBySide) {
    VELT_USER* ann = nullptr;
    VELT_USER* ben = nullptr;
    ASSERT_GE(VELTUserGet("ann", &ann), 0);
    ASSERT_GE(VELTUserGet("ben", &ben), 0);
    EXPECT_STREQ(ann->name, "ann");
    EXPECT_STREQ(ben->name, "ben");
}

TEST_F(AccountContract, AnUnknownNameFails) {
    for (const char* name : {"nobody-like-this", "", "ANN", "staff"}) {
        VELT_USER* user = nullptr;
        EXPECT_LT(VELTUserGet(name, &user), 0) << name;
    }
    for (const char* name : {"nobody-like-this", "", "ann"}) {
        VELT_GROUP* group = nullptr;
        EXPECT_LT(VELTGroupGet(name, &group), 0) << name;
    }
}

TEST_F(AccountContract, AfterAFailureTheRecordCanBeHandedInAgain) {
    VELT_USER* user = nullptr;
    ASSERT_GE(VELTUserGet("ann", &user), 0);
    EXPECT_LT(VELTUserGet("nobody-like-this", &user), 0);
    ASSERT_GE(VELTUserGet("bea", &user), 0) << lastError();
    EXPECT_STREQ(user->name, "bea");
}

TEST_F(AccountContract, ALoadedUserHasADescription) {
    SDK::User* ann = SDK::User::LoadUser("ann");
    SDK::User* ben = SDK::User::LoadUser("ben");
    ASSERT_NE(ann, nullptr);
    ASSERT_NE(ben, nullptr);
    EXPECT_EQ(ann->GetDesc(), "Ann Example");
    SDK::User::Release(ann);
    EXPECT_EQ(ben->GetDesc(), "");
    SDK::User::Release(ben);
}

TEST_F(AccountContract, AnUnknownUserIsNotLoaded) {
    for (const char* name : {"nobody-like-this", "", "staff"}) {
        EXPECT_EQ(SDK::User::LoadUser(name), nullptr) << name;
    }
}

} // namespace
} // namespace contract
