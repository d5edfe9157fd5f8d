// Running a helper program of a test.
#ifndef VELT_TESTS_STANDALONE_SUPPORT_PROCESS_H
#define VELT_TESTS_STANDALONE_SUPPORT_PROCESS_H

#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <string>
#include <vector>

namespace velt::test {

/// Starts a program; its pid, or -1.
inline pid_t start(const std::vector<std::string>& arguments) {
    std::vector<char*> argv;
    for (const std::string& argument : arguments)
        argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);
    pid_t pid = -1;
    return posix_spawn(&pid, argv[0], nullptr, nullptr, argv.data(), environ) == 0 ? pid : -1;
}

/// Waits for the end of a program of ours; its exit code, or -1.
inline int finish(pid_t pid) {
    int status = 0;
    if (pid <= 0 || waitpid(pid, &status, 0) != pid || !WIFEXITED(status))
        return -1;
    return WEXITSTATUS(status);
}

} // namespace velt::test

#endif
