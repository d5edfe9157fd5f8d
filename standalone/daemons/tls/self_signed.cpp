#include "standalone/daemons/tls/self_signed.h"

#include "base/ipv4.h"
#include "standalone/core/error_number.h"
#include "standalone/daemons/tls/openssl_owners.h"

#include <arpa/inet.h>
#include <ifaddrs.h>
#include <netinet/in.h>
#include <openssl/ec.h>
#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <unistd.h>

#include <algorithm>
#include <array>

namespace velt {
namespace {

constexpr long validSeconds = 3650L * 24 * 60 * 60;
constexpr std::size_t mostAddresses = 64;
constexpr std::size_t longestCommonName = 64;

bool isHostName(const std::string& name) {
    return !name.empty() && name.size() <= 253 && std::ranges::all_of(name, [](unsigned char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
               c == '.';
    });
}

bool addName(GENERAL_NAMES* names, int type, void* value) {
    NameOwner name(GENERAL_NAME_new());
    if (!name) {
        return false;
    }
    GENERAL_NAME_set0_value(name.get(), type, value);
    if (sk_GENERAL_NAME_push(names, name.get()) == 0) {
        // The caller still owns the value.
        name->type = GEN_EMAIL;
        name->d.ptr = nullptr;
        return false;
    }
    (void)name.release();
    return true;
}

bool addHostName(GENERAL_NAMES* names, const std::string& hostName) {
    TextOwner text(ASN1_IA5STRING_new());
    if (!text || ASN1_STRING_set(text.get(), hostName.data(), static_cast<int>(hostName.size())) == 0 ||
        !addName(names, GEN_DNS, text.get())) {
        return false;
    }
    (void)text.release();
    return true;
}

bool addAddress(GENERAL_NAMES* names, const std::string& address) {
    std::array<unsigned char, sizeof(in6_addr)> bytes{};
    int length = 0;
    if (const auto ipv4 = parseIPv4(address)) {
        std::copy(ipv4->begin(), ipv4->end(), bytes.begin());
        length = static_cast<int>(ipv4->size());
    } else if (inet_pton(AF_INET6, address.c_str(), bytes.data()) == 1) {
        length = sizeof(in6_addr);
    } else {
        return true;
    }
    OctetsOwner octets(ASN1_OCTET_STRING_new());
    if (!octets || ASN1_OCTET_STRING_set(octets.get(), bytes.data(), length) == 0 ||
        !addName(names, GEN_IPADD, octets.get())) {
        return false;
    }
    (void)octets.release();
    return true;
}

bool addAlternativeNames(X509* certificate, const CertificateNames& wanted) {
    NamesOwner names(GENERAL_NAMES_new());
    if (!names || (isHostName(wanted.hostName) && !addHostName(names.get(), wanted.hostName))) {
        return false;
    }
    for (const auto& address : wanted.addresses) {
        if (!addAddress(names.get(), address)) {
            return false;
        }
    }
    return sk_GENERAL_NAME_num(names.get()) == 0 ||
           X509_add1_ext_i2d(certificate, NID_subject_alt_name, names.get(), 0, X509V3_ADD_DEFAULT) == 1;
}

bool addExtension(X509* certificate, int kind, const char* value) {
    X509V3_CTX context;
    X509V3_set_ctx_nodb(&context);
    X509V3_set_ctx(&context, certificate, certificate, nullptr, nullptr, 0);
    ExtensionOwner extension(X509V3_EXT_conf_nid(nullptr, &context, kind, value));
    return extension && X509_add_ext(certificate, extension.get(), -1) == 1;
}

bool setSerial(X509* certificate) {
    std::array<unsigned char, 8> bytes{};
    if (RAND_bytes(bytes.data(), static_cast<int>(bytes.size())) != 1) {
        return false;
    }
    std::uint64_t number = 0;
    for (const unsigned char byte : bytes) {
        number = number << 8 | byte;
    }
    return ASN1_INTEGER_set_uint64(X509_get_serialNumber(certificate), number >> 1 | 1) == 1;
}

bool setSubject(X509* certificate, const std::string& hostName) {
    const std::string common =
        isHostName(hostName) ? hostName.substr(0, longestCommonName) : std::string("localhost");
    X509_NAME* subject = X509_get_subject_name(certificate);
    const auto* text = reinterpret_cast<const unsigned char*>(common.data());
    return X509_NAME_add_entry_by_NID(subject, NID_commonName, MBSTRING_ASC, text,
                                      static_cast<int>(common.size()), -1, 0) == 1 &&
           X509_set_issuer_name(certificate, subject) == 1;
}

bool fill(X509* certificate, EVP_PKEY* key, const CertificateNames& names) {
    return X509_set_version(certificate, X509_VERSION_3) == 1 && setSerial(certificate) &&
           X509_gmtime_adj(X509_getm_notBefore(certificate), 0) != nullptr &&
           X509_gmtime_adj(X509_getm_notAfter(certificate), validSeconds) != nullptr &&
           setSubject(certificate, names.hostName) && X509_set_pubkey(certificate, key) == 1 &&
           addAlternativeNames(certificate, names) &&
           addExtension(certificate, NID_basic_constraints, "critical,CA:FALSE") &&
           addExtension(certificate, NID_key_usage, "critical,digitalSignature") &&
           addExtension(certificate, NID_ext_key_usage, "serverAuth") &&
           addExtension(certificate, NID_subject_key_identifier, "hash") &&
           X509_sign(certificate, key, EVP_sha256()) > 0;
}

std::string contentsOf(BIO* bio) {
    char* data = nullptr;
    const long length = BIO_get_mem_data(bio, &data);
    return length > 0 ? std::string(data, static_cast<std::size_t>(length)) : std::string();
}

Error libraryError() {
    ERR_clear_error();
    return {ErrorNumber::daemon, "The OpenSSL library cannot make a certificate for this server."};
}

} // namespace

CertificateNames namesOfThisHost() {
    CertificateNames names;
    std::array<char, 256> host{};
    if (gethostname(host.data(), host.size() - 1) == 0) {
        names.hostName = host.data();
    }
    ifaddrs* first = nullptr;
    if (getifaddrs(&first) < 0) {
        return names;
    }
    const std::unique_ptr<ifaddrs, Releaser<freeifaddrs>> owner(first);
    for (const ifaddrs* entry = first; entry != nullptr && names.addresses.size() < mostAddresses;
         entry = entry->ifa_next) {
        std::array<char, INET6_ADDRSTRLEN> text{};
        if (entry->ifa_addr == nullptr) {
            continue;
        }
        if (entry->ifa_addr->sa_family == AF_INET) {
            const auto* address = reinterpret_cast<const sockaddr_in*>(entry->ifa_addr);
            inet_ntop(AF_INET, &address->sin_addr, text.data(), text.size());
            names.addresses.emplace_back(text.data());
        } else if (entry->ifa_addr->sa_family == AF_INET6) {
            const auto* address = reinterpret_cast<const sockaddr_in6*>(entry->ifa_addr);
            if (!IN6_IS_ADDR_LINKLOCAL(&address->sin6_addr)) {
                inet_ntop(AF_INET6, &address->sin6_addr, text.data(), text.size());
                names.addresses.emplace_back(text.data());
            }
        }
    }
    return names;
}

Result<SelfSigned> makeSelfSigned(const CertificateNames& names) {
    const KeyOwner key(EVP_EC_gen("P-256"));
    const CertificateOwner certificate(X509_new());
    if (!key || !certificate || !fill(certificate.get(), key.get(), names)) {
        return libraryError();
    }
    const BioOwner certificateText(BIO_new(BIO_s_mem()));
    const BioOwner keyText(BIO_new(BIO_s_secmem()));
    if (!certificateText || !keyText || PEM_write_bio_X509(certificateText.get(), certificate.get()) != 1 ||
        PEM_write_bio_PrivateKey(keyText.get(), key.get(), nullptr, nullptr, 0, nullptr, nullptr) != 1) {
        return libraryError();
    }
    return SelfSigned{contentsOf(certificateText.get()), contentsOf(keyText.get())};
}

} // namespace velt
