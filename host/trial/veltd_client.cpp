#include "host/trial/veltd_client.h"

#include "host/base/json.h"
#include "host/trial/trial_error.h"

#include <sys/socket.h>
#include <sys/un.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstring>
#include <string_view>

namespace velt::host {

namespace {

/// A change may wait for daemons to end and start.
constexpr timeval longestWait{100, 0};

bool sendAll(int descriptor, std::string_view text) {
    while (!text.empty()) {
        const ssize_t count = ::send(descriptor, text.data(), text.size(), MSG_NOSIGNAL);
        if (count <= 0) {
            return false;
        }
        text.remove_prefix(static_cast<std::size_t>(count));
    }
    return true;
}

std::string receiveAll(int descriptor) {
    std::string text;
    std::array<char, 4096> buffer{};
    for (ssize_t count = 1; count > 0;) {
        count = ::recv(descriptor, buffer.data(), buffer.size(), 0);
        text.append(buffer.data(), static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
    }
    return text;
}

/// Without status when the text is not a complete answer.
Reply parseReply(const std::string& text) {
    constexpr std::string_view version = "HTTP/1.1 ";
    const std::size_t head = text.find("\r\n\r\n");
    if (!text.starts_with(version) || head == std::string::npos) {
        return {};
    }
    const auto body = parseObject(std::string_view(text).substr(head + 4));
    int status = 0;
    std::from_chars(text.data() + version.size(), text.data() + head, status);
    return {status, body ? *body : Json::Value()};
}

} // namespace

UniqueFd VeltdClient::connected() const {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    socketPath_.copy(static_cast<char*>(address.sun_path), sizeof address.sun_path - 1);
    UniqueFd socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const void* const name = &address;
    if (::connect(socket.get(), static_cast<const sockaddr*>(name), sizeof address) != 0) {
        return UniqueFd();
    }
    ::setsockopt(socket.get(), SOL_SOCKET, SO_RCVTIMEO, &longestWait, sizeof longestWait);
    return socket;
}

Reply VeltdClient::post(const std::string& target, const Json::Value& body) const {
    return ask("POST", target, toJson(body));
}

Reply VeltdClient::ask(const std::string& method, const std::string& target, const std::string& body) const {
    const std::string token = token_.empty() ? "" : "Authorization: Bearer " + token_ + "\r\n";
    const UniqueFd socket = connected();
    Reply reply;
    if (socket && sendAll(socket.get(), method + " " + target + " HTTP/1.1\r\nHost: localhost\r\n" + token +
                                            "Connection: close\r\nContent-Length: " +
                                            std::to_string(body.size()) + "\r\n\r\n" + body)) {
        reply = parseReply(receiveAll(socket.get()));
    }
    if (reply.status == 0) {
        throw TrialError("veltd does not answer. See its log, veltd.log.");
    }
    return reply;
}

} // namespace velt::host
