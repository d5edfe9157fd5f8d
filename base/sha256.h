// Fingerprints of texts.
#ifndef VELT_BASE_SHA256_H
#define VELT_BASE_SHA256_H

#include <string>
#include <string_view>

namespace velt {

/// The text's SHA-256 in 64 hexadecimal digits. Throws std::bad_alloc.
std::string sha256(std::string_view text);

} // namespace velt

#endif
