#include "standalone/contract/last_error.h"

#include "platform/core.h"

#include <gtest/gtest.h>

#include <thread>

namespace velt {
namespace {

TEST(LastError, NamesNumberPlaceAndSentence) {
    const int line = __LINE__ + 1;
    EXPECT_EQ(fail(ErrorNumber::damaged, "The file is damaged."), -1);

    EXPECT_EQ(VLIBCErrGet(), 0x0301);
    EXPECT_STREQ(VLIBCErrorGetFile(), "last_error_test.cpp");
    EXPECT_EQ(VLIBCErrorGetLine(), line);
    EXPECT_EQ(lastErrorSentence(), "The file is damaged.");
}

TEST(LastError, WithoutANumberIsOneOfTheStore) {
    fail(Error("Cannot read /x: Is a directory."));
    EXPECT_EQ(VLIBCErrGet(), 0x0300);
    EXPECT_EQ(lastErrorSentence(), "Cannot read /x: Is a directory.");
}

TEST(LastError, IsForgottenOnRequest) {
    fail(ErrorNumber::invalid, "Something is wrong.");
    clearLastError();

    EXPECT_EQ(VLIBCErrGet(), 0);
    EXPECT_STREQ(VLIBCErrorGetFile(), "");
    EXPECT_EQ(VLIBCErrorGetLine(), 0);
    EXPECT_EQ(lastErrorSentence(), "");
}

TEST(LastError, BelongsToItsThread) {
    clearLastError();
    std::thread([] {
        fail(ErrorNumber::store, "In the other thread.");
        EXPECT_EQ(VLIBCErrGet(), 0x0300);
    }).join();

    EXPECT_EQ(VLIBCErrGet(), 0);
    EXPECT_EQ(lastErrorSentence(), "");
}

TEST(LastError, ANamedPlaceIsReportedWithoutItsFolder) {
    fail(ErrorNumber::store, "", SourcePlace{"some/folder/place.cpp", 7});

    EXPECT_STREQ(VLIBCErrorGetFile(), "place.cpp");
    EXPECT_EQ(VLIBCErrorGetLine(), 7);
}

} // namespace
} // namespace velt
