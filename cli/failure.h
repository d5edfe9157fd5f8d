// Why a command failed, and how veltctl reports that to the program that started it.
#ifndef VELT_CLI_FAILURE_H
#define VELT_CLI_FAILURE_H

#include <iosfwd>
#include <stdexcept>
#include <string>
#include <vector>

namespace velt::cli {

/// The exit status.
enum class ExitCode {
    done = 0,
    local = 1,       ///< a file or the output could not be read or written here
    usage = 2,       ///< the command line is wrong; nothing was asked of the server
    refused = 3,     ///< the input was refused
    conflict = 4,    ///< the input conflicts with something else: a port, a share
    platform = 5,    ///< the server failed to carry it out
    access = 6,      ///< the server cannot be reached, or does not allow this user or token to do it
    wouldChange = 7, ///< no failure: a dry run found something to change, or diff a difference
    unhealthy = 8,   ///< done, and the server has errors or warnings to tell of
};

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
