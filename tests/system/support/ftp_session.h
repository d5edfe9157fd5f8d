// An FTP client that says exactly what a test tells it to say.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_FTP_SESSION_H
#define VELT_TESTS_SYSTEM_SUPPORT_FTP_SESSION_H

#include "base/unique_fd.h"

#include <chrono>
#include <optional>
#include <string>

namespace velt::test {

struct Reply {
    int code = 0;     ///< 0: the connection ended
    std::string text; ///< all lines
};

struct DataAddress {
    std::string host;
    int port = 0;
};

/// A TCP connection to host:port, from `from` when it is not empty; nothing when it is refused.
UniqueFd connectTo(const std::string& host, int port, const std::string& from = {});

class FtpSession {
public:
    explicit FtpSession(int port, const std::string& host = "127.0.0.1", const std::string& from = {});

    const Reply& greeting() const { return greeting_; }
    Reply command(const std::string& line);
    /// The code of the answer to the password.
    int logIn(const std::string& user, const std::string& password);
    /// As logIn with the password of the tests' accounts.
    int logIn(const std::string& user) { return logIn(user, user + "-secret"); }

    /// What the answer to PASV says.
    std::optional<DataAddress> passive();

    /// Reads all that a command like "RETR x" or "NLST" sends; nothing when the server refuses.
    std::optional<std::string> receive(const std::string& line);
    /// Sends the data by a command like "STOR x"; the code of the final answer.
    int send(const std::string& line, const std::string& data);

    Reply read();

private:
    UniqueFd connection_;
    std::string pending_;
    Reply greeting_;
};

std::string readToEnd(int connection);

} // namespace velt::test

#endif
