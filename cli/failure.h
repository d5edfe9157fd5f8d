// Why a command failed.
#ifndef VELT_CLI_FAILURE_H
#define VELT_CLI_FAILURE_H

#include "cli/exit_code.h"

#include <iosfwd>
#include <stdexcept>
#include <string>
#include <vector>

namespace velt::cli {

class Failure : public std::runtime_error {
public:
    /// `message` is one sentence, without a program's name; `notes` are lines of explanation below it; `hint`
    /// says what to do next and may be empty.
    Failure(ExitCode code, const std::string& message, std::string hint = {},
            std::vector<std::string> notes = {})
        : std::runtime_error(message), code_(code), hint_(std::move(hint)), notes_(std::move(notes)) {}

    /// Adds a line of explanation below the message.
    void note(std::string line) { notes_.push_back(std::move(line)); }

    ExitCode code() const { return code_; }
    const std::string& hint() const { return hint_; }
    const std::vector<std::string>& notes() const { return notes_; }

private:
    ExitCode code_;
    std::string hint_;
    std::vector<std::string> notes_;
};

/// Writes "veltctl: message", the notes, and what to do next.
void writeFailure(std::ostream& out, const Failure& failure);

} // namespace velt::cli

#endif
