// Bearer tokens. Only their hashes are stored, so the file is useless to a thief.
#ifndef VELT_HOST_API_TOKEN_STORE_H
#define VELT_HOST_API_TOKEN_STORE_H

#include "host/http/message.h"

#include <json/value.h>

#include <filesystem>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace velt::host {

/// Where the tokens are below the state root.
inline constexpr const char* tokenFileName = "var/lib/velt/tokens.json";

/// The token file cannot be read or written; what() is a sentence for the administrator.
class TokenError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// There is a token of that name already.
class TokenNameTaken : public TokenError {
public:
    static constexpr const char* sentence =
        "There is a token of this name. Delete it, or choose another name.";

    TokenNameTaken() : TokenError(sentence) {}
};

struct Token {
    std::string id;
    std::string name;
    Role role = Role::viewer;
    std::string created; ///< "2026-11-21T06:30:00.000Z"
    std::string hash;    ///< SHA-256 of the token, 64 hexadecimal digits
};

/// What everybody may know of a token: all but its hash.
Json::Value toObject(const Token& token);

struct NewToken {
    Token stored;
    std::string text; ///< what its owner sends; not kept anywhere
};

/// Thread-safe.
class TokenStore {
public:
    /// Reads the file, which may be missing. Throws TokenError when it is damaged, or when others than root
    /// and the host's own user could have written it: access is never guessed.
    explicit TokenStore(std::filesystem::path file);

    /// Makes a token of 256 random bits. Throws TokenError, and makes none, when it cannot be stored, or
    /// another one has its name.
    NewToken create(const std::string& name, Role role);

    /// False when there is no such token. Throws TokenError when the change cannot be stored.
    bool remove(const std::string& id);

    std::vector<Token> tokens() const;

    bool has(const std::string& id) const;

    /// The token with this text.
    std::optional<Token> find(const std::string& token) const;

private:
    void load();
    void store(const std::vector<Token>& tokens) const;

    const std::filesystem::path file_;
    mutable std::mutex mutex_;
    std::vector<Token> tokens_;
};

/// "admin" or "viewer".
const char* roleName(Role role);

/// Nothing for any other word.
std::optional<Role> roleNamed(const std::string& name);

} // namespace velt::host

#endif
