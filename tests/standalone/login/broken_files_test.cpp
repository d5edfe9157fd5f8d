// The files that decide on logins, broken in many ways: each is refused or read as what it says, and nothing
// worse happens.
#include "standalone/rules/rule_store.h"
#include "standalone/shares/share_file.h"

#include <gtest/gtest.h>

#include <random>

namespace velt::test {
namespace {

constexpr const char* shares =
    R"({"version":1,"shares":[{"name":"a","comment":"\u00e4","path":"/srv/a","ftp":true,"users":{"x":"read"},)"
    R"("groups":{"g":"none"}},{"name":"b","path":"/srv/b"}]})";
constexpr const char* rules = "velt-chroot-rules 1\nu:1000:/home\ng:100:/a/below\nu:4294967294:/b\n";

class Breaker {
public:
    std::string broken(std::string text) {
        for (std::size_t i = 0, count = 1 + pick(3); i < count && !text.empty(); i++) {
            const auto at = pick(text.size());
            switch (pick(5)) {
            case 0:
                text[at] = static_cast<char>(pick(256));
                break;
            case 1:
                text.erase(at, 1 + pick(8));
                break;
            case 2:
                text.insert(at, text, pick(text.size()), 1 + pick(16));
                break;
            case 3:
                text.resize(at);
                break;
            default:
                text.insert(at, std::string(1 + pick(40), "[{\"\0\n/.:9"[pick(10)]));
            }
        }
        return text;
    }

private:
    std::size_t pick(std::size_t below) {
        return std::uniform_int_distribution<std::size_t>(0, below - 1)(random_);
    }

    std::mt19937 random_{20};
};

TEST(BrokenFiles, ofSharesAreRefusedOrKeepTheirForm) {
    Breaker breaker;
    int refused = 0;
    for (int i = 0; i < 20000; i++) {
        const std::string text = breaker.broken(shares);
        std::string flaw;
        const auto read = parseShares(text, flaw);
        if (!read) {
            refused++;
            EXPECT_NE(flaw, "") << text;
            continue;
        }
        std::string none;
        EXPECT_TRUE(parseShares(renderShares(*read), none)) << text << ": " << none;
    }
    EXPECT_GT(refused, 10000);
    EXPECT_LT(refused, 20000);
}

TEST(BrokenFiles, ofRulesAreRefusedOrKeepTheirForm) {
    Breaker breaker;
    int refused = 0;
    for (int i = 0; i < 20000; i++) {
        const std::string text = breaker.broken(rules);
        const auto read = parseRules(text);
        if (!read) {
            refused++;
            continue;
        }
        std::string again = "velt-chroot-rules 1\n";
        for (const ChrootRule& rule : *read) {
            again += formatRule(rule) + "\n";
        }
        EXPECT_EQ(again, text);
    }
    EXPECT_GT(refused, 10000);
    EXPECT_LT(refused, 20000);
}

TEST(BrokenFiles, thatNestWithoutEndAreRefused) {
    std::string flaw;
    EXPECT_FALSE(parseShares(std::string(1000000, '['), flaw));
    EXPECT_FALSE(parseShares(R"({"version":1,"shares":)" + std::string(1000000, '['), flaw));
}

} // namespace
} // namespace velt::test
