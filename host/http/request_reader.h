// Reads requests from the bytes of a connection.
#ifndef VELT_HOST_HTTP_REQUEST_READER_H
#define VELT_HOST_HTTP_REQUEST_READER_H

#include "host/http/message.h"

#include <cstddef>
#include <memory>
#include <string>
#include <utility>

namespace velt::host {

/// Finds the requests of one connection. Strict wherever two readers could disagree about where a request
/// ends. Not thread-safe.
class RequestReader {
public:
    enum class Step {
        needMore, ///< read more bytes
        head,     ///< the head is complete: check it, then call next() again. Comes once for each request,
                  ///< even if it is refused next, unless its head cannot be read
        request,  ///< the request is complete
        refused,  ///< no more requests can be read; refusal() says why
    };

    struct Refused {
        int status = 400;
        std::string detail; ///< "" when nothing is refused
    };

    RequestReader(std::size_t headLimit, std::size_t bodyLimit);
    ~RequestReader();
    RequestReader(const RequestReader&) = delete;
    RequestReader& operator=(const RequestReader&) = delete;

    /// Call it after Step::head: this request's body may be no larger.
    void limitBody(std::size_t limit);

    /// Where the next bytes go, and how many fit; at least one after needMore.
    std::pair<char*, std::size_t> space();
    void added(std::size_t bytes);

    Step next();

    /// Whether part of a request has arrived.
    bool hasBegun() const;

    /// With its body only after Step::request.
    const HttpRequest& request() const { return request_; }
    HttpRequest takeRequest() { return std::move(request_); }
    bool keepAlive() const { return keepAlive_; }

    /// Whether the client waits for "100 Continue" before it sends the body.
    bool expectsContinue() const { return expectsContinue_; }
    const Refused& refusal() const { return refusal_; }

    /// Begins the next request.
    void reset();

private:
    struct Parser;

    Step readHead();
    Step readBody();
    Step refuse(int status, const char* detail);
    Step checkHead(std::size_t size);
    Refused tooLargeBody() const;
    Refused faultOfHead(bool bodyTooLarge) const;
    void fillRequest();

    const std::size_t headLimit_;
    const std::size_t bodyLimit_;
    std::size_t allowedBody_; ///< of this request
    std::unique_ptr<Parser> parser_;
    std::string buffer_;
    std::size_t begin_ = 0;
    std::size_t end_ = 0;
    std::size_t scanned_ = 0; ///< of the head, from begin_
    bool headDone_ = false;
    bool keepAlive_ = false;
    bool expectsContinue_ = false;
    HttpRequest request_;
    Refused refusal_;
};

} // namespace velt::host

#endif
