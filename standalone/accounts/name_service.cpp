#include "standalone/accounts/name_service.h"

#include "base/text.h"
#include "standalone/accounts/account_files.h"

#include <dlfcn.h>
#include <grp.h>
#include <nss.h>
#include <pwd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <functional>
#include <iterator>
#include <mutex>
#include <sstream>

namespace velt {

// The entry points that the system's C library calls in such a module; each may be absent.
struct NameService::Functions {
    nss_status (*setpwent)(int) = nullptr;
    nss_status (*endpwent)() = nullptr;
    nss_status (*getpwent)(passwd*, char*, std::size_t, int*) = nullptr;
    nss_status (*getpwnam)(const char*, passwd*, char*, std::size_t, int*) = nullptr;
    nss_status (*getpwuid)(uid_t, passwd*, char*, std::size_t, int*) = nullptr;
    nss_status (*getgrnam)(const char*, group*, char*, std::size_t, int*) = nullptr;
    nss_status (*getgrgid)(gid_t, group*, char*, std::size_t, int*) = nullptr;
    nss_status (*initgroups)(const char*, gid_t, long*, long*, gid_t**, long, int*) = nullptr;
};

namespace {

constexpr std::size_t largestRecord = 1U << 20;

// A module's enumeration has one position for the whole process.
std::mutex enumerationMutex;

template<typename Function>
void bind(void* module, const std::string& prefix, const char* name, Function& function) {
    function = reinterpret_cast<Function>(dlsym(module, (prefix + name).c_str()));
}

/// Calls `look` with a buffer that grows until the record fits.
bool withBuffer(std::vector<char>& buffer, const std::function<nss_status(char*, std::size_t, int*)>& look) {
    for (;;) {
        int error = 0;
        const nss_status status = look(buffer.data(), buffer.size(), &error);
        if (status != NSS_STATUS_TRYAGAIN || error != ERANGE || buffer.size() >= largestRecord) {
            return status == NSS_STATUS_SUCCESS;
        }
        buffer.resize(buffer.size() * 2);
    }
}

std::string textOf(const char* text) {
    return text == nullptr ? std::string() : std::string(text);
}

UserEntry entryOf(const passwd& record, int source) {
    return {textOf(record.pw_name),
            record.pw_uid,
            record.pw_gid,
            textOf(record.pw_dir),
            descriptionOf(record.pw_gecos == nullptr ? "" : record.pw_gecos),
            source};
}

GroupEntry entryOf(const group& record, int source) {
    return {textOf(record.gr_name), record.gr_gid, source};
}

/// What the module's function finds for the key.
template<class Key, class Record>
auto lookUp(nss_status (*function)(Key, Record*, char*, std::size_t, int*), Key key, int source) {
    std::vector<char> buffer(4096);
    Record record{};
    const auto look = [&](char* text, std::size_t size, int* error) {
        return function(key, &record, text, size, error);
    };
    const bool found = function != nullptr && withBuffer(buffer, look);
    return found ? std::optional(entryOf(record, source)) : std::nullopt;
}

} // namespace

std::unique_ptr<NameService> NameService::load(const std::filesystem::path& folder, std::string_view name,
                                               int source) {
    const std::string file = "libnss_" + std::string(name) + ".so.2";
    // Never closed: such modules start threads and keep connections of their own.
    void* module = dlopen(folder.empty() ? file.c_str() : (folder / file).c_str(), RTLD_NOW | RTLD_LOCAL);
    if (module == nullptr) {
        return nullptr;
    }
    auto functions = std::make_unique<Functions>();
    const std::string prefix = "_nss_" + std::string(name) + "_";
    bind(module, prefix, "setpwent", functions->setpwent);
    bind(module, prefix, "endpwent", functions->endpwent);
    bind(module, prefix, "getpwent_r", functions->getpwent);
    bind(module, prefix, "getpwnam_r", functions->getpwnam);
    bind(module, prefix, "getpwuid_r", functions->getpwuid);
    bind(module, prefix, "getgrnam_r", functions->getgrnam);
    bind(module, prefix, "getgrgid_r", functions->getgrgid);
    bind(module, prefix, "initgroups_dyn", functions->initgroups);
    return std::unique_ptr<NameService>(new NameService(std::move(functions), source));
}

NameService::NameService(std::unique_ptr<Functions> functions, int source)
    : functions_(std::move(functions)), source_(source) {}

NameService::~NameService() = default;

std::vector<UserEntry> NameService::users() const {
    std::vector<UserEntry> users;
    if (functions_->getpwent == nullptr) {
        return users;
    }
    const std::lock_guard lock(enumerationMutex);
    if (functions_->setpwent != nullptr && functions_->setpwent(0) != NSS_STATUS_SUCCESS) {
        return users;
    }
    std::vector<char> buffer(4096);
    passwd record{};
    while (withBuffer(buffer, [&](char* text, std::size_t size, int* error) {
        return functions_->getpwent(&record, text, size, error);
    })) {
        users.push_back(entryOf(record, source_));
    }
    if (functions_->endpwent != nullptr) {
        functions_->endpwent();
    }
    return users;
}

std::optional<UserEntry> NameService::userByName(const std::string& name) const {
    return lookUp(functions_->getpwnam, name.c_str(), source_);
}

std::optional<UserEntry> NameService::userById(uid_t uid) const {
    return lookUp(functions_->getpwuid, uid, source_);
}

std::optional<GroupEntry> NameService::groupByName(const std::string& name) const {
    return lookUp(functions_->getgrnam, name.c_str(), source_);
}

std::optional<GroupEntry> NameService::groupById(gid_t gid) const {
    return lookUp(functions_->getgrgid, gid, source_);
}

std::vector<gid_t> NameService::groupsOf(const std::string& user, gid_t primary) const {
    if (functions_->initgroups == nullptr) {
        return {};
    }
    long count = 0;
    long room = 64;
    int error = 0;
    auto* groups = static_cast<gid_t*>(std::malloc(static_cast<std::size_t>(room) * sizeof(gid_t)));
    if (groups == nullptr) {
        return {};
    }
    // The module grows the array with realloc.
    const nss_status status =
        functions_->initgroups(user.c_str(), primary, &count, &room, &groups, -1, &error);
    std::vector<gid_t> found;
    if (status == NSS_STATUS_SUCCESS && count > 0) {
        found.assign(groups, groups + count);
    }
    std::free(groups);
    std::erase(found, primary);
    return found;
}

bool nsswitchNames(std::string_view text, std::string_view database, std::string_view service) {
    while (!text.empty()) {
        std::string_view line = cut(text, '\n');
        line = cut(line, '#');
        if (trimmed(cut(line, ':')) != database) {
            continue;
        }
        std::istringstream words{std::string(line)};
        return std::find(std::istream_iterator<std::string>(words), {}, service) !=
               std::istream_iterator<std::string>();
    }
    return false;
}

} // namespace velt
