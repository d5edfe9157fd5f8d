// A user of the service, whatever the protocol.
#ifndef VELT_TESTS_MODEL_CLIENT_H
#define VELT_TESTS_MODEL_CLIENT_H

#include <memory>
#include <optional>
#include <set>
#include <string>

namespace velt::model {

/// How to ask for what is in a folder, where the protocol has several ways.
enum class Listing {
    list,
    names,
    facts,
};

/// A user who tried to log in, and whose session ends with this. "False" and "nothing" mean that the server
/// refused.
class Client {
public:
    Client() = default;
    virtual ~Client() = default;
    Client(const Client&) = delete;
    Client& operator=(const Client&) = delete;

    /// The rest is for those who are.
    virtual bool isLoggedIn() const = 0;

    /// Whether the server ended the session at the last step, and said so.
    virtual bool hasEnded() const = 0;

    virtual bool enter(const std::string& path) = 0;
    virtual std::optional<std::set<std::string>> list(const std::string& path, Listing how) = 0;
    virtual std::optional<std::string> read(const std::string& path) = 0;
    virtual bool write(const std::string& path, const std::string& data) = 0;
    virtual bool append(const std::string& path, const std::string& data) = 0;
    virtual bool make(const std::string& path) = 0;
    virtual bool remove(const std::string& path) = 0;
    virtual bool removeFolder(const std::string& path) = 0;
    virtual bool rename(const std::string& from, const std::string& to) = 0;
    virtual bool changeMode(const std::string& path, const std::string& mode) = 0;
};

} // namespace velt::model

#endif
