#include "standalone/shares/share_file.h"

#include "base/json_text.h"
#include "base/plain_text.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <algorithm>
#include <array>
#include <initializer_list>

namespace velt {

namespace {

constexpr int formVersion = 1;

/// In the order of Access.
constexpr std::array accessWords{"none", "read", "write"};

Error damaged(const std::string& why) {
    return {ErrorNumber::damaged, statePath(paths::shares).string() + ": " + why + "."};
}

/// Reads the members of a JSON object and keeps the first mistake; what is read after it means nothing.
class Members {
public:
    Members(const Json::Value& object, std::string name) : object_(object), name_(std::move(name)) {
        expect(object.isObject(), ": expected an object");
    }

    void expectOnly(std::initializer_list<std::string_view> keys) {
        for (const std::string& key : good() ? object_.getMemberNames() : Json::Value::Members()) {
            expect(std::ranges::find(keys, key) != keys.end(),
                   ": unknown key \"" + plainText(key, 80) + "\"");
        }
    }
    std::string text(const char* key) {
        const Json::Value& value = at(key);
        expect(value.isString(), member(key) + "expected a string");
        return good() ? value.asString() : "";
    }
    std::string optionalText(const char* key) { return has(key) ? text(key) : ""; }
    bool truth(const char* key) {
        if (!has(key)) {
            return false;
        }
        expect(at(key).isBool(), member(key) + "expected true or false");
        return good() && at(key).asBool();
    }
    std::map<std::string, Access> grants(const char* key);

    Result<> result() const { return good() ? Result<>() : damaged(name_ + mistake_); }

private:
    static std::string member(const char* key) { return ", \"" + std::string(key) + "\": "; }
    bool good() const { return mistake_.empty(); }
    bool has(const char* key) const { return good() && object_.isMember(key); }
    const Json::Value& at(const char* key) const {
        return good() ? object_[key] : Json::Value::nullSingleton();
    }
    void expect(bool asItShould, const std::string& mistake) {
        if (good() && !asItShould) {
            mistake_ = mistake;
        }
    }

    const Json::Value& object_;
    std::string name_;
    std::string mistake_;
};

std::map<std::string, Access> Members::grants(const char* key) {
    std::map<std::string, Access> grants;
    if (!has(key)) {
        return grants;
    }
    const Json::Value& entries = at(key);
    expect(entries.isObject(), member(key) + "expected an object");
    for (const std::string& account : good() ? entries.getMemberNames() : Json::Value::Members()) {
        const Json::Value& value = entries[account];
        const auto* const word = std::ranges::find(accessWords, value.isString() ? value.asString() : "");
        expect(word != accessWords.end(), member(key) + "expected \"none\", \"read\" or \"write\" for \"" +
                                              plainText(account, 80) + "\"");
        grants.emplace(account, static_cast<Access>(word - accessWords.begin()));
    }
    return grants;
}

Result<ShareEntry> shareOf(const Json::Value& object, std::size_t number) {
    Members members(object, "share " + std::to_string(number));
    members.expectOnly({"name", "comment", "path", "ftp", "users", "groups"});
    ShareEntry share;
    share.name = members.text("name");
    share.path = members.text("path");
    share.comment = members.optionalText("comment");
    share.offeredToFtp = members.truth("ftp");
    share.users = members.grants("users");
    share.groups = members.grants("groups");
    VELT_RETURN_IF_ERROR(members.result());
    return share;
}

Result<> checkRoot(const Json::Value& root) {
    if (!root.isObject()) {
        return damaged("expected an object");
    }
    if (!root["version"].isInt() || root["version"].asInt() != formVersion) {
        return damaged("\"version\": expected 1");
    }
    if (!root["shares"].isArray()) {
        return damaged("\"shares\": expected a list");
    }
    for (const std::string& key : root.getMemberNames()) {
        if (key != "version" && key != "shares") {
            return damaged("unknown key \"" + plainText(key, 80) + "\"");
        }
    }
    return {};
}

} // namespace

Result<std::vector<ShareEntry>> parseShares(std::string_view text) {
    const Result<Json::Value> root = parseJson(text);
    if (!root) {
        return damaged("invalid JSON: " + plainText(root.error().message, 300));
    }
    VELT_RETURN_IF_ERROR(checkRoot(*root));
    std::vector<ShareEntry> shares;
    for (const Json::Value& object : (*root)["shares"]) {
        VELT_ASSIGN_OR_RETURN(auto share, shareOf(object, shares.size() + 1));
        shares.push_back(std::move(share));
    }
    if (const Result<> good = checkShares(shares); !good) {
        return damaged(good.error().message);
    }
    return shares;
}

} // namespace velt
