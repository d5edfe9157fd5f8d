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
    // A key that is restricted to a command would get file transfer in its place, and with that, write itself
    // a better line. So the daemon does not read the users' files itself. It starts no program of a folder
    // that others than root may change, as where this one is built; env is the system's own.
    text += "AuthorizedKeysFile none\n"
            "AuthorizedKeysCommand /usr/bin/env \"" +
            places.keysProgram.string() + "\" %u\n" + "AuthorizedKeysCommandUser " + places.ownUser + "\n";
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
