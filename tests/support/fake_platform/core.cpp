// The core library's key-value files and last error.

#include "platform/core.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/text.h"

#include <cstdio>
#include <string_view>

using fake::arguments;
using fake::Platform;

namespace {

constexpr const char* infoFile = "/etc/veltinfo.conf";
constexpr const char* extIpKey = "ftp_ext_ip";

std::optional<std::string> findInfo(const std::string& key) {
    const auto& platform = Platform::instance();
    if (key == extIpKey) {
        return platform.extIp;
    }
    const auto entry = platform.infoKeys.find(key);
    return entry == platform.infoKeys.end() ? std::nullopt : std::optional(entry->second);
}

bool isFolder(std::string_view path) {
    const std::string_view file = infoFile;
    return file.starts_with(path) && file.size() > path.size() &&
           (path.ends_with('/') || file[path.size()] == '/');
}

void copyText(char* buffer, int size, const std::string& text) {
    if (size > 0) {
        std::snprintf(buffer, static_cast<size_t>(size), "%s", text.c_str());
    }
}

} // namespace

int VLIBCFileGetKeyValue(const char* path, const char* key, char* value, int size, int flags) {
    if (const auto failure =
            Platform::instance().enter("VLIBCFileGetKeyValue", arguments(path, key, size, flags))) {
        return *failure;
    }
    if (path == nullptr || key == nullptr || value == nullptr || isFolder(path)) {
        return -1;
    }
    // There is no other file.
    const auto text = path == std::string_view(infoFile) ? findInfo(key) : std::nullopt;
    // Callers must not rely on the buffer when there is no such key; one that does shows it.
    copyText(value, size, text.value_or("no such key"));
    return text ? 1 : 0;
}

int VLIBCINFOSetKeyValue(const char* key, const char* value) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VLIBCINFOSetKeyValue", arguments(key, value))) {
        return *failure;
    }
    if (key == nullptr || value == nullptr) {
        return -1;
    }
    if (std::string(key) == extIpKey) {
        platform.extIp = value;
    } else {
        platform.infoKeys[key] = value;
    }
    return 0;
}

int VLIBCErrGet(void) {
    auto& platform = Platform::instance();
    return platform.enter("VLIBCErrGet", "", platform.journalErrorGets).value_or(platform.lastError.number);
}

const char* VLIBCErrorGetFile(void) {
    auto& platform = Platform::instance();
    const bool failed = platform.enter("VLIBCErrorGetFile", "", platform.journalErrorGets).has_value();
    return failed ? "" : platform.lastError.file.c_str();
}

int VLIBCErrorGetLine(void) {
    auto& platform = Platform::instance();
    return platform.enter("VLIBCErrorGetLine", "", platform.journalErrorGets)
        .value_or(platform.lastError.line);
}
