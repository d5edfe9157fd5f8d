// The FTP configuration library: the shares offered to FTP and the chroot users.

#include "ftp/ftp_library.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/handles.h"
#include "tests/support/fake_platform/lists.h"
#include "tests/support/fake_platform/text.h"

#include <algorithm>
#include <cstring>
#include <iterator>

using fake::arguments;
using fake::Platform;
using fake::Verbatim;

namespace {

using Names = std::vector<std::string>;

Verbatim nameOf(const VLIBCSzList* list) {
    return {Platform::instance().handles().nameOf(list)};
}

bool comesFrom(const std::string& name, int source, const char* domain) {
    const auto& users = Platform::instance().users;
    const auto user = users.find(name);
    if (user == users.end()) {
        return true;
    }
    const auto& own = user->second.domain;
    return (user->second.source & source) != 0 && (domain == nullptr || !own || *own == domain);
}

bool contains(const std::string& name, const char* substr) {
    return substr == nullptr || ::strcasestr(name.c_str(), substr) != nullptr;
}

Names narrowed(const Names& names, int source, const char* substr, const char* domain) {
    Names found;
    std::copy_if(names.begin(), names.end(), std::back_inserter(found), [&](const std::string& name) {
        return contains(name, substr) && comesFrom(name, source, domain);
    });
    return found;
}

bool isKnown(const std::string& name) {
    const auto& platform = Platform::instance();
    const auto stands = [&name](const Names& names) {
        return std::find(names.begin(), names.end(), name) != names.end();
    };
    return platform.users.contains(name) || stands(platform.chrootUsers) || stands(platform.nonChrootUsers);
}

int moveUsers(const char* operation, const VLIBCSzList* list, Names& from, Names& to) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter(operation, arguments(fake::listContents(list)))) {
        return *failure;
    }
    if (platform.handles().use<fake::ListBlock>(list, operation) == nullptr) {
        return -1;
    }
    const Names names = fake::textsOf(list, operation);
    if (platform.unknownUsersAreRefused && !std::all_of(names.begin(), names.end(), isKnown)) {
        return -1;
    }
    for (const std::string& name : names) {
        std::erase(from, name);
        if (std::find(to.begin(), to.end(), name) == to.end()) {
            to.push_back(name);
        }
    }
    return 0;
}

} // namespace

int VELTFTPShareEnum(VLIBCSzList** list, int selection) {
    const auto shown = arguments(nameOf(*list), fake::Hex{static_cast<unsigned>(selection)});
    return fake::enumerate("VELTFTPShareEnum", shown, list, Platform::instance().ftpShares);
}

int VELTFTPChrootUserEnum(VLIBCSzList** list, int source, const char* substr, const char* domain) {
    const auto shown = arguments(nameOf(*list), source, substr, domain);
    const auto users = narrowed(Platform::instance().chrootUsers, source, substr, domain);
    return fake::enumerate("VELTFTPChrootUserEnum", shown, list, users);
}

int VELTFTPNonChrootUserEnum(VLIBCSzList** list, int source, const char* substr, const char* domain) {
    const auto shown = arguments(nameOf(*list), source, substr, domain);
    const auto users = narrowed(Platform::instance().nonChrootUsers, source, substr, domain);
    return fake::enumerate("VELTFTPNonChrootUserEnum", shown, list, users);
}

int VELTFTPAddChrootUser(VLIBCSzList* list) {
    auto& platform = Platform::instance();
    return moveUsers("VELTFTPAddChrootUser", list, platform.nonChrootUsers, platform.chrootUsers);
}

int VELTFTPDeleteChrootUser(VLIBCSzList* list) {
    auto& platform = Platform::instance();
    return moveUsers("VELTFTPDeleteChrootUser", list, platform.chrootUsers, platform.nonChrootUsers);
}
