#include "standalone/shares/share_file.h"

#include "base/plain_text.h"

#include <json/json.h>

#include <algorithm>
#include <array>
#include <exception>
#include <initializer_list>
#include <memory>
#include <stdexcept>

namespace velt {

namespace {

constexpr int formVersion = 1;

struct GrantWord {
    ShareGrant grant;
    const char* word;
};
constexpr std::array<GrantWord, 3> grantWords{{
    {ShareGrant::none, "none"},
    {ShareGrant::read, "read"},
    {ShareGrant::write, "write"},
}};

/// What is wrong with the text, on its way from where it is seen to where it is reported.
class Flaw : public std::runtime_error {
    using std::runtime_error::runtime_error;
};

void requireOnlyKeys(const Json::Value& object, std::initializer_list<std::string_view> known) {
    for (const std::string& key : object.getMemberNames()) {
        if (std::find(known.begin(), known.end(), key) == known.end()) {
            throw Flaw("has the unknown key \"" + plainText(key, 80) + "\"");
        }
    }
}

std::string textAt(const Json::Value& object, const char* key) {
    if (!object[key].isString()) {
        throw Flaw("has no text \"" + std::string(key) + "\"");
    }
    return object[key].asString();
}

std::map<std::string, ShareGrant> grantsAt(const Json::Value& object, const char* key) {
    std::map<std::string, ShareGrant> grants;
    if (!object.isMember(key)) {
        return grants;
    }
    const Json::Value& entries = object[key];
    if (!entries.isObject()) {
        throw Flaw("has \"" + std::string(key) + "\" that is no object");
    }
    for (const std::string& account : entries.getMemberNames()) {
        const Json::Value& value = entries[account];
        const auto* const word =
            std::find_if(grantWords.begin(), grantWords.end(), [&value](const GrantWord& known) {
                return value.isString() && value == known.word;
            });
        if (word == grantWords.end()) {
            throw Flaw("grants \"" + plainText(account, 80) +
                       "\" something other than \"none\", \"read\" or \"write\"");
        }
        grants.emplace(account, word->grant);
    }
    return grants;
}

ShareEntry shareOf(const Json::Value& object) {
    if (!object.isObject()) {
        throw Flaw("is no object");
    }
    requireOnlyKeys(object, {"name", "comment", "path", "ftp", "users", "groups"});
    ShareEntry share;
    share.name = textAt(object, "name");
    share.path = textAt(object, "path");
    if (object.isMember("comment")) {
        share.comment = textAt(object, "comment");
    }
    if (object.isMember("ftp")) {
        if (!object["ftp"].isBool()) {
            throw Flaw("has \"ftp\" that is neither true nor false");
        }
        share.offeredToFtp = object["ftp"].asBool();
    }
    share.users = grantsAt(object, "users");
    share.groups = grantsAt(object, "groups");
    return share;
}

std::vector<ShareEntry> sharesOf(const Json::Value& root) {
    if (!root.isObject()) {
        throw Flaw("the file is no object");
    }
    if (!root["version"].isInt() || root["version"].asInt() != formVersion) {
        throw Flaw("\"version\" is not 1");
    }
    if (!root["shares"].isArray()) {
        throw Flaw("\"shares\" is no array");
    }
    for (const std::string& key : root.getMemberNames()) {
        if (key != "version" && key != "shares") {
            throw Flaw("the unknown key \"" + plainText(key, 80) + "\"");
        }
    }
    std::vector<ShareEntry> shares;
    for (Json::ArrayIndex i = 0; i < root["shares"].size(); ++i) {
        try {
            shares.push_back(shareOf(root["shares"][i]));
        } catch (const Flaw& flaw) {
            throw Flaw("share " + std::to_string(i + 1) + " " + flaw.what());
        }
    }
    if (const std::optional<std::string> flaw = flawOf(shares)) {
        throw Flaw(*flaw);
    }
    return shares;
}

Json::Value parseJson(std::string_view text) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value root;
    std::string errors;
    if (!reader->parse(text.data(), text.data() + text.size(), &root, &errors)) {
        std::replace(errors.begin(), errors.end(), '\n', ' ');
        throw Flaw("no valid JSON: " + plainText(errors, 300));
    }
    return root;
}

Json::Value grantsValue(const std::map<std::string, ShareGrant>& grants) {
    Json::Value object(Json::objectValue);
    for (const auto& [account, grant] : grants) {
        object[account] = grantWords[static_cast<std::size_t>(grant)].word;
    }
    return object;
}

} // namespace

std::optional<std::vector<ShareEntry>> parseShares(std::string_view text, std::string& flaw) {
    // The JSON library throws, too, when values are nested too deep.
    try {
        return sharesOf(parseJson(text));
    } catch (const std::exception& problem) {
        flaw = problem.what();
        return std::nullopt;
    }
}

std::string renderShares(const std::vector<ShareEntry>& shares) {
    Json::Value list(Json::arrayValue);
    for (const ShareEntry& share : shares) {
        Json::Value object(Json::objectValue);
        object["name"] = share.name;
        object["comment"] = share.comment;
        object["path"] = share.path;
        object["ftp"] = share.offeredToFtp;
        object["users"] = grantsValue(share.users);
        object["groups"] = grantsValue(share.groups);
        list.append(std::move(object));
    }
    Json::Value root(Json::objectValue);
    root["version"] = formVersion;
    root["shares"] = std::move(list);
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "  ";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, root) + "\n";
}

} // namespace velt
