#include "standalone/keys/key_store.h"

#include "base/file.h"
#include "base/json_text.h"
#include "base/json_value.h"
#include "base/plain_text.h"
#include "base/trusted_file.h"
#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <algorithm>
#include <charconv>

namespace velt {
namespace {
namespace fs = std::filesystem;

constexpr int formVersion = 1;
constexpr mode_t fileMode = 0600;
constexpr mode_t folderMode = 0700;
constexpr std::size_t longestFileName = 240; ///< a store adds a few letters
constexpr std::size_t longestText = 256;     ///< of what says when, and by whom

// A dot in front would be a hidden file, as an unfinished store is; case counts in names of accounts.
constexpr std::string_view plainLetters =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_-.@";
constexpr std::string_view digits = "0123456789ABCDEF";

std::string fileNameOf(std::string_view user) {
    std::string name;
    for (const char letter : user) {
        const bool plain =
            plainLetters.find(letter) != std::string_view::npos && (letter != '.' || !name.empty());
        const auto byte = static_cast<unsigned char>(letter);
        name += plain ? std::string(1, letter) : std::string{'%', digits[byte / 16], digits[byte % 16]};
    }
    return name;
}

/// The user with this file; nothing for a file of nobody.
std::optional<std::string> userOf(std::string_view fileName) {
    std::string user;
    for (std::size_t i = 0; i < fileName.size(); ++i) {
        unsigned byte = static_cast<unsigned char>(fileName[i]);
        if (fileName[i] == '%' && i + 2 < fileName.size()) {
            const auto* const begin = fileName.data() + i + 1;
            std::from_chars(begin, begin + 2, byte, 16);
            i += 2;
        }
        user += static_cast<char>(byte);
    }
    const bool is = !user.empty() && fileNameOf(user) == fileName;
    return is ? std::optional(std::move(user)) : std::nullopt;
}

Error damaged(const std::string& user, const std::string& why) {
    const auto path = keyFileOf(user);
    return {ErrorNumber::damaged, "The file of the keys of " + plainText(user, longestText) + ", " +
                                      (path ? path->string() : "") + ", is damaged: " + why + "."};
}

bool isShortText(const Json::Value& value) {
    return value.isString() && value.asString().size() <= longestText && isPlainText(value.asString());
}

bool hasOnly(const Json::Value& object, std::initializer_list<const char*> names) {
    return object.isObject() && object.size() == names.size() &&
           std::ranges::all_of(names, [&](const char* name) { return object.isMember(name); });
}

Result<KeyEntry> entryOf(const Json::Value& object) {
    if (!hasOnly(object, {"key", "added", "by"}) || !object["key"].isString() ||
        !isShortText(object["added"]) || !isShortText(object["by"])) {
        return Error(ErrorNumber::damaged, "texts \"key\", \"added\" and \"by\"");
    }
    VELT_ASSIGN_OR_RETURN(auto key, parsePublicKey(object["key"].asString()));
    return KeyEntry{std::move(key), object["added"].asString(), object["by"].asString()};
}

Json::Value toObject(const KeyEntry& entry) {
    return jsonObject({{"key", toText(entry.key)}, {"added", entry.added}, {"by", entry.by}});
}

bool hasKey(const KeyFile& file, const std::string& fingerprint) {
    return std::ranges::any_of(file.keys,
                               [&](const KeyEntry& each) { return each.key.fingerprint == fingerprint; });
}

} // namespace

Result<fs::path> keyFileOf(const std::string& user) {
    const std::string name = fileNameOf(user);
    if (name.empty() || name.size() > longestFileName) {
        return Error(ErrorNumber::notFound, "There is no user with a name of such a length.");
    }
    return statePath(paths::userKeys) / name;
}

Result<std::optional<std::string>> readKeyFile(const std::string& user) {
    VELT_ASSIGN_OR_RETURN(const auto path, keyFileOf(user));
    VELT_ASSIGN_OR_RETURN(const bool there, isThere(path));
    if (!there) {
        return std::nullopt;
    }
    auto text = readTrusted(path);
    if (!text) {
        return Error(ErrorNumber::store, "The file of the keys of " + plainText(user, longestText) +
                                             " cannot be used: " + text.error().message);
    }
    return std::optional(std::move(*text));
}

Result<KeyFile> parseKeyFile(const std::string& user, std::string_view text) {
    const auto root = parseJson(text);
    if (!root) {
        return damaged(user, "invalid JSON: " + plainText(root.error().message, longestText));
    }
    if (!hasOnly(*root, {"version", "user", "uid", "keys"}) || (*root)["version"] != formVersion ||
        (*root)["user"] != user || !(*root)["uid"].isUInt() || !(*root)["keys"].isArray()) {
        return damaged(user, R"(expected "version" 1, this "user", a "uid", and a list of "keys")");
    }
    KeyFile file{user, (*root)["uid"].asUInt(), {}};
    for (const Json::Value& object : (*root)["keys"]) {
        auto entry = entryOf(object);
        const std::string place = "key " + std::to_string(file.keys.size() + 1) + ": ";
        if (!entry) {
            return damaged(user, place + "expected " + entry.error().message);
        }
        if (hasKey(file, entry->key.fingerprint)) {
            return damaged(user, place + "it is there twice");
        }
        file.keys.push_back(std::move(*entry));
    }
    return file;
}

Result<std::optional<KeyFile>> loadKeyFile(const std::string& user) {
    VELT_ASSIGN_OR_RETURN(const auto text, readKeyFile(user));
    if (!text) {
        return std::nullopt;
    }
    VELT_ASSIGN_OR_RETURN(auto file, parseKeyFile(user, *text));
    return std::optional(std::move(file));
}

Result<> storeKeyFile(const KeyFile& file) {
    VELT_ASSIGN_OR_RETURN(const auto path, keyFileOf(file.user));
    const Json::Value root = jsonObject({{"version", formVersion},
                                         {"user", file.user},
                                         {"uid", file.uid},
                                         {"keys", jsonArray(file.keys, toObject)}});
    return perform(Effect::store, "keys", [&]() -> Result<> {
        VELT_RETURN_IF_ERROR(makeFolder(path.parent_path(), folderMode));
        return replaceFile(path, jsonText(root, "  ") + "\n", fileMode);
    });
}

Result<std::vector<std::string>> usersWithKeys() {
    const fs::path folder = statePath(paths::userKeys);
    VELT_ASSIGN_OR_RETURN(const bool there, isThere(folder));
    std::vector<std::string> users;
    if (!there) {
        return users;
    }
    std::error_code error;
    for (fs::directory_iterator at(folder, error), end; !error && at != end; at.increment(error)) {
        if (auto user = userOf(at->path().filename().string())) {
            users.push_back(std::move(*user));
        }
    }
    if (error) {
        return cannot("read the folder", folder, error.value());
    }
    std::ranges::sort(users);
    return users;
}

std::string keysForDaemon(const KeyFile& file, uid_t uid) {
    std::string lines;
    for (const KeyEntry& entry : file.keys) {
        lines += file.uid == uid ? lineForDaemon(entry.key) : "";
    }
    return lines;
}

} // namespace velt
