#include "standalone/shares/share.h"

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

Result<> checkAccounts(const std::map<std::string, Access>& grants, const char* kind) {
    for (const auto& [account, grant] : grants) {
        if (account.empty() || account.size() > longestAccount || !isPlainText(account)) {
            return Error("names a " + std::string(kind) + " that cannot exist: \"" + plainText(account, 80) +
                         "\"");
        }
    }
    return {};
}

Result<> checkShare(const ShareEntry& share) {
    if (!isShareName(share.name)) {
        return Error("has a name that is not 1 to 255 bytes of UTF-8 without \"/\" and control characters, "
                     "or that is \".\" or \"..\"");
    }
    if (share.comment.size() > longestComment || !isPlainText(share.comment)) {
        return Error("has a comment that is not one line of at most 1024 bytes of UTF-8");
    }
    if (!isFolderPath(share.path)) {
        return Error("has a path that is not absolute, has \"..\" in it, is longer than 4095 bytes, or is "
                     "not one line of UTF-8: \"" +
                     plainText(share.path, 120) + "\"");
    }
    const Result<> users = checkAccounts(share.users, "user");
    return users ? checkAccounts(share.groups, "group") : users;
}

} // namespace

Result<> checkShares(const std::vector<ShareEntry>& shares) {
    std::set<std::string_view> names;
    for (std::size_t i = 0; i < shares.size(); ++i) {
        const std::string which =
            "share " + std::to_string(i + 1) + " (\"" + plainText(shares[i].name, 80) + "\") ";
        if (const Result<> good = checkShare(shares[i]); !good) {
            return Error(ErrorNumber::invalid, which + good.error().message);
        }
        if (!names.insert(shares[i].name).second) {
            return Error(ErrorNumber::invalid, which + "has the name of another share");
        }
    }
    return {};
}

} // namespace velt
