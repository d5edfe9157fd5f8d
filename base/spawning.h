// Starting programs.
#ifndef VELT_BASE_SPAWNING_H
#define VELT_BASE_SPAWNING_H

#include "base/result.h"

#include <spawn.h>
#include <sys/types.h>

#include <string>
#include <vector>

namespace velt {

/// A program that is about to be started. It begins with no signal blocked or ignored, since what this
/// process has chosen for itself (an ignored SIGPIPE, a blocked SIGTERM) is none of its business, and with
/// an environment of PATH and LANG=C.UTF-8 alone.
class Spawn {
public:
    Spawn();
    ~Spawn();
    Spawn(const Spawn&) = delete;
    Spawn& operator=(const Spawn&) = delete;

    /// Has the program find this process's `descriptor` as `number`.
    void pass(int descriptor, int number);

    /// Has the program find the opened file as `number`.
    void open(const char* path, int flags, int number);

    /// Closes the descriptors from `first` on, which otherwise stay open unless they are closed on exec.
    void closeFrom(int first);

    /// Starts the program arguments[0], a path. To be called once, after what it is to find, in this order.
    Result<pid_t> start(const std::vector<std::string>& arguments);

private:
    posix_spawn_file_actions_t actions_{};
    posix_spawnattr_t attributes_{};
};

} // namespace velt

#endif
