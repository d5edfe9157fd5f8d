#include "standalone/shares/share_file.h"

#include "base/plain_text.h"

#include <set>

namespace velt {

namespace {

// A share appears as a folder of its name below the root that unconfined users see.
constexpr std::size_t longestName = 255;
constexpr std::size_t longestComment = 1024;
constexpr std::size_t longestPath = 4095;
constexpr std::size_t longestAccount = 255;

bool isFolderPath(std::string_view path) {
    if (path.empty() || path[0] != '/' || path.size() > longestPath || !isPlainText(path)) {
        return false;
    }
    return (std::string(path) + "/").find("/../") == std::string::npos;
}

std::optional<std::string> flawOfGrants(const std::map<std::string, ShareGrant>& grants, const char* whose) {
    for (const auto& [account, grant] : grants) {
        if (account.empty() || account.size() > longestAccount || !isPlainText(account)) {
            return "names a " + std::string(whose) + " that cannot exist: \"" + plainText(account, 80) + "\"";
        }
    }
    return std::nullopt;
}

std::optional<std::string> flawOf(const ShareEntry& share) {
    if (!isShareName(share.name)) {
        return "has a name that is not 1 to 255 bytes of UTF-8 without \"/\" and control characters, or that "
               "is "
               "\".\" or \"..\"";
    }
    if (share.comment.size() > longestComment || !isPlainText(share.comment)) {
        return "has a comment that is not one line of at most 1024 bytes of UTF-8";
    }
    if (!isFolderPath(share.path)) {
        return "has a path that is not absolute, has \"..\" in it, is longer than 4095 bytes, or is not one "
               "line "
               "of UTF-8: \"" +
               plainText(share.path, 120) + "\"";
    }
    if (std::optional<std::string> flaw = flawOfGrants(share.users, "user")) {
        return flaw;
    }
    return flawOfGrants(share.groups, "group");
}

} // namespace

bool isShareName(std::string_view name) {
    return !name.empty() && name.size() <= longestName && name != "." && name != ".." &&
           name.find('/') == std::string_view::npos && isPlainText(name);
}

std::optional<std::string> flawOf(const std::vector<ShareEntry>& shares) {
    std::set<std::string_view> names;
    for (std::size_t i = 0; i < shares.size(); ++i) {
        const std::string which =
            "share " + std::to_string(i + 1) + " (\"" + plainText(shares[i].name, 80) + "\") ";
        if (const std::optional<std::string> flaw = flawOf(shares[i])) {
            return which + *flaw;
        }
        if (!names.insert(shares[i].name).second) {
            return which + "has the name of another share";
        }
    }
    return std::nullopt;
}

} // namespace velt
