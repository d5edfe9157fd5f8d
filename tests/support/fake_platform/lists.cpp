#include "tests/support/fake_platform/lists.h"

#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/handles.h"

#include <algorithm>

namespace fake {

namespace {

ListBlock& moveList(ListBlock& old) {
    VLIBCSzList header = old.record;
    std::vector<std::string> texts = std::move(old.texts);
    ListBlock& fresh = Platform::instance().handles().createInPlaceOf(old);
    fresh.record = header;
    fresh.texts = std::move(texts);
    return fresh;
}

void setTexts(ListBlock& block, const std::vector<std::string>& texts) {
    block.texts = texts;
    block.record.count = static_cast<int>(texts.size());
    block.record.capacity = std::max(block.record.capacity, block.record.count);
}

void push(VLIBCSzList** list, ListBlock& block, const char* text) {
    const bool full = block.record.count >= block.record.capacity;
    ListBlock& target = full || Platform::instance().pushMovesList ? moveList(block) : block;
    if (full) {
        target.record.capacity = 2 * target.record.capacity + 1;
    }
    target.texts.emplace_back(text);
    ++target.record.count;
    *list = &target.record;
}

} // namespace

int enumerate(const std::string& operation, const std::string& shown, VLIBCSzList** list,
              const std::vector<std::string>& texts) {
    auto& platform = Platform::instance();
    const auto failure = platform.enter(operation, shown);
    if (failure && !platform.failedEnumeratorsReplaceList) {
        return *failure;
    }
    auto* block = platform.handles().use<ListBlock>(*list, operation);
    if (block == nullptr) {
        return failure.value_or(-1);
    }
    if (failure || platform.enumeratorsReplaceList) {
        block = &moveList(*block);
        *list = &block->record;
    }
    if (failure) {
        return *failure;
    }
    setTexts(*block, texts);
    return 0;
}

Verbatim listContents(const VLIBCSzList* list) {
    auto& handles = Platform::instance().handles();
    const auto* block = handles.peek<ListBlock>(list);
    if (block == nullptr) {
        return {handles.nameOf(list)};
    }
    return {block->name + " flags=" + std::to_string(block->record.flags) + " " + render(block->texts)};
}

std::vector<std::string> textsOf(const VLIBCSzList* list, const std::string& operation) {
    const auto* block = Platform::instance().handles().use<ListBlock>(list, operation);
    return block == nullptr ? std::vector<std::string>{} : block->texts;
}

} // namespace fake

using fake::arguments;
using fake::ListBlock;
using fake::Platform;
using fake::Verbatim;

VLIBCSzList* VLIBCSzListAlloc(int capacity) {
    auto& platform = Platform::instance();
    if (platform.enter("VLIBCSzListAlloc", arguments(capacity))) {
        return nullptr;
    }
    ListBlock& block = platform.handles().create<ListBlock>();
    block.record.capacity = capacity;
    return &block.record;
}

const char* VLIBCSzListGet(const VLIBCSzList* list, int index) {
    auto& platform = Platform::instance();
    const Verbatim name{platform.handles().nameOf(list)};
    if (platform.enter("VLIBCSzListGet", arguments(name, index), platform.journalListGets)) {
        return nullptr;
    }
    const auto* block = platform.handles().use<ListBlock>(list, "VLIBCSzListGet");
    if (block == nullptr || index < 0 || index >= block->record.count) {
        return nullptr;
    }
    return block->texts[static_cast<size_t>(index)].c_str();
}

int VLIBCSzListPush(VLIBCSzList** list, const char* text) {
    auto& platform = Platform::instance();
    const auto* before = platform.handles().peek<ListBlock>(*list);
    const bool flagged = before != nullptr && before->record.flags != 0;
    const Verbatim name{platform.handles().nameOf(*list) +
                        (flagged ? " flags=" + std::to_string(before->record.flags) : "")};
    if (const auto failure = platform.enter("VLIBCSzListPush", arguments(name, text))) {
        return *failure;
    }
    auto* block = platform.handles().use<ListBlock>(*list, "VLIBCSzListPush");
    if (block == nullptr || text == nullptr) {
        return -1;
    }
    fake::push(list, *block, text);
    return 0;
}

void VLIBCSzListFree(VLIBCSzList* list) {
    auto& platform = Platform::instance();
    const Verbatim name{platform.handles().nameOf(list)};
    if (!platform.enter("VLIBCSzListFree", arguments(name))) {
        platform.handles().release<ListBlock>(list, "VLIBCSzListFree");
    }
}
