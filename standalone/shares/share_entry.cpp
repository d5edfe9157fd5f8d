#include "standalone/shares/share_entry.h"

#include "base/plain_text.h"
#include "standalone/core/error_number.h"

#include <set>
#include <string_view>

namespace velt {

namespace {

// A share appears as a folder of its name below the root that unconfined users see.
constexpr std::size_t longestName = 255;
constexpr std::size_t longestComment = 1024;
constexpr std::size_t longestPath = 4095;
constexpr std::size_t longestAccount = 255;

bool isShareName(std::string_view name) {
    return !name.empty() && name.size() <= longestName && name != "." && name != ".." &&
           name.find('/') == std::string_view::npos && isPlainText(name);
}

bool isFolderPath(std::string_view path) {
    if (path.empty() || path[0] != '/' || path.size() > longestPath || !isPlainText(path)) {
        return false;
    }
    return (std::string(path) + "/").find("/../") == std::string::npos;
}

Error wrong(const char* key, const std::string& expected) {
    return Error(", \"" + std::string(key) + "\": " + expected);
}

Result<> checkAccounts(const std::map<std::string, Access>& grants, const char* key) {
    for (const auto& [account, grant] : grants) {
        if (account.empty() || account.size() > longestAccount || !isPlainText(account)) {
            return wrong(key, "\"" + plainText(account, 80) + "\" cannot be the name of an account");
        }
    }
    return {};
}

Result<> checkShare(const ShareEntry& share) {
    if (!isShareName(share.name)) {
        return wrong("name",
                     "expected 1 to 255 bytes of UTF-8 in one line, without \"/\", not \".\" or \"..\"");
    }
    if (share.comment.size() > longestComment || !isPlainText(share.comment)) {
        return wrong("comment", "expected at most 1024 bytes of UTF-8 in one line");
    }
    if (!isFolderPath(share.path)) {
        return wrong("path",
                     "expected an absolute path without \"..\", at most 4095 bytes of UTF-8 in one line");
    }
    VELT_RETURN_IF_ERROR(checkAccounts(share.users, "users"));
    return checkAccounts(share.groups, "groups");
}

} // namespace

Result<> checkShares(const std::vector<ShareEntry>& shares) {
    std::set<std::string_view> names;
    for (std::size_t i = 0; i < shares.size(); ++i) {
        const std::string which = "share " + std::to_string(i + 1);
        if (const Result<> good = checkShare(shares[i]); !good) {
            return Error(ErrorNumber::invalid, which + good.error().message);
        }
        if (!names.insert(shares[i].name).second) {
            return Error(ErrorNumber::invalid,
                         which + ": duplicate name \"" + plainText(shares[i].name, 80) + "\"");
        }
    }
    return {};
}

} // namespace velt
