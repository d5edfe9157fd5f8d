#include "standalone/core/effects.h"

#include "platform/core.h"
#include "standalone/core/last_error.h"

#include <gtest/gtest.h>

#include <thread>
#include <vector>

namespace velt {
namespace {

class Effects : public ::testing::Test {
protected:
    ~Effects() override { setEffectHook({}); }
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
