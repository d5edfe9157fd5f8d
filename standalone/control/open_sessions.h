// Who is logged in now, over all protocols.
#ifndef VELT_STANDALONE_CONTROL_OPEN_SESSIONS_H
#define VELT_STANDALONE_CONTROL_OPEN_SESSIONS_H

#include "base/result.h"
#include "standalone/activity/operation_record.h"

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace velt {

struct RunningTransfer {
    bool upload = false; ///< else a download
    std::string path;    ///< as the session sees it; a very long one is cut
    std::uint64_t octets = 0;
    std::chrono::system_clock::time_point since;
};

/// Texts are UTF-8; octets of names that are not are shown as "%XX".
struct OpenSession {
    std::string id; ///< names this session for ever
    SessionProtocol protocol = SessionProtocol::ftp;
    std::string security; ///< TLS or SSH version and cipher: "TLSv1.3 TLS_AES_256_GCM_SHA384"; "" for none
    std::string user;     ///< the name of the login; of guests what they called themselves
    std::string account;  ///< the Unix name whose rights count
    std::string address;
    std::chrono::system_clock::time_point since;     ///< its login
    std::chrono::system_clock::time_point idleSince; ///< its last activity
    bool busy = false;                               ///< at a command, or a transfer runs
    std::string command;                             ///< the last one, without its parameters
    std::string path;                                ///< of that command, where it has one
    std::optional<RunningTransfer> transfer;
    std::uint64_t octetsIn = 0;  ///< uploaded so far,
    std::uint64_t octetsOut = 0; ///< and downloaded, the running transfer included
    std::uint64_t rate = 0;      ///< of the running transfer, octets in the last second
    bool current = true;         ///< whether it runs with the settings in force, not with former ones
};

/// Those that are logged in, oldest first. Thread-safe.
Result<std::vector<OpenSession>> openSessions();

/// On whose behalf a session is ended, and why. Both are recorded.
struct SessionEnd {
    std::string by;     ///< "root" or the name of a token
    std::string reason; ///< what the administrator said, may be ""
};

/// Ends the session, all of its processes, within a second. False when there is none of this id (any more).
/// Thread-safe.
Result<bool> endSession(const std::string& id, const SessionEnd& end);

} // namespace velt

#endif
