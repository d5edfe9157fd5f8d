// The records behind the contract's handles, and the account of their lives.
//
// A freed record stays in memory until the table is cleared, so that no address is given out twice and
// every use after the end is recognised here. Under the address sanitizer the part of it that callers
// read directly is poisoned as well.
#ifndef VELT_TESTS_SUPPORT_FAKE_PLATFORM_HANDLES_H
#define VELT_TESTS_SUPPORT_FAKE_PLATFORM_HANDLES_H

#include "platform/account.h"
#include "platform/core.h"
#include "platform/sdk_user.h"
#include "platform/share.h"

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

struct VLIBCSzHash {
    std::vector<std::pair<std::string, std::string>> entries; ///< in the order of their first setting
};

namespace fake {

enum class Life {
    live,
    moved, ///< a record at another address has taken its place
    freed
};

struct Block {
    Block() = default;
    Block(const Block&) = delete;
    Block& operator=(const Block&) = delete;
    virtual ~Block() = default;

    /// Makes the end visible to a caller that reads the record directly.
    virtual void poison() {}

    std::string name;
    Life life = Life::live;
};

struct ListBlock : Block {
    static constexpr const char* kind = "list";
    ~ListBlock() override;
    void poison() override;

    alignas(8) VLIBCSzList record{}; // aligned as poisoning needs it
    std::vector<std::string> texts;
};

struct MapBlock : Block {
    static constexpr const char* kind = "map";
    void poison() override;

    VLIBCSzHash record;
};

struct ShareBlock : Block {
    static constexpr const char* kind = "share";
    ~ShareBlock() override;
    void poison() override;
    /// Sets the texts and points the record at them.
    void set(const std::string& newName, const std::string& newComment, const std::string& newPath);

    VELT_SHARE record{};
    std::string shareName;
    std::string comment;
    std::string path;
    int privilege = 0;
};

struct SdkUserBlock : Block {
    static constexpr const char* kind = "sdkuser";

    SDK::User record;
    std::string descr;
};

struct UserBlock : Block {
    static constexpr const char* kind = "user";

    VELT_USER record{};
    std::string userName;
    std::string descr;
};

struct GroupBlock : Block {
    static constexpr const char* kind = "group";

    VELT_GROUP record{};
    std::string groupName;
};

class HandleTable {
public:
    /// Makes a record; its address is `&block.record`.
    template<typename T> T& create() { return add<T>(T::kind + std::to_string(++made_[T::kind])); }

    /// Makes the record that takes the place, and the name, of `old`, whose address ends here.
    template<typename T> T& createInPlaceOf(T& old) {
        T& fresh = add<T>(old.name);
        end(old, Life::moved);
        return fresh;
    }

    /// The live record at the address, or null.
    template<typename T> T* peek(const void* address) const {
        T* block = dynamic_cast<T*>(find(address));
        return block != nullptr && block->life == Life::live ? block : nullptr;
    }

    /// The same, for an operation that needs it: null is entered among the errors.
    template<typename T> T* use(const void* address, const std::string& operation) {
        T* block = peek<T>(address);
        if (block == nullptr) {
            errors_.push_back(operation + "(" + nameOf(address) + ")");
        }
        return block;
    }

    /// Ends the record at the address. Null is allowed, anything but a live record is an error.
    template<typename T> void release(const void* address, const std::string& operation) {
        if (address == nullptr) {
            return;
        }
        if (T* block = use<T>(address, operation)) {
            end(*block, Life::freed);
        }
    }

    /// The handle's name in the journal, with a note when it is not live; "null" or "unknown handle".
    std::string nameOf(const void* address) const;

    int made(const std::string& kind) const;

    /// Uses of what was not live, in order, then what is still live although callers have to free it.
    std::vector<std::string> errors() const;

private:
    template<typename T> T& add(const std::string& name) {
        auto block = std::make_unique<T>();
        T& result = *block;
        result.name = name;
        blocks_[&result.record] = std::move(block);
        return result;
    }

    Block* find(const void* address) const;
    static void end(Block& block, Life life);

    std::map<const void*, std::unique_ptr<Block>> blocks_;
    std::map<std::string, int> made_;
    std::vector<std::string> errors_;
};

} // namespace fake

#endif
