#include "standalone/daemons/sshd/sshd_configuration.h"

namespace velt {

std::string renderSshd(const SftpSettings& settings, const SshdPlaces& places) {
    std::string text = "# Made from the stored settings; changes here are lost.\n"
                       "Port " +
                       std::to_string(settings.port) + "\n";
    text += places.loopbackOnly ? "ListenAddress 127.0.0.1\n" : "";
    for (const auto& key : places.hostKeys) {
        text += "HostKey \"" + key.string() + "\"\n";
    }
    text += "PidFile none\n"
            "PermitRootLogin no\n"
            // Many may log in at once. Without a login, one address has few places, and not for long.
            "LoginGraceTime 30\n"
            "MaxStartups 200:30:1000\n"
            "PerSourceMaxStartups 20\n"
            "PerSourceNetBlockSize 32:64\n"
            "PrintMotd no\n"
            "UseDNS no\n";
    text += places.privileged ? "UsePAM yes\n" : "UsePAM no\n";
    // A session may transfer files and do nothing else.
    text += "DisableForwarding yes\n"
            "PermitTTY no\n"
            "PermitUserRC no\n"
            "PermitUserEnvironment no\n"
            "Subsystem sftp internal-sftp\n"
            "ForceCommand internal-sftp\n";
    return text;
}

} // namespace velt
