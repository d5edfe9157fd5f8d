#include "standalone/health/greeting.h"

#include "base/file.h"
#include "base/input_wait.h"
#include "base/sha256.h"
#include "base/unique_fd.h"
#include "standalone/daemons/tls/openssl_owners.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <cstring>

namespace velt {
namespace {

using Clock = std::chrono::steady_clock;
using ContextOwner = std::unique_ptr<SSL_CTX, Releaser<SSL_CTX_free>>;
using TlsOwner = std::unique_ptr<SSL, Releaser<SSL_free>>;

Error systemError(const char* what) {
    return Error(std::string(what) + ": " + std::strerror(errno));
}

/// A connection to a service of this machine, with a time at which it is over.
class Connection {
public:
    static Result<Connection> open(int port, std::chrono::milliseconds limit) {
        Connection connection(Clock::now() + limit);
        VELT_RETURN_IF_ERROR(connection.connect(port));
        return connection;
    }

    /// A line without its end, at most as long as any that a service begins with.
    Result<std::string> readLine() {
        constexpr std::size_t longest = 4096;
        for (;;) {
            if (const auto end = received_.find('\n'); end != std::string::npos) {
                std::string line = received_.substr(0, end);
                received_.erase(0, end + 1);
                return line;
            }
            if (received_.size() > longest) {
                return Error("it sends no line");
            }
            VELT_ASSIGN_OR_RETURN(const std::string more, receive());
            received_ += more;
        }
    }

    /// The next bytes.
    Result<std::string> receive() {
        if (!waitForInput(socket_.get(), deadline_)) {
            return Error("it did not answer in time");
        }
        std::array<char, 4096> bytes{};
        const ssize_t length = ::recv(socket_.get(), bytes.data(), bytes.size(), MSG_DONTWAIT);
        if (length < 0) {
            return systemError("cannot receive");
        }
        if (length == 0) {
            return Error("it closed the connection");
        }
        return std::string(bytes.data(), static_cast<std::size_t>(length));
    }

    /// Little enough for the kernel to take it at once.
    Result<> send(std::string_view bytes) const {
        const ssize_t sent = ::send(socket_.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
        return sent == static_cast<ssize_t>(bytes.size()) ? Result<>() : systemError("cannot send");
    }

private:
    explicit Connection(Clock::time_point deadline)
        : socket_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0)), deadline_(deadline) {}

    Result<> connect(int port) const {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(static_cast<in_port_t>(port));
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        if (::connect(socket_.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0) {
            return {};
        }
        if (errno != EINPROGRESS) {
            return systemError("cannot connect");
        }
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline_ - Clock::now());
        pollfd event{socket_.get(), POLLOUT, 0};
        if (::poll(&event, 1, static_cast<int>(std::max<std::int64_t>(left.count(), 0))) != 1) {
            return Error("it took no connection in time");
        }
        socklen_t size = sizeof errno;
        ::getsockopt(socket_.get(), SOL_SOCKET, SO_ERROR, &errno, &size);
        return errno == 0 ? Result<>() : systemError("cannot connect");
    }

    UniqueFd socket_;
    Clock::time_point deadline_;
    std::string received_;
};

Result<> expectLine(Connection& connection, std::string_view beginning) {
    VELT_ASSIGN_OR_RETURN(const std::string line, connection.readLine());
    if (!line.starts_with(beginning)) {
        constexpr std::size_t shown = 80;
        return Error("it says \"" + line.substr(0, line.find('\r')).substr(0, shown) + "\"");
    }
    return {};
}

/// The last line of a reply, which may have several: the first three characters are its number, and a blank
/// follows.
Result<> expectReply(Connection& connection, std::string_view number) {
    for (;;) {
        VELT_ASSIGN_OR_RETURN(const std::string line, connection.readLine());
        if (line.size() > number.size() && line[number.size()] == ' ') {
            constexpr std::size_t shown = 80;
            return line.starts_with(number)
                       ? Result<>()
                       : Error("it says \"" + line.substr(0, line.find('\r')).substr(0, shown) + "\"");
        }
    }
}

std::string certificateDigest(X509* certificate) {
    std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
    unsigned length = 0;
    if (certificate == nullptr || X509_digest(certificate, EVP_sha256(), digest.data(), &length) != 1) {
        return "";
    }
    return {reinterpret_cast<const char*>(digest.data()), length};
}

/// TLS over buffers in memory: the library's own writing to a socket could end this process by a signal.
class TlsClient {
public:
    TlsClient() : context_(SSL_CTX_new(TLS_client_method())) {
        tls_.reset(context_ ? SSL_new(context_.get()) : nullptr);
        if (tls_) {
            SSL_set_verify(tls_.get(), SSL_VERIFY_NONE, nullptr);
            SSL_set_connect_state(tls_.get());
            SSL_set_bio(tls_.get(), BIO_new(BIO_s_mem()), BIO_new(BIO_s_mem()));
        }
    }

    Result<std::string> takeUp(Connection& connection) {
        while (tls_) {
            const int done = SSL_do_handshake(tls_.get());
            const int problem = SSL_get_error(tls_.get(), done);
            VELT_RETURN_IF_ERROR(sendPending(connection));
            if (done == 1) {
                const CertificateOwner served(SSL_get1_peer_certificate(tls_.get()));
                return certificateDigest(served.get());
            }
            if (problem != SSL_ERROR_WANT_READ) {
                ERR_clear_error();
                return Error("TLS was not agreed upon");
            }
            VELT_ASSIGN_OR_RETURN(const std::string bytes, connection.receive());
            BIO_write(SSL_get_rbio(tls_.get()), bytes.data(), static_cast<int>(bytes.size()));
        }
        return Error("the OpenSSL library has no client");
    }

private:
    Result<> sendPending(const Connection& connection) {
        std::array<char, 4096> bytes{};
        for (;;) {
            const int length =
                BIO_read(SSL_get_wbio(tls_.get()), bytes.data(), static_cast<int>(bytes.size()));
            if (length <= 0) {
                return {};
            }
            VELT_RETURN_IF_ERROR(connection.send({bytes.data(), static_cast<std::size_t>(length)}));
        }
    }

    ContextOwner context_;
    TlsOwner tls_;
};

} // namespace

Result<> awaitGreeting(int port, std::string_view beginning, std::chrono::milliseconds limit) {
    VELT_ASSIGN_OR_RETURN(auto connection, Connection::open(port, limit));
    return expectLine(connection, beginning);
}

Result<std::string> certificateServedAt(int port, std::chrono::milliseconds limit) {
    VELT_ASSIGN_OR_RETURN(auto connection, Connection::open(port, limit));
    VELT_RETURN_IF_ERROR(expectReply(connection, "220"));
    VELT_RETURN_IF_ERROR(connection.send("AUTH TLS\r\n"));
    VELT_RETURN_IF_ERROR(expectReply(connection, "234"));
    return TlsClient().takeUp(connection);
}

std::string digestOf(const std::filesystem::path& certificate) {
    const auto text = readFile(certificate);
    const BioOwner bio(text ? BIO_new_mem_buf(text->data(), static_cast<int>(text->size())) : nullptr);
    const CertificateOwner parsed(bio ? PEM_read_bio_X509(bio.get(), nullptr, nullptr, nullptr) : nullptr);
    ERR_clear_error();
    return certificateDigest(parsed.get());
}

} // namespace velt
