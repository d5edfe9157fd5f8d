// The host's access to the platform, over the fake platform.
#ifndef VELT_TESTS_HOST_FAKE_ACCESS_H
#define VELT_TESTS_HOST_FAKE_ACCESS_H

#include "host/platform_access.h"

#include <cstdint>
#include <map>
#include <string>
#include <vector>

/// What a test sets up and looks at, while no request runs.
struct FakeAccess {
    velt::host::PlatformObserver observer;
    std::vector<velt::host::AdminLogEntry> log; ///< oldest first
    int largestLimit = 0;                       ///< that the log was asked for
    std::string logError;                       ///< not empty: the log cannot be read
    std::string sentence;                       ///< of the last error
    std::string holder;                         ///< of a port that is found taken
    int port = 0;
    bool storeFailed = false;
    std::vector<velt::host::ServiceDown> down; ///< services that are switched on and do not run
    bool startHelps = false;                   ///< and run once they are started
    int starts = 0;                            ///< how often the host started what is switched on
    std::map<std::string, std::uint64_t> restarts;
    std::string actor; ///< of the last request
    std::string address;

    static FakeAccess& instance();
};

#endif
