#include "base/sha256.h"

#include "base/text.h"

#include <openssl/evp.h>

#include <new>

namespace velt {

std::string sha256(std::string_view text) {
    std::string digest(EVP_MAX_MD_SIZE, '\0');
    void* const bytes = digest.data();
    unsigned length = 0;
    if (EVP_Digest(text.data(), text.size(), static_cast<unsigned char*>(bytes), &length, EVP_sha256(),
                   nullptr) != 1) {
        throw std::bad_alloc();
    }
    return hexadecimal(std::string_view(digest).substr(0, length));
}

} // namespace velt
