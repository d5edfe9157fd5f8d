// Service control.

#include "platform/service.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/text.h"

using fake::arguments;
using fake::Platform;

namespace {

constexpr int runKeyStarted = 1;
constexpr int runKeyStopped = 2;

// Whether a service is enabled is the stored settings' business: nothing here changes that.
void setRunning(const std::string& service, bool running) {
    auto& platform = Platform::instance();
    platform.paused.erase(service);
    if (running) {
        platform.running.insert(service);
    } else {
        platform.running.erase(service);
    }
}

void setAlive(const std::string& service, bool alive) {
    auto& platform = Platform::instance();
    setRunning(service, alive);
    platform.runKeys[service] = alive ? runKeyStarted : runKeyStopped;
    if (service == "sftp") {
        platform.sftpAlive = alive ? 1 : 0;
    }
}

} // namespace

int VLIBServiceIsEnabled(const char* service) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VLIBServiceIsEnabled", arguments(service))) {
        return *failure;
    }
    const auto entry = platform.services.find(service);
    return entry == platform.services.end() ? 0 : entry->second;
}

int VLIBServicectlStart(const char* service, int flags) {
    if (const auto failure = Platform::instance().enter("VLIBServicectlStart", arguments(service, flags))) {
        return *failure;
    }
    setRunning(service, true);
    return 0;
}

int VLIBServicectlStop(const char* service, int flags) {
    if (const auto failure = Platform::instance().enter("VLIBServicectlStop", arguments(service, flags))) {
        return *failure;
    }
    setRunning(service, false);
    return 0;
}

int VLIBServicecfgRunKeySet(const char* service, int value) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VLIBServicecfgRunKeySet", arguments(service, value))) {
        return *failure;
    }
    platform.runKeys[service] = value;
    return 0;
}

int VLIBServiceStart(const char* service, int flags) {
    if (const auto failure = Platform::instance().enter("VLIBServiceStart", arguments(service, flags))) {
        return *failure;
    }
    setAlive(service, true);
    return 0;
}

int VLIBServiceStop(const char* service, int flags) {
    if (const auto failure = Platform::instance().enter("VLIBServiceStop", arguments(service, flags))) {
        return *failure;
    }
    setAlive(service, false);
    return 0;
}

int VLIBServicePause(const char* service) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VLIBServicePause", arguments(service))) {
        return *failure;
    }
    platform.paused.insert(service);
    return 0;
}

int VLIBServiceResume(const char* service) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VLIBServiceResume", arguments(service))) {
        return *failure;
    }
    platform.paused.erase(service);
    return 0;
}
