#include "tests/system/support/ftp_session.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/time.h>

#include <array>
#include <cstdlib>
#include <sstream>

namespace velt::test {
namespace {

sockaddr_in addressOf(const std::string& host, int port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<in_port_t>(port));
    inet_pton(AF_INET, host.c_str(), &address.sin_addr);
    return address;
}

bool sendAll(int connection, const std::string& data) {
    for (std::size_t sent = 0; sent < data.size();) {
        const ssize_t count = ::send(connection, data.data() + sent, data.size() - sent, MSG_NOSIGNAL);
        if (count <= 0) {
            return false;
        }
        sent += static_cast<std::size_t>(count);
    }
    return true;
}

} // namespace

UniqueFd connectTo(const std::string& host, int port, const std::string& from) {
    UniqueFd connection(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const timeval limit{20, 0};
    setsockopt(connection.get(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    if (!from.empty()) {
        const sockaddr_in own = addressOf(from, 0);
        if (bind(connection.get(), reinterpret_cast<const sockaddr*>(&own), sizeof own) < 0) {
            return {};
        }
    }
    const sockaddr_in address = addressOf(host, port);
    if (connect(connection.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) < 0) {
        return {};
    }
    return connection;
}

std::string readToEnd(int connection) {
    std::string data;
    std::array<char, 65536> buffer{};
    for (ssize_t count = 0; (count = recv(connection, buffer.data(), buffer.size(), 0)) > 0;) {
        data.append(buffer.data(), static_cast<std::size_t>(count));
    }
    return data;
}

FtpSession::FtpSession(int port, const std::string& host, const std::string& from)
    : connection_(connectTo(host, port, from)) {
    greeting_ = read();
}

Reply FtpSession::read() {
    Reply reply;
    while (true) {
        const auto end = pending_.find("\r\n");
        if (end == std::string::npos) {
            std::array<char, 4096> buffer{};
            const ssize_t count = recv(connection_.get(), buffer.data(), buffer.size(), 0);
            if (count <= 0) {
                return {};
            }
            pending_.append(buffer.data(), static_cast<std::size_t>(count));
            continue;
        }
        const std::string line = pending_.substr(0, end);
        pending_.erase(0, end + 2);
        reply.text += line + '\n';
        // "123-" goes on, "123 " ends.
        const long code = std::strtol(line.c_str(), nullptr, 10);
        if (line.size() > 3 && line[3] == ' ' && code >= 100) {
            reply.code = static_cast<int>(code);
            return reply;
        }
    }
}

Reply FtpSession::command(const std::string& line) {
    return sendAll(connection_.get(), line + "\r\n") ? read() : Reply{};
}

int FtpSession::logIn(const std::string& user, const std::string& password) {
    const Reply reply = command("USER " + user);
    return reply.code == 331 ? command("PASS " + password).code : reply.code;
}

std::optional<DataAddress> FtpSession::passive() {
    const Reply reply = command("PASV");
    const auto open = reply.text.find('(');
    if (reply.code != 227 || open == std::string::npos) {
        return std::nullopt;
    }
    std::istringstream address(reply.text.substr(open + 1));
    std::array<unsigned, 6> n{};
    char separator = ',';
    for (unsigned& number : n) {
        if (separator != ',' || !(address >> number >> separator)) {
            return std::nullopt;
        }
    }
    return DataAddress{std::to_string(n[0]) + '.' + std::to_string(n[1]) + '.' + std::to_string(n[2]) + '.' +
                           std::to_string(n[3]),
                       static_cast<int>(n[4] * 256 + n[5])};
}

std::optional<std::string> FtpSession::receive(const std::string& line) {
    const auto address = passive();
    UniqueFd data = address ? connectTo("127.0.0.1", address->port) : UniqueFd();
    if (!data || command(line).code / 100 != 1) {
        return std::nullopt;
    }
    std::string received = readToEnd(data.get());
    // The server answers once both sides have closed.
    data.reset();
    return read().code == 226 ? std::optional(std::move(received)) : std::nullopt;
}

int FtpSession::send(const std::string& line, const std::string& data) {
    const auto address = passive();
    UniqueFd connection = address ? connectTo("127.0.0.1", address->port) : UniqueFd();
    const Reply reply = connection ? command(line) : Reply{};
    if (reply.code / 100 != 1) {
        return reply.code;
    }
    sendAll(connection.get(), data);
    connection.reset();
    return read().code;
}

} // namespace velt::test
