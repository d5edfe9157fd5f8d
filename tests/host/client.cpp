#include "tests/host/client.h"

#include <gtest/gtest.h>
#include <json/reader.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cstring>
#include <sstream>
#include <utility>

namespace {

void limitWaiting(int descriptor) {
    const timeval time{20, 0};
    setsockopt(descriptor, SOL_SOCKET, SO_RCVTIMEO, &time, sizeof time);
    setsockopt(descriptor, SOL_SOCKET, SO_SNDTIMEO, &time, sizeof time);
}

Client connected(int descriptor, const void* address, socklen_t size) {
    limitWaiting(descriptor);
    if (connect(descriptor, static_cast<const sockaddr*>(address), size) != 0) {
        close(descriptor);
        return Client(-1);
    }
    return Client(descriptor);
}

} // namespace

Json::Value Answer::json() const {
    Json::Value value;
    std::string errors;
    std::istringstream stream(body);
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), stream, &value, &errors)) << body;
    return value;
}

std::string Answer::header(const std::string& name) const {
    const auto found = headers.find(name);
    return found == headers.end() ? "" : found->second;
}

Client Client::tcp(unsigned short port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return ::connected(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0), &address, sizeof address);
}

Client Client::unixSocket(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(static_cast<char*>(address.sun_path), path.c_str(), path.size() + 1);
    return ::connected(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0), &address, sizeof address);
}

Client::Client(Client&& other) noexcept
    : descriptor_(std::exchange(other.descriptor_, -1)), buffer_(std::move(other.buffer_)) {}

Client::~Client() {
    if (descriptor_ >= 0) {
        close(descriptor_);
    }
}

bool Client::send(const std::string& text) const {
    std::size_t sent = 0;
    while (sent < text.size()) {
        const ssize_t count = ::send(descriptor_, text.data() + sent, text.size() - sent, MSG_NOSIGNAL);
        if (count <= 0) {
            return false;
        }
        sent += static_cast<std::size_t>(count);
    }
    return true;
}

bool Client::fill() {
    std::array<char, 16384> bytes{};
    const ssize_t count = recv(descriptor_, bytes.data(), bytes.size(), 0);
    if (count <= 0) {
        return false;
    }
    buffer_.append(bytes.data(), static_cast<std::size_t>(count));
    return true;
}

Answer Client::receive(bool withBody) {
    Answer answer;
    const std::string head = readUntil("\r\n\r\n");
    if (!head.starts_with("HTTP/1.1 ")) {
        return answer;
    }
    answer.status = std::stoi(head.substr(9, 3));
    std::istringstream lines(head);
    std::string line;
    std::getline(lines, line);
    while (std::getline(lines, line) && line != "\r") {
        const std::size_t colon = line.find(": ");
        std::string name = line.substr(0, colon);
        std::transform(name.begin(), name.end(), name.begin(),
                       [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
        answer.headers[name] = line.substr(colon + 2, line.size() - colon - 3);
    }
    const std::size_t length = withBody && !answer.header("content-length").empty()
                                   ? std::stoul(answer.header("content-length"))
                                   : 0;
    while (buffer_.size() < length && fill()) {
    }
    answer.body = buffer_.substr(0, length);
    buffer_.erase(0, length);
    return answer;
}

Answer Client::ask(const std::string& text) {
    send(text);
    return receive();
}

std::string Client::readUntil(const std::string& text) {
    std::size_t place = buffer_.find(text);
    while (place == std::string::npos) {
        if (!fill()) {
            return "";
        }
        place = buffer_.find(text);
    }
    std::string read = buffer_.substr(0, place + text.size());
    buffer_.erase(0, read.size());
    return read;
}

bool Client::ended() {
    while (fill()) {
    }
    char byte = 0;
    return recv(descriptor_, &byte, 1, MSG_DONTWAIT) == 0 || (errno != EAGAIN && errno != EWOULDBLOCK);
}

std::string requestText(const std::string& method, const std::string& target, const std::string& headers,
                        const std::string& body) {
    std::string text = method + " " + target + " HTTP/1.1\r\nHost: localhost\r\n" + headers;
    if (!body.empty()) {
        text += "Content-Length: " + std::to_string(body.size()) + "\r\n";
    }
    return text + "\r\n" + body;
}
