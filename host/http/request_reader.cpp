#include "host/http/request_reader.h"

#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>

#include <algorithm>
#include <cstring>
#include <optional>

namespace velt::host {

namespace {

namespace http = boost::beast::http;

constexpr std::size_t firstBufferSize = std::size_t{8} * 1024;

/// "0", and the ends of its line and of the body: what every chunked body ends with.
constexpr std::size_t shortestLastChunk = 5;

/// Whether a name or an address is followed by nothing but a port.
bool isHost(boost::beast::string_view host) {
    const std::size_t end = host.find(']');
    return end == host.npos || end + 1 == host.size() || host[end + 1] == ':';
}

std::string text(boost::beast::string_view view) {
    return {view.data(), view.size()};
}

} // namespace

struct RequestReader::Parser {
    std::optional<http::request_parser<http::string_body>> http;
};

RequestReader::RequestReader(std::size_t headLimit, std::size_t bodyLimit)
    : headLimit_(headLimit), bodyLimit_(bodyLimit), allowedBody_(bodyLimit),
      parser_(std::make_unique<Parser>()) {
    reset();
}

RequestReader::~RequestReader() = default;

void RequestReader::reset() {
    auto& parser = parser_->http.emplace();
    parser.eager(true);
    parser.body_limit(bodyLimit_);
    // Not the limit itself, which the reader enforces: it hands over whole heads.
    parser.header_limit(static_cast<std::uint32_t>(headLimit_ + firstBufferSize));
    allowedBody_ = bodyLimit_;
    headDone_ = false;
    keepAlive_ = false;
    expectsContinue_ = false;
    scanned_ = 0;
    request_ = {};
    refusal_ = {};
}

std::pair<char*, std::size_t> RequestReader::space() {
    if (begin_ > 0) {
        std::memmove(buffer_.data(), buffer_.data() + begin_, end_ - begin_);
        end_ -= begin_;
        begin_ = 0;
    }
    if (end_ == buffer_.size()) {
        const std::size_t largest = std::max(headLimit_, firstBufferSize);
        buffer_.resize(std::min(std::max(buffer_.size() * 2, firstBufferSize), largest));
    }
    return {buffer_.data() + end_, buffer_.size() - end_};
}

void RequestReader::added(std::size_t bytes) {
    end_ += bytes;
}

bool RequestReader::hasBegun() const {
    return headDone_ || begin_ < end_;
}

RequestReader::Refused RequestReader::tooLargeBody() const {
    return {413, "The body is larger than " + std::to_string(allowedBody_) + " bytes."};
}

RequestReader::Step RequestReader::refuse(int status, const char* detail) {
    refusal_ = {status, detail};
    return Step::refused;
}

void RequestReader::limitBody(std::size_t limit) {
    if (limit >= allowedBody_ || !refusal_.detail.empty()) {
        return;
    }
    allowedBody_ = limit;
    parser_->http->body_limit(limit);
    if (parser_->http->content_length_remaining().value_or(0) > limit) {
        refusal_ = tooLargeBody();
        keepAlive_ = false;
        expectsContinue_ = false;
    }
}

RequestReader::Step RequestReader::next() {
    return headDone_ ? readBody() : readHead();
}

RequestReader::Step RequestReader::readHead() {
    // Empty lines before a request are ignored, as the protocol asks.
    while (end_ - begin_ >= 2 && buffer_[begin_] == '\r' && buffer_[begin_ + 1] == '\n') {
        begin_ += 2;
        scanned_ = 0;
    }
    const char* const head = buffer_.data() + begin_;
    const std::size_t size = end_ - begin_;
    while (scanned_ < size) {
        const void* const found = std::memchr(head + scanned_, '\n', size - scanned_);
        if (found == nullptr) {
            scanned_ = size;
            break;
        }
        const auto lineEnd = static_cast<std::size_t>(static_cast<const char*>(found) - head);
        if (lineEnd == 0 || head[lineEnd - 1] != '\r') {
            return refuse(400, "A header line does not end in CR LF.");
        }
        if (lineEnd >= 3 && head[lineEnd - 2] == '\n') {
            return lineEnd < headLimit_ ? checkHead(lineEnd + 1)
                                        : refuse(431, "The request header is too large.");
        }
        // Programs disagree about what a continued line means.
        if (lineEnd + 1 < size && (head[lineEnd + 1] == ' ' || head[lineEnd + 1] == '\t')) {
            return refuse(400, "A header line continues on the next line, which is obsolete.");
        }
        if (lineEnd + 1 == size) {
            // The first byte of the next line will tell whether it continues this one.
            scanned_ = lineEnd;
            break;
        }
        scanned_ = lineEnd + 1;
    }
    return size >= headLimit_ ? refuse(431, "The request header is too large.") : Step::needMore;
}

// The head alone: the parser adds the trailers of a body to the fields, and a client's word about itself is
// taken only where access is checked.
RequestReader::Step RequestReader::checkHead(std::size_t size) {
    auto& parser = *parser_->http;
    boost::beast::error_code error;
    begin_ += parser.put(boost::asio::const_buffer(buffer_.data() + begin_, size), error);
    headDone_ = true;
    const bool tooLarge = error == http::error::body_limit;
    if (error && error != http::error::need_more && !tooLarge) {
        return error == http::error::bad_version ? refuse(505, "Only HTTP/1.0 and HTTP/1.1 are supported.")
                                                 : refuse(400, "The request is not well-formed HTTP.");
    }
    // Reported later: access is checked first.
    refusal_ = faultOfHead(tooLarge);
    fillRequest();
    return Step::head;
}

RequestReader::Refused RequestReader::faultOfHead(bool bodyTooLarge) const {
    const auto& message = parser_->http->get();
    const auto hosts = message.count(http::field::host);
    if (hosts > 1 || (hosts == 0 && message.version() == 11)) {
        return {400, "The request must have exactly one Host header."};
    }
    if (!isHost(message[http::field::host])) {
        return {400, "The Host header must be a name or an address, with a port at most."};
    }
    const auto coding = message.find(http::field::transfer_encoding);
    if (coding != message.end() && !boost::beast::iequals(coding->value(), "chunked")) {
        return {501, "The only supported transfer coding is chunked."};
    }
    if (coding != message.end() && message.version() == 10) {
        return {400, "HTTP/1.0 has no transfer codings."};
    }
    if (!message.target().starts_with('/')) {
        return {400, "The request target must begin with \"/\"."};
    }
    return bodyTooLarge ? tooLargeBody() : Refused{};
}

void RequestReader::fillRequest() {
    const auto& parser = *parser_->http;
    const auto& message = parser.get();
    request_.method = text(message.method_string());
    request_.target = text(message.target());
    request_.host = text(message[http::field::host]);
    request_.origin = text(message[http::field::origin]);
    request_.fetchSite = text(message["Sec-Fetch-Site"]);
    // With two of them it is unclear which one counts, so neither does.
    const bool one = message.count(http::field::authorization) <= 1;
    request_.authorization = one ? text(message[http::field::authorization]) : "ambiguous";
    request_.ifMatch = text(message[http::field::if_match]);
    request_.accept = text(message[http::field::accept]);
    request_.wellFormed = refusal_.detail.empty();
    keepAlive_ = request_.wellFormed && message.keep_alive();
    // A client that has begun the body does not wait.
    expectsContinue_ = request_.wellFormed && !parser.is_done() && begin_ == end_ &&
                       boost::beast::iequals(message[http::field::expect], "100-continue");
}

RequestReader::Step RequestReader::readBody() {
    if (!refusal_.detail.empty()) {
        return Step::refused;
    }
    auto& parser = *parser_->http;
    // The parser relies on seeing the last chunk whole, as soon as it has seen its first line.
    const std::size_t least = parser.chunked() ? shortestLastChunk : 1;
    if (!parser.is_done() && end_ - begin_ >= least) {
        boost::beast::error_code error;
        begin_ += parser.put(boost::asio::const_buffer(buffer_.data() + begin_, end_ - begin_), error);
        if (error == http::error::body_limit) {
            refusal_ = tooLargeBody();
            return Step::refused;
        }
        if (error && error != http::error::need_more) {
            return refuse(400, "The body is not well-formed HTTP.");
        }
        if (!parser.is_done() && end_ - begin_ == std::max(headLimit_, firstBufferSize)) {
            return refuse(400, "The header of a chunk is too long.");
        }
    }
    if (!parser.is_done()) {
        return Step::needMore;
    }
    request_.body = std::move(parser.get().body());
    return Step::request;
}

} // namespace velt::host
