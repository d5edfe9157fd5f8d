#include "tests/cli/http_server.h"

#include <netinet/in.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <stdexcept>
#include <system_error>

namespace {

int check(int result, const char* what) {
    if (result < 0) {
        throw std::system_error(errno, std::generic_category(), what);
    }
    return result;
}

int listenOnLoopback(int& port) {
    const int socket = check(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0), "socket");
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    check(bind(socket, reinterpret_cast<sockaddr*>(&address), size), "bind");
    check(listen(socket, 16), "listen");
    check(getsockname(socket, reinterpret_cast<sockaddr*>(&address), &size), "getsockname");
    port = ntohs(address.sin_port);
    return socket;
}

int listenOnPath(const std::string& path) {
    const int socket = check(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0), "socket");
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path) {
        throw std::length_error("the path of the socket is too long");
    }
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    check(bind(socket, reinterpret_cast<sockaddr*>(&address), sizeof address), "bind");
    check(listen(socket, 16), "listen");
    return socket;
}

std::size_t lengthOfBody(const std::string& head) {
    const std::size_t at = head.find("Content-Length: ");
    return at == std::string::npos ? 0 : std::stoul(head.substr(at + std::strlen("Content-Length: ")));
}

bool readRequest(int connection, HttpRequest& request) {
    std::string text;
    std::size_t headEnd = std::string::npos;
    while (headEnd == std::string::npos ||
           text.size() < headEnd + 4 + lengthOfBody(text.substr(0, headEnd))) {
        char buffer[4096];
        const ssize_t got = recv(connection, buffer, sizeof buffer, 0);
        if (got <= 0) {
            return false;
        }
        text.append(buffer, static_cast<std::size_t>(got));
        headEnd = text.find("\r\n\r\n");
    }
    request.method = text.substr(0, text.find(' '));
    const std::size_t target = text.find(' ') + 1;
    request.target = text.substr(target, text.find(' ', target) - target);
    request.head = text.substr(text.find("\r\n") + 2, headEnd - text.find("\r\n"));
    request.body = text.substr(headEnd + 4);
    return true;
}

void sendAll(int connection, const std::string& text) {
    std::size_t sent = 0;
    while (sent < text.size()) {
        const ssize_t count = send(connection, text.data() + sent, text.size() - sent, MSG_NOSIGNAL);
        if (count <= 0) {
            return;
        }
        sent += static_cast<std::size_t>(count);
    }
}

} // namespace

HttpServer::HttpServer(std::string socketPath, Handler handler)
    : socketPath_(std::move(socketPath)), handler_(std::move(handler)), tcp_(listenOnLoopback(port_)),
      unix_(listenOnPath(socketPath_)), stop_(check(eventfd(0, EFD_CLOEXEC), "eventfd")) {
    thread_ = std::thread([this] { serve(); });
}

HttpServer::~HttpServer() {
    const std::uint64_t one = 1;
    if (write(stop_, &one, sizeof one) == sizeof one) {
        thread_.join();
    }
    close(tcp_);
    close(unix_);
    close(stop_);
    unlink(socketPath_.c_str());
}

std::vector<HttpRequest> HttpServer::requests() const {
    const std::lock_guard lock(mutex_);
    return requests_;
}

void HttpServer::serve() {
    for (;;) {
        pollfd waiting[] = {{stop_, POLLIN, 0}, {tcp_, POLLIN, 0}, {unix_, POLLIN, 0}};
        poll(waiting, 3, -1);
        if (waiting[0].revents != 0) {
            return;
        }
        for (const pollfd& listener : {waiting[1], waiting[2]}) {
            if (listener.revents == 0) {
                continue;
            }
            const int connection = accept4(listener.fd, nullptr, nullptr, SOCK_CLOEXEC);
            if (connection >= 0) {
                answer(connection);
                close(connection);
            }
        }
    }
}

void HttpServer::answer(int connection) {
    HttpRequest request;
    if (!readRequest(connection, request)) {
        return;
    }
    {
        const std::lock_guard lock(mutex_);
        requests_.push_back(request);
    }
    const HttpReply reply = handler_(request);
    if (reply.drop) {
        return;
    }
    std::string text = "HTTP/1.1 " + std::to_string(reply.status) + " Status\r\nConnection: close\r\n";
    text += "Content-Type: " + reply.contentType + "\r\n";
    if (!reply.etag.empty()) {
        text += "ETag: " + reply.etag + "\r\n";
    }
    if (!reply.link.empty()) {
        text += "Link: " + reply.link + "\r\n";
    }
    if (!reply.stream && reply.status != 204) {
        text += "Content-Length: " + std::to_string(reply.body.size()) + "\r\n";
    }
    sendAll(connection, text + "\r\n" + reply.body);
    if (reply.stream) {
        holdOpen(connection);
    }
}

void HttpServer::holdOpen(int connection) {
    pollfd waiting[] = {{stop_, POLLIN, 0}, {connection, POLLIN, 0}};
    poll(waiting, 2, -1);
}
