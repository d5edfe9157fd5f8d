#include "platform/share.h"
#include "tests/contract/contract_test.h"
#include "tests/contract/platform_setup.h"

namespace contract {
namespace {

class ShareContract : public ContractTest {
protected:
    /// Whether the account can reach the share, by the code of the privilege.
    static bool reaches(const char* account, const char* name) {
        VELT_SHARE* share = nullptr;
        EXPECT_GE(VELTShareGet(name, &share), 0) << lastError();
        VELT_SHARE_PRIV privilege{{0, 0}, 0};
        EXPECT_GE(VELTShareUGPrivGetLocal(account, share, &privilege), 0) << lastError();
        VELTShareFree(share);
        return privilege.effective != 0 && privilege.effective != 4;
    }
};

TEST_F(ShareContract, AShareHasItsThreeTexts) {
    VELT_SHARE* share = nullptr;
    ASSERT_GE(VELTShareGet("photos", &share), 0) << lastError();
    ASSERT_NE(share, nullptr);
    EXPECT_STREQ(share->name, "photos");
    EXPECT_STREQ(share->comment, "All of them");
    EXPECT_EQ(share->path, folderOf("photos"));
    EXPECT_EQ(share->path[0], '/');
    VELTShareFree(share);
}

TEST_F(ShareContract, OneThatIsNotOfferedIsFoundAllTheSame) {
    VELT_SHARE* share = nullptr;
    ASSERT_GE(VELTShareGet("hidden", &share), 0) << lastError();
    EXPECT_STREQ(share->name, "hidden");
    EXPECT_STREQ(share->comment, "");
    VELTShareFree(share);
}

TEST_F(ShareContract, AnUnknownNameFailsAndLeavesTheHandleAlone) {
    for (const char* name : {"nowhere", "", "photo", "photos/", "../photos", "\xff"}) {
        VELT_SHARE* share = nullptr;
        EXPECT_LT(VELTShareGet(name, &share), 0) << name;
        EXPECT_EQ(share, nullptr) << name;
        VELTShareFree(share);
    }
}

TEST_F(ShareContract, TwoLookUpsAreFreedApart) {
    VELT_SHARE* first = nullptr;
    VELT_SHARE* second = nullptr;
    ASSERT_GE(VELTShareGet("photos", &first), 0);
    ASSERT_GE(VELTShareGet("private", &second), 0);
    VELTShareFree(first);
    EXPECT_STREQ(second->name, "private");
    VELTShareFree(second);
}

TEST_F(ShareContract, TheAnonymousAccountReachesWhatItIsGranted) {
    if (!tellsPrivileges()) {
        GTEST_SKIP() << "only root can ask what another account may do";
    }
    EXPECT_TRUE(reaches("ftp", "photos"));
    EXPECT_TRUE(reaches("ftp", "hidden"));
    EXPECT_FALSE(reaches("ftp", "private"));
}

TEST_F(ShareContract, ThoseOfferedToFtpAreListed) {
    List list;
    ASSERT_GE(VELTFTPShareEnum(list.address(), 0x207), 0) << lastError();
    EXPECT_EQ(list.nameSet(), (std::set<std::string>{"photos", "private"}));
}

TEST_F(ShareContract, EachListedShareCanBeLookedUp) {
    List list;
    ASSERT_GE(VELTFTPShareEnum(list.address(), 0x207), 0) << lastError();
    ASSERT_FALSE(list.names().empty());
    for (const std::string& name : list.names()) {
        VELT_SHARE* share = nullptr;
        ASSERT_GE(VELTShareGet(name.c_str(), &share), 0) << name;
        EXPECT_EQ(share->name, name);
        VELTShareFree(share);
    }
}

} // namespace
} // namespace contract
