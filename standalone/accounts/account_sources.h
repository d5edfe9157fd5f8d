// Which files and modules the accounts come from.
#ifndef VELT_STANDALONE_ACCOUNTS_ACCOUNT_SOURCES_H
#define VELT_STANDALONE_ACCOUNTS_ACCOUNT_SOURCES_H

#include <chrono>
#include <filesystem>

namespace velt {

/// The system's own, wherever the state root is: who may log in is the system's business.
struct AccountSources {
    std::filesystem::path passwd = "/etc/passwd";
    std::filesystem::path group = "/etc/group";
    std::filesystem::path loginDefs = "/etc/login.defs";
    std::filesystem::path nsswitch = "/etc/nsswitch.conf";
    std::filesystem::path moduleFolder; ///< of libnss_*.so.2; empty: where the dynamic linker looks
    /// How long a listing of the domain and LDAP sources is taken as current; they do not report changes.
    std::chrono::seconds remoteLifetime{30};
};

/// Replaces the sources and forgets what was read from the former ones; for tests. Thread-safe.
void setAccountSources(AccountSources sources);

} // namespace velt

#endif
