// Logins that were refused although the password or key was right, as the daemons' parts of ours write of
// them.
#ifndef VELT_STANDALONE_SUPERVISE_REFUSED_LOGINS_H
#define VELT_STANDALONE_SUPERVISE_REFUSED_LOGINS_H

#include <chrono>
#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

struct RefusedLogin {
    std::string user;
    std::string reason; ///< a sentence
};

/// What a message of the FTP or SFTP daemon says of such a login; nothing when it is about something else.
/// Nothing that a client sends can look like it.
std::optional<RefusedLogin> refusedFtpLogin(std::string_view message);
std::optional<RefusedLogin> refusedSftpLogin(std::string_view message);

/// Lets each reason through once a minute, so that nobody who tries again and again fills a log. For one
/// thread.
class ReasonsOfLate {
public:
    using Clock = std::chrono::steady_clock;

    /// Whether the reason has not been let through for a minute.
    bool isNew(const std::string& reason, Clock::time_point now);

private:
    std::map<std::string, Clock::time_point> let_;
};

} // namespace velt

#endif
