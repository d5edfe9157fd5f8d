// The FTP configuration library: the chroot rules.

#include "ftp/ftp_library.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/handles.h"
#include "tests/support/fake_platform/lists.h"
#include "tests/support/fake_platform/text.h"

#include <cstdio>
#include <regex>

using fake::arguments;
using fake::Platform;

namespace {

std::optional<std::string> userCalled(const std::string& uid) {
    for (const auto& [name, user] : Platform::instance().users) {
        if (std::to_string(user.uid) == uid) {
            return name;
        }
    }
    return std::nullopt;
}

std::optional<std::string> groupCalled(const std::string& gid) {
    for (const auto& [name, id] : Platform::instance().groups) {
        if (std::to_string(id) == gid) {
            return name;
        }
    }
    return std::nullopt;
}

/// Negative when the text does not fit.
int copyWhole(char* buffer, int size, const std::string& text) {
    if (size <= 0 || text.size() >= static_cast<size_t>(size)) {
        return -1;
    }
    std::snprintf(buffer, static_cast<size_t>(size), "%s", text.c_str());
    return 0;
}

} // namespace

int VELTFTPChrootRuleEnum(VLIBCSzList** list) {
    auto& platform = Platform::instance();
    return fake::enumerate("VELTFTPChrootRuleEnum", platform.handles().nameOf(*list), list, platform.rules);
}

int VELTFTPChrootRuleParseToName(const char* line, int* isUser, char* name, int nameSize, char* path,
                                 int pathSize) {
    const auto shown = arguments(line, nameSize, pathSize);
    if (const auto failure = Platform::instance().enter("VELTFTPChrootRuleParseToName", shown)) {
        return *failure;
    }
    static const std::regex form("(user|group):([0-9]+):([^]*)");
    std::cmatch parts;
    if (line == nullptr || !std::regex_match(line, parts, form)) {
        return Platform::instance().notFound(__FILE__, __LINE__);
    }
    const bool user = parts[1] == "user";
    const auto account = user ? userCalled(parts[2]) : groupCalled(parts[2]);
    if (!account || copyWhole(name, nameSize, *account) < 0 || copyWhole(path, pathSize, parts[3]) < 0) {
        return Platform::instance().notFound(__FILE__, __LINE__);
    }
    *isUser = user ? Platform::instance().userFlag : 0;
    return 0;
}

int VELTFTPChrootRuleFormat(char* buf, int size, int isUser, int id, const char* path) {
    const auto shown = arguments(size, isUser, id, path);
    if (const auto failure = Platform::instance().enter("VELTFTPChrootRuleFormat", shown)) {
        return *failure;
    }
    if (path == nullptr) {
        return -1;
    }
    return copyWhole(buf, size, (isUser != 0 ? "user:" : "group:") + std::to_string(id) + ":" + path);
}

int VELTFTPChrootRuleSave(VLIBCSzList* list) {
    constexpr const char* operation = "VELTFTPChrootRuleSave";
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter(operation, arguments(fake::listContents(list)))) {
        return *failure;
    }
    if (platform.handles().use<fake::ListBlock>(list, operation) == nullptr) {
        return -1;
    }
    platform.rules = fake::textsOf(list, operation);
    return 0;
}
