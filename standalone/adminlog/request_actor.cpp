#include "standalone/adminlog/request_actor.h"

#include <utility>

namespace velt {

namespace {

RequestActor& threadActor() {
    thread_local RequestActor actor;
    return actor;
}

} // namespace

void setRequestActor(std::string actor, std::string address) {
    threadActor() = {std::move(actor), std::move(address)};
}

const RequestActor& requestActor() {
    return threadActor();
}

} // namespace velt
