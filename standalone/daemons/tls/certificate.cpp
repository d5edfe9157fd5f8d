#include "standalone/daemons/tls/certificate.h"

#include "base/file.h"
#include "base/sha256.h"
#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/tls/openssl_owners.h"
#include "standalone/daemons/tls/self_signed.h"

#include <openssl/err.h>
#include <openssl/pem.h>
#include <sys/stat.h>
#include <unistd.h>

namespace velt {
namespace {

struct Pair {
    std::filesystem::path certificate;
    std::filesystem::path key;
};

// A key that asks for a passphrase is one that a daemon cannot load; there is nobody to ask.
int noPassphrase(char*, int, int, void*) {
    return -1;
}

BioOwner reader(const std::string& text) {
    return BioOwner(BIO_new_mem_buf(text.data(), static_cast<int>(text.size())));
}

CertificateOwner parseCertificate(const std::string& text) {
    const BioOwner bio = reader(text);
    return CertificateOwner(bio ? PEM_read_bio_X509(bio.get(), nullptr, noPassphrase, nullptr) : nullptr);
}

KeyOwner parseKey(const std::string& text) {
    const BioOwner bio = reader(text);
    return KeyOwner(bio ? PEM_read_bio_PrivateKey(bio.get(), nullptr, noPassphrase, nullptr) : nullptr);
}

bool isOthers(const struct stat& facts) {
    return facts.st_uid != 0 && facts.st_uid != geteuid();
}

bool isOpen(const struct stat& facts) {
    return (facts.st_mode & (S_IRWXO | S_IWGRP)) != 0;
}

Error refuse(const std::filesystem::path& file, const std::string& why) {
    ERR_clear_error();
    return {ErrorNumber::certificate, file.string() + " " + why + "."};
}

Result<ServerCertificate> load(const Pair& pair) {
    const auto certificateText = readFile(pair.certificate);
    if (!certificateText) {
        return refuse(pair.certificate, "cannot be read");
    }
    const auto keyText = readFile(pair.key);
    if (!keyText) {
        return refuse(pair.key, "cannot be read");
    }
    const CertificateOwner certificate = parseCertificate(*certificateText);
    if (!certificate) {
        return refuse(pair.certificate, "does not contain a PEM certificate");
    }
    const KeyOwner key = parseKey(*keyText);
    if (!key) {
        return refuse(pair.key, "does not contain an unencrypted PEM private key");
    }
    const int kind = EVP_PKEY_get_base_id(key.get());
    if (kind != EVP_PKEY_RSA && kind != EVP_PKEY_EC) {
        return refuse(pair.key, "contains an unsupported key; expected an RSA or elliptic-curve key");
    }
    if (X509_check_private_key(certificate.get(), key.get()) != 1) {
        return refuse(pair.key, "does not match the certificate");
    }
    return ServerCertificate{pair.certificate, pair.key, kind == EVP_PKEY_RSA,
                             sha256(*certificateText + *keyText), nullptr};
}

// Whoever reads the key can pass for this server, and whoever writes it decides who can.
Result<> checkPrivate(const std::filesystem::path& key) {
    struct stat facts {};
    if (::stat(key.c_str(), &facts) != 0) {
        return refuse(key, "cannot be read");
    }
    if (isOthers(facts)) {
        return refuse(key, "belongs to another user; mend it with: " + closeKeyCommand(key));
    }
    return isOpen(facts) ? refuse(key, "is open to other users; mend it with: " + closeKeyCommand(key))
                         : Result<>();
}

Result<ServerCertificate> loadPrivate(const Pair& pair) {
    VELT_ASSIGN_OR_RETURN(auto certificate, load(pair));
    VELT_RETURN_IF_ERROR(checkPrivate(pair.key));
    return certificate;
}

// A crash between the two writes of a renewal leaves an old certificate with a new key, which is not usable
// either. One that cannot be read this time may be, and clients know this server by it.
Result<bool> isUsable(const Pair& pair) {
    VELT_ASSIGN_OR_RETURN(const auto certificateText, readOptionalFile(pair.certificate));
    VELT_ASSIGN_OR_RETURN(const auto keyText, readOptionalFile(pair.key));
    const CertificateOwner certificate = certificateText ? parseCertificate(*certificateText) : nullptr;
    const KeyOwner key = keyText ? parseKey(*keyText) : nullptr;
    const bool usable = certificate && key && X509_check_private_key(certificate.get(), key.get()) == 1 &&
                        X509_cmp_current_time(X509_get0_notAfter(certificate.get())) > 0;
    ERR_clear_error();
    return usable;
}

Result<> makeOwn(const Pair& pair) {
    VELT_ASSIGN_OR_RETURN(const auto made, makeSelfSigned(namesOfThisHost()));
    VELT_RETURN_IF_ERROR(replaceFile(pair.key, made.key, 0600));
    return replaceFile(pair.certificate, made.certificate, 0644);
}

// A configuration under test needs a certificate even where none may be stored.
Result<ServerCertificate> throwAway() {
    VELT_ASSIGN_OR_RETURN(auto made, ScratchFolder::make());
    const auto folder = std::make_shared<ScratchFolder>(std::move(made));
    const Pair pair{folder->path() / "server.crt", folder->path() / "server.key"};
    VELT_RETURN_IF_ERROR(makeOwn(pair));
    auto certificate = load(pair);
    if (certificate) {
        certificate->throwAway = folder;
    }
    return certificate;
}

Pair givenPair() {
    return {statePath(paths::givenCertificate), statePath(paths::givenKey)};
}

Pair ownPair() {
    return {statePath(paths::ownCertificate), statePath(paths::ownKey)};
}

Result<bool> isThere(const Pair& pair) {
    VELT_ASSIGN_OR_RETURN(const bool certificate, velt::isThere(pair.certificate));
    VELT_ASSIGN_OR_RETURN(const bool key, velt::isThere(pair.key));
    return certificate || key;
}

} // namespace

std::string closeKeyCommand(const std::filesystem::path& key) {
    struct stat facts {};
    if (::stat(key.c_str(), &facts) != 0) {
        return "";
    }
    if (isOthers(facts)) {
        return "chown root " + key.string();
    }
    return isOpen(facts) ? "chmod 640 " + key.string() : "";
}

Result<ServerCertificate> serverCertificate() {
    const Pair given = givenPair();
    VELT_ASSIGN_OR_RETURN(const bool isGiven, isThere(given));
    if (isGiven) {
        return loadPrivate(given);
    }
    const Pair own = ownPair();
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(bool usable, isUsable(own));
    if (!usable) {
        VELT_RETURN_IF_ERROR(perform(Effect::store, "certificate", [&] { return makeOwn(own); }));
        VELT_ASSIGN_OR_RETURN(usable, isUsable(own));
    }
    return usable ? loadPrivate(own) : throwAway();
}

Result<std::optional<ServerCertificate>> storedCertificate() {
    const Pair given = givenPair();
    const Pair own = ownPair();
    VELT_ASSIGN_OR_RETURN(const bool isGiven, isThere(given));
    VELT_ASSIGN_OR_RETURN(const bool isOwn, isThere(own));
    if (!isGiven && !isOwn) {
        return std::optional<ServerCertificate>();
    }
    VELT_ASSIGN_OR_RETURN(auto certificate, loadPrivate(isGiven ? given : own));
    return std::optional(std::move(certificate));
}

} // namespace velt
