// Names and numbers of this machine's users and groups.
#ifndef VELT_HOST_BASE_ACCOUNT_NAMES_H
#define VELT_HOST_BASE_ACCOUNT_NAMES_H

#include <sys/types.h>

#include <optional>
#include <string>

namespace velt::host {

/// "uid 1234" when the number has no name.
std::string userName(uid_t uid);

/// "gid 1234" when the number has no name.
std::string groupName(gid_t gid);

/// Nothing when there is no such group.
std::optional<gid_t> groupNamed(const std::string& name);

} // namespace velt::host

#endif
