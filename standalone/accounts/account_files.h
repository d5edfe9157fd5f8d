// Reading the files of the local accounts.
#ifndef VELT_STANDALONE_ACCOUNTS_ACCOUNT_FILES_H
#define VELT_STANDALONE_ACCOUNTS_ACCOUNT_FILES_H

#include "standalone/accounts/user_directory.h"

#include <string>
#include <string_view>
#include <vector>

namespace velt {

struct UidRange {
    uid_t first = 1000;
    uid_t last = 60000;
};

struct LocalGroup {
    GroupEntry entry;
    std::vector<std::string> members;
};

/// The users of a password file's text, in its order. Lines that the system's own reader skips (comments, too
/// few fields, no number) are skipped here.
std::vector<UserEntry> parsePasswd(std::string_view text);

/// The same for a group file.
std::vector<LocalGroup> parseGroup(std::string_view text);

/// UID_MIN and UID_MAX; the customary ones where the text does not set them.
UidRange parseLoginDefs(std::string_view text);

/// The description in a GECOS field: the part before its first comma.
std::string descriptionOf(std::string_view gecos);

} // namespace velt

#endif
