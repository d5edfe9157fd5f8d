// The platform of an ordinary server below a temporary state root. No daemon is started; the daemons' own
// tests of a configuration are the real ones.
#include "standalone/accounts/account_sources.h"
#include "standalone/contract/last_error.h"
#include "standalone/contract/string_map.h"
#include "standalone/core/state_root.h"
#include "standalone/standalone.h"
#include "tests/contract/platform_setup.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/temporary_folder.h"

#include <sys/stat.h>
#include <unistd.h>

#include <optional>
#include <stdexcept>

namespace contract {

namespace {

std::optional<velt::test::TemporaryFolder>& root() {
    static std::optional<velt::test::TemporaryFolder> folder;
    return folder;
}

void prepareAccounts(const World& world) {
    std::string passwd;
    for (const User& user : world.users) {
        passwd += user.name + ":x:" + std::to_string(user.uid) + ":65534:" + user.description + ":/home/" +
                  user.name + ":/bin/sh\n";
    }
    std::string groups;
    for (const Group& group : world.groups) {
        groups += group.name + ":x:" + std::to_string(group.gid) + ":\n";
    }
    velt::AccountSources sources;
    sources.passwd = root()->write("accounts/passwd", passwd);
    sources.group = root()->write("accounts/group", groups);
    sources.loginDefs = root()->write("accounts/login.defs", "UID_MIN 1000\nUID_MAX 60000\n");
    sources.nsswitch = root()->write("accounts/nsswitch.conf", "passwd: files\ngroup: files\n");
    sources.moduleFolder = root()->path();
    velt::setAccountSources(sources);
}

velt::Result<> prepareShares(const World& world) {
    std::vector<velt::ShareEntry> shares;
    for (const Share& share : world.shares) {
        std::filesystem::create_directories(folderOf(share.name));
        const auto grant = share.ftpReachesIt ? velt::Access::write : velt::Access::none;
        shares.push_back(
            {share.name, share.comment, folderOf(share.name), share.offeredToFtp, {{"ftp", grant}}, {}});
    }
    return velt::test::storeShares(shares);
}

} // namespace

void prepare(const World& world) {
    root().emplace();
    // The share's folders are reached as the account that is asked about.
    ::chmod(root()->path().c_str(), 0755);
    ::setenv("VELT_LIBEXEC_DIR", VELT_BUILT_FOLDER, 1);
    prepareAccounts(world);
    if (const auto opened = velt::openState(root()->path()); !opened) {
        throw std::runtime_error(opened.error().message);
    }
    if (const auto stored = prepareShares(world); !stored) {
        throw std::runtime_error(stored.error().message);
    }
    velt::clearLastError();
}

void finish() {
    velt::setAccountSources({});
    velt::setStateRoot("/");
    root().reset();
}

std::string folderOf(const std::string& share) {
    return (root()->path() / "srv" / share).string();
}

bool tellsPrivileges() {
    return ::geteuid() == 0;
}

std::map<std::string, std::string> entriesOf(const VLIBCSzHash* map) {
    return map->entries;
}

} // namespace contract
