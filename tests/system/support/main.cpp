#include "tests/system/support/private_world.h"

#include <gtest/gtest.h>

int main(int count, char** arguments) {
    testing::InitGoogleTest(&count, arguments);
    if (GTEST_FLAG_GET(list_tests)) {
        return RUN_ALL_TESTS();
    }
    int exitCode = 1;
    return velt::test::enterPrivateWorld(exitCode) ? RUN_ALL_TESTS() : exitCode;
}
