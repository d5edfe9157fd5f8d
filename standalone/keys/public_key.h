// A public key with which somebody may log in.
#ifndef VELT_STANDALONE_KEYS_PUBLIC_KEY_H
#define VELT_STANDALONE_KEYS_PUBLIC_KEY_H

#include "base/result.h"
#include "standalone/keys/key_options.h"

#include <cstddef>
#include <string>
#include <string_view>

namespace velt {

struct PublicKey {
    KeyOptions options;
    std::string type;        ///< "ssh-ed25519"
    std::string base64;      ///< the key itself
    std::string comment;     ///< plain text; "" without any
    std::string fingerprint; ///< as ssh-keygen -l shows it: "SHA256:..."
    int bits = 0;            ///< its size, likewise

    bool operator==(const PublicKey&) const = default;
};

/// A longer line is no key.
inline constexpr std::size_t longestKeyLine = 8192;

/// Reads one line of an authorized_keys file (sshd(8)), which is to hold a key that is taken here: of
/// Ed25519, ECDSA, RSA from 2048 bits on, or a security key, whole and of the type that it names, with no
/// other options than parseKeyOptions takes. An error says what was expected, to stand behind "expected",
/// without a full stop. Thread-safe.
Result<PublicKey> parsePublicKey(std::string_view line);

/// The line, which parsePublicKey reads as the same key.
std::string toText(const PublicKey& key);

/// The line for a daemon that gives file transfer and nothing else: the key with its options and `restrict`.
std::string lineForDaemon(const PublicKey& key);

} // namespace velt

#endif
