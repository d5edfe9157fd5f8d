// The owners free what they hold: once, wherever it moved to, and also while an exception unwinds.

#include "handler/owners.h"

#include "ftp/ftp_library.h"
#include "tests/support/handler_test.h"

#include <stdexcept>

namespace {

class Owners : public HandlerTest {};

TEST_F(Owners, AListIsAllocatedWithItsCapacityAndFreed) {
    { const SzList list; }
    EXPECT_EQ(platform.journal, (Lines{"VLIBCSzListAlloc(1024)", "VLIBCSzListFree(list1)"}));
}

TEST_F(Owners, AListThatCouldNotBeAllocatedIsFalseAndNotFreed) {
    platform.fail("VLIBCSzListAlloc");
    {
        const SzList list;
        EXPECT_FALSE(list);
    }
    EXPECT_EQ(platform.count("VLIBCSzListFree"), 0);
}

TEST_F(Owners, AListThatMovesIsFreedWhereItEndsUp) {
    platform.pushMovesList = true;
    {
        SzList list;
        list.push("a");
        list.push("b");
        EXPECT_EQ(list.count(), 2);
        EXPECT_STREQ(list.at(1), "b");
    }
    EXPECT_EQ(platform.handleErrors(), Lines{});
}

TEST_F(Owners, AListThatAnEnumeratorReplacesIsFreedWhereItEndsUp) {
    platform.enumeratorsReplaceList = true;
    platform.ftpShares = {"public"};
    {
        SzList list;
        VELTFTPShareEnum(list.address(), 0x207);
        EXPECT_EQ(list.count(), 1);
    }
    EXPECT_EQ(platform.handleErrors(), Lines{});
}

TEST_F(Owners, AMapThatMovesIsFreedWhereItEndsUp) {
    platform.hashMoves = true;
    {
        SzHash map(1024);
        map.set("a", "1");
        map.set("b", "2");
    }
    EXPECT_EQ(platform.handleErrors(), Lines{});
}

TEST_F(Owners, AMapThatCouldNotBeAllocatedIsFalseAndNotFreed) {
    platform.fail("VLIBCSzHashAlloc");
    {
        const SzHash map(1024);
        EXPECT_FALSE(map);
    }
    EXPECT_EQ(platform.count("VLIBCSzHashFree"), 0);
}

TEST_F(Owners, AShareIsFreedAlsoWhenItsLookUpFailed) {
    platform.shares["public"] = {"", "/", 1};
    platform.failedShareGetLeavesShare = true;
    platform.fail("VELTShareGet");
    {
        ShareHandle share;
        EXPECT_LT(VELTShareGet("public", share.address()), 0);
    }
    EXPECT_EQ(platform.count("VELTShareFree"), 1);
}

TEST_F(Owners, AShareThatWasNeverFoundIsNotFreed) {
    {
        ShareHandle share;
        EXPECT_LT(VELTShareGet("public", share.address()), 0);
    }
    EXPECT_EQ(platform.count("VELTShareFree"), 0);
}

TEST_F(Owners, AUserThatCannotBeLoadedHasNoDescriptionAndIsNotReleased) {
    EXPECT_EQ(LoadedUser("nobody").description(), "");
    EXPECT_EQ(platform.count("SDK::User::Release"), 0);
}

TEST_F(Owners, EverythingIsFreedWhileAnExceptionUnwinds) {
    platform.shares["public"] = {"", "/", 1};
    platform.users["bob"] = {"Bob", 1000};
    const auto useAll = [] {
        const SzList list;
        const SzHash map(1024);
        ShareHandle share;
        VELTShareGet("public", share.address());
        const LoadedUser user("bob");
        throw std::runtime_error("midway");
    };
    EXPECT_THROW(useAll(), std::runtime_error);
    EXPECT_EQ(platform.handleErrors(), Lines{});
}

} // namespace
