#include "standalone/daemons/sshd/sshd_configuration.h"

namespace velt {
namespace {

// Approved kinds alone, of keys as well: Ed25519 and X25519 are none in the modules that have been validated.
constexpr const char* fipsAlgorithms =
    "Ciphers aes256-gcm@openssh.com,aes128-gcm@openssh.com,aes256-ctr,aes192-ctr,aes128-ctr\n"
    "MACs hmac-sha2-512-etm@openssh.com,hmac-sha2-256-etm@openssh.com,hmac-sha2-512,hmac-sha2-256\n"
    "KexAlgorithms ecdh-sha2-nistp384,ecdh-sha2-nistp521,ecdh-sha2-nistp256,"
    "diffie-hellman-group16-sha512,diffie-hellman-group18-sha512,diffie-hellman-group14-sha256\n"
    "HostKeyAlgorithms rsa-sha2-512,rsa-sha2-256\n"
    "PubkeyAcceptedAlgorithms ecdsa-sha2-nistp384-cert-v01@openssh.com,"
    "ecdsa-sha2-nistp521-cert-v01@openssh.com,ecdsa-sha2-nistp256-cert-v01@openssh.com,"
    "rsa-sha2-512-cert-v01@openssh.com,rsa-sha2-256-cert-v01@openssh.com,"
    "ecdsa-sha2-nistp384,ecdsa-sha2-nistp521,ecdsa-sha2-nistp256,rsa-sha2-512,rsa-sha2-256\n"
    "CASignatureAlgorithms ecdsa-sha2-nistp384,ecdsa-sha2-nistp521,ecdsa-sha2-nistp256,"
    "rsa-sha2-512,rsa-sha2-256\n"
    "RequiredRSASize 2048\n";

/// Without the mask in the command the daemon has the one that it was started with.
std::string transferCommand(const SharedSettings& shared, const SshdPlaces& places) {
    // A path that is the home's outside means nothing, or another folder, in a session's root directory.
    const std::string start = places.sessionRoot.empty() ? "" : " -d /";
    return "internal-sftp" + start + (shared.umask ? " -u 022" : " -u 000");
}

} // namespace

std::string renderSshd(const SftpSettings& settings, const SharedSettings& shared, const SshdPlaces& places) {
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
    text += shared.fipsOnly ? fipsAlgorithms : "";
    text += places.privileged ? "UsePAM yes\n" : "UsePAM no\n";
    // A key that is restricted to a command would get file transfer in its place, and with that, write itself
    // a better line. So the daemon does not read the users' files itself. It starts no program of a folder
    // that others than root may change, as where this one is built; env is the system's own.
    text += "AuthorizedKeysFile none\n"
            "AuthorizedKeysCommand /usr/bin/env \"" +
            places.keysProgram.string() + "\" %u \"" + places.state.string() + "\"\n" +
            "AuthorizedKeysCommandUser " + places.ownUser + "\n";
    if (!places.sessionRoot.empty()) {
        text += "ChrootDirectory \"" + places.sessionRoot.string() + "\"\n";
    }
    // A session may transfer files and do nothing else.
    const std::string command = transferCommand(shared, places);
    text += "DisableForwarding yes\n"
            "PermitTTY no\n"
            "PermitUserRC no\n"
            "PermitUserEnvironment no\n"
            "Subsystem sftp " +
            command + "\nForceCommand " + command + "\n";
    return text;
}

} // namespace velt
