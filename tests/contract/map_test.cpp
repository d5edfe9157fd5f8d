#include "platform/sysevent.h"
#include "tests/contract/contract_test.h"
#include "tests/contract/platform_setup.h"

namespace contract {
namespace {

using Entries = std::map<std::string, std::string>;

class MapContract : public ContractTest {
protected:
    void SetUp() override {
        ContractTest::SetUp();
        map_ = VLIBCSzHashAlloc(2);
        ASSERT_NE(map_, nullptr);
    }
    void TearDown() override {
        VLIBCSzHashFree(map_);
        ContractTest::TearDown();
    }

    void set(const std::string& key, const std::string& value) {
        ASSERT_GE(VLIBCSzHashSetValue(&map_, key.c_str(), value.c_str()), 0) << lastError();
    }

    VLIBCSzHash* map_ = nullptr;
};

TEST_F(MapContract, IsEmptyAtFirst) {
    EXPECT_EQ(entriesOf(map_), Entries());
}

TEST_F(MapContract, ReplacesTheValueOfAKeyItHas) {
    set("service", "ftpd");
    set("action", "start");
    set("service", "sftp");
    set("", "empty key");
    set("empty value", "");
    EXPECT_EQ(entriesOf(map_),
              (Entries{{"service", "sftp"}, {"action", "start"}, {"", "empty key"}, {"empty value", ""}}));
}

TEST_F(MapContract, GrowsBeyondItsFirstSize) {
    Entries expected;
    for (int i = 0; i < 100; ++i) {
        const std::string number = std::to_string(i);
        set("key " + number, number);
        expected["key " + number] = number;
    }
    EXPECT_EQ(entriesOf(map_), expected);
}

TEST_F(MapContract, TakesCopies) {
    std::string text = "before";
    ASSERT_GE(VLIBCSzHashSetValue(&map_, text.c_str(), text.c_str()), 0);
    text = "after";
    EXPECT_EQ(entriesOf(map_), (Entries{{"before", "before"}}));
}

TEST_F(MapContract, AFailedSetLeavesItAsItWas) {
    set("key", "value");
    EXPECT_LT(VLIBCSzHashSetValue(&map_, nullptr, "x"), 0);
    EXPECT_LT(VLIBCSzHashSetValue(&map_, "key", nullptr), 0);
    EXPECT_EQ(entriesOf(map_), (Entries{{"key", "value"}}));
}

TEST_F(MapContract, StaysTheCallersWhenItIsAnnounced) {
    set("SERVICE", "ftpd");
    ASSERT_GE(VLIBSyseventEmit("velt.service.start", map_, 1), 0) << lastError();
    EXPECT_EQ(entriesOf(map_), (Entries{{"SERVICE", "ftpd"}}));
    set("SERVICE", "sftp");
    EXPECT_GE(VLIBSyseventEmit("velt.service.start", map_, 1), 0) << lastError();
}

TEST_F(MapContract, FreeingNullIsAllowed) {
    set("key", "value");
    VLIBCSzHashFree(nullptr);
    EXPECT_EQ(entriesOf(map_).size(), 1U);
}

} // namespace
} // namespace contract
