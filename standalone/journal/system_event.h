// What happened on the server, for programs that follow it.
#ifndef VELT_STANDALONE_JOURNAL_SYSTEM_EVENT_H
#define VELT_STANDALONE_JOURNAL_SYSTEM_EVENT_H

#include <chrono>
#include <map>
#include <string>

namespace velt {

/// A system event, as it was announced.
struct SystemEvent {
    std::chrono::system_clock::time_point time;
    std::string name; ///< "velt.service.action"
    std::map<std::string, std::string> parameters;
    std::string actor; ///< "" for the system itself
    std::string address;
};

} // namespace velt

#endif
