#include "platform/core.h"
#include "standalone/core/boundary.h"

#include <algorithm>
#include <climits>
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
        return fail(ErrorNumber::outOfMemory, "A list of texts is full.");
    // Copied first: the text may be an entry of this list, and growing moves the entries.
    std::string copy(text);
    list.texts.push_back(std::move(copy));
    list.count = static_cast<int>(list.texts.size());
    list.capacity = static_cast<int>(std::min<std::size_t>(list.texts.capacity(), INT_MAX));
    return 0;
}

} // namespace

} // namespace velt

VLIBCSzList* VLIBCSzListAlloc(int capacity) {
    velt::StringList* list = nullptr;
    const int result = velt::atBoundary([&] {
        auto made = std::make_unique<velt::StringList>();
        made->texts.reserve(static_cast<std::size_t>(std::max(capacity, 0)));
        made->capacity = std::max(capacity, 0);
        list = made.release();
        return 0;
    });
    return result < 0 ? nullptr : list;
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
        return velt::fail(velt::ErrorNumber::invalid, "There is no list or no text to add to it.");
    return velt::atBoundary([&] { return velt::push(*static_cast<velt::StringList*>(*list), text); });
}

void VLIBCSzListFree(VLIBCSzList* list) {
    delete static_cast<velt::StringList*>(list);
}
