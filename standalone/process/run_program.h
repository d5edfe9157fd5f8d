// Running a program to its end.
#ifndef VELT_STANDALONE_PROCESS_RUN_PROGRAM_H
#define VELT_STANDALONE_PROCESS_RUN_PROGRAM_H

#include "base/result.h"

#include <chrono>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

struct ProcessResult {
    int exitCode = 0;        ///< 0 to 255; 128 + n when signal n ended it; -1 when that cannot be told
    std::string output;      ///< its standard output, at most 1 MiB
    std::string errors;      ///< its standard error, at most 1 MiB; that it ran too long
    bool ranTooLong = false; ///< so that it was killed
};

/// Runs arguments[0] (an absolute path, or a name looked up in /usr/sbin:/usr/bin:/sbin:/bin) with `input` on
/// its standard input and a clean environment (PATH, LANG=C.UTF-8), and waits for its end. No shell is
/// involved. Past `limit` it is killed by its pid. Fails when it cannot be started. Thread-safe.
Result<ProcessResult> runProcess(std::vector<std::string> arguments, std::string_view input = {},
                                 std::chrono::milliseconds limit = std::chrono::seconds(10));

} // namespace velt

#endif
