// The host's access to the platform, over the fake platform.
#ifndef VELT_TESTS_HOST_FAKE_ACCESS_H
#define VELT_TESTS_HOST_FAKE_ACCESS_H

#include "host/platform_access.h"

#include <string>
#include <vector>

/// What a test sets up and looks at, while no request runs.
struct FakeAccess {
    velt::host::PlatformObserver observer;
    std::vector<velt::host::AdminLogEntry> log; ///< oldest first
    std::string logError;                       ///< not empty: the log cannot be read
    std::string sentence;                       ///< of the last error
    std::string holder;                         ///< of a port that is found taken
    int port = 0;
    std::string actor; ///< of the last request
    std::string address;

    static FakeAccess& instance();
};

#endif
