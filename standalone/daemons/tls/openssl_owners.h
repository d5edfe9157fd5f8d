// Owners of the OpenSSL library's objects.
#ifndef VELT_STANDALONE_DAEMONS_TLS_OPENSSL_OWNERS_H
#define VELT_STANDALONE_DAEMONS_TLS_OPENSSL_OWNERS_H

#include <openssl/bio.h>
#include <openssl/evp.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include <memory>

namespace velt {

template<auto release> struct Releaser {
    template<typename Object> void operator()(Object* object) const { release(object); }
};

using BioOwner = std::unique_ptr<BIO, Releaser<BIO_free_all>>;
using KeyOwner = std::unique_ptr<EVP_PKEY, Releaser<EVP_PKEY_free>>;
using CertificateOwner = std::unique_ptr<X509, Releaser<X509_free>>;
using NamesOwner = std::unique_ptr<GENERAL_NAMES, Releaser<GENERAL_NAMES_free>>;
using NameOwner = std::unique_ptr<GENERAL_NAME, Releaser<GENERAL_NAME_free>>;
using OctetsOwner = std::unique_ptr<ASN1_OCTET_STRING, Releaser<ASN1_OCTET_STRING_free>>;
using TextOwner = std::unique_ptr<ASN1_IA5STRING, Releaser<ASN1_IA5STRING_free>>;
using ExtensionOwner = std::unique_ptr<X509_EXTENSION, Releaser<X509_EXTENSION_free>>;

} // namespace velt

#endif
