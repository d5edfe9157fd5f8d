// A client that says exactly what a test tells it to, byte for byte.
#ifndef VELT_TESTS_HOST_CLIENT_H
#define VELT_TESTS_HOST_CLIENT_H

#include <json/value.h>

#include <chrono>
#include <map>
#include <string>

struct Answer {
    int status = 0;                             ///< 0: the connection ended without an answer
    std::map<std::string, std::string> headers; ///< names in lower case
    std::string body;

    /// The body as JSON; fails the test when it is none.
    Json::Value json() const;
    std::string header(const std::string& name) const;
};

/// One connection. Whatever it waits for, it gives up after 20 seconds.
class Client {
public:
    static Client tcp(unsigned short port);
    static Client unixSocket(const std::string& path);

    explicit Client(int descriptor) : descriptor_(descriptor) {}
    Client(Client&& other) noexcept;
    Client(const Client&) = delete;
    Client& operator=(const Client&) = delete;
    Client& operator=(Client&&) = delete;
    ~Client();

    bool connected() const { return descriptor_ >= 0; }
    int descriptor() const { return descriptor_; }

    /// Sends the text; false when the other side does not take it any more.
    bool send(const std::string& text) const;

    /// Reads one answer, also "100 Continue".
    Answer receive(bool withBody = true);

    /// send and receive.
    Answer ask(const std::string& text);

    /// Reads until the text was seen; returns all that came before it and itself, or "" when it does not
    /// come.
    std::string readUntil(const std::string& text);

    /// Whether the other side has ended the connection.
    bool ended();

private:
    bool fill();

    int descriptor_;
    std::string buffer_;
};

/// "METHOD target HTTP/1.1", Host, the header lines given (each with its line end), and the body with its
/// length.
std::string requestText(const std::string& method, const std::string& target, const std::string& headers = "",
                        const std::string& body = "");

#endif
