#include "host/http/tls_context.h"

#include "base/file.h"
#include "base/unique_fd.h"

#include <boost/asio/buffer.hpp>

#include <fcntl.h>
#include <openssl/ssl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

namespace velt::host {
namespace {

using Context = boost::asio::ssl::context;
using Error = boost::system::error_code;

/// Whoever reads the key can pass for this server, and whoever writes it decides who can.
void checkPrivate(const struct stat& facts, const std::string& key) {
    if (facts.st_uid != 0 && facts.st_uid != geteuid()) {
        throw ListenError("The key " + key + " belongs to another user; mend it with: chown root " + key);
    }
    if ((facts.st_mode & (S_IRWXO | S_IWGRP)) != 0) {
        throw ListenError("The key " + key + " is open to other users; mend it with: chmod 640 " + key);
    }
}

// What is checked is what is read: by its name, the file could be exchanged in between.
std::string readKey(const std::filesystem::path& key) {
    const UniqueFd file(::open(key.c_str(), O_RDONLY | O_CLOEXEC));
    struct stat facts {};
    if (!file || ::fstat(file.get(), &facts) != 0) {
        throw ListenError(cannot("read", key).message);
    }
    checkPrivate(facts, key.string());
    const auto text = readAll(file.get());
    if (!text) {
        throw ListenError(cannot("read", key).message);
    }
    return *text;
}

} // namespace

std::unique_ptr<Context> makeTlsContext(const TlsFiles& files) {
    if (files.certificate.empty()) {
        return nullptr;
    }
    auto context = std::make_unique<Context>(Context::tls_server);
    SSL_CTX_set_min_proto_version(context->native_handle(), TLS1_2_VERSION);
    SSL_CTX_set_options(context->native_handle(), SSL_OP_NO_RENEGOTIATION | SSL_OP_NO_COMPRESSION);
    const std::string key = readKey(files.key);
    Error error;
    context->use_certificate_chain_file(files.certificate.string(), error);
    if (!error) {
        context->use_private_key(boost::asio::buffer(key), Context::pem, error);
    }
    if (!error && SSL_CTX_check_private_key(context->native_handle()) != 1) {
        throw ListenError("The key " + files.key.string() + " does not belong to the TLS certificate " +
                          files.certificate.string() + ".");
    }
    if (error) {
        throw ListenError("Cannot use the TLS certificate " + files.certificate.string() + " with the key " +
                          files.key.string() + ": " + error.message() + ".");
    }
    return context;
}

} // namespace velt::host
