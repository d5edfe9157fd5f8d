// Asking for accounts without waiting for a directory that does not answer.
#ifndef VELT_STANDALONE_HEALTH_NAMED_ACCOUNTS_H
#define VELT_STANDALONE_HEALTH_NAMED_ACCOUNTS_H

#include <chrono>
#include <optional>
#include <string>
#include <tuple>
#include <vector>

namespace velt {

/// An account that a file names.
struct NamedAccount {
    bool isUser = false;
    std::string name; ///< "" where it is known by its number
    unsigned id = 0;

    bool operator<(const NamedAccount& other) const {
        return std::tie(isUser, name, id) < std::tie(other.isUser, other.name, other.id);
    }
};

/// Those that no source knows; accounts of /etc/velt/ftp.passwd and ftp.group are known, too. Nothing when
/// the sources take longer than the limit; they are not asked again before they have answered.
std::optional<std::vector<NamedAccount>> unknownAccounts(std::vector<NamedAccount> accounts,
                                                         std::chrono::milliseconds limit);

/// The same accounts with their names, where a source knows them by their numbers; as they were when the
/// sources take longer than the limit.
std::vector<NamedAccount> withNames(std::vector<NamedAccount> accounts, std::chrono::milliseconds limit);

} // namespace velt

#endif
