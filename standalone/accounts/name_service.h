// The domain and LDAP sources: modules of the system's name service, asked directly, so that it is known
// which of them an account comes from.
#ifndef VELT_STANDALONE_ACCOUNTS_NAME_SERVICE_H
#define VELT_STANDALONE_ACCOUNTS_NAME_SERVICE_H

#include "standalone/accounts/user_directory.h"

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// One loaded module. A source that does not answer looks like one without accounts. Thread-safe.
class NameService {
public:
    /// The module libnss_NAME.so.2 of `folder` (empty: where the dynamic linker looks); null when there is
    /// none.
    static std::unique_ptr<NameService> load(const std::filesystem::path& folder, std::string_view name,
                                             int source);
    ~NameService();
    NameService(const NameService&) = delete;
    NameService& operator=(const NameService&) = delete;

    /// Every user that the source lists. Many sources are set up to list nobody, though their users can log
    /// in.
    std::vector<UserEntry> users() const;

    std::optional<UserEntry> userByName(const std::string& name) const;
    std::optional<UserEntry> userById(uid_t uid) const;
    std::optional<GroupEntry> groupByName(const std::string& name) const;
    std::optional<GroupEntry> groupById(gid_t gid) const;

    /// The groups of this source that the user belongs to, without `primary`.
    std::vector<gid_t> groupsOf(const std::string& user, gid_t primary) const;

private:
    struct Functions;
    NameService(std::unique_ptr<Functions> functions, int source);

    std::unique_ptr<Functions> functions_;
    int source_;
};

/// Whether a line of nsswitch.conf's text, such as "passwd: files winbind", names the service for the
/// database.
bool nsswitchNames(std::string_view text, std::string_view database, std::string_view service);

} // namespace velt

#endif
