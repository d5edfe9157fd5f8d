#include "host/api/token_store.h"

#include "base/file.h"
#include "base/json_value.h"
#include "base/sha256.h"
#include "base/trusted_file.h"
#include "base/utc_text.h"
#include "host/base/json.h"
#include "host/base/random_text.h"

#include <openssl/crypto.h>

#include <algorithm>
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

} // namespace

Json::Value toObject(const Token& token) {
    return jsonObject(
        {{"id", token.id}, {"name", token.name}, {"role", roleName(token.role)}, {"created", token.created}});
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
    load();
}

void TokenStore::load() {
    std::error_code unknown;
    if (std::filesystem::symlink_status(file_, unknown).type() == std::filesystem::file_type::not_found) {
        return;
    }
    const auto text = readTrusted(file_);
    if (!text) {
        throw TokenError("The token file " + text.error().message +
                         " Correct that, or remove it and make new tokens.");
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
        throw TokenError("The token file " + file_.string() +
                         " is damaged. Restore it, or remove it and make new tokens.");
    }
}

void TokenStore::store(const std::vector<Token>& tokens) const {
    const Json::Value root = jsonObject({{"tokens", jsonArray(tokens, toStored)}});
    if (const auto stored = replaceFile(file_, toJson(root) + "\n", 0600); !stored) {
        throw TokenError(stored.error().message);
    }
}

NewToken TokenStore::create(const std::string& name, Role role) {
    std::string text = "velt_" + randomHexadecimal(tokenBytes);
    Token token{randomHexadecimal(idBytes), name, role, timestamp(), sha256(text)};
    const std::lock_guard lock(mutex_);
    if (std::ranges::find(tokens_, name, &Token::name) != tokens_.end()) {
        throw TokenNameTaken();
    }
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

bool TokenStore::has(const std::string& id) const {
    const std::lock_guard lock(mutex_);
    return std::ranges::find(tokens_, id, &Token::id) != tokens_.end();
}

std::optional<Token> TokenStore::find(const std::string& token) const {
    const std::string hash = sha256(token);
    const std::lock_guard lock(mutex_);
    const auto found = std::ranges::find_if(tokens_, [&hash](const Token& each) {
        return each.hash.size() == hash.size() &&
               CRYPTO_memcmp(each.hash.data(), hash.data(), hash.size()) == 0;
    });
    return found == tokens_.end() ? std::nullopt : std::optional(*found);
}

} // namespace velt::host
