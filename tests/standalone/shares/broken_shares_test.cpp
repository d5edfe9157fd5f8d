#include "standalone/shares/share_file.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/standalone/support/text_breaker.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

constexpr const char* shares =
    R"({"version":1,"shares":[{"name":"a","comment":"\u00e4","path":"/srv/a","ftp":true,"users":{"x":"read"},)"
    R"("groups":{"g":"none"}},{"name":"b","path":"/srv/b"}]})";

TEST(BrokenShares, areRefusedOrKeepTheirForm) {
    TextBreaker breaker;
    int refused = 0;
    for (int i = 0; i < 20000; i++) {
        const std::string text = breaker.broken(shares);
        const auto read = parseShares(text);
        if (!read) {
            refused++;
            EXPECT_NE(read.error().message, "") << text;
            continue;
        }
        EXPECT_EQ(messageOf(parseShares(renderShares(*read))), "") << text;
    }
    EXPECT_GT(refused, 10000);
    EXPECT_LT(refused, 20000);
}

TEST(BrokenShares, thatNestWithoutEndAreRefused) {
    EXPECT_FALSE(parseShares(std::string(1000000, '[')));
    EXPECT_FALSE(parseShares(R"({"version":1,"shares":)" + std::string(1000000, '[')));
}

} // namespace
} // namespace velt::test
