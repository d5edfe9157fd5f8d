#include "host/api/token_store.h"

#include "base/sha256.h"
#include "host/base/clock.h"
#include "host/base/file_text.h"
#include "host/base/json.h"
#include "host/base/random_text.h"

#include <fcntl.h>
#include <openssl/crypto.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <system_error>
#include <utility>

namespace velt::host {

namespace {

constexpr std::size_t tokenBytes = 32;
constexpr std::size_t idBytes = 6;
constexpr std::size_t hashLength = 64; ///< in digits

Json::Value toStored(const Token& token) {
    Json::Value object = toObject(token);
    object["sha256"] = token.hash;
    return object;
}

std::optional<Token> fromObject(const Json::Value& object) {
    for (const char* key : {"id", "name", "role", "created", "sha256"}) {
        if (!object.isObject() || !object[key].isString()) {
            return std::nullopt;
        }
    }
    const auto role = roleNamed(object["role"].asString());
    if (!role || object["sha256"].asString().size() != hashLength) {
        return std::nullopt;
    }
    return Token{object["id"].asString(), object["name"].asString(), *role, object["created"].asString(),
                 object["sha256"].asString()};
}

std::string systemError() {
    return std::generic_category().message(errno);
}

/// Writes the file whole and makes it durable; false, with errno, on failure.
bool writeDurably(const std::filesystem::path& file, const std::string& text) {
    const int descriptor = ::open(file.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOFOLLOW, 0600);
    if (descriptor < 0) {
        return false;
    }
    std::size_t written = 0;
    bool good = true;
    while (good && written < text.size()) {
        const ssize_t count = ::write(descriptor, text.data() + written, text.size() - written);
        good = count > 0 || (count < 0 && errno == EINTR);
        written += count > 0 ? static_cast<std::size_t>(count) : 0;
    }
    good = good && ::fsync(descriptor) == 0;
    return ::close(descriptor) == 0 && good;
}

bool syncFolder(const std::filesystem::path& folder) {
    const int descriptor = ::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    const bool good = descriptor >= 0 && ::fsync(descriptor) == 0;
    if (descriptor >= 0) {
        ::close(descriptor);
    }
    return good;
}

} // namespace

Json::Value toObject(const Token& token) {
    Json::Value object(Json::objectValue);
    object["id"] = token.id;
    object["name"] = token.name;
    object["role"] = roleName(token.role);
    object["created"] = token.created;
    return object;
}

const char* roleName(Role role) {
    return role == Role::admin ? "admin" : "viewer";
}

std::optional<Role> roleNamed(const std::string& name) {
    if (name == "admin") {
        return Role::admin;
    }
    return name == "viewer" ? std::optional(Role::viewer) : std::nullopt;
}

TokenStore::TokenStore(std::filesystem::path file) : file_(std::move(file)) {
    read();
}

void TokenStore::read() {
    const auto text = readFileText(file_);
    if (!text) {
        if (errno == ENOENT) {
            return;
        }
        throw TokenError("The file of tokens " + file_.string() + " cannot be read: " + systemError() + ".");
    }
    const auto content = parseObject(*text);
    const Json::Value list = content ? (*content)["tokens"] : Json::Value();
    bool good = list.isArray();
    for (Json::ArrayIndex i = 0; good && i < list.size(); ++i) {
        const auto token = fromObject(list[i]);
        good = token.has_value();
        if (token) {
            tokens_.push_back(*token);
        }
    }
    if (!good) {
        throw TokenError("The file of tokens " + file_.string() +
                         " is damaged. Restore it, or remove it and make new tokens.");
    }
}

void TokenStore::store(const std::vector<Token>& tokens) const {
    Json::Value root(Json::objectValue);
    root["tokens"] = Json::Value(Json::arrayValue);
    for (const Token& token : tokens) {
        root["tokens"].append(toStored(token));
    }
    std::error_code folderError;
    const std::filesystem::path folder = file_.parent_path();
    std::filesystem::create_directories(folder, folderError);
    const std::filesystem::path fresh = file_.string() + ".new";
    errno = folderError.value();
    if (folderError || !writeDurably(fresh, toJson(root) + "\n") ||
        ::rename(fresh.c_str(), file_.c_str()) != 0 || !syncFolder(folder)) {
        throw TokenError("The file of tokens " + file_.string() + " cannot be written: " + systemError() +
                         ".");
    }
}

NewToken TokenStore::create(const std::string& name, Role role) {
    std::string text = "velt_" + randomHexadecimal(tokenBytes);
    Token token{randomHexadecimal(idBytes), name, role, timestamp(), sha256(text)};
    const std::lock_guard lock(mutex_);
    std::vector<Token> changed = tokens_;
    changed.push_back(token);
    store(changed);
    tokens_ = std::move(changed);
    return {std::move(token), std::move(text)};
}

bool TokenStore::remove(const std::string& id) {
    const std::lock_guard lock(mutex_);
    std::vector<Token> changed = tokens_;
    if (std::erase_if(changed, [&id](const Token& token) { return token.id == id; }) == 0) {
        return false;
    }
    store(changed);
    tokens_ = std::move(changed);
    return true;
}

std::vector<Token> TokenStore::tokens() const {
    const std::lock_guard lock(mutex_);
    return tokens_;
}

std::optional<Token> TokenStore::find(const std::string& token) const {
    const std::string hash = sha256(token);
    const std::lock_guard lock(mutex_);
    const auto found = std::find_if(tokens_.begin(), tokens_.end(), [&hash](const Token& each) {
        return each.hash.size() == hash.size() &&
               CRYPTO_memcmp(each.hash.data(), hash.data(), hash.size()) == 0;
    });
    return found == tokens_.end() ? std::nullopt : std::optional(*found);
}

} // namespace velt::host
