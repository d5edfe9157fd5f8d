// On whose behalf the calling thread works.
#ifndef VELT_STANDALONE_ADMINLOG_REQUEST_ACTOR_H
#define VELT_STANDALONE_ADMINLOG_REQUEST_ACTOR_H

#include <string>

namespace velt {

struct RequestActor {
    std::string actor;
    std::string address;
};

/// Says who asked for what the calling thread does from now on, and from where; "" and "" when the request is done.
void setRequestActor(std::string actor, std::string address);

const RequestActor& requestActor();

} // namespace velt

#endif
