// The user and group library, and the user records of the platform's C++ kit.

#include "platform/account.h"
#include "platform/sdk_user.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/handles.h"
#include "tests/support/fake_platform/text.h"

using fake::arguments;
using fake::GroupBlock;
using fake::Platform;
using fake::SdkUserBlock;
using fake::UserBlock;
using fake::Verbatim;

namespace {

/// The record that the caller hands in, or a new one when there is none yet.
template<typename T> T* recordFor(const void* standing, const std::string& operation) {
    auto& handles = Platform::instance().handles();
    return standing == nullptr ? &handles.create<T>() : handles.use<T>(standing, operation);
}

} // namespace

int VELTUserGet(const char* name, VELT_USER** out) {
    auto& platform = Platform::instance();
    const Verbatim standing{platform.handles().nameOf(*out)};
    if (const auto failure = platform.enter("VELTUserGet", arguments(name, standing))) {
        return *failure;
    }
    const auto user = platform.users.find(name);
    if (user == platform.users.end()) {
        return platform.notFound(__FILE__, __LINE__);
    }
    auto* block = recordFor<UserBlock>(*out, "VELTUserGet");
    if (block == nullptr) {
        return -1;
    }
    block->userName = user->first;
    block->descr = user->second.descr;
    block->record = {block->userName.c_str(), block->descr.c_str(), user->second.uid};
    *out = &block->record;
    return 0;
}

int VELTGroupGet(const char* name, VELT_GROUP** out) {
    auto& platform = Platform::instance();
    const Verbatim standing{platform.handles().nameOf(*out)};
    if (const auto failure = platform.enter("VELTGroupGet", arguments(name, standing))) {
        return *failure;
    }
    const auto group = platform.groups.find(name);
    if (group == platform.groups.end()) {
        return platform.notFound(__FILE__, __LINE__);
    }
    auto* block = recordFor<GroupBlock>(*out, "VELTGroupGet");
    if (block == nullptr) {
        return -1;
    }
    block->groupName = group->first;
    block->record = {block->groupName.c_str(), group->second};
    *out = &block->record;
    return 0;
}

namespace SDK {

User* User::LoadUser(const std::string& name) {
    auto& platform = Platform::instance();
    const bool failed = platform.enter("SDK::User::LoadUser", arguments(name)).has_value();
    const auto user = platform.users.find(name);
    if (failed || user == platform.users.end()) {
        return nullptr;
    }
    auto& block = platform.handles().create<SdkUserBlock>();
    block.descr = user->second.descr;
    return &block.record;
}

void User::Release(User* user) {
    auto& platform = Platform::instance();
    const Verbatim name{platform.handles().nameOf(user)};
    if (platform.enter("SDK::User::Release", arguments(name))) {
        return;
    }
    if (user == nullptr) {
        platform.handles().use<SdkUserBlock>(user, "SDK::User::Release");
    }
    platform.handles().release<SdkUserBlock>(user, "SDK::User::Release");
}

std::string User::GetDesc() const {
    auto& platform = Platform::instance();
    const Verbatim name{platform.handles().nameOf(this)};
    if (platform.enter("SDK::User::GetDesc", arguments(name))) {
        return "";
    }
    const auto* block = platform.handles().use<SdkUserBlock>(this, "SDK::User::GetDesc");
    return block == nullptr ? "" : block->descr;
}

} // namespace SDK
