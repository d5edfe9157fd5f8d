#include "standalone/contract/string_map.h"

#include "standalone/contract/last_error.h"

#include <gtest/gtest.h>

namespace {

TEST(StringMap, SetsAndReplacesCopies) {
    VLIBCSzHash* map = VLIBCSzHashAlloc(1024);
    ASSERT_NE(map, nullptr);
    std::string value = "stop";
    EXPECT_GE(VLIBCSzHashSetValue(&map, "SERVICE_NAME", "ftpd"), 0);
    EXPECT_GE(VLIBCSzHashSetValue(&map, "SERVICE_ACTION", "start"), 0);
    EXPECT_GE(VLIBCSzHashSetValue(&map, "SERVICE_ACTION", value.c_str()), 0);
    value = "gone";

    EXPECT_EQ(map->entries,
              (std::map<std::string, std::string>{{"SERVICE_ACTION", "stop"}, {"SERVICE_NAME", "ftpd"}}));
    VLIBCSzHashFree(map);
}

TEST(StringMap, TakesAnyInitialSize) {
    for (const int size : {0, -1}) {
        VLIBCSzHash* map = VLIBCSzHashAlloc(size);
        EXPECT_GE(VLIBCSzHashSetValue(&map, "k", "v"), 0);
        VLIBCSzHashFree(map);
    }
}

TEST(StringMap, RefusesWhatIsNotThere) {
    VLIBCSzHash* map = VLIBCSzHashAlloc(1);
    EXPECT_LT(VLIBCSzHashSetValue(&map, nullptr, "v"), 0);
    EXPECT_LT(VLIBCSzHashSetValue(&map, "k", nullptr), 0);
    EXPECT_LT(VLIBCSzHashSetValue(nullptr, "k", "v"), 0);
    EXPECT_EQ(velt::lastErrorSentence(), "A map, a key and a value are required.");
    EXPECT_TRUE(map->entries.empty());
    VLIBCSzHashFree(map);
    VLIBCSzHashFree(nullptr);
}

} // namespace
