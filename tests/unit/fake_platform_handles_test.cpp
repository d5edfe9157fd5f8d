// The fake platform's account of handles: leaked, freed twice, used after their end, moved.

#include "tests/support/fake_platform/fake_platform.h"

#include "platform/account.h"
#include "platform/sdk_user.h"
#include "platform/share.h"
#include "platform/sysevent.h"

#include <gtest/gtest.h>

#include <algorithm>

namespace {

using Lines = std::vector<std::string>;

class FakeHandles : public ::testing::Test {
protected:
    FakeHandles() { platform.reset(); }
    ~FakeHandles() override { platform.reset(); }

    fake::Platform& platform = fake::Platform::instance();
};

Lines textsOf(const VLIBCSzList* list) {
    Lines texts;
    for (int i = 0; i < list->count; ++i) {
        texts.emplace_back(VLIBCSzListGet(list, i));
    }
    return texts;
}

TEST_F(FakeHandles, NamesLeakedHandles) {
    platform.shares["photos"] = {"", "/volume1/photos", 2};
    platform.users["bob"] = {"Bob", 1000};
    VLIBCSzListAlloc(1024);
    VLIBCSzListFree(VLIBCSzListAlloc(1024));
    VLIBCSzListAlloc(1024);
    VLIBCSzHashAlloc(1024);
    VELT_SHARE* share = nullptr;
    VELTShareGet("photos", &share);
    SDK::User::LoadUser("bob");
    auto errors = platform.handleErrors();
    std::sort(errors.begin(), errors.end());
    EXPECT_EQ(errors, (Lines{"list1 was not freed", "list3 was not freed", "map1 was not freed",
                             "sdkuser1 was not freed", "share1 was not freed"}));
}

TEST_F(FakeHandles, NamesHandlesFreedTwice) {
    platform.shares["photos"] = {};
    platform.users["bob"] = {};
    VLIBCSzList* list = VLIBCSzListAlloc(1024);
    VLIBCSzListFree(list);
    VLIBCSzListFree(list);
    VLIBCSzHash* map = VLIBCSzHashAlloc(1024);
    VLIBCSzHashFree(map);
    VLIBCSzHashFree(map);
    VELT_SHARE* share = nullptr;
    VELTShareGet("photos", &share);
    VELTShareFree(share);
    VELTShareFree(share);
    SDK::User* user = SDK::User::LoadUser("bob");
    SDK::User::Release(user);
    SDK::User::Release(user);
    EXPECT_EQ(platform.handleErrors(),
              (Lines{"VLIBCSzListFree(list1 (freed))", "VLIBCSzHashFree(map1 (freed))",
                     "VELTShareFree(share1 (freed))", "SDK::User::Release(sdkuser1 (freed))"}));
}

TEST_F(FakeHandles, NamesUsesAfterTheEnd) {
    platform.shares["photos"] = {};
    platform.users["bob"] = {"Bob", 1000};
    VLIBCSzList* list = VLIBCSzListAlloc(1024);
    VLIBCSzListPush(&list, "a");
    VLIBCSzListFree(list);
    EXPECT_EQ(VLIBCSzListGet(list, 0), nullptr);
    EXPECT_LT(VLIBCSzListPush(&list, "b"), 0);
    EXPECT_LT(VELTFTPAddChrootUser(list), 0);
    EXPECT_LT(VELTFTPShareEnum(&list, 0x207), 0);
    VLIBCSzHash* map = VLIBCSzHashAlloc(1024);
    VLIBCSzHashFree(map);
    EXPECT_LT(VLIBSyseventEmit("event", map, 1), 0);
    VELT_SHARE* share = nullptr;
    VELTShareGet("photos", &share);
    VELTShareFree(share);
    VELT_SHARE_PRIV priv{};
    EXPECT_LT(VELTShareUGPrivGetLocal("ftp", share, &priv), 0);
    const SDK::User* user = SDK::User::LoadUser("bob");
    SDK::User::Release(const_cast<SDK::User*>(user));
    EXPECT_EQ(user->GetDesc(), "");
    EXPECT_EQ(platform.handleErrors(),
              (Lines{"VLIBCSzListGet(list1 (freed))", "VLIBCSzListPush(list1 (freed))",
                     "VELTFTPAddChrootUser(list1 (freed))", "VELTFTPShareEnum(list1 (freed))",
                     "VLIBSyseventEmit(map1 (freed))", "VELTShareUGPrivGetLocal(share1 (freed))",
                     "SDK::User::GetDesc(sdkuser1 (freed))"}));
}

TEST_F(FakeHandles, TellsKindsApartAndAllowsNullWhereTheContractDoes) {
    VLIBCSzHash* map = VLIBCSzHashAlloc(8);
    VLIBCSzListFree(reinterpret_cast<VLIBCSzList*>(map));
    VLIBCSzHashFree(map);
    VLIBCSzListFree(nullptr);
    VLIBCSzHashFree(nullptr);
    VELTShareFree(nullptr);
    VLIBCSzList stray{};
    VLIBCSzListFree(&stray);
    SDK::User::Release(nullptr);
    EXPECT_EQ(platform.handleErrors(), (Lines{"VLIBCSzListFree(map1)", "VLIBCSzListFree(unknown handle)",
                                              "SDK::User::Release(null)"}));
}

TEST_F(FakeHandles, MovesAListThatGrows) {
    platform.pushMovesList = true;
    VLIBCSzList* list = VLIBCSzListAlloc(1024);
    list->flags = 16;
    VLIBCSzList* const before = list;
    EXPECT_EQ(VLIBCSzListPush(&list, "a"), 0);
    EXPECT_NE(list, before);
    EXPECT_EQ(VLIBCSzListPush(&list, "b"), 0);
    EXPECT_EQ(list->flags, 16);
    EXPECT_EQ(list->count, 2);
    EXPECT_EQ(VELTFTPAddChrootUser(list), 0);
    EXPECT_EQ(platform.chrootUsers, (Lines{"a", "b"}));
    VLIBCSzListFree(list);
    EXPECT_TRUE(platform.handleErrors().empty());
    VLIBCSzListFree(before);
    EXPECT_EQ(platform.handleErrors(), Lines{"VLIBCSzListFree(list1 (moved))"});
    EXPECT_EQ(platform.journal, (Lines{
                                    "VLIBCSzListAlloc(1024)",
                                    R"(VLIBCSzListPush(list1 flags=16, "a"))",
                                    R"(VLIBCSzListPush(list1 flags=16, "b"))",
                                    R"(VELTFTPAddChrootUser(list1 flags=16 ["a", "b"]))",
                                    "VLIBCSzListFree(list1)",
                                    "VLIBCSzListFree(list1 (moved))",
                                }));
}

TEST_F(FakeHandles, MovesAFullListAndNoOther) {
    VLIBCSzList* list = VLIBCSzListAlloc(1);
    const VLIBCSzList* const before = list;
    VLIBCSzListPush(&list, "a");
    EXPECT_EQ(list, before);
    VLIBCSzListPush(&list, "b");
    EXPECT_NE(list, before);
    EXPECT_EQ(textsOf(list), (Lines{"a", "b"}));
    VLIBCSzListFree(list);
}

TEST_F(FakeHandles, ReplacesTheListOfAnEnumerator) {
    platform.enumeratorsReplaceList = true;
    platform.ftpShares = {"photos", "music"};
    VLIBCSzList* list = VLIBCSzListAlloc(1024);
    const VLIBCSzList* const before = list;
    EXPECT_EQ(VELTFTPShareEnum(&list, 0x207), 0);
    EXPECT_NE(list, before);
    EXPECT_EQ(textsOf(list), platform.ftpShares);
    VLIBCSzListFree(list);
    EXPECT_TRUE(platform.handleErrors().empty());
    EXPECT_EQ(platform.journal,
              (Lines{"VLIBCSzListAlloc(1024)", "VELTFTPShareEnum(list1, 0x207)", "VLIBCSzListFree(list1)"}));
}

TEST_F(FakeHandles, ReplacesTheListAlsoWhenAnEnumeratorFails) {
    platform.failedEnumeratorsReplaceList = true;
    platform.rules = {"user:1000:/home"};
    platform.fail("VELTFTPChrootRuleEnum");
    VLIBCSzList* list = VLIBCSzListAlloc(1024);
    VLIBCSzList* const before = list;
    EXPECT_EQ(VELTFTPChrootRuleEnum(&list), -1);
    EXPECT_NE(list, before);
    EXPECT_EQ(list->count, 0);
    VLIBCSzListFree(before);
    EXPECT_EQ(platform.handleErrors(), (Lines{"VLIBCSzListFree(list1 (moved))", "list1 was not freed"}));
    VLIBCSzListFree(list);
}

TEST_F(FakeHandles, MovesAMap) {
    platform.hashMoves = true;
    VLIBCSzHash* map = VLIBCSzHashAlloc(1024);
    VLIBCSzHash* const before = map;
    EXPECT_EQ(VLIBCSzHashSetValue(&map, "SERVICE_NAME", "ftpd"), 0);
    EXPECT_NE(map, before);
    EXPECT_EQ(VLIBCSzHashSetValue(&map, "SERVICE_ACTION", "stop"), 0);
    EXPECT_EQ(VLIBSyseventEmit("velt.service.action", map, 1), 0);
    VLIBCSzHashFree(map);
    EXPECT_TRUE(platform.handleErrors().empty());
    const std::string pairs = R"({"SERVICE_NAME": "ftpd", "SERVICE_ACTION": "stop"})";
    EXPECT_EQ(platform.journal, (Lines{
                                    "VLIBCSzHashAlloc(1024)",
                                    R"(VLIBCSzHashSetValue(map1, "SERVICE_NAME", "ftpd"))",
                                    R"(VLIBCSzHashSetValue(map1, "SERVICE_ACTION", "stop"))",
                                    "VLIBSyseventEmit(\"velt.service.action\", " + pairs + ", 1)",
                                    "VLIBCSzHashFree(map1)",
                                }));
}

TEST_F(FakeHandles, LeavesAShareToFreeAlsoAfterAFailure) {
    VELT_SHARE* share = nullptr;
    EXPECT_LT(VELTShareGet("photos", &share), 0);
    EXPECT_EQ(share, nullptr);
    platform.failedShareGetLeavesShare = true;
    EXPECT_LT(VELTShareGet("photos", &share), 0);
    EXPECT_NE(share, nullptr);
    EXPECT_EQ(platform.handleErrors(), Lines{"share1 was not freed"});
    VELTShareFree(share);
    EXPECT_TRUE(platform.handleErrors().empty());
}

TEST_F(FakeHandles, OwnsUserAndGroupRecords) {
    platform.users = {{"bob", {"Bob", 1000}}, {"eve", {"", 1001}}};
    platform.groups = {{"staff", 50}};
    VELT_USER* user = nullptr;
    VELT_GROUP* group = nullptr;
    ASSERT_EQ(VELTUserGet("bob", &user), 0);
    EXPECT_EQ(user->uid, 1000);
    EXPECT_STREQ(user->description, "Bob");
    ASSERT_EQ(VELTUserGet("eve", &user), 0);
    EXPECT_STREQ(user->name, "eve");
    EXPECT_LT(VELTUserGet("nobody", &user), 0);
    ASSERT_EQ(VELTGroupGet("staff", &group), 0);
    EXPECT_EQ(group->gid, 50);
    EXPECT_EQ(platform.userRecords(), 1);
    EXPECT_EQ(platform.groupRecords(), 1);
    EXPECT_TRUE(platform.handleErrors().empty());
    EXPECT_EQ(platform.journal, (Lines{R"(VELTUserGet("bob", null))", R"(VELTUserGet("eve", user1))",
                                       R"(VELTUserGet("nobody", user1))", R"(VELTGroupGet("staff", null))"}));
}

} // namespace
