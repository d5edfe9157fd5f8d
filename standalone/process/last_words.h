// What a daemon gave as its reason.
#ifndef VELT_STANDALONE_PROCESS_LAST_WORDS_H
#define VELT_STANDALONE_PROCESS_LAST_WORDS_H

#include "standalone/process/run_program.h"

#include <string>

namespace velt {

/// The one line of what a daemon wrote to its standard error that explains its end best, without time,
/// process, host and full stop, as plain text of at most 400 bytes; "" when it wrote nothing.
std::string lastWords(const std::string& errors);

/// These words, or "it ended with status 3" where there are none.
std::string reasonOfEnd(std::string words, int status, const std::string& program = "it");

/// Why a program failed, by what runProcess gave for it: its last words, or why it could not be started.
std::string reasonOfEnd(const Result<ProcessResult>& failed, const std::string& program = "it");

} // namespace velt

#endif
