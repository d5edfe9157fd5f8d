// velt-access STATE USER [PATH]
//
// Writes what logins of this user would see, and why, as JSON (docs/api.md) to standard output; with PATH
// also what they could do with this file or folder of the server. STATE is the state root. Ends with 1 and
// the reason on standard error when that cannot be told. It looks at files with the user's rights, so it is a
// program of its own, and not a thread of the host.
#include "base/json_text.h"
#include "base/json_value.h"
#include "base/plain_text.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/state_root.h"
#include "standalone/login/view_report.h"
#include "standalone/settings/confinement_settings.h"

#include <array>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string_view>

namespace {

using velt::jsonArray;
using velt::jsonObject;

/// Names of files may hold bytes that are no text.
Json::Value text(const std::string& bytes) {
    return velt::plainText(bytes, PATH_MAX);
}

Json::Value texts(const std::vector<std::string>& all) {
    return jsonArray(all, text);
}

Json::Value word(velt::Access access) {
    constexpr std::array words{"none", "read", "write"};
    return words.at(static_cast<std::size_t>(access));
}

Json::Value describe(const velt::SeenFolder& seen) {
    const auto within = jsonArray(seen.within, [&](const velt::Restriction& one) {
        return jsonObject({{"folder", text(seen.folder / one.place)}, {"access", word(one.access)}});
    });
    return jsonObject({{"path", text(seen.path)},
                       {"folder", text(seen.folder)},
                       {"access", word(seen.access)},
                       {"reasons", texts(seen.reasons)},
                       {"within", within}});
}

Json::Value describe(const velt::ViewReport& view) {
    Json::Value result = jsonObject(
        {{"allowed", view.refused.empty()},
         {"whole_server", view.isWholeServer},
         {"reasons", texts(view.reasons)},
         {"folders", jsonArray(view.folders, [](const auto& seen) { return describe(seen); })},
         {"unseen_shares",
          jsonArray(view.unseen,
                    [](const velt::UnseenShare& one) {
                        return jsonObject({{"share", text(one.share)}, {"reasons", texts(one.reasons)}});
                    })},
         {"remarks", texts(view.remarks)}});
    if (!view.refused.empty()) {
        result["refused"] = text(view.refused);
    }
    return result;
}

Json::Value describe(const velt::SeenPath& seen) {
    Json::Value result = jsonObject({{"access", word(seen.access)}, {"reason", text(seen.reason)}});
    if (!seen.path.empty()) {
        result["path"] = text(seen.path);
    }
    return result;
}

/// Of an FTP login of this account with the stored settings.
velt::Result<velt::Login> ftpLogin(const velt::UserEntry& user) {
    VELT_ASSIGN_OR_RETURN(const auto view, velt::storedDefaultView());
    return velt::Login{view, {user.name, user.uid, velt::groupsOf(user)}, user.home, ""};
}

/// Over SFTP a login sees the same, or everything.
velt::Result<velt::ViewReport> sftpView(const velt::ViewReport& ftp) {
    VELT_ASSIGN_OR_RETURN(const auto confinement, velt::loadConfinementSettings());
    if (confinement.sftp) {
        return ftp;
    }
    velt::ViewReport all;
    all.isWholeServer = true;
    all.reasons.emplace_back("SFTP is not confined: the login sees what Unix modes let the user reach.");
    return all;
}

/// Neither daemon lets it in, whatever the rules say.
velt::ViewReport refusedRoot() {
    velt::ViewReport none;
    none.refused = "The services let no account with the user number 0 log in.";
    return none;
}

velt::Result<Json::Value> report(const std::string& name, const char* path) {
    VELT_ASSIGN_OR_RETURN(const auto user, velt::findUser(name));
    VELT_ASSIGN_OR_RETURN(const auto login, ftpLogin(user));
    const auto ftp = user.uid == 0 ? refusedRoot() : velt::reportView(login);
    VELT_ASSIGN_OR_RETURN(const auto sftp,
                          user.uid == 0 ? velt::Result<velt::ViewReport>(refusedRoot()) : sftpView(ftp));
    Json::Value result = jsonObject(
        {{"user", jsonObject({{"name", text(user.name)},
                              {"uid", user.uid},
                              {"home", text(user.home)},
                              {"groups", jsonArray(login.user.gids,
                                                   [](gid_t gid) {
                                                       const auto group = velt::groupById(gid);
                                                       return group ? text(group->name)
                                                                    : Json::Value(std::to_string(gid));
                                                   })}})},
         {"ftp", describe(ftp)},
         {"sftp", describe(sftp)}});
    if (path == nullptr) {
        return result;
    }
    VELT_ASSIGN_OR_RETURN(const auto rights, velt::rightsOn(login.user, path));
    result["path"] = jsonObject(
        {{"folder", text(rights.place)},
         {"file_system", jsonObject({{"access", word(rights.access)}, {"reason", text(rights.reason)}})},
         {"ftp", describe(velt::findInView(ftp, rights))},
         {"sftp", describe(velt::findInView(sftp, rights))}});
    return result;
}

int refuse(std::string_view why) {
    std::fprintf(stderr, "%s\n", velt::plainText(why, 2000).c_str());
    return EXIT_FAILURE;
}

int run(int count, char** arguments) {
    if (count < 3 || count > 4) {
        return refuse("usage: velt-access STATE USER [PATH]");
    }
    velt::setStateRoot(arguments[1]);
    const auto result = report(arguments[2], count == 4 ? arguments[3] : nullptr);
    if (!result) {
        return refuse(result.error().message);
    }
    std::printf("%s\n", velt::jsonText(*result).c_str());
    return EXIT_SUCCESS;
}

} // namespace

int main(int count, char** arguments) {
    try {
        return run(count, arguments);
    } catch (const std::exception& error) {
        return refuse(error.what());
    }
}
