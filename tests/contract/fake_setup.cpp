#include "tests/contract/platform_setup.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/handles.h"

#include <gtest/gtest.h>

namespace contract {

namespace {

constexpr int readOnly = 2;
constexpr int denied = 4;

} // namespace

void prepare(const World& world) {
    auto& platform = fake::Platform::instance();
    platform.reset();
    // The most that the contract allows: whoever relies on a handle's staying fails here.
    platform.pushMovesList = true;
    platform.hashMoves = true;
    platform.enumeratorsReplaceList = true;
    platform.unknownUsersAreRefused = true;
    for (const User& user : world.users) {
        platform.users[user.name] = {user.description, user.uid, fake::sourceLocal, ""};
        if (user.isPerson) {
            platform.nonChrootUsers.push_back(user.name);
        }
    }
    for (const Group& group : world.groups) {
        platform.groups[group.name] = group.gid;
    }
    for (const Share& share : world.shares) {
        platform.shares[share.name] = {share.comment, folderOf(share.name),
                                       share.ftpReachesIt ? readOnly : denied};
        if (share.offeredToFtp) {
            platform.ftpShares.push_back(share.name);
        }
    }
}

void finish() {
    auto& platform = fake::Platform::instance();
    EXPECT_EQ(platform.handleErrors(), std::vector<std::string>());
    platform.reset();
}

std::string folderOf(const std::string& share) {
    return "/srv/" + share;
}

bool tellsPrivileges() {
    return true;
}

std::map<std::string, std::string> entriesOf(const VLIBCSzHash* map) {
    return {map->entries.begin(), map->entries.end()};
}

} // namespace contract
