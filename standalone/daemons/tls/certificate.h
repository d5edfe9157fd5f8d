// The certificate of the FTPS service.
#ifndef VELT_STANDALONE_DAEMONS_TLS_CERTIFICATE_H
#define VELT_STANDALONE_DAEMONS_TLS_CERTIFICATE_H

#include "base/result.h"

#include <filesystem>
#include <memory>
#include <optional>
#include <string>

namespace velt {

class ScratchFolder;

struct ServerCertificate {
    std::filesystem::path
        certificate;           ///< PEM; the server's certificate first, then those that lead to its issuer
    std::filesystem::path key; ///< PEM
    bool isRsa = false;        ///< else it is an elliptic curve's
    std::string fingerprint;   ///< changes when the certificate or its key does
    std::shared_ptr<const ScratchFolder> throwAway; ///< holds the two files when they are for a test only
};

/// The administrator's certificate ("/etc/velt/tls/server.crt" and ".key" below the state root) if given,
/// else a self-signed one, made at the first call and again once it has expired. Where the thread's hook
/// leaves the store of it undone, a throw-away one that is gone with the result. Fails when a file cannot be
/// read or written, key and certificate do not belong together, the kind of key is neither RSA nor an
/// elliptic curve, or others than the owner (root or this process's user) and the group may read the key, or
/// others than the owner may write it. Thread-safe.
Result<ServerCertificate> serverCertificate();

/// The certificate that is stored, read and checked in the same way, and nothing made. Nothing when none was
/// given or made. Thread-safe.
Result<std::optional<ServerCertificate>> storedCertificate();

/// What takes a key from those who must not have it; "" where that is not needed, or the key is missing.
std::string closeKeyCommand(const std::filesystem::path& key);

} // namespace velt

#endif
