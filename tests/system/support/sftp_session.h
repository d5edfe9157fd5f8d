// An SFTP client that says exactly what a test tells it to say, over the system's ssh.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SFTP_SESSION_H
#define VELT_TESTS_SYSTEM_SUPPORT_SFTP_SESSION_H

#include "base/unique_fd.h"

#include <sys/types.h>

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace velt::test {

/// The answers of version 3 of the protocol.
enum SftpStatus {
    sftpEnded = -1, ///< no answer: the session is over
    sftpGood = 0,
    sftpAbsent = 2,
    sftpDenied = 3,
    sftpFailed = 4,
    sftpUnknown = 8, ///< the server knows no such request
};

/// What a request to open a file asks for.
inline constexpr std::uint32_t sftpRead = 0x01;
inline constexpr std::uint32_t sftpWrite = 0x02;
inline constexpr std::uint32_t sftpAppend = 0x04;
inline constexpr std::uint32_t sftpMake = 0x08;
inline constexpr std::uint32_t sftpCut = 0x10;

class SftpSession {
public:
    /// Logs in with the password; by default that of the tests' accounts. Whether that worked, isOpen tells.
    SftpSession(int port, const std::string& user, const std::string& password);
    SftpSession(int port, const std::string& user) : SftpSession(port, user, user + "-secret") {}
    /// Ends the client.
    ~SftpSession();
    SftpSession(SftpSession&& other) noexcept;
    SftpSession& operator=(SftpSession&&) = delete;

    bool isOpen() const { return open_; }
    /// What the client wrote to its standard error, after the session's end.
    std::string words();

    /// Nothing when the server refuses.
    std::optional<std::string> receive(const std::string& path);
    /// The names in the folder but "." and "..", sorted.
    std::optional<std::vector<std::string>> list(const std::string& folder);
    std::optional<std::string> target(const std::string& link);
    std::optional<std::string> realPath(const std::string& path);

    // The rest gives an SftpStatus.
    /// Whether something is there, as far as a link leads.
    int look(const std::string& path);
    int send(const std::string& path, const std::string& data,
             std::uint32_t how = sftpWrite | sftpMake | sftpCut, std::optional<std::uint32_t> mode = {});
    int makeFolder(const std::string& path);
    int removeFolder(const std::string& path);
    int remove(const std::string& path);
    /// By the protocol's own request, which replaces nothing.
    int rename(const std::string& from, const std::string& to);
    /// By OpenSSH's, as rename(2).
    int move(const std::string& from, const std::string& to);
    int hardLink(const std::string& from, const std::string& to);
    int symbolicLink(const std::string& target, const std::string& path);
    int setMode(const std::string& path, std::uint32_t mode);
    int setOwner(const std::string& path, std::uint32_t user, std::uint32_t group);
    int setTimes(const std::string& path, std::uint32_t seconds);
    int cut(const std::string& path, std::uint64_t length);
    /// Sets the mode of a link itself.
    int setModeOfLink(const std::string& path, std::uint32_t mode);
    /// Opens the file for reading only, and sets this of what is open.
    int setModeOfOpen(const std::string& path, std::uint32_t mode) {
        return ofOpen(path, [&](const std::string& handle) { return setModeOfHandle(handle, mode); });
    }
    int setTimesOfOpen(const std::string& path, std::uint32_t seconds);

    /// The handle of an open file; nothing when the server refuses. It stays open.
    std::optional<std::string> open(const std::string& path, std::uint32_t how,
                                    std::optional<std::uint32_t> mode = {});
    /// All of it; nothing when the server refuses.
    std::optional<std::string> receiveOpen(const std::string& handle);
    /// From its beginning.
    int sendOpen(const std::string& handle, const std::string& data);
    /// From the beginning of the open file; nothing when the server refuses, and at the end of the file.
    std::optional<std::string> read(const std::string& handle);
    int cutHandle(const std::string& handle, std::uint64_t length);
    int setModeOfHandle(const std::string& handle, std::uint32_t mode);
    int close(const std::string& handle);

private:
    struct Packet {
        int type = -1; ///< -1: the session is over
        std::string body;
    };

    Packet ask(int type, const std::string& body);
    int status(int type, const std::string& body);
    std::optional<std::string> handleOf(int type, const std::string& body);
    template<class Set> int ofOpen(const std::string& path, const Set& set) {
        const auto handle = open(path, sftpRead);
        const int done = handle ? set(*handle) : lastStatus_;
        if (handle) {
            close(*handle);
        }
        return done;
    }
    std::optional<std::string> nameOf(int type, const std::string& path);
    int statusOf(const Packet& answer);
    bool writePacket(int type, const std::string& body);
    Packet readPacket();

    pid_t client_ = -1;
    UniqueFd toClient_;
    UniqueFd fromClient_;
    UniqueFd errors_;
    bool open_ = false;
    std::uint32_t number_ = 0;
    int lastStatus_ = sftpEnded;
};

} // namespace velt::test

#endif
