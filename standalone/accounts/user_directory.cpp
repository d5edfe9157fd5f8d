#include "standalone/accounts/user_directory.h"

#include "base/file.h"
#include "base/file_stamp.h"
#include "base/plain_text.h"
#include "standalone/accounts/account_snapshot.h"
#include "standalone/accounts/account_sources.h"
#include "standalone/accounts/name_service.h"
#include "standalone/core/error_number.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <mutex>
#include <type_traits>

namespace velt {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t longestNameShown = 120;

struct ModuleName {
    std::string_view name;
    int source;
};
constexpr std::array<ModuleName, 3> moduleNames{{
    {"winbind", sourceDomain},
    {"sss", sourceLdap},
    {"ldap", sourceLdap},
}};

using Modules = std::vector<std::shared_ptr<const NameService>>;

/// What is known of the accounts, and when it was learned. A file that cannot be read for a moment, for want
/// of descriptors say, is not taken for an empty one. Files are read under the lock, so that a change of a
/// large one is read once for all threads. A domain may take long to answer or not answer at all: it is
/// asked outside of the lock, by one thread at a time, and the others use what it said before.
class Directory {
public:
    void setSources(AccountSources sources);
    std::shared_ptr<const UserSnapshot> users();
    std::shared_ptr<const GroupSnapshot> groups();
    Modules modules();

    /// Errors when the file could not be read when it was last looked at.
    Result<> usersRead();
    Result<> groupsRead();

private:
    void refreshRemote();
    bool isCurrent(const std::optional<Clock::time_point>& readAt) const;

    std::mutex remoteReading_; ///< taken before mutex_ where both are
    std::mutex mutex_;
    AccountSources sources_;
    unsigned sourcesNumber_ = 0;
    std::shared_ptr<const UserSnapshot> users_;
    std::shared_ptr<const GroupSnapshot> groups_;
    FileStamp passwdStamp_;
    FileStamp loginDefsStamp_;
    FileStamp groupStamp_;
    Result<> usersRead_;
    Result<> groupsRead_;
    Modules modules_; ///< of the domain and LDAP sources in use
    std::optional<Clock::time_point> modulesReadAt_;
    std::vector<UserEntry> remoteUsers_; ///< those that these sources told of
    std::optional<Clock::time_point> remoteReadAt_;
};

Directory& directory() {
    static Directory instance;
    return instance;
}

void Directory::setSources(AccountSources sources) {
    const std::lock_guard lock(mutex_);
    sources_ = std::move(sources);
    ++sourcesNumber_;
    users_.reset();
    groups_.reset();
    modulesReadAt_.reset();
    modules_ = {};
    remoteReadAt_.reset();
    remoteUsers_ = {};
}

bool Directory::isCurrent(const std::optional<Clock::time_point>& readAt) const {
    return readAt && Clock::now() - *readAt < sources_.remoteLifetime;
}

Modules loadModules(const AccountSources& sources) {
    const std::string configuration = readFile(sources.nsswitch).valueOr("");
    Modules modules;
    for (const ModuleName& module : moduleNames) {
        // A module that is installed but not in use knows accounts that cannot log in.
        if (!nsswitchNames(configuration, "passwd", module.name)) {
            continue;
        }
        std::shared_ptr<const NameService> service =
            NameService::load(sources.moduleFolder, module.name, module.source);
        if (service != nullptr) {
            modules.push_back(std::move(service));
        }
    }
    return modules;
}

std::vector<UserEntry> usersOf(const Modules& modules) {
    std::vector<UserEntry> users;
    for (const auto& module : modules) {
        for (UserEntry& user : module->users()) {
            users.push_back(std::move(user));
        }
    }
    return users;
}

void Directory::refreshRemote() {
    std::unique_lock reading(remoteReading_, std::try_to_lock);
    if (!reading) {
        {
            const std::lock_guard lock(mutex_);
            if (remoteReadAt_) {
                return;
            }
        }
        reading.lock();
    }
    std::unique_lock lock(mutex_);
    if (isCurrent(remoteReadAt_)) {
        return;
    }
    const unsigned number = sourcesNumber_;
    lock.unlock();
    std::vector<UserEntry> users = usersOf(modules());
    lock.lock();
    if (number != sourcesNumber_) {
        return;
    }
    if (!remoteUsers_.empty() || !users.empty()) {
        users_.reset();
    }
    remoteUsers_ = std::move(users);
    remoteReadAt_ = Clock::now();
}

/// "" for a file that is missing, and for one that could not be read this time.
std::string textOf(const Result<std::optional<std::string>>& file) {
    return file ? file->value_or("") : "";
}

std::shared_ptr<const UserSnapshot> Directory::users() {
    refreshRemote();
    const std::lock_guard lock(mutex_);
    const FileStamp passwd = FileStamp::of(sources_.passwd);
    const FileStamp loginDefs = FileStamp::of(sources_.loginDefs);
    if (users_ != nullptr && passwd == passwdStamp_ && loginDefs == loginDefsStamp_) {
        return users_;
    }
    const auto text = readOptionalFile(sources_.passwd);
    usersRead_ = text ? Result<>() : text.error();
    if (!text && users_ != nullptr) {
        return users_;
    }
    users_ = UserSnapshot::make(parsePasswd(textOf(text)), remoteUsers_,
                                parseLoginDefs(textOf(readOptionalFile(sources_.loginDefs))));
    passwdStamp_ = text ? passwd : FileStamp();
    loginDefsStamp_ = loginDefs;
    return users_;
}

std::shared_ptr<const GroupSnapshot> Directory::groups() {
    const std::lock_guard lock(mutex_);
    const FileStamp stamp = FileStamp::of(sources_.group);
    if (groups_ != nullptr && stamp == groupStamp_) {
        return groups_;
    }
    const auto text = readOptionalFile(sources_.group);
    groupsRead_ = text ? Result<>() : text.error();
    if (text || groups_ == nullptr) {
        groups_ = std::make_shared<const GroupSnapshot>(parseGroup(textOf(text)));
        groupStamp_ = text ? stamp : FileStamp();
    }
    return groups_;
}

Result<> Directory::usersRead() {
    const std::lock_guard lock(mutex_);
    return usersRead_;
}

Result<> Directory::groupsRead() {
    const std::lock_guard lock(mutex_);
    return groupsRead_;
}

// Looking up one account must not wait for a listing: each FTP login is a new process, so the listing would
// always be its first.
Modules Directory::modules() {
    const std::lock_guard lock(mutex_);
    if (!isCurrent(modulesReadAt_)) {
        modules_ = loadModules(sources_);
        modulesReadAt_ = Clock::now();
    }
    return modules_;
}

/// What the first module that knows of it says.
template<class Entry, class Key>
std::optional<Entry> askModules(std::optional<Entry> (NameService::*lookUp)(Key) const,
                                std::type_identity_t<Key> key) {
    for (const auto& module : directory().modules()) {
        if (std::optional<Entry> entry = ((*module).*lookUp)(key)) {
            return entry;
        }
    }
    return std::nullopt;
}

char lower(char character) {
    return character >= 'A' && character <= 'Z' ? static_cast<char>(character - 'A' + 'a') : character;
}

bool sameLetters(std::string_view a, std::string_view b) {
    return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                      [](char x, char y) { return lower(x) == lower(y); });
}

