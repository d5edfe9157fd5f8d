// The calling thread's last error: what VLIBCErrGet and its siblings report, and a sentence for people.
#ifndef VELT_STANDALONE_CONTRACT_LAST_ERROR_H
#define VELT_STANDALONE_CONTRACT_LAST_ERROR_H

#include "standalone/core/error_number.h"

#include <string>

namespace velt {

/// Records the error for the calling thread and returns -1, so that a failing operation ends with
/// `return fail(...)`. The sentence says what failed and why, and ends with a full stop.
int fail(ErrorNumber number, std::string sentence, SourcePlace where = SourcePlace::current());

/// Records the error for the calling thread and returns -1.
int fail(const Error& error);

/// The kind of the calling thread's last error; none when there was none.
ErrorNumber lastErrorNumber();

/// The place of the calling thread's last error: the bare name of its file and the line; "" and 0 when there
/// was none.
SourcePlace lastErrorPlace();

/// The sentence of the calling thread's last error; "" when there was none.
const std::string& lastErrorSentence();

/// Forgets the calling thread's last error.
void clearLastError();

} // namespace velt

#endif
