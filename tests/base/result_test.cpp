#include "base/result.h"

#include <gtest/gtest.h>

#include <map>
#include <memory>

namespace velt {
namespace {

constexpr ErrorNumber kind{7};

Result<std::unique_ptr<int>> owned(int value) {
    if (value < 0) {
        return Error(kind, "less than nothing", {"place.cpp", 11});
    }
    return std::make_unique<int>(value);
}

Result<> check(int value) {
    VELT_RETURN_IF_ERROR(value > 9 ? Result<>(Error(kind, "too large", {"place.cpp", 22})) : Result<>());
    return {};
}

Result<std::string> sum(int first, int second) {
    VELT_RETURN_IF_ERROR(check(first));
    VELT_ASSIGN_OR_RETURN(const std::unique_ptr<int> one, owned(first));
    std::unique_ptr<int> other;
    VELT_ASSIGN_OR_RETURN(other, owned(second));
    return std::to_string(*one + *other);
}

void expectError(const Error& error, const std::string& message, int line) {
    EXPECT_EQ(error.number, kind);
    EXPECT_EQ(error.message, message);
    EXPECT_STREQ(error.where.file, "place.cpp");
    EXPECT_EQ(error.where.line, line);
}

TEST(ResultMacros, goOnWithValues) {
    EXPECT_EQ(sum(3, 4), "7");
}

TEST(ResultMacros, handOnAnErrorUnchanged) {
    expectError(sum(10, 4).error(), "too large", 22);
    expectError(sum(-1, 4).error(), "less than nothing", 11);
    expectError(sum(3, -4).error(), "less than nothing", 11);
}

TEST(ResultMacros, endTheFunctionAtAnError) {
    bool wentOn = false;
    const auto act = [&]() -> Result<> {
        VELT_RETURN_IF_ERROR(check(10));
        wentOn = true;
        return {};
    };
    EXPECT_FALSE(act());
    EXPECT_FALSE(wentOn);
}

TEST(ResultMacros, evaluateOnce) {
    int times = 0;
    const auto act = [&]() -> Result<int> {
        VELT_RETURN_IF_ERROR(check(++times));
        VELT_ASSIGN_OR_RETURN(const auto value, owned(++times));
        return *value;
    };
    EXPECT_EQ(act(), 2);
    EXPECT_EQ(times, 2);
}

// The variable lives as long as its block, as that of a lock has to.
TEST(ResultMacros, keepAValueToTheEndOfItsBlock) {
    const auto shared = std::make_shared<int>(1);
    long during = 0;
    const auto act = [&]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(const auto held, Result<std::shared_ptr<int>>(shared));
        during = shared.use_count();
        return {};
    };
    EXPECT_TRUE(act());
    EXPECT_EQ(during, 2);
    EXPECT_EQ(shared.use_count(), 1);
}

TEST(ResultMacros, takeCommasAndLambdasThatUseThem) {
    const auto lookUp = [](const std::map<int, int>& values, int key) -> Result<int> {
        return values.at(key);
    };
    const auto act = [&]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(const int number, lookUp(std::map<int, int>{{1, 10}}, 1));
        VELT_RETURN_IF_ERROR([&](int first, int second) -> Result<> {
            VELT_ASSIGN_OR_RETURN(const auto value, owned(first));
            VELT_RETURN_IF_ERROR(check(second));
            return check(*value);
        }(1, number));
        return {};
    };
    expectError(act().error(), "too large", 22);
}

} // namespace
} // namespace velt
