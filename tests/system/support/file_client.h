// A user of the service, whatever the protocol.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_FILE_CLIENT_H
#define VELT_TESTS_SYSTEM_SUPPORT_FILE_CLIENT_H

#include <cstdint>
#include <memory>
#include <optional>
#include <set>
#include <string>

namespace velt::test {

enum class Protocol {
    ftp,
    sftp,
};

/// How to ask for what is in a folder, where the protocol has several ways.
enum class Listing {
    list,
    names,
    facts,
};

/// A user who tried to log in, and whose session ends with this. "False" and "nothing" mean that the server
/// refused.
class FileClient {
public:
    FileClient() = default;
    virtual ~FileClient() = default;
    FileClient(const FileClient&) = delete;
    FileClient& operator=(const FileClient&) = delete;

    /// The rest is for those who are.
    virtual bool isLoggedIn() const = 0;

    /// Whether the server ended the session at the last request.
    virtual bool hasEnded() const = 0;

    virtual bool enter(const std::string& path) = 0;
    /// The names in the folder, without its own and its parent's.
    virtual std::optional<std::set<std::string>> list(const std::string& path,
                                                      Listing how = Listing::names) = 0;
    virtual std::optional<std::string> read(const std::string& path) = 0;
    virtual bool write(const std::string& path, const std::string& data) = 0;
    virtual bool append(const std::string& path, const std::string& data) = 0;
    virtual bool makeFolder(const std::string& path) = 0;
    virtual bool remove(const std::string& path) = 0;
    virtual bool removeFolder(const std::string& path) = 0;
    /// Over FTP it replaces a file that is there, over SFTP nothing.
    virtual bool rename(const std::string& from, const std::string& to) = 0;
    virtual bool setMode(const std::string& path, unsigned mode) = 0;
    /// To this second after the beginning of 1970.
    virtual bool setTimes(const std::string& path, std::uint32_t seconds) = 0;
    virtual bool symbolicLink(const std::string& target, const std::string& path) = 0;

    // FTP has no words for these, and refuses them all.
    virtual bool hardLink(const std::string& from, const std::string& to);
    /// As rename(2), which replaces.
    virtual bool replace(const std::string& from, const std::string& to);
    /// Makes the file empty.
    virtual bool cut(const std::string& path);

    // Of one file that stays open, until another is opened. Only over SFTP.
    enum class Opening {
        toRead,
        toWrite, ///< makes the file, and leaves what it holds
    };
    virtual bool open(const std::string& path, Opening opening);
    virtual std::optional<std::string> readOpen();
    /// From the beginning of the file.
    virtual bool writeOpen(const std::string& data);
    virtual bool setModeOfOpen(unsigned mode);
};

/// With the password of the tests' accounts; "ftp" is the anonymous user.
std::unique_ptr<FileClient> logInBy(Protocol protocol, int port, const std::string& user);
std::unique_ptr<FileClient> logInBy(Protocol protocol, int port, const std::string& user,
                                    const std::string& password);

} // namespace velt::test

#endif