bool containsLetters(std::string_view text, std::string_view part) {
    return std::search(text.begin(), text.end(), part.begin(), part.end(),
                       [](char x, char y) { return lower(x) == lower(y); }) != text.end();
}

} // namespace

void setAccountSources(AccountSources sources) {
    directory().setSources(std::move(sources));
}

std::shared_ptr<const std::vector<UserEntry>> allUsers() {
    std::shared_ptr<const UserSnapshot> snapshot = directory().users();
    const std::vector<UserEntry>& people = snapshot->people.users();
    return {std::move(snapshot), &people};
}

std::optional<UserEntry> userByName(const std::string& name) {
    const std::shared_ptr<const UserSnapshot> snapshot = directory().users();
    if (const UserEntry* user = snapshot->systemAccounts.byName(name)) {
        return *user;
    }
    if (const UserEntry* user = snapshot->people.byName(name)) {
        return *user;
    }
    return askModules(&NameService::userByName, name);
}

std::optional<UserEntry> userById(uid_t uid) {
    const std::shared_ptr<const UserSnapshot> snapshot = directory().users();
    if (const UserEntry* user = snapshot->systemAccounts.byId(uid)) {
        return *user;
    }
    if (const UserEntry* user = snapshot->people.byId(uid)) {
        return *user;
    }
    return askModules(&NameService::userById, uid);
}

std::optional<GroupEntry> groupByName(const std::string& name) {
    if (const auto snapshot = directory().groups(); const GroupEntry* group = snapshot->byName(name)) {
        return *group;
    }
    return askModules(&NameService::groupByName, name);
}

std::optional<GroupEntry> groupById(gid_t gid) {
    if (const auto snapshot = directory().groups(); const GroupEntry* group = snapshot->byId(gid)) {
        return *group;
    }
    return askModules(&NameService::groupById, gid);
}

Result<> usersAreKnown() {
    return directory().usersRead();
}

Result<> groupsAreKnown() {
    return directory().groupsRead();
}

Result<UserEntry> findUser(const std::string& name) {
    if (auto user = userByName(name)) {
        return std::move(*user);
    }
    VELT_RETURN_IF_ERROR(usersAreKnown());
    return Error(ErrorNumber::notFound, "There is no user \"" + plainText(name, longestNameShown) + "\".");
}

Result<GroupEntry> findGroup(const std::string& name) {
    if (auto group = groupByName(name)) {
        return std::move(*group);
    }
    VELT_RETURN_IF_ERROR(groupsAreKnown());
    return Error(ErrorNumber::notFound, "There is no group \"" + plainText(name, longestNameShown) + "\".");
}

std::vector<gid_t> groupsOf(const UserEntry& user) {
    std::vector<gid_t> groups{user.gid};
    const auto add = [&groups](const std::vector<gid_t>& further) {
        for (const gid_t gid : further) {
            if (std::find(groups.begin(), groups.end(), gid) == groups.end()) {
                groups.push_back(gid);
            }
        }
    };
    add(directory().groups()->groupsOf(user.name));
    for (const auto& module : directory().modules()) {
        add(module->groupsOf(user.name, user.gid));
    }
    return groups;
}

bool matches(const UserEntry& user, const UserFilter& filter) {
    if ((user.source & filter.sources) == 0) {
        return false;
    }
    if (!filter.substring.empty() && !containsLetters(user.name, filter.substring)) {
        return false;
    }
    if (filter.domain.empty()) {
        return true;
    }
    const std::string_view name = user.name;
    if (const std::size_t slash = name.find('\\'); slash != std::string_view::npos) {
        return sameLetters(name.substr(0, slash), filter.domain);
    }
    const std::size_t at = name.rfind('@');
    return at != std::string_view::npos && sameLetters(name.substr(at + 1), filter.domain);
}

} // namespace velt
