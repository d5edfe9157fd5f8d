// What a daemon gave as its reason.
#ifndef VELT_STANDALONE_PROCESS_LAST_WORDS_H
#define VELT_STANDALONE_PROCESS_LAST_WORDS_H

#include <string>

namespace velt {

/// The one line of what a daemon wrote to its standard error that explains its end best, without time,
/// process, host and full stop; "" when it wrote nothing.
std::string lastWords(const std::string& errors);

} // namespace velt

#endif
