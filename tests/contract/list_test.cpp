#include "tests/contract/contract_test.h"

namespace contract {
namespace {

class ListContract : public ContractTest {};

TEST_F(ListContract, ANewListIsEmptyAndHasRoom) {
    for (const int capacity : {0, 1, 1024}) {
        VLIBCSzList* list = VLIBCSzListAlloc(capacity);
        ASSERT_NE(list, nullptr);
        EXPECT_GE(list->capacity, capacity);
        EXPECT_EQ(list->count, 0);
        EXPECT_EQ(list->reserved, 0);
        EXPECT_EQ(list->flags, 0);
        EXPECT_EQ(VLIBCSzListGet(list, 0), nullptr);
        VLIBCSzListFree(list);
    }
}

TEST_F(ListContract, GrowsByPushAndKeepsItsTexts) {
    for (const int capacity : {0, 1, 3, 200}) {
        VLIBCSzList* list = VLIBCSzListAlloc(capacity);
        ASSERT_NE(list, nullptr);
        for (int i = 0; i < 100; ++i) {
            ASSERT_GE(VLIBCSzListPush(&list, ("text " + std::to_string(i)).c_str()), 0);
            ASSERT_EQ(list->count, i + 1);
            ASSERT_GE(list->capacity, list->count);
        }
        for (int i = 0; i < 100; ++i) {
            EXPECT_EQ(VLIBCSzListGet(list, i), "text " + std::to_string(i));
        }
        VLIBCSzListFree(list);
    }
}

TEST_F(ListContract, KeepsItsFlagsWhenItGrows) {
    List list;
    list.get()->flags = 16;
    for (int i = 0; i < 100; ++i) {
        ASSERT_GE(VLIBCSzListPush(list.address(), "x"), 0);
        ASSERT_EQ(list.get()->flags, 16);
    }
}

TEST_F(ListContract, TakesACopyOfAnyText) {
    List list;
    std::string text = "\xff\n";
    ASSERT_GE(VLIBCSzListPush(list.address(), text.c_str()), 0);
    text = "gone";
    ASSERT_GE(VLIBCSzListPush(list.address(), ""), 0);
    ASSERT_GE(VLIBCSzListPush(list.address(), VLIBCSzListGet(list.get(), 0)), 0) << "a text of its own";
    EXPECT_EQ(list.names(), (Names{"\xff\n", "", "\xff\n"}));
}

TEST_F(ListContract, HasNoEntryOutsideItsRange) {
    List list({"a", "b"});
    for (const int index : {-1, 2, 3, 1 << 30, -(1 << 30)}) {
        EXPECT_EQ(VLIBCSzListGet(list.get(), index), nullptr) << index;
    }
}

TEST_F(ListContract, APushWithoutATextLeavesTheListAsItWas) {
    List list({"a"});
    VLIBCSzList* const before = list.get();
    EXPECT_LT(VLIBCSzListPush(list.address(), nullptr), 0);
    EXPECT_EQ(list.get(), before);
    EXPECT_EQ(list.names(), Names{"a"});
}

TEST_F(ListContract, FreeingNullIsAllowed) {
    VLIBCSzListFree(nullptr);
    List list({"a"});
    EXPECT_EQ(list.names(), Names{"a"}) << "and leaves other lists alone";
}

} // namespace
} // namespace contract
