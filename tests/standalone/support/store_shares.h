// Shares in the file where the platform finds them. An administrator writes it by hand.
#ifndef VELT_TESTS_STANDALONE_SUPPORT_STORE_SHARES_H
#define VELT_TESTS_STANDALONE_SUPPORT_STORE_SHARES_H

#include "base/file.h"
#include "base/json_text.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/shares/share_entry.h"

#include <array>
#include <map>
#include <string>
#include <vector>

namespace velt::test {

inline Json::Value grantsValue(const std::map<std::string, Access>& grants) {
    constexpr std::array words{"none", "read", "write"};
    Json::Value value(Json::objectValue);
    for (const auto& [account, access] : grants) {
        value[account] = words.at(static_cast<std::size_t>(access));
    }
    return value;
}

inline std::string renderShares(const std::vector<ShareEntry>& shares) {
    Json::Value root;
    root["version"] = 1;
    root["shares"] = Json::Value(Json::arrayValue);
    for (const ShareEntry& share : shares) {
        Json::Value value;
        value["name"] = share.name;
        value["comment"] = share.comment;
        value["path"] = share.path;
        value["ftp"] = share.offeredToFtp;
        value["users"] = grantsValue(share.users);
        value["groups"] = grantsValue(share.groups);
        root["shares"].append(value);
    }
    return jsonText(root, "  ") + "\n";
}

inline Result<> storeShares(const std::vector<ShareEntry>& shares) {
    return replaceFile(statePath(paths::shares), renderShares(shares), 0644);
}

} // namespace velt::test

#endif
