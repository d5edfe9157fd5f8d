#include "platform/core.h"

#include "standalone/contract/boundary.h"
#include "standalone/contract/last_error.h"
#include "standalone/contract/string_map.h"
#include "standalone/control/change_settings.h"
#include "standalone/core/effects.h"
#include "standalone/core/key_value_file.h"
#include "standalone/core/paths.h"
#include "standalone/core/staged_files.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/settings/settings_store.h"

#include <algorithm>
#include <climits>
#include <cstring>
#include <memory>
#include <vector>

namespace velt {

namespace {

// The public header, and behind it the texts. The list itself never moves, which the contract leaves open.
struct StringList : VLIBCSzList {
    std::vector<std::string> texts;
};

int push(StringList& list, const char* text) {
    if (list.count == INT_MAX)
        return fail(ErrorNumber::outOfMemory, "The list is full.");
    // Copied first: the text may be an entry of this list, and growing moves the entries.
    std::string copy(text);
    list.texts.push_back(std::move(copy));
    list.count = static_cast<int>(list.texts.size());
    list.capacity = static_cast<int>(std::min<std::size_t>(list.texts.capacity(), INT_MAX));
    return 0;
}

bool isBlank(std::string_view text) {
    return text.find_first_not_of(" \t") == std::string_view::npos;
}

Result<> writeSystemInformation(std::string_view key, std::string_view value) {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    return perform(Effect::store, "system information", [&]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(const auto file, storePath(paths::systemInformation));
        return writeKeyValue(file, key, value);
    });
}

} // namespace

} // namespace velt

VLIBCSzList* VLIBCSzListAlloc(int capacity) {
    velt::StringList* list = nullptr;
    velt::atBoundary([&] {
        auto made = std::make_unique<velt::StringList>();
        made->texts.reserve(static_cast<std::size_t>(std::max(capacity, 0)));
        made->capacity = std::max(capacity, 0);
        list = made.release();
        return 0;
    });
    return list;
}

const char* VLIBCSzListGet(const VLIBCSzList* list, int index) {
    if (list == nullptr || index < 0)
        return nullptr;
    const auto& texts = static_cast<const velt::StringList*>(list)->texts;
    const auto at = static_cast<std::size_t>(index);
    return at < texts.size() ? texts[at].c_str() : nullptr;
}

int VLIBCSzListPush(VLIBCSzList** list, const char* text) {
    if (list == nullptr || *list == nullptr || text == nullptr)
        return velt::fail(velt::ErrorNumber::invalid, "A list and a text to add to it are required.");
    return velt::atBoundary([&] { return velt::push(*static_cast<velt::StringList*>(*list), text); });
}

void VLIBCSzListFree(VLIBCSzList* list) {
    delete static_cast<velt::StringList*>(list);
}

VLIBCSzHash* VLIBCSzHashAlloc(int /*initialSize*/) {
    VLIBCSzHash* map = nullptr;
    velt::atBoundary([&] {
        map = new VLIBCSzHash();
        return 0;
    });
    return map;
}

int VLIBCSzHashSetValue(VLIBCSzHash** map, const char* key, const char* value) {
    if (map == nullptr || *map == nullptr || key == nullptr || value == nullptr)
        return velt::fail(velt::ErrorNumber::invalid, "A map, a key and a value are required.");
    return velt::atBoundary([&] {
        (*map)->entries.insert_or_assign(key, value);
        return 0;
    });
}

void VLIBCSzHashFree(VLIBCSzHash* map) {
    delete map;
}

int VLIBCFileGetKeyValue(const char* path, const char* key, char* value, int size, int /*flags*/) {
    if (path == nullptr || key == nullptr || value == nullptr || size < 1)
        return velt::fail(velt::ErrorNumber::invalid, "A file, a key and room for its value are required.");
    return velt::atBoundary([&] {
        const auto found = velt::readKeyValue(velt::statePath(path), key);
        if (!found)
            return velt::fail(found.error());
        if (!*found)
            return 0;
        // A NUL byte in the file ends the value, as it does for everybody who reads C strings.
        const std::string& text = **found;
        const auto length = std::min({text.size(), text.find('\0'), static_cast<std::size_t>(size - 1)});
        std::memcpy(value, text.data(), length);
        value[length] = '\0';
        return 1;
    });
}

int VLIBCINFOSetKeyValue(const char* key, const char* value) {
    if (key == nullptr || value == nullptr)
        return velt::fail(velt::ErrorNumber::invalid, "A key and a value are required.");
    return velt::atBoundary([&]() -> int {
        // A blank means no address, for callers that cannot pass an empty text.
        if (key == velt::externalAddressKey)
            return velt::toContract(velt::changeExternalAddress(velt::isBlank(value) ? "" : value));
        return velt::toContract(velt::writeSystemInformation(key, value));
    });
}

int VLIBCErrGet(void) {
    return static_cast<int>(velt::lastErrorNumber());
}

const char* VLIBCErrorGetFile(void) {
    return velt::lastErrorPlace().file;
}

int VLIBCErrorGetLine(void) {
    return velt::lastErrorPlace().line;
}
