#include "ftp/ftp_library.h"
#include "platform/core.h"
#include "platform/share.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

using test::messageOf;

constexpr int offeredToFtp = 0x207;

class ShareContractTest : public testing::Test {
protected:
    ShareContractTest() {
        setStateRoot(folder_.path());
        clearLastError();
    }
    ~ShareContractTest() override { VLIBCSzListFree(list_); }

    std::vector<std::string> listed() const {
        std::vector<std::string> names;
        for (int i = 0; i < list_->count; ++i) {
            names.emplace_back(VLIBCSzListGet(list_, i));
        }
        return names;
    }

    test::TemporaryFolder folder_;
    VLIBCSzList* list_ = VLIBCSzListAlloc(1);
};

TEST_F(ShareContractTest, AShareHasItsThreeTexts) {
    ASSERT_EQ(messageOf(test::storeShares({{"public", "For all", "/srv/public", true, {}, {}}})), "");
    VELT_SHARE* share = nullptr;
    ASSERT_EQ(VELTShareGet("public", &share), 0);
    EXPECT_STREQ(share->name, "public");
    EXPECT_STREQ(share->comment, "For all");
    EXPECT_STREQ(share->path, "/srv/public");
    VELTShareFree(share);
    VELTShareFree(nullptr);
}

TEST_F(ShareContractTest, AnUnknownNameFailsAndLeavesTheHandleAlone) {
    ASSERT_EQ(messageOf(test::storeShares({{"public", "", "/srv/public", true, {}, {}}})), "");
    for (const char* name : {"PUBLIC", "", "public/", "../public", "publi", "\xff", "a\nb"}) {
        VELT_SHARE* share = nullptr;
        EXPECT_LT(VELTShareGet(name, &share), 0) << name;
        EXPECT_EQ(share, nullptr);
        EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::notFound));
        EXPECT_EQ(lastErrorSentence().find('\n'), std::string::npos);
    }
}

TEST_F(ShareContractTest, ListsWhatIsOfferedToFtpInTheOrderOfTheStore) {
    ASSERT_EQ(messageOf(test::storeShares({{"z", "", "/z", true, {}, {}},
                                           {"hidden", "", "/h", false, {}, {}},
                                           {"a", "", "/a", true, {}, {}},
                                           {"m", "", "/m", true, {}, {}}})),
              "");
    ASSERT_EQ(VELTFTPShareEnum(&list_, offeredToFtp), 0);
    EXPECT_EQ(listed(), (std::vector<std::string>{"z", "a", "m"}));
}

TEST_F(ShareContractTest, ListsNothingBeforeTheFirstStore) {
    ASSERT_EQ(VELTFTPShareEnum(&list_, offeredToFtp), 0);
    EXPECT_EQ(list_->count, 0);
}

TEST_F(ShareContractTest, RefusesASelectionThatItDoesNotKnow) {
    EXPECT_LT(VELTFTPShareEnum(&list_, 1), 0);
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::invalid));
}

TEST_F(ShareContractTest, ADamagedStoreFailsEveryOperation) {
    folder_.write("/etc/velt/shares.json", "{");
    VELT_SHARE* share = nullptr;
    EXPECT_LT(VELTShareGet("public", &share), 0);
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::damaged));
    clearLastError();
    EXPECT_LT(VELTFTPShareEnum(&list_, offeredToFtp), 0);
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::damaged));
}

TEST_F(ShareContractTest, NullArgumentsFail) {
    VELT_SHARE* share = nullptr;
    VELT_SHARE_PRIV privilege{};
    EXPECT_LT(VELTShareGet(nullptr, &share), 0);
    EXPECT_LT(VELTShareGet("a", nullptr), 0);
    EXPECT_LT(VELTShareUGPrivGetLocal("ftp", nullptr, &privilege), 0);
    EXPECT_LT(VELTFTPShareEnum(nullptr, offeredToFtp), 0);
}

} // namespace
} // namespace velt
