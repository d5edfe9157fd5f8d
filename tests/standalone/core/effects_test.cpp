#include "standalone/core/effects.h"

#include "platform/core.h"
#include "standalone/core/last_error.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <thread>
#include <vector>

namespace velt {
namespace {

class Effects : public ::testing::Test {
protected:
    ~Effects() override {
        setEffectHook({});
        setEffectReport({});
    }
};

TEST_F(Effects, AreDoneWithoutAHook) {
    EXPECT_EQ(perform(Effect::store, "ftp settings", [] { return 5; }), 5);
}

TEST_F(Effects, CanBeListedInsteadOfDone) {
    std::vector<std::string> listed;
    setEffectHook([&](Effect effect, std::string_view subject) {
        listed.push_back(std::string(effectName(effect)) + ": " + std::string(subject));
        return EffectDecision{false, 0};
    });
    bool done = false;
    const auto act = [&] {
        done = true;
        return 0;
    };

    for (const Effect effect : {Effect::store, Effect::firewall, Effect::stop, Effect::start, Effect::runKey,
                                Effect::event, Effect::logEntry})
        EXPECT_EQ(perform(effect, "ftpd", act), 0);

    EXPECT_FALSE(done);
    EXPECT_EQ(listed, (std::vector<std::string>{"store: ftpd", "firewall: ftpd", "stop: ftpd", "start: ftpd",
                                                "run key: ftpd", "event: ftpd", "log: ftpd"}));
}

TEST_F(Effects, AreDoneWhenTheHookSaysSo) {
    setEffectHook([](Effect, std::string_view) { return EffectDecision{}; });
    EXPECT_EQ(perform(Effect::stop, "ftpd", [] { return 3; }), 3);
}

TEST_F(Effects, ThatAHookRefusesHaveAReason) {
    setEffectHook([](Effect, std::string_view) { return EffectDecision{false, -1}; });

    EXPECT_EQ(perform(Effect::firewall, "rules", [] { return 0; }), -1);
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::firewall));
    EXPECT_EQ(lastErrorSentence(), "The effect \"firewall\" on rules was refused.");
}

TEST_F(Effects, AreReportedAfterTheyWereDone) {
    std::vector<std::string> reported;
    std::chrono::nanoseconds took{};
    setEffectReport([&](Effect effect, std::string_view subject, int result, std::chrono::nanoseconds time) {
        reported.push_back(std::string(effectName(effect)) + " " + std::string(subject) + " " +
                           std::to_string(result));
        took = time;
    });
    const auto slow = [&] {
        EXPECT_EQ(reported.size(), 0U) << "not before it is done";
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
        return 7;
    };
    EXPECT_EQ(perform(Effect::start, "ftpd", slow), 7);
    EXPECT_GE(took, std::chrono::milliseconds(20));
    EXPECT_EQ(
        perform(Effect::start, "outer", [] { return perform(Effect::store, "inner", [] { return 0; }) - 1; }),
        -1);
    EXPECT_THROW(perform(Effect::stop, "ftpd", []() -> int { throw std::runtime_error("x"); }),
                 std::runtime_error);
    setEffectHook([](Effect, std::string_view) { return EffectDecision{false, 0}; });
    EXPECT_EQ(perform(Effect::store, "undone", [] { return 0; }), 0);
    EXPECT_EQ(reported,
              (std::vector<std::string>{"start ftpd 7", "store inner 0", "start outer -1", "stop ftpd -1"}));
}

TEST_F(Effects, HaveAHookForEachThread) {
    setEffectHook([](Effect, std::string_view) { return EffectDecision{false, 1}; });
    std::thread([] { EXPECT_EQ(perform(Effect::store, "x", [] { return 0; }), 0); }).join();
}

TEST_F(Effects, AHookMayRemoveItself) {
    setEffectHook([](Effect, std::string_view) {
        setEffectHook({});
        return EffectDecision{false, 1};
    });
    EXPECT_EQ(perform(Effect::store, "x", [] { return 0; }), 1);
    EXPECT_EQ(perform(Effect::store, "x", [] { return 0; }), 0);
}

} // namespace
} // namespace velt
