// The server over TLS, and what it asks for before it can be reached from elsewhere.

#include "host/http/tls_context.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <openssl/x509.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <memory>

namespace {

template<class T> using Owner = std::unique_ptr<T, void (*)(T*)>;

void writeKey(EVP_PKEY* key, const std::filesystem::path& path) {
    const Owner<std::FILE> file(std::fopen(path.c_str(), "w"), [](std::FILE* open) { std::fclose(open); });
    PEM_write_PrivateKey(file.get(), key, nullptr, nullptr, 0, nullptr, nullptr);
}

/// Writes a self-signed certificate and its key.
void makeCertificate(const velt::host::TlsFiles& files) {
    const Owner<EVP_PKEY> key(EVP_EC_gen("P-256"), EVP_PKEY_free);
    const Owner<X509> certificate(X509_new(), X509_free);
    ASN1_INTEGER_set(X509_get_serialNumber(certificate.get()), 1);
    X509_gmtime_adj(X509_getm_notBefore(certificate.get()), -60);
    X509_gmtime_adj(X509_getm_notAfter(certificate.get()), 3600);
    X509_set_pubkey(certificate.get(), key.get());
    X509_NAME* const name = X509_get_subject_name(certificate.get());
    const unsigned char text[] = "localhost";
    X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC, text, -1, -1, 0);
    X509_set_issuer_name(certificate.get(), name);
    X509_sign(certificate.get(), key.get(), EVP_sha256());
    const Owner<std::FILE> certificateFile(std::fopen(files.certificate.c_str(), "w"),
                                           [](std::FILE* file) { std::fclose(file); });
    PEM_write_X509(certificateFile.get(), certificate.get());
    writeKey(key.get(), files.key);
    std::filesystem::permissions(files.key, std::filesystem::perms::owner_read);
}

class HostTls : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
        settings.workers = 1;
        tls = {folder / "certificate.pem", folder / "key.pem"};
        makeCertificate(tls);
    }

    /// What the server answers over TLS of the given versions, to its end or to the last text wanted; "" when
    /// there is no handshake.
    std::string askOverTls(const std::string& request, int lowest, int highest,
                           const std::string& last = "\r\n\r\nnever") const {
        const Owner<SSL_CTX> context(SSL_CTX_new(TLS_client_method()), SSL_CTX_free);
        SSL_CTX_set_min_proto_version(context.get(), lowest);
        SSL_CTX_set_max_proto_version(context.get(), highest);
        SSL_CTX_set_security_level(context.get(), 0);
        const Client client = connect();
        const Owner<SSL> ssl(SSL_new(context.get()), SSL_free);
        SSL_set_fd(ssl.get(), client.descriptor());
        if (SSL_connect(ssl.get()) != 1) {
            return "";
        }
        SSL_write(ssl.get(), request.data(), static_cast<int>(request.size()));
        std::string answer;
        char bytes[4096];
        int count = 0;
        while (answer.find(last) == std::string::npos &&
               (count = SSL_read(ssl.get(), &bytes[0], sizeof bytes)) > 0) {
            answer.append(&bytes[0], static_cast<std::size_t>(count));
        }
        endedCleanly = SSL_get_shutdown(ssl.get()) == SSL_RECEIVED_SHUTDOWN;
        return answer;
    }

    mutable bool endedCleanly = false;
};

TEST_F(HostTls, RequestsAreServed) {
    start();
    const std::string request =
        requestText("GET", "/healthz", admin + "Connection: close\r\nOrigin: https://localhost\r\n");
    for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
        EXPECT_TRUE(askOverTls(request, version, version).starts_with("HTTP/1.1 200 OK\r\n"));
        EXPECT_TRUE(endedCleanly);
    }
}

TEST_F(HostTls, OlderVersionsAreNotSpoken) {
    start();
    EXPECT_EQ(askOverTls(requestText("GET", "/healthz", admin), TLS1_VERSION, TLS1_1_VERSION), "");
}

// The libraries of a test's machine may refuse them by themselves.
TEST_F(HostTls, OlderVersionsAreRefusedWhateverTheLibraryAllows) {
    const auto context = velt::host::makeTlsContext(tls);
    EXPECT_EQ(SSL_CTX_get_min_proto_version(context->native_handle()), TLS1_2_VERSION);
}

TEST_F(HostTls, PlainHttpIsNotAnswered) {
    start();
    EXPECT_EQ(ask("GET", "/healthz", admin).status, 0);
}

TEST_F(HostTls, AHandshakeThatDoesNotComeEndsTheConnection) {
    limits.headTime = std::chrono::milliseconds(200);
    start();
    Client client = connect();
    EXPECT_TRUE(client.ended());
}

TEST_F(HostTls, EventsComeOverTls) {
    limits.heartbeat = std::chrono::milliseconds(50);
    start();
    const std::string answer =
        askOverTls(requestText("GET", "/events", admin), TLS1_2_VERSION, TLS1_3_VERSION, ": beat\n\n");
    EXPECT_TRUE(answer.starts_with("HTTP/1.1 200 OK\r\n")) << answer;
    EXPECT_NE(answer.find(": connected\n\n: beat\n\n"), std::string::npos) << answer;
}

TEST_F(HostTls, FilesThatCannotBeUsedStopTheStart) {
    std::ofstream(tls.key) << "no key";
    EXPECT_THROW(start(), velt::host::ListenError);
    app.reset();
}

TEST_F(HostTls, AKeyOfAnotherCertificateStopsTheStart) {
    std::filesystem::permissions(tls.key, std::filesystem::perms::owner_all);
    const Owner<EVP_PKEY> ofOneKind(EVP_EC_gen("P-256"), EVP_PKEY_free);
    const Owner<EVP_PKEY> ofAnother(EVP_RSA_gen(2048), EVP_PKEY_free);
    for (EVP_PKEY* const key : {ofOneKind.get(), ofAnother.get()}) {
        writeKey(key, tls.key);
        EXPECT_THROW(start(), velt::host::ListenError);
        app.reset();
    }
}

TEST_F(HostTls, AKeyThatOthersMayReadOrWriteStopsTheStart) {
    using std::filesystem::perms;
    for (const perms open : {perms::others_read, perms::others_write, perms::group_write}) {
        std::filesystem::permissions(tls.key, perms::owner_read | open);
        try {
            start();
            ADD_FAILURE() << "served with a key of mode " << std::oct << static_cast<int>(open);
        } catch (const velt::host::ListenError& error) {
            EXPECT_EQ(error.what(), "The key " + tls.key.string() +
                                        " is open to other users; mend it with: chmod 640 " +
                                        tls.key.string());
        }
        app.reset();
    }
    std::filesystem::permissions(tls.key, perms::owner_read | perms::group_read);
    EXPECT_NO_THROW(start());
}

TEST_F(HostTls, AKeyOfAnotherUserStopsTheStart) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "needs root's rights to give a file away";
    }
    ASSERT_EQ(chown(tls.key.c_str(), 1234, 1234), 0);
    EXPECT_THROW(start(), velt::host::ListenError);
    app.reset();
}

} // namespace
