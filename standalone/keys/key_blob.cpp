#include "standalone/keys/key_blob.h"

#include "standalone/core/error_number.h"

#include <openssl/ec.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/obj_mac.h>

#include <algorithm>
#include <array>
#include <bit>
#include <memory>
#include <new>

namespace velt {
namespace {

constexpr std::size_t lengthSize = 4;
constexpr int fewestRsaBits = 2048;
constexpr int mostRsaBits = 16384; ///< which OpenSSH takes
constexpr int ed25519Bits = 256;
constexpr std::size_t ed25519Size = 32;
constexpr unsigned char negativeBit = 0x80;

/// Cuts off the fields, each of which has its length before it; nothing where a field is not whole.
class Fields {
public:
    explicit Fields(std::string_view rest) : rest_(rest) {}

    std::optional<std::string_view> next() {
        if (rest_.size() < lengthSize) {
            return std::nullopt;
        }
        std::size_t length = 0;
        for (std::size_t i = 0; i < lengthSize; ++i) {
            length = length << 8U | static_cast<unsigned char>(rest_[i]);
        }
        rest_.remove_prefix(lengthSize);
        if (length > rest_.size()) {
            return std::nullopt;
        }
        const std::string_view field = rest_.substr(0, length);
        rest_.remove_prefix(length);
        return field;
    }
    bool atEnd() const { return rest_.empty(); }

private:
    std::string_view rest_;
};

Error expected(std::string what) {
    return {ErrorNumber::invalid, std::move(what)};
}

Error notThatType(std::string_view type) {
    return expected("base64 that is one whole key of the type " + std::string(type));
}

/// The bits of a number above 0 in its shortest form; 0 for anything else.
int bitsOf(std::string_view number) {
    const auto byteAt = [&](std::size_t i) { return static_cast<unsigned char>(number[i]); };
    if (number.empty() || (byteAt(0) & negativeBit) != 0) {
        return 0;
    }
    if (byteAt(0) == 0) { // only before a first bit that would make it negative
        if (number.size() < 2 || (byteAt(1) & negativeBit) == 0) {
            return 0;
        }
        number.remove_prefix(1);
    }
    return static_cast<int>((number.size() - 1) * 8 +
                            std::bit_width(unsigned{static_cast<unsigned char>(number[0])}));
}

bool isOdd(std::string_view number) {
    return (static_cast<unsigned char>(number.back()) & 1U) != 0;
}

Result<int> checkRsa(std::string_view type, Fields& fields) {
    const auto exponent = fields.next();
    const auto modulus = fields.next();
    if (!exponent || !modulus || bitsOf(*exponent) < 2 || !isOdd(*exponent) || bitsOf(*modulus) == 0 ||
        !isOdd(*modulus)) {
        return notThatType(type);
    }
    const int bits = bitsOf(*modulus);
    if (bits < fewestRsaBits || bits > mostRsaBits) {
        return expected("an RSA key of " + std::to_string(fewestRsaBits) + " to " +
                        std::to_string(mostRsaBits) + " bits, not of " + std::to_string(bits));
    }
    return bits;
}

Result<int> checkEd25519(std::string_view type, Fields& fields) {
    const auto point = fields.next();
    return point && point->size() == ed25519Size ? Result<int>(ed25519Bits) : notThatType(type);
}

struct Curve {
    std::string_view name;
    int number; ///< OpenSSL's
    int bits;
};

constexpr std::array<Curve, 3> curves{{
    {"nistp256", NID_X9_62_prime256v1, 256},
    {"nistp384", NID_secp384r1, 384},
    {"nistp521", NID_secp521r1, 521},
}};

/// Whether it is a point of the curve, written out with both coordinates.
bool isPointOf(const Curve& curve, std::string_view point) {
    const std::size_t coordinate = (static_cast<std::size_t>(curve.bits) + 7) / 8;
    if (point.size() != 1 + 2 * coordinate || point.front() != POINT_CONVERSION_UNCOMPRESSED) {
        return false;
    }
    const std::unique_ptr<EC_GROUP, decltype(&EC_GROUP_free)> group(EC_GROUP_new_by_curve_name(curve.number),
                                                                    EC_GROUP_free);
    if (!group) {
        throw std::bad_alloc();
    }
    const std::unique_ptr<EC_POINT, decltype(&EC_POINT_free)> place(EC_POINT_new(group.get()), EC_POINT_free);
    if (!place) {
        throw std::bad_alloc();
    }
    const auto* const bytes = reinterpret_cast<const unsigned char*>(point.data());
    ERR_set_mark(); // others on this thread are not to find why it is none
    const bool is = EC_POINT_oct2point(group.get(), place.get(), bytes, point.size(), nullptr) == 1;
    ERR_pop_to_mark();
    return is;
}

Result<int> checkEcdsa(std::string_view type, Fields& fields) {
    const auto name = fields.next();
    const auto point = fields.next();
    const auto* const curve = std::ranges::find(curves, name.value_or(""), &Curve::name);
    // The curve's name ends the type's, before what names a security key.
    const bool fits = curve != curves.end() && type.substr(0, type.find('@')).ends_with(curve->name);
    return fits && point && isPointOf(*curve, *point) ? Result<int>(curve->bits) : notThatType(type);
}

struct KeyType {
    std::string_view name;
    Result<int> (*check)(std::string_view type, Fields& fields);
    bool ofSecurityKey = false; ///< ends in the name of what may ask for it
};

constexpr std::array<KeyType, 7> keyTypes{{
    {"ssh-ed25519", checkEd25519},
    {"ecdsa-sha2-nistp256", checkEcdsa},
    {"ecdsa-sha2-nistp384", checkEcdsa},
    {"ecdsa-sha2-nistp521", checkEcdsa},
    {"ssh-rsa", checkRsa},
    {"sk-ssh-ed25519@openssh.com", checkEd25519, true},
    {"sk-ecdsa-sha2-nistp256@openssh.com", checkEcdsa, true},
}};

std::string encodedBase64(std::string_view bytes) {
    std::string text(4 * ((bytes.size() + 2) / 3) + 1, '\0'); // OpenSSL ends it with a zero
    const int length =
        EVP_EncodeBlock(reinterpret_cast<unsigned char*>(text.data()),
                        reinterpret_cast<const unsigned char*>(bytes.data()), static_cast<int>(bytes.size()));
    text.resize(static_cast<std::size_t>(length));
    return text;
}

} // namespace

std::optional<std::string> decodedBase64(std::string_view text) {
    if (text.empty() || text.size() % 4 != 0) {
        return std::nullopt;
    }
    std::string bytes(text.size() / 4 * 3, '\0');
    const int length =
        EVP_DecodeBlock(reinterpret_cast<unsigned char*>(bytes.data()),
                        reinterpret_cast<const unsigned char*>(text.data()), static_cast<int>(text.size()));
    if (length < 0) {
        return std::nullopt;
    }
    const auto padding = text.size() - (text.find_last_not_of('=') + 1);
    if (padding > 2) {
        return std::nullopt;
    }
    bytes.resize(static_cast<std::size_t>(length) - padding); // which counts the padding
    // The function passes over blanks and bits that mean nothing.
    return encodedBase64(bytes) == text ? std::optional(std::move(bytes)) : std::nullopt;
}

std::string fingerprintOf(std::string_view blob) {
    std::string hash(EVP_MAX_MD_SIZE, '\0');
    unsigned length = 0;
    if (EVP_Digest(blob.data(), blob.size(), reinterpret_cast<unsigned char*>(hash.data()), &length,
                   EVP_sha256(), nullptr) != 1) {
        throw std::bad_alloc();
    }
    hash.resize(length);
    std::string text = encodedBase64(hash);
    text.erase(text.find_last_not_of('=') + 1);
    return "SHA256:" + text;
}

bool isKeyType(std::string_view type) {
    return std::ranges::find(keyTypes, type, &KeyType::name) != keyTypes.end();
}

Result<int> checkKeyBlob(std::string_view type, std::string_view blob) {
    const auto* const known = std::ranges::find(keyTypes, type, &KeyType::name);
    Fields fields(blob);
    if (known == keyTypes.end() || fields.next() != type) {
        return notThatType(type);
    }
    VELT_ASSIGN_OR_RETURN(const int bits, known->check(type, fields));
    const bool whole = !known->ofSecurityKey || fields.next().has_value();
    return whole && fields.atEnd() ? Result<int>(bits) : notThatType(type);
}

} // namespace velt
