// A program that runs beside the test and tells by lines on its standard output how far it is.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_RUNNING_PROGRAM_H
#define VELT_TESTS_SYSTEM_SUPPORT_RUNNING_PROGRAM_H

#include "base/unique_fd.h"

#include <sys/types.h>

#include <chrono>
#include <string>
#include <vector>

namespace velt::test {

class RunningProgram {
public:
    RunningProgram() = default;
    /// Kills the program if it still runs.
    ~RunningProgram();
    RunningProgram(RunningProgram&& other) noexcept;
    RunningProgram& operator=(RunningProgram&& other) noexcept;
    RunningProgram(const RunningProgram&) = delete;
    RunningProgram& operator=(const RunningProgram&) = delete;

    /// Starts arguments[0], an absolute path, with these variables alone; its standard error goes to the end
    /// of the file.
    static RunningProgram start(const std::vector<std::string>& arguments,
                                const std::vector<std::string>& environment, const std::string& errorFile);

    bool running() const { return pid_ > 0; }
    pid_t pid() const { return pid_; }

    /// What came on its standard output up to the text and with it; all that came when the text does not come
    /// within ten seconds.
    std::string readUntil(const std::string& text);

    void signal(int number) const;

    /// Waits for its end: the exit code, or 128 + n when signal n ended it; -1 and a kill after the limit.
    int wait(std::chrono::milliseconds limit = std::chrono::seconds(20));

private:
    pid_t pid_ = -1;
    UniqueFd output_;
    std::string pending_;
};

} // namespace velt::test

#endif
