#include "standalone/events/event_bus.h"

#include <syslog.h>

#include <atomic>
#include <exception>
#include <memory>
#include <mutex>
#include <utility>

namespace velt {

namespace {

std::atomic<int> nextSubscription{1};

/// A subscription keeps a lock of its own, held during its calls: ending it waits for a running call, and a listener
/// that ends its own subscription, or causes a further message, does not wait for itself.
template<class Message> class Listeners {
public:
    int add(std::function<void(const Message&)> call) {
        auto listener = std::make_shared<Listener>();
        listener->call = std::move(call);
        const int subscription = nextSubscription++;
        const std::lock_guard lock(mutex_);
        listeners_.emplace(subscription, std::move(listener));
        return subscription;
    }

    void remove(int subscription) {
        std::shared_ptr<Listener> listener;
        {
            const std::lock_guard lock(mutex_);
            const auto found = listeners_.find(subscription);
            if (found == listeners_.end())
                return;
            listener = std::move(found->second);
            listeners_.erase(found);
        }
        const std::lock_guard lock(listener->mutex);
        listener->ended = true;
    }

    void tell(const Message& message) {
        std::map<int, std::shared_ptr<Listener>> listeners;
        {
            const std::lock_guard lock(mutex_);
            listeners = listeners_;
        }
        for (const auto& [subscription, listener] : listeners) {
            const std::lock_guard lock(listener->mutex);
            if (!listener->ended)
                call(*listener, message);
        }
    }

private:
    struct Listener {
        std::recursive_mutex mutex;
        bool ended = false;
        std::function<void(const Message&)> call;
    };

    // What happened has happened, whatever a listener makes of it.
    static void call(const Listener& listener, const Message& message) {
        try {
            listener.call(message);
        } catch (const std::exception& error) {
            syslog(LOG_WARNING, "a listener failed: %s", error.what());
        } catch (...) {
            syslog(LOG_WARNING, "a listener failed");
        }
    }

    std::mutex mutex_;
    std::map<int, std::shared_ptr<Listener>> listeners_;
};

template<class Message> Listeners<Message>& listeners() {
    static Listeners<Message> instance;
    return instance;
}

} // namespace

int subscribeEvents(std::function<void(const SystemEvent&)> listener) {
    return listeners<SystemEvent>().add(std::move(listener));
}

int subscribeLog(std::function<void(const LogEntry&)> listener) {
    return listeners<LogEntry>().add(std::move(listener));
}

void unsubscribe(int subscription) {
    listeners<SystemEvent>().remove(subscription);
    listeners<LogEntry>().remove(subscription);
}

void publish(const SystemEvent& event) {
    listeners<SystemEvent>().tell(event);
}

void publish(const LogEntry& entry) {
    listeners<LogEntry>().tell(entry);
}

} // namespace velt
