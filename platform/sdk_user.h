// User records of the platform's C++ kit.
//
// Threads: every operation may be called from any thread; a loaded user belongs to the thread that loaded it.
#ifndef VELT_PLATFORM_SDK_USER_H
#define VELT_PLATFORM_SDK_USER_H

#include <string>

namespace SDK {

/// A loaded user. Objects are made by LoadUser and end in Release, nowhere else.
class User {
public:
    /// Returns the user called `name`, which the caller gives back with Release, or null when no such
    /// user can be loaded.
    static User* LoadUser(const std::string& name);

    /// Frees what LoadUser returned; never called with null.
    static void Release(User* user);

    /// The user's description; "" when there is none.
    std::string GetDesc() const;
};

} // namespace SDK

#endif
