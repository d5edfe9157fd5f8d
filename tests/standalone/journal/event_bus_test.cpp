#include "standalone/journal/event_bus.h"
#include "standalone/journal/subscriptions.h"

#include <gtest/gtest.h>

#include <atomic>
#include <stdexcept>
#include <thread>
#include <vector>

namespace velt {
namespace {

SystemEvent eventCalled(const std::string& name) {
    SystemEvent event;
    event.name = name;
    return event;
}

using Names = std::vector<std::string>;

TEST(EventBus, TellsEverySubscriberInTheOrderOfSubscription) {
    Names heard;
    const Subscription first =
        subscribeEvents([&](const SystemEvent& event) { heard.push_back("1 " + event.name); });
    const Subscription second =
        subscribeEvents([&](const SystemEvent& event) { heard.push_back("2 " + event.name); });
    EXPECT_NE(first, second);
    publish(eventCalled("a"));
    unsubscribe(first);
    publish(eventCalled("b"));
    unsubscribe(second);
    publish(eventCalled("c"));
    EXPECT_EQ(heard, (Names{"1 a", "2 a", "2 b"}));
}

TEST(EventBus, KeepsEventsAndLogEntriesApart) {
    int events = 0;
    int entries = 0;
    const Subscription first = subscribeEvents([&](const SystemEvent&) { ++events; });
    const Subscription second = subscribeLog([&](const LogEntry&) { ++entries; });
    publish(eventCalled("a"));
    publish(LogEntry{});
    publish(LogEntry{});
    unsubscribe(first);
    unsubscribe(second);
    EXPECT_EQ(events, 1);
    EXPECT_EQ(entries, 2);
}

TEST(EventBus, ASubscriberThatThrowsHidesNothingFromTheNext) {
    int heard = 0;
    const Subscription first = subscribeEvents([](const SystemEvent&) { throw std::runtime_error("no"); });
    const Subscription second = subscribeEvents([&](const SystemEvent&) { ++heard; });
    EXPECT_NO_THROW(publish(eventCalled("a")));
    unsubscribe(first);
    unsubscribe(second);
    EXPECT_EQ(heard, 1);
}

TEST(EventBus, ASubscriptionThatEndsMeanwhileHearsNothing) {
    int heard = 0;
    Subscription second = 0;
    const Subscription first = subscribeEvents([&](const SystemEvent&) { unsubscribe(second); });
    second = subscribeEvents([&](const SystemEvent&) { ++heard; });
    publish(eventCalled("a"));
    unsubscribe(first);
    EXPECT_EQ(heard, 0);
}

TEST(EventBus, ASubscriberMayEndItsOwnSubscription) {
    int heard = 0;
    Subscription subscription = 0;
    subscription = subscribeEvents([&](const SystemEvent&) {
        ++heard;
        unsubscribe(subscription);
    });
    publish(eventCalled("a"));
    publish(eventCalled("b"));
    EXPECT_EQ(heard, 1);
}

TEST(EventBus, ASubscriberMayCauseAFurtherEvent) {
    Names heard;
    const Subscription subscription = subscribeEvents([&](const SystemEvent& event) {
        heard.push_back(event.name);
        if (event.name == "a") {
            publish(eventCalled("b"));
        }
    });
    publish(eventCalled("a"));
    unsubscribe(subscription);
    EXPECT_EQ(heard, (Names{"a", "b"}));
}

TEST(EventBus, IgnoresUnknownSubscriptions) {
    unsubscribe(0);
    unsubscribe(1'000'000);
}

TEST(EventBus, NoCallRunsOnceASubscriptionHasEnded) {
    std::atomic<bool> done = false;
    std::thread announcer([&done] {
        while (!done) {
            publish(eventCalled("a"));
        }
    });
    std::atomic<int> late = 0;
    for (int round = 0; round < 300; ++round) {
        std::atomic<bool> ended = false;
        const Subscription subscription = subscribeEvents([&](const SystemEvent&) {
            if (ended) {
                ++late;
            }
        });
        std::this_thread::yield();
        unsubscribe(subscription);
        ended = true;
    }
    done = true;
    announcer.join();
    EXPECT_EQ(late, 0);
}

} // namespace
} // namespace velt
