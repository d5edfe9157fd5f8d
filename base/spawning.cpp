#include "base/spawning.h"

#include "base/file.h"

#include <signal.h>

namespace velt {

Spawn::Spawn() {
    ::posix_spawn_file_actions_init(&actions_);
    ::posix_spawnattr_init(&attributes_);
    sigset_t none;
    sigset_t all;
    ::sigemptyset(&none);
    ::sigfillset(&all);
    ::posix_spawnattr_setsigmask(&attributes_, &none);
    ::posix_spawnattr_setsigdefault(&attributes_, &all);
    ::posix_spawnattr_setflags(&attributes_, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
}

Spawn::~Spawn() {
    ::posix_spawnattr_destroy(&attributes_);
    ::posix_spawn_file_actions_destroy(&actions_);
}

void Spawn::pass(int descriptor, int number) {
    ::posix_spawn_file_actions_adddup2(&actions_, descriptor, number);
}

void Spawn::open(const char* path, int flags, int number) {
    ::posix_spawn_file_actions_addopen(&actions_, number, path, flags, 0);
}

void Spawn::closeFrom(int first) {
    ::posix_spawn_file_actions_addclosefrom_np(&actions_, first);
}

Result<pid_t> Spawn::start(const std::vector<std::string>& arguments) {
    std::vector<char*> pointers;
    pointers.reserve(arguments.size() + 1);
    for (const std::string& argument : arguments) {
        pointers.push_back(const_cast<char*>(argument.c_str()));
    }
    pointers.push_back(nullptr);
    char path[] = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
    char language[] = "LANG=C.UTF-8";
    char* environment[] = {path, language, nullptr};
    pid_t pid = -1;
    const int error = ::posix_spawn(&pid, pointers[0], &actions_, &attributes_, pointers.data(), environment);
    if (error != 0)
        return cannot("start", arguments[0], error);
    return pid;
}

} // namespace velt
