#include "platform/core.h"
#include "standalone/contract/last_error.h"

#include <gtest/gtest.h>

#include <climits>
#include <ctime>
#include <memory>
#include <string>

namespace {

struct FreeList {
    void operator()(VLIBCSzList* list) const { VLIBCSzListFree(list); }
};
using List = std::unique_ptr<VLIBCSzList, FreeList>;

int push(List& list, const char* text) {
    VLIBCSzList* raw = list.release();
    const int result = VLIBCSzListPush(&raw, text);
    list.reset(raw);
    return result;
}

TEST(StringList, StartsEmptyWithTheRoomAskedFor) {
    const List list(VLIBCSzListAlloc(1024));
    ASSERT_NE(list, nullptr);
    EXPECT_EQ(list->capacity, 1024);
    EXPECT_EQ(list->count, 0);
    EXPECT_EQ(list->reserved, 0);
    EXPECT_EQ(list->flags, 0);
    EXPECT_EQ(VLIBCSzListGet(list.get(), 0), nullptr);
}

TEST(StringList, KeepsCopiesInOrder) {
    List list(VLIBCSzListAlloc(1));
    std::string text = "first";
    ASSERT_GE(push(list, text.c_str()), 0);
    text = "other";
    ASSERT_GE(push(list, ""), 0);
    ASSERT_GE(push(list, "\xff\n"), 0);

    EXPECT_EQ(list->count, 3);
    EXPECT_GE(list->capacity, 3);
    EXPECT_STREQ(VLIBCSzListGet(list.get(), 0), "first");
    EXPECT_STREQ(VLIBCSzListGet(list.get(), 1), "");
    EXPECT_STREQ(VLIBCSzListGet(list.get(), 2), "\xff\n");
    EXPECT_EQ(VLIBCSzListGet(list.get(), 3), nullptr);
    EXPECT_EQ(VLIBCSzListGet(list.get(), -1), nullptr);
}

TEST(StringList, KeepsItsFlagsWhileItGrows) {
    List list(VLIBCSzListAlloc(1));
    list->flags = 16;
    for (int i = 0; i < 100; ++i)
        ASSERT_GE(push(list, "x"), 0);
    EXPECT_EQ(list->flags, 16);
}

TEST(StringList, TakesAnEntryOfItsOwn) {
    List list(VLIBCSzListAlloc(1));
    ASSERT_GE(push(list, "short"), 0);
    for (int i = 0; i < 20; ++i)
        ASSERT_GE(push(list, VLIBCSzListGet(list.get(), list->count - 1)), 0);
    EXPECT_STREQ(VLIBCSzListGet(list.get(), 20), "short");
}

TEST(StringList, TakesACapacityOfNothingOrLess) {
    for (const int capacity : {0, -1, INT_MIN}) {
        List list(VLIBCSzListAlloc(capacity));
        ASSERT_NE(list, nullptr);
        EXPECT_EQ(list->capacity, 0);
        EXPECT_GE(push(list, "x"), 0);
        EXPECT_EQ(list->count, 1);
    }
}

TEST(StringList, RefusesWhatIsNotThere) {
    List list(VLIBCSzListAlloc(1));
    EXPECT_LT(push(list, nullptr), 0);
    EXPECT_EQ(velt::lastErrorSentence(), "A list and a text to add to it are required.");
    EXPECT_EQ(list->count, 0);
    VLIBCSzList* none = nullptr;
    EXPECT_LT(VLIBCSzListPush(&none, "x"), 0);
    EXPECT_LT(VLIBCSzListPush(nullptr, "x"), 0);
    EXPECT_EQ(VLIBCSzListGet(nullptr, 0), nullptr);
    VLIBCSzListFree(nullptr);
}

/// Of the processor, so that nothing else on the machine counts.
double secondsFor(int pushes) {
    List list(VLIBCSzListAlloc(0));
    const std::clock_t begin = std::clock();
    for (int i = 0; i < pushes; ++i)
        if (push(list, "a name of some twenty-four") < 0)
            return -1;
    return static_cast<double>(std::clock() - begin) / CLOCKS_PER_SEC;
}

// Growth by a constant would take a hundred times as long for ten times the entries.
TEST(StringList, GrowsInLinearTime) {
    // The best of some runs of each is what the code costs; the rest is what else shares the caches.
    double small = 1e9;
    double large = 1e9;
    for (int run = 0; run < 4; ++run) {
        small = std::min(small, secondsFor(10'000));
        large = std::min(large, secondsFor(100'000));
    }
    ASSERT_GT(small, 0);
    EXPECT_LT(large, 40 * small);
    EXPECT_LT(large, 1.0);
}

} // namespace
