// The inside of a public key: what stands in base64 behind its type.
#ifndef VELT_STANDALONE_KEYS_KEY_BLOB_H
#define VELT_STANDALONE_KEYS_KEY_BLOB_H

#include "base/result.h"

#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// The bytes of a base64 text (RFC 4648) with its padding; nothing when it has another form. One text alone
/// gives these bytes.
std::optional<std::string> decodedBase64(std::string_view text);

/// "SHA256:" and the hash of the bytes, as ssh-keygen -l shows it.
std::string fingerprintOf(std::string_view blob);

/// Whether keys of this type are known here: Ed25519, ECDSA and RSA, and the first two of a security key.
bool isKeyType(std::string_view type);

/// The size of the key, as ssh-keygen -l shows it. The bytes (RFC 4253, RFC 5656, RFC 8709) are one whole key
/// of the type, written in the one form that daemons write it in, so that a key has one fingerprint. Else an
/// error that says what was expected, to stand behind "expected". RSA has 2048 to 16384 bits.
Result<int> checkKeyBlob(std::string_view type, std::string_view blob);

} // namespace velt

#endif
