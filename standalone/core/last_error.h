// The calling thread's last error: what VLIBCErrGet and its siblings report, and a sentence for people.
#ifndef VELT_STANDALONE_CORE_LAST_ERROR_H
#define VELT_STANDALONE_CORE_LAST_ERROR_H

#include <memory>
#include <string>

namespace velt {

/// Kinds of errors, as VLIBCErrGet reports them.
enum class ErrorNumber {
    none = 0,
    invalid = 0x0100,   ///< a value that a daemon or the store would refuse
    notFound = 0x0200,  ///< no such share, user, group, rule or service
    store = 0x0300,     ///< a file of the settings store cannot be read or written
    damaged = 0x0301,   ///< a file of the settings store does not have its form
    daemon = 0x0400,    ///< a daemon does not start, stop or take its configuration
    portTaken = 0x0401, ///< a port is in use by another program
    firewall = 0x0500,  ///< the firewall does not take the rules
    log = 0x0600,       ///< the administrator log cannot be written
    event = 0x0700,     ///< a system event cannot be announced
    outOfMemory = 0x0800,
};

/// A place in the source. (std::source_location is not there with every compiler that builds this.)
struct SourcePlace {
    const char* file = "";
    int line = 0;

    /// The place of the call; as a default argument, that of the caller's call.
    static constexpr SourcePlace current(const char* file = __builtin_FILE(), int line = __builtin_LINE()) {
        return {file, line};
    }
};

/// Records the error for the calling thread and returns -1, so that a failing operation ends with
/// `return fail(...)`. The sentence says what failed and why, and ends with a full stop.
int fail(ErrorNumber number, std::string sentence, SourcePlace where = SourcePlace::current());

/// The sentence of the calling thread's last error; "" when there was none.
const std::string& lastErrorSentence();

/// Forgets the calling thread's last error.
void clearLastError();

/// Puts the calling thread's last error back as it was at the construction, when it goes: for work whose
/// failures are not those of the operation that it belongs to. Stays on its thread.
class LastErrorKept {
public:
    LastErrorKept();
    ~LastErrorKept();
    LastErrorKept(const LastErrorKept&) = delete;
    LastErrorKept& operator=(const LastErrorKept&) = delete;

private:
    struct Kept;
    std::unique_ptr<Kept> kept_;
};

} // namespace velt

#endif
