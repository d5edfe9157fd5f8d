// Running programs as a test does, to which one that cannot be started is one that failed.
#ifndef VELT_TESTS_SUPPORT_RUN_PROGRAM_H
#define VELT_TESTS_SUPPORT_RUN_PROGRAM_H

#include "standalone/process/run_program.h"

#include <utility>

namespace velt::test {

/// As velt::runProcess; -1, and the reason as its errors, when the program cannot be started or runs too
/// long.
inline ProcessResult runProcess(std::vector<std::string> arguments, std::string_view input = {},
                                std::chrono::milliseconds limit = std::chrono::seconds(10)) {
    auto result = velt::runProcess(std::move(arguments), input, limit);
    if (!result) {
        return {-1, "", result.error().message};
    }
    if (result->ranTooLong) {
        result->exitCode = -1;
    }
    return std::move(*result);
}

} // namespace velt::test

#endif
