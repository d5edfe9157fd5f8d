// What posix_spawn(3) is handed for each program that the platform starts.
#ifndef VELT_BASE_SPAWN_SETUP_H
#define VELT_BASE_SPAWN_SETUP_H

#include <signal.h>
#include <spawn.h>

namespace velt {

/// Attributes under which the program begins with no signal blocked or ignored: what this process has chosen
/// for itself (an ignored SIGPIPE, a blocked SIGTERM) is none of its business. No file actions yet; the owner
/// adds them.
class SpawnSetup {
public:
    SpawnSetup() {
        ::posix_spawn_file_actions_init(&actions);
        ::posix_spawnattr_init(&attributes);
        sigset_t none;
        sigset_t all;
        ::sigemptyset(&none);
        ::sigfillset(&all);
        ::posix_spawnattr_setsigmask(&attributes, &none);
        ::posix_spawnattr_setsigdefault(&attributes, &all);
        ::posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
    }
    ~SpawnSetup() {
        ::posix_spawnattr_destroy(&attributes);
        ::posix_spawn_file_actions_destroy(&actions);
    }
    SpawnSetup(const SpawnSetup&) = delete;
    SpawnSetup& operator=(const SpawnSetup&) = delete;

    posix_spawn_file_actions_t actions{};
    posix_spawnattr_t attributes{};
};

} // namespace velt

#endif
