// On whose behalf the calling thread works, as setRequestActor told.
#ifndef VELT_STANDALONE_ADMINLOG_REQUEST_ACTOR_H
#define VELT_STANDALONE_ADMINLOG_REQUEST_ACTOR_H

#include <string>

namespace velt {

struct RequestActor {
    std::string actor;
    std::string address;
};

const RequestActor& requestActor();

} // namespace velt

#endif
