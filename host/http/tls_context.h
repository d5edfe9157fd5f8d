// What the server speaks TLS with.
#ifndef VELT_HOST_HTTP_TLS_CONTEXT_H
#define VELT_HOST_HTTP_TLS_CONTEXT_H

#include "host/http/server.h"

#include <boost/asio/ssl/context.hpp>

#include <memory>

namespace velt::host {

/// TLS 1.2 and newer with this certificate; nothing when there is none. Throws ListenError when a file cannot
/// be used, or when the key is not this process's alone: it belongs to somebody else (other than root),
/// others than its owner and group may read it, or others than its owner may write it.
std::unique_ptr<boost::asio::ssl::context> makeTlsContext(const TlsFiles& files);

} // namespace velt::host

#endif
