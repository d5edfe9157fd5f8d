#include "base/sha256.h"

#include <openssl/evp.h>

#include <array>
#include <new>

namespace velt {

std::string sha256(std::string_view text) {
    std::array<unsigned char, EVP_MAX_MD_SIZE> bytes{};
    unsigned length = 0;
    if (EVP_Digest(text.data(), text.size(), bytes.data(), &length, EVP_sha256(), nullptr) != 1) {
        throw std::bad_alloc();
    }
    constexpr std::string_view digits = "0123456789abcdef";
    std::string result;
    for (unsigned i = 0; i < length; i++) {
        result += digits[bytes[i] >> 4];
        result += digits[bytes[i] & 15];
    }
    return result;
}

} // namespace velt
