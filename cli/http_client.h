// HTTP over TCP or a Unix socket, one request after the other on one connection.
#ifndef VELT_CLI_HTTP_CLIENT_H
#define VELT_CLI_HTTP_CLIENT_H

#include "cli/server_address.h"

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace velt::cli {

struct HttpAnswer {
    long status = 0;
    std::string body;
    std::string etag; ///< empty when the server names no state
    std::string link; ///< the header Link, or empty
};

/// Not thread-safe.
class HttpClient {
public:
    explicit HttpClient(ServerAddress server);
    ~HttpClient();
    HttpClient(const HttpClient&) = delete;
    HttpClient& operator=(const HttpClient&) = delete;

    const ServerAddress& server() const { return server_; }

    /// Sends one request; `path` starts with a slash and is already encoded, `body` is JSON. With an
    /// `ifMatch` the server refuses the request unless it is in that state. Any status is an answer. Failure
    /// (access) when there is no answer.
    HttpAnswer send(const std::string& method, const std::string& path,
                    const std::optional<std::string>& body, const std::string& ifMatch = {});

    /// Passes what a GET of `path` delivers to `onText`, until the server ends it, `onText` returns false or
    /// `stop` returns true (asked at least once a second). The body of an answer other than 200 is returned
    /// instead.
    HttpAnswer follow(const std::string& path, const std::function<bool(std::string_view)>& onText,
                      const std::function<bool()>& stop);

private:
    struct Handle;

    void prepare(const std::string& path);
    void perform(bool mayBeStopped);

    ServerAddress server_;
    std::unique_ptr<Handle> handle_;
};

/// A text as one segment of a path or one value of a query.
std::string percentEncode(const std::string& text);

} // namespace velt::cli

#endif
