#include "standalone/core/effects.h"

#include "standalone/core/error_number.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <thread>
#include <vector>

namespace velt {
namespace {

using test::messageOf;

Result<> succeed() {
    return {};
}

Result<> refused() {
    return Error("Refused.");
}

class Effects : public ::testing::Test {
protected:
    ~Effects() override { setEffectHook({}); }
};

TEST_F(Effects, AreDoneWithoutAHook) {
    int done = 0;
    EXPECT_EQ(messageOf(perform(Effect::store, "ftp settings",
                                [&] {
                                    ++done;
                                    return Result<>();
                                })),
              "");
    EXPECT_EQ(messageOf(perform(Effect::store, "ftp settings", refused)), "Refused.");
    EXPECT_EQ(done, 1);
}

TEST_F(Effects, CanBeListedInsteadOfDone) {
    std::vector<std::string> listed;
    setEffectHook([&](Effect effect, std::string_view subject) {
        listed.push_back(std::string(effectName(effect)) + ": " + std::string(subject));
        return EffectDecision(Result<>());
    });
    bool done = false;
    const auto act = [&] {
        done = true;
        return Result<>();
    };

    for (const Effect effect : {Effect::store, Effect::firewall, Effect::stop, Effect::start, Effect::restart,
                                Effect::runKey, Effect::event, Effect::logEntry})
        EXPECT_TRUE(perform(effect, "ftpd", act));

    EXPECT_FALSE(done);
    EXPECT_EQ(listed,
              (std::vector<std::string>{"store: ftpd", "firewall: ftpd", "stop: ftpd", "start: ftpd",
                                        "restart: ftpd", "run key: ftpd", "event: ftpd", "log: ftpd"}));
}

TEST_F(Effects, AreDoneWhenTheHookSaysSo) {
    setEffectHook([](Effect, std::string_view) { return EffectDecision(); });
    EXPECT_EQ(messageOf(perform(Effect::stop, "ftpd", refused)), "Refused.");
}

TEST_F(Effects, ThatAHookRefusesHaveItsReason) {
    setEffectHook(
        [](Effect, std::string_view) { return EffectDecision(Error(ErrorNumber::firewall, "Not today.")); });

    const Result<> refusal = perform(Effect::firewall, "rules", succeed);
    ASSERT_FALSE(refusal);
    EXPECT_EQ(refusal.error().number, ErrorNumber::firewall);
    EXPECT_EQ(refusal.error().message, "Not today.");
}

TEST_F(Effects, AHookCanBePutBack) {
    setEffectHook([](Effect, std::string_view) { return EffectDecision(refused()); });
    EffectHook former = setEffectHook([](Effect, std::string_view) { return EffectDecision(); });
    EXPECT_TRUE(perform(Effect::store, "x", succeed));
    setEffectHook(std::move(former));
    EXPECT_FALSE(perform(Effect::store, "x", succeed));
}

TEST_F(Effects, HaveAHookForEachThread) {
    setEffectHook([](Effect, std::string_view) { return EffectDecision(refused()); });
    std::thread([] { EXPECT_TRUE(perform(Effect::store, "x", succeed)); }).join();
}

TEST_F(Effects, AHookMayRemoveItself) {
    setEffectHook([](Effect, std::string_view) {
        setEffectHook({});
        return EffectDecision(refused());
    });
    EXPECT_FALSE(perform(Effect::store, "x", succeed));
    EXPECT_TRUE(perform(Effect::store, "x", succeed));
}

} // namespace
} // namespace velt
