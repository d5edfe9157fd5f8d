#include "host/http/response_text.h"

#include "host/clock.h"
#include "host/problem.h"

namespace velt::host {

namespace {

void addHeader(std::string& text, const std::string& name, const std::string& value) {
    text += name;
    text += ": ";
    // A line end in a value would begin a header of its own.
    for (const char c : value) {
        text += static_cast<unsigned char>(c) < 0x20 ? ' ' : c;
    }
    text += "\r\n";
}

std::string commonHead(int status) {
    std::string text = "HTTP/1.1 " + std::to_string(status) + " " + reasonPhrase(status) + "\r\n";
    addHeader(text, "Date", httpDate());
    addHeader(text, "Cache-Control", "no-store");
    addHeader(text, "X-Content-Type-Options", "nosniff");
    return text;
}

} // namespace

std::string responseText(const HttpResponse& response, bool keepAlive, bool withBody) {
    constexpr int noContent = 204;
    std::string text = commonHead(response.status);
    if (response.status != noContent) {
        addHeader(text, "Content-Type", response.contentType);
        addHeader(text, "Content-Length", std::to_string(response.body.size()));
    }
    for (const auto& [name, value] : response.headers) {
        addHeader(text, name, value);
    }
    addHeader(text, "Connection", keepAlive ? "keep-alive" : "close");
    text += "\r\n";
    if (withBody) {
        text += response.body;
    }
    return text;
}

std::string eventStreamHead() {
    constexpr int good = 200;
    std::string text = commonHead(good);
    addHeader(text, "Content-Type", "text/event-stream");
    addHeader(text, "Connection", "close");
    text += "\r\n: connected\n\n";
    return text;
}

} // namespace velt::host
