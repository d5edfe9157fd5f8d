// What is wrong with this server.
#ifndef VELT_STANDALONE_HEALTH_FINDING_H
#define VELT_STANDALONE_HEALTH_FINDING_H

#include <string>
#include <string_view>
#include <vector>

namespace velt {

enum class Severity {
    notice,  ///< worth knowing
    warning, ///< somebody is affected, or everybody will be soon
    error,   ///< what is switched on does not work
};

/// "notice", "warning", "error".
std::string_view severityName(Severity severity);

struct Finding {
    std::string id; ///< stable, for programs: "certificate-key-mismatch"
    Severity severity = Severity::notice;
    std::string subject;  ///< what it is about: "ftp", "sftp", "settings", "firewall", "shares", "chroot",
                          ///< "keys", "log", "sessions", "host"
    std::string sentence; ///< for people
    std::string mend;     ///< the command that mends it, or what to do before that command

    bool operator==(const Finding&) const = default;
};

using Findings = std::vector<Finding>;

} // namespace velt

#endif
