// Owners of platform handles. Each frees what it holds when its scope ends, also while an exception
// unwinds. Those with an address() hand the handle to a platform function that may put another one in its
// place; they own whatever stands there afterwards.
#ifndef VELT_HANDLER_OWNERS_H
#define VELT_HANDLER_OWNERS_H

#include "platform/core.h"
#include "platform/sdk_user.h"
#include "platform/share.h"

#include <string>

/// A platform string list.
class SzList {
public:
    /// The capacity that every list of the module starts with.
    static constexpr int initialCapacity = 1024;

    SzList() : list_(VLIBCSzListAlloc(initialCapacity)) {}
    ~SzList() {
        if (list_ != nullptr) {
            VLIBCSzListFree(list_);
        }
    }
    SzList(const SzList&) = delete;
    SzList& operator=(const SzList&) = delete;

    /// False when the allocation failed; nothing else may be called then.
    explicit operator bool() const { return list_ != nullptr; }
    VLIBCSzList* get() { return list_; }
    VLIBCSzList** address() { return &list_; }
    int count() const { return list_->count; }
    const char* at(int index) const { return VLIBCSzListGet(list_, index); }

    /// Appends a text; negative on failure. The list may move.
    int push(const char* text) { return VLIBCSzListPush(&list_, text); }

private:
    VLIBCSzList* list_;
};

/// A platform string map.
class SzHash {
public:
    explicit SzHash(int initialSize) : map_(VLIBCSzHashAlloc(initialSize)) {}
    ~SzHash() {
        if (map_ != nullptr) {
            VLIBCSzHashFree(map_);
        }
    }
    SzHash(const SzHash&) = delete;
    SzHash& operator=(const SzHash&) = delete;

    /// False when the allocation failed; nothing else may be called then.
    explicit operator bool() const { return map_ != nullptr; }
    VLIBCSzHash* get() { return map_; }

    /// Sets a key; negative on failure. The map may move.
    int set(const char* key, const char* value) { return VLIBCSzHashSetValue(&map_, key, value); }

private:
    VLIBCSzHash* map_;
};

/// A share that a look-up fills in; empty until then.
class ShareHandle {
public:
    ShareHandle() = default;
    ~ShareHandle() {
        if (share_ != nullptr) {
            VELTShareFree(share_);
        }
    }
    ShareHandle(const ShareHandle&) = delete;
    ShareHandle& operator=(const ShareHandle&) = delete;

    VELT_SHARE* get() { return share_; }
    VELT_SHARE** address() { return &share_; }

private:
    VELT_SHARE* share_ = nullptr;
};

/// A user loaded by name; empty when no such user can be loaded.
class LoadedUser {
public:
    explicit LoadedUser(const std::string& name) : user_(SDK::User::LoadUser(name)) {}
    ~LoadedUser() {
        if (user_ != nullptr) {
            SDK::User::Release(user_);
        }
    }
    LoadedUser(const LoadedUser&) = delete;
    LoadedUser& operator=(const LoadedUser&) = delete;

    /// The user's description, "" for an empty one.
    std::string description() const { return user_ != nullptr ? user_->GetDesc() : std::string(); }

private:
    SDK::User* user_;
};

#endif
