#include "standalone/login/login_view.h"

#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/trusted_file.h"
#include "standalone/login/grants.h"
#include "standalone/login/open_folder.h"
#include "standalone/login/view_mounts.h"
#include "standalone/rules/rule_store.h"
#include "standalone/shares/share_file.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <optional>

namespace velt {
namespace {

bool refuse(const std::string& why) {
    fail(ErrorNumber::invalid, why);
    return false;
}

// A missing file is the same as no share, but for rules, which could have been taken away with their file.
std::optional<std::vector<ShareEntry>> readShares() {
    const auto path = statePath(paths::shares);
    std::error_code error;
    if (std::filesystem::symlink_status(path, error).type() == std::filesystem::file_type::not_found) {
        return std::vector<ShareEntry>();
    }
    const auto text = readTrusted(path);
    if (!text) {
        fail(text.error());
        return std::nullopt;
    }
    std::string flaw;
    auto shares = parseShares(*text, flaw);
    if (!shares) {
        refuse("The file " + path.string() + " is damaged: " + flaw + ".");
    }
    return shares;
}

/// The path of the rule that applies, "" for none.
std::optional<std::string> readRule(const Login& login) {
    const auto text = readTrusted(statePath(paths::chrootRules));
    if (!text) {
        fail(text.error());
        return std::nullopt;
    }
    const auto rules = parseRules(*text);
    if (!rules) {
        return std::nullopt;
    }
    const auto ofUser = std::ranges::find_if(
        *rules, [&](const ChrootRule& rule) { return rule.isUser && rule.id == login.uid; });
    const auto rule = ofUser != rules->end() ? ofUser : std::ranges::find_if(*rules, [&](const auto& one) {
        return !one.isUser && std::ranges::find(login.gids, one.id) != login.gids.end();
    });
    return rule != rules->end() ? rule->path : std::string();
}

/// Shows a folder of which the login may use so much, seen from the share or home at `outer`.
bool showOne(const std::filesystem::path& root, UniqueFd folder, const std::filesystem::path& outer,
             Access access, const Grants& grants) {
    const auto place = placeOf(folder);
    if (place.empty() || outer.empty()) {
        return refuse("The place of the folder cannot be told.");
    }
    access = grants.leastAt(place, outer, access);
    if (access == Access::none) {
        return refuse("The shares grant no access to " + place.string() + ".");
    }
    return showFolder(root,
                      {std::move(folder), access == Access::read, grants.restrictionsBelow(place, access)});
}

bool showHome(const Login& login, const std::filesystem::path& root, const Grants& grants) {
    UniqueFd home = openFolderAs(login, login.home);
    if (!home) {
        return refuse("The home " + login.home + " cannot be opened: " + std::strerror(errno) + ".");
    }
    const auto place = placeOf(home);
    if (place == "/") {
        return refuse("The home is the root directory of the server.");
    }
    // Of the shares around the home none counts: it is the user's own. A share that is the home counts.
    return showOne(root, std::move(home), place.parent_path(), Access::write, grants);
}

/// Shows the folder "/share/below/it".
bool showInShare(const Login& login, const std::filesystem::path& root, const std::string& path,
                 const std::vector<ShareEntry>& shares, const Grants& grants) {
    const auto end = std::min(path.find('/', 1), path.size());
    const auto share = std::ranges::find(shares, path.substr(1, end - 1), &ShareEntry::name);
    if (share == shares.end()) {
        return refuse("There is no share for " + path + ".");
    }
    const Access access = grants.on(*share);
    if (access == Access::none) {
        return refuse("The share " + share->name + " grants no access.");
    }
    UniqueFd folder = openFolderAs(login, share->path);
    const auto outer = folder ? placeOf(folder) : std::filesystem::path();
    if (folder && end < path.size()) {
        folder = openFolderBelow(login, folder, path.substr(end + 1));
    }
    if (!folder) {
        return refuse("The folder for " + path + " cannot be opened: " + std::strerror(errno) + ".");
    }
    return showOne(root, std::move(folder), outer, access, grants);
}

bool showShares(const Login& login, const std::filesystem::path& root, const std::vector<ShareEntry>& shares,
                const Grants& grants, std::vector<std::string>& remarks) {
    SideBySide view(root);
    if (!view.begin()) {
        return false;
    }
    for (const ShareEntry& share : shares) {
        const Access access = share.offeredToFtp ? grants.on(share) : Access::none;
        if (access == Access::none) {
            continue;
        }
        UniqueFd folder = openFolderAs(login, share.path);
        const auto place = folder ? placeOf(folder) : std::filesystem::path();
        if (place.empty()) {
            remarks.push_back("The share " + share.name + " is left out: its folder cannot be opened.");
        } else if (!view.add(share.name, {std::move(folder), access == Access::read,
                                          grants.restrictionsBelow(place, access)})) {
            remarks.push_back("The share " + share.name + " is left out: " + lastErrorSentence());
        }
    }
    return view.finish();
}

bool showToAnonymous(const Login& login, const std::filesystem::path& root,
                     const std::vector<ShareEntry>& shares, const Grants& grants,
                     std::vector<std::string>& remarks) {
    if (login.anonymousShare.empty()) {
        return showShares(login, root, shares, grants, remarks);
    }
    const auto name = readTrusted(login.anonymousShare);
    if (!name) {
        return false;
    }
    const auto share = std::ranges::find(shares, *name, &ShareEntry::name);
    if (share == shares.end() || !share->offeredToFtp) {
        return refuse("The share for anonymous users is gone, or is not offered to FTP.");
    }
    return showInShare(login, root, "/" + *name, shares, grants);
}

} // namespace

bool makeLoginView(const Login& login, const std::filesystem::path& root, std::vector<std::string>& remarks) {
    const bool anonymous = login.kind == LoginKind::anonymous;
    const auto rule = anonymous ? std::string() : readRule(login);
    if (!rule) {
        return false;
    }
    if (login.kind == LoginKind::server) {
        return rule->empty() || refuse("A login cannot be confined without root's rights.");
    }
    const auto shares = readShares();
    if (!shares || !isolateMounts()) {
        return false;
    }
    const Grants grants(login, *shares);
    if (anonymous) {
        return showToAnonymous(login, root, *shares, grants, remarks);
    }
    if (!rule->empty() && *rule != homePath) {
        return showInShare(login, root, *rule, *shares, grants);
    }
    return rule->empty() && login.kind == LoginKind::shares
               ? showShares(login, root, *shares, grants, remarks)
               : showHome(login, root, grants);
}

} // namespace velt
