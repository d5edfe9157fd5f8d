#include "standalone/journal/request_actor.h"

namespace velt {

namespace {

RequestActor& threadActor() {
    thread_local RequestActor actor;
    return actor;
}

} // namespace

void setRequestActor(const std::string& actor, const std::string& address) {
    threadActor() = {actor, address};
}

const RequestActor& requestActor() {
    return threadActor();
}

} // namespace velt
