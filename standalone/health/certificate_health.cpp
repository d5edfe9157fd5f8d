#include "base/file.h"
#include "base/utc_text.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/tls/certificate.h"
#include "standalone/daemons/tls/openssl_owners.h"
#include "standalone/daemons/tls/self_signed.h"
#include "standalone/health/checks.h"
#include "standalone/settings/settings.h"

#include <openssl/err.h>
#include <openssl/pem.h>

#include <ctime>

namespace velt {
namespace {

constexpr std::chrono::days soon{21};

Finding finding(const char* id, Severity severity, std::string sentence, std::string mend) {
    return {id, severity, "ftp", std::move(sentence), std::move(mend)};
}

CertificateOwner readCertificate(const std::filesystem::path& file) {
    const auto text = readFile(file);
    const BioOwner bio(text ? BIO_new_mem_buf(text->data(), static_cast<int>(text->size())) : nullptr);
    CertificateOwner certificate(bio ? PEM_read_bio_X509(bio.get(), nullptr, nullptr, nullptr) : nullptr);
    ERR_clear_error();
    return certificate;
}

KeyOwner readKey(const std::filesystem::path& file) {
    const auto noPassphrase = [](char*, int, int, void*) { return -1; };
    const auto text = readFile(file);
    const BioOwner bio(text ? BIO_new_mem_buf(text->data(), static_cast<int>(text->size())) : nullptr);
    KeyOwner key(bio ? PEM_read_bio_PrivateKey(bio.get(), nullptr, noPassphrase, nullptr) : nullptr);
    ERR_clear_error();
    return key;
}

/// Nothing when OpenSSL cannot tell.
std::optional<TimePoint> timeOf(const ASN1_TIME* time) {
    std::tm parts{};
    if (ASN1_TIME_to_tm(time, &parts) != 1) {
        return std::nullopt;
    }
    return std::chrono::system_clock::from_time_t(::timegm(&parts));
}

std::string dayOf(TimePoint time) {
    return utcText(time, "%Y-%m-%d %H:%M UTC");
}

/// What is wrong with the administrator's files, of which no certificate can be had for the reason given.
Finding unusableGiven(const Error& reason) {
    const auto file = statePath(paths::givenCertificate);
    const auto keyFile = statePath(paths::givenKey);
    const CertificateOwner certificate = readCertificate(file);
    const KeyOwner key = readKey(keyFile);
    const bool mismatch = certificate && key && X509_check_private_key(certificate.get(), key.get()) != 1;
    ERR_clear_error();
    const std::string close = closeKeyCommand(keyFile);
    if (!mismatch && !close.empty()) {
        return finding("certificate-unusable", Severity::error, reason.message,
                       close + " && veltctl restart ftp");
    }
    if (!mismatch) {
        return finding("certificate-unusable", Severity::error, reason.message,
                       "Put a certificate and its key in place, then run: veltctl restart ftp");
    }
    return finding("certificate-key-mismatch", Severity::error,
                   "The key " + keyFile.string() + " does not belong to the certificate " + file.string() +
                       ".",
                   "Put the key of this certificate in place, then run: veltctl restart ftp");
}

/// The same for the self-signed one, which the next start makes anew unless its key is merely open to others.
Finding unusableOwn(const Error& reason) {
    const std::string close = closeKeyCommand(statePath(paths::ownKey));
    return finding("certificate-unusable", Severity::error, reason.message,
                   close + (close.empty() ? "" : " && ") + "veltctl restart ftp");
}

Finding unusable(const Error& reason) {
    const bool given =
        fileExists(statePath(paths::givenCertificate)) || fileExists(statePath(paths::givenKey));
    return given ? unusableGiven(reason) : unusableOwn(reason);
}

bool isGiven(const ServerCertificate& certificate) {
    return certificate.certificate == statePath(paths::givenCertificate);
}

std::string renewal(const ServerCertificate& certificate) {
    if (isGiven(certificate)) {
        return "Renew the certificate, then run: veltctl restart ftp";
    }
    return "rm " + certificate.certificate.string() + " && veltctl restart ftp";
}

Findings validity(const ServerCertificate& stored, X509* certificate, TimePoint now) {
    const std::string name = "The certificate " + stored.certificate.string();
    const auto begin = timeOf(X509_get0_notBefore(certificate));
    const auto end = timeOf(X509_get0_notAfter(certificate));
    if (end && *end <= now) {
        return {finding("certificate-expired", Severity::error, name + " expired on " + dayOf(*end) + ".",
                        renewal(stored))};
    }
    if (begin && *begin > now) {
        return {finding("certificate-not-yet-valid", Severity::error,
                        name + " is valid from " + dayOf(*begin) + " on, which is in the future.",
                        "timedatectl status")};
    }
    if (end && *end - now < soon) {
        return {finding("certificate-expires", Severity::warning, name + " expires on " + dayOf(*end) + ".",
                        renewal(stored))};
    }
    return {};
}

Findings names(const ServerCertificate& stored, X509* certificate) {
    const NamesOwner alternative(
        static_cast<GENERAL_NAMES*>(X509_get_ext_d2i(certificate, NID_subject_alt_name, nullptr, nullptr)));
    if (isGiven(stored)) {
        return alternative ? Findings()
                           : Findings{finding("certificate-without-names", Severity::warning,
                                              "The certificate " + stored.certificate.string() +
                                                  " has no alternative names, so clients that verify it "
                                                  "refuse it under any name.",
                                              renewal(stored))};
    }
    const std::string host = namesOfThisHost().hostName;
    const bool named =
        host.empty() || X509_check_host(certificate, host.c_str(), host.size(), 0, nullptr) == 1;
    return named ? Findings()
                 : Findings{finding("certificate-other-name", Severity::notice,
                                    "The self-signed certificate " + stored.certificate.string() +
                                        " does not name this host, \"" + host + "\".",
                                    renewal(stored))};
}

bool servesTls() {
    const auto settings = loadFtpSettings();
    return settings && (settings->record.service_flags & VELT_FTP_SERVICE_TLS) != 0;
}

} // namespace

Findings certificateFindings(TimePoint now) {
    if (!servesTls()) {
        return {};
    }
    const auto stored = storedCertificate();
    if (!stored) {
        return {unusable(stored.error())};
    }
    const CertificateOwner certificate = *stored ? readCertificate((*stored)->certificate) : nullptr;
    if (!certificate) {
        return {}; // it is made when the service starts
    }
    Findings findings = validity(**stored, certificate.get(), now);
    std::ranges::move(names(**stored, certificate.get()), std::back_inserter(findings));
    return findings;
}

} // namespace velt
