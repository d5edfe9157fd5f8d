// On whose behalf the calling thread works, as setRequestActor told.
#ifndef VELT_STANDALONE_JOURNAL_REQUEST_ACTOR_H
#define VELT_STANDALONE_JOURNAL_REQUEST_ACTOR_H

#include <string>

namespace velt {

struct RequestActor {
    std::string actor;
    std::string address;
};

/// Names who makes the request that this thread serves now, and the address it came from, for the entries of
/// the administrator log. Holds for this thread until the next call; two empty texts: the system itself.
void setRequestActor(const std::string& actor, const std::string& address);

/// The actor of the request that this thread serves.
const RequestActor& requestActor();

} // namespace velt

#endif
