// Users and groups of this machine by their numbers and names.
#ifndef VELT_HOST_BASE_ACCOUNT_NAMES_H
#define VELT_HOST_BASE_ACCOUNT_NAMES_H

#include <sys/types.h>

#include <optional>
#include <string>

namespace velt::host {

/// "uid 1234" when the number has no name.
std::string userName(uid_t uid);

/// Nothing when there is no such group.
std::optional<gid_t> groupNamed(const std::string& name);

} // namespace velt::host

#endif
