#include "host/http/response_text.h"

#include "base/utc_text.h"

#include <algorithm>
#include <array>
#include <utility>

namespace velt::host {

namespace {

void addHeader(std::string& text, const std::string& name, const std::string& value) {
    text += name;
    text += ": ";
    // A line break in a value would begin another header.
    for (const char c : value) {
        text += static_cast<unsigned char>(c) < 0x20 ? ' ' : c;
    }
    text += "\r\n";
}

std::string commonHead(int status) {
    std::string text = "HTTP/1.1 " + std::to_string(status) + " " + reasonPhrase(status) + "\r\n";
    addHeader(text, "Date", utcText(std::chrono::system_clock::now(), "%a, %d %b %Y %H:%M:%S GMT"));
    addHeader(text, "Cache-Control", "no-store");
    addHeader(text, "X-Content-Type-Options", "nosniff");
    return text;
}

} // namespace

const char* reasonPhrase(int status) {
    static constexpr std::array<std::pair<int, const char*>, 19> phrases{{
        {200, "OK"},
        {201, "Created"},
        {204, "No Content"},
        {400, "Bad Request"},
        {401, "Unauthorized"},
        {403, "Forbidden"},
        {404, "Not Found"},
        {405, "Method Not Allowed"},
        {408, "Request Timeout"},
        {409, "Conflict"},
        {412, "Precondition Failed"},
        {413, "Content Too Large"},
        {422, "Unprocessable Content"},
        {429, "Too Many Requests"},
        {431, "Request Header Fields Too Large"},
        {500, "Internal Server Error"},
        {501, "Not Implemented"},
        {503, "Service Unavailable"},
        {505, "HTTP Version Not Supported"},
    }};
    const auto* const found = std::ranges::find(phrases, status, &std::pair<int, const char*>::first);
    return found == phrases.end() ? "Unknown" : found->second;
}

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
