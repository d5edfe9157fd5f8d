// How veltctl reports its result to the program that started it.
#ifndef VELT_CLI_EXIT_CODE_H
#define VELT_CLI_EXIT_CODE_H

namespace velt::cli {

enum class ExitCode {
    done = 0,
    local = 1,    ///< a file or the output could not be read or written here
    usage = 2,    ///< the command line is wrong; nothing was asked of the server
    refused = 3,  ///< the input was refused
    conflict = 4, ///< the input conflicts with something else: a port, a share
    platform = 5, ///< the server failed to carry it out
    access = 6,   ///< the server cannot be reached, or does not allow this user or token to do it
};

} // namespace velt::cli

#endif
