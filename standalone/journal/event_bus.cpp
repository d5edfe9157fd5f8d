#include "standalone/journal/event_bus.h"

#include "standalone/journal/subscriptions.h"

#include <syslog.h>

#include <atomic>
#include <exception>
#include <memory>
#include <mutex>
#include <utility>

namespace velt {

namespace {

std::atomic<Subscription> nextSubscription{1};

/// A subscription keeps a lock of its own, held during its calls: ending it waits for a running call, and a
/// subscriber that ends its own subscription, or causes a further message, does not wait for itself.
template<class Message> class Subscribers {
public:
    Subscription add(std::function<void(const Message&)> call) {
        auto subscriber = std::make_shared<Subscriber>();
        subscriber->call = std::move(call);
        const Subscription subscription = nextSubscription++;
        const std::lock_guard lock(mutex_);
        subscribers_.emplace(subscription, std::move(subscriber));
        return subscription;
    }

    void remove(Subscription subscription) {
        std::shared_ptr<Subscriber> subscriber;
        {
            const std::lock_guard lock(mutex_);
            const auto found = subscribers_.find(subscription);
            if (found == subscribers_.end()) {
                return;
            }
            subscriber = std::move(found->second);
            subscribers_.erase(found);
        }
        const std::lock_guard lock(subscriber->mutex);
        subscriber->ended = true;
    }

    void tell(const Message& message) {
        std::map<Subscription, std::shared_ptr<Subscriber>> subscribers;
        {
            const std::lock_guard lock(mutex_);
            subscribers = subscribers_;
        }
        for (const auto& [subscription, subscriber] : subscribers) {
            const std::lock_guard lock(subscriber->mutex);
            if (!subscriber->ended) {
                call(*subscriber, message);
            }
        }
    }

private:
    struct Subscriber {
        std::recursive_mutex mutex;
        bool ended = false;
        std::function<void(const Message&)> call;
    };

    // What happened has happened, whatever a subscriber makes of it.
    static void call(const Subscriber& subscriber, const Message& message) {
        try {
            subscriber.call(message);
        } catch (const std::exception& error) {
            syslog(LOG_WARNING, "a subscriber failed: %s", error.what());
        } catch (...) {
            syslog(LOG_WARNING, "a subscriber failed");
        }
    }

    std::mutex mutex_;
    std::map<Subscription, std::shared_ptr<Subscriber>> subscribers_;
};

template<class Message> Subscribers<Message>& subscribers() {
    static Subscribers<Message> instance;
    return instance;
}

} // namespace

Subscription subscribeEvents(EventSubscriber subscriber) {
    return subscribers<SystemEvent>().add(std::move(subscriber));
}

Subscription subscribeLog(LogSubscriber subscriber) {
    return subscribers<LogEntry>().add(std::move(subscriber));
}

void unsubscribe(Subscription subscription) {
    subscribers<SystemEvent>().remove(subscription);
    subscribers<LogEntry>().remove(subscription);
}

void publish(const SystemEvent& event) {
    subscribers<SystemEvent>().tell(event);
}

void publish(const LogEntry& entry) {
    subscribers<LogEntry>().tell(entry);
}

} // namespace velt
