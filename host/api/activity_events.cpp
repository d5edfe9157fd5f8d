#include "host/api/activity_events.h"

#include "host/api/operation_text.h"

#include <string>
#include <string_view>

namespace velt::host {

namespace {

constexpr const char* ofSession = "session";
constexpr const char* ofTransfer = "transfer";
constexpr const char* ofOthers = "operation";

const char* kindOf(Operation operation) {
    switch (operation) {
    case Operation::loginRefused:
    case Operation::sessionOpened:
    case Operation::sessionClosed:
        return ofSession;
    case Operation::upload:
    case Operation::download:
        return ofTransfer;
    default:
        return ofOthers;
    }
}

/// What happened to the session or transfer.
std::string_view actionOf(const Activity& activity) {
    switch (activity.kind) {
    case ActivityKind::transferStarted:
        return "started";
    case ActivityKind::transferProgress:
        return "progress";
    default:
        break;
    }
    switch (activity.record.operation) {
    case Operation::loginRefused:
        return "refused";
    case Operation::sessionOpened:
        return "opened";
    case Operation::sessionClosed:
        return "closed";
    default:
        return operationResultName(activity.record.result);
    }
}

void publish(EventHub& hub, const Activity& activity) {
    const char* const kind = kindOf(activity.record.operation);
    // Nearly always nobody listens, and there may be thousands in a second.
    if (!hub.isWanted(kind)) {
        return;
    }
    Json::Value data = toObject(activity.record);
    if (kind != ofOthers) {
        data["action"] = std::string(actionOf(activity));
    }
    if (activity.kind != ActivityKind::operation) {
        data.removeMember("result"); // there is none yet
        data["rate"] = Json::UInt64{activity.rate};
    }
    hub.publish(kind, data);
}

} // namespace

ActivityEvents::ActivityEvents(EventHub& hub)
    : subscription_(subscribeActivity([&hub](const Activity& activity) { publish(hub, activity); })) {}

ActivityEvents::~ActivityEvents() {
    unsubscribeActivity(subscription_);
}

} // namespace velt::host
