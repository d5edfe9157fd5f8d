// Certificates that this server signs for itself.
#ifndef VELT_STANDALONE_DAEMONS_TLS_SELF_SIGNED_H
#define VELT_STANDALONE_DAEMONS_TLS_SELF_SIGNED_H

#include "base/result.h"

#include <string>
#include <vector>

namespace velt {

/// What a certificate is for: the host's name and its addresses, as text.
struct CertificateNames {
    std::string hostName;
    std::vector<std::string> addresses; ///< IPv4 and IPv6; others are left out
};

/// This server's name and the addresses of its interfaces, but for link-local ones.
CertificateNames namesOfThisHost();

struct SelfSigned {
    std::string certificate; ///< PEM
    std::string key;         ///< PEM, not encrypted
};

/// Makes a key (ECDSA P-256) and a certificate for it that is valid from now on for ten years.
Result<SelfSigned> makeSelfSigned(const CertificateNames& names);

} // namespace velt

#endif
