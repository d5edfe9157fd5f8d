// Public keys whose fingerprints ssh-keygen told.
#ifndef VELT_TESTS_STANDALONE_SUPPORT_EXAMPLE_KEYS_H
#define VELT_TESTS_STANDALONE_SUPPORT_EXAMPLE_KEYS_H

#include "standalone/keys/public_key.h"

#include <string>

namespace velt::test {

inline const std::string aKey =
    "ssh-ed25519 AAAAC3NzaC1lZDI1NTE5AAAAIG6o8kw9HXo7MMRTNqpwImZIpCtgXHP+yTaiesMotiqn";
inline const std::string aFingerprint = "SHA256:c7wij9jSPaWxr0rn8PdTcjybaczY12MU+OVKvcddZjc";
inline const std::string anotherKey =
    "ecdsa-sha2-nistp256 AAAAE2VjZHNhLXNoYTItbmlzdHAyNTYAAAAIbmlzdHAyNTYAAABBBHx2IkktIkrPbH4U"
    "Tw8GmlCD8A10txdPLuy2o6QVyUq8UZEds534rkw+AGbQctY2rDu330UG6Lo+BwMdys28ca4=";
inline const std::string anotherFingerprint = "SHA256:iPDOAAnSAKsXkIwrVnmslkrk850r2cCTvREe5vc8T8E";

/// Has to be a key.
inline PublicKey keyOf(const std::string& line) {
    return parsePublicKey(line).valueOr({});
}

} // namespace velt::test

#endif
