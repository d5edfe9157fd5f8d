// What services say to a client, and services that say nothing.
#include "base/file.h"
#include "standalone/daemons/tls/openssl_owners.h"
#include "standalone/daemons/tls/self_signed.h"
#include "standalone/health/greeting.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <netinet/in.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <csignal>
#include <functional>
#include <string>
#include <thread>

namespace velt::test {
namespace {

using std::chrono::milliseconds;

/// Serves one connection with a function.
class OneService {
public:
    explicit OneService(std::function<void(int)> serve) {
        listener_ = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        auto* const name = reinterpret_cast<sockaddr*>(&address);
        EXPECT_EQ(::bind(listener_, name, size), 0);
        EXPECT_EQ(::listen(listener_, 4), 0);
        ::getsockname(listener_, name, &size);
        port = ntohs(address.sin_port);
        thread_ = std::thread([this, serve = std::move(serve)] {
            const int connection = ::accept(listener_, nullptr, nullptr);
            serve(connection);
            ::close(connection);
        });
    }
    ~OneService() {
        thread_.join();
        ::close(listener_);
    }
    OneService(const OneService&) = delete;
    OneService& operator=(const OneService&) = delete;

    int port = 0;

private:
    int listener_ = -1;
    std::thread thread_;
};

/// Says it, then waits for the client's end.
std::function<void(int)> saying(const std::string& text) {
    return [text](int connection) {
        (void)::send(connection, text.data(), text.size(), MSG_NOSIGNAL);
        char byte = 0;
        (void)::recv(connection, &byte, 1, 0);
    };
}

std::string greetingProblem(const std::string& said, std::string_view expected) {
    const OneService service(saying(said));
    return messageOf(awaitGreeting(service.port, expected, milliseconds(300)));
}

TEST(Greeting, IsTheFirstLine) {
    EXPECT_EQ(greetingProblem("220 welcome\r\n", "220"), "");
    EXPECT_EQ(greetingProblem("220-many\r\n220 lines\r\n", "220"), "");
    EXPECT_EQ(greetingProblem("SSH-2.0-OpenSSH_9.2\r\n", "SSH-2.0-"), "");
    EXPECT_EQ(greetingProblem("421 too many users\r\n", "220"), "it says \"421 too many users\"");
    EXPECT_EQ(greetingProblem(std::string(9000, 'a'), "220"), "it sends no line");
}

TEST(Greeting, OfAServiceThatSaysNothingIsNotWaitedForLong) {
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(greetingProblem("", "220"), "it did not answer in time");
    EXPECT_EQ(greetingProblem("220 without an end", "220"), "it did not answer in time");
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(3));
}

TEST(Greeting, OfAServiceThatEndsAtOnceIsMissing) {
    const OneService service([](int) {});
    EXPECT_EQ(messageOf(awaitGreeting(service.port, "220", milliseconds(300))), "it closed the connection");
    EXPECT_EQ(messageOf(awaitGreeting(freePort(), "220", milliseconds(300))),
              "cannot connect: Connection refused");
}

class TlsGreeting : public testing::Test {
protected:
    // The service writes after its client has gone, by the library, which asks for the signal.
    void SetUp() override { std::signal(SIGPIPE, SIG_IGN); }
    void TearDown() override { std::signal(SIGPIPE, SIG_DFL); }

    /// An FTP service that takes up TLS with this certificate and key.
    std::function<void(int)> encrypting() const {
        return [this](int connection) {
            saying("220 welcome\r\n")(connection); // takes the first byte of the request
            std::string rest(64, ' ');
            (void)::recv(connection, rest.data(), rest.size(), 0);
            (void)::send(connection, "234 go\r\n", 8, MSG_NOSIGNAL);
            SSL_CTX* const context = SSL_CTX_new(TLS_server_method());
            SSL_CTX_use_certificate_chain_file(context, certificate_.c_str());
            SSL_CTX_use_PrivateKey_file(context, key_.c_str(), SSL_FILETYPE_PEM);
            SSL* const tls = SSL_new(context);
            SSL_set_fd(tls, connection);
            SSL_accept(tls);
            char byte = 0;
            (void)::recv(connection, &byte, 1, 0);
            SSL_free(tls);
            SSL_CTX_free(context);
        };
    }

    TemporaryFolder folder_;
    SelfSigned made_ = *makeSelfSigned({"files.example", {}});
    std::string certificate_ = folder_.write("crt", made_.certificate).string();
    std::string key_ = folder_.write("key", made_.key).string();
};

TEST_F(TlsGreeting, GivesTheCertificateThatIsServed) {
    const OneService service(encrypting());
    const auto served = certificateServedAt(service.port, milliseconds(5000));
    ASSERT_EQ(messageOf(served), "");
    EXPECT_EQ(*served, digestOf(certificate_));
    EXPECT_NE(*served, digestOf(folder_.write("other", makeSelfSigned({"files.example", {}})->certificate)));
    EXPECT_EQ(digestOf(folder_.path() / "none"), "");
}

TEST_F(TlsGreeting, OfAServiceWithoutItIsAnError) {
    const OneService plain([](int connection) {
        saying("220 welcome\r\n")(connection);
        (void)::send(connection, "500 no\r\n", 8, MSG_NOSIGNAL);
        saying("")(connection);
    });
    EXPECT_EQ(messageOf(certificateServedAt(plain.port, milliseconds(1000))), "it says \"500 no\"");
    const OneService broken([](int connection) {
        saying("220 welcome\r\n")(connection);
        (void)::send(connection, "234 go\r\nnonsense that is no TLS", 31, MSG_NOSIGNAL);
        std::string rest(9000, ' ');
        while (::recv(connection, rest.data(), rest.size(), 0) > 0) {
        }
    });
    EXPECT_NE(messageOf(certificateServedAt(broken.port, milliseconds(500))), "");
}

} // namespace
} // namespace velt::test
