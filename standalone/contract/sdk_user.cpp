#include "platform/sdk_user.h"

#include "standalone/accounts/user_directory.h"
#include "standalone/contract/last_error.h"

#include <memory>

namespace {

// What is behind the handle. The public class has no fields.
struct LoadedUser : SDK::User {
    explicit LoadedUser(std::string text) : description(std::move(text)) {}
    std::string description;
};

} // namespace

namespace SDK {

User* User::LoadUser(const std::string& name) {
    velt::Result<velt::UserEntry> user = velt::findUser(name);
    if (!user) {
        velt::fail(user.error());
        return nullptr;
    }
    return std::make_unique<LoadedUser>(std::move(user->description)).release();
}

void User::Release(User* user) {
    const std::unique_ptr<LoadedUser> owner(static_cast<LoadedUser*>(user));
}

std::string User::GetDesc() const {
    return static_cast<const LoadedUser*>(this)->description;
}

} // namespace SDK
