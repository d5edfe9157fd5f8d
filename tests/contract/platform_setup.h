// What a contract test needs of a platform besides the contract: a world to ask about. Each platform that the
// suite is linked with defines these functions.
#ifndef VELT_TESTS_CONTRACT_PLATFORM_SETUP_H
#define VELT_TESTS_CONTRACT_PLATFORM_SETUP_H

#include "platform/core.h"

#include <map>
#include <string>
#include <vector>

namespace contract {

/// A local user or a system account.
struct User {
    std::string name;
    std::string description;
    int uid = 0;
    bool isPerson = true; ///< false: a system account, which no listing of users shows
};

struct Group {
    std::string name;
    int gid = 0;
};

struct Share {
    std::string name;
    std::string comment;
    bool offeredToFtp = true;
    bool ftpReachesIt = false; ///< the account "ftp" may enter the share
};

struct World {
    std::vector<User> users;
    std::vector<Group> groups;
    std::vector<Share> shares;
};

/// Begins anew: nothing stored, no last error, and the accounts and shares of this world alone. Throws
/// std::runtime_error when the platform cannot be prepared.
void prepare(const World& world);

/// Ends what prepare began; adds a test failure for every handle that was not freed, as far as the platform
/// counts them.
void finish();

/// The folder of a share of the prepared world.
std::string folderOf(const std::string& share);

/// False when the platform cannot tell privileges in this process, as it takes root's rights.
bool tellsPrivileges();

/// What the contract gives no means to read.
std::map<std::string, std::string> entriesOf(const VLIBCSzHash* map);

} // namespace contract

#endif
