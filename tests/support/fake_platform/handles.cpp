#include "tests/support/fake_platform/handles.h"

#include <sanitizer/asan_interface.h>

namespace fake {

namespace {

// Negative, so that a loop over a list that has ended visits nothing and the test misses the entries.
constexpr int endedField = -0x5EAD;

const char* const endedText = "(a share that has ended)";

} // namespace

ListBlock::~ListBlock() {
    ASAN_UNPOISON_MEMORY_REGION(&record, sizeof(record));
}

void ListBlock::poison() {
    record = {endedField, endedField, endedField, endedField};
    std::vector<std::string>().swap(texts);
    ASAN_POISON_MEMORY_REGION(&record, sizeof(record));
}

void MapBlock::poison() {
    record.entries.clear();
}

ShareBlock::~ShareBlock() {
    ASAN_UNPOISON_MEMORY_REGION(&record, sizeof(record));
}

void ShareBlock::poison() {
    record = {endedText, endedText, endedText};
    ASAN_POISON_MEMORY_REGION(&record, sizeof(record));
}

void ShareBlock::set(const std::string& newName, const std::string& newComment, const std::string& newPath) {
    shareName = newName;
    comment = newComment;
    path = newPath;
    record = {shareName.c_str(), comment.c_str(), path.c_str()};
}

std::string HandleTable::nameOf(const void* address) const {
    if (address == nullptr) {
        return "null";
    }
    const Block* block = find(address);
    if (block == nullptr) {
        return "unknown handle";
    }
    switch (block->life) {
    case Life::moved:
        return block->name + " (moved)";
    case Life::freed:
        return block->name + " (freed)";
    case Life::live:
        break;
    }
    return block->name;
}

int HandleTable::made(const std::string& kind) const {
    const auto entry = made_.find(kind);
    return entry == made_.end() ? 0 : entry->second;
}

std::vector<std::string> HandleTable::errors() const {
    std::vector<std::string> result = errors_;
    for (const auto& [address, block] : blocks_) {
        const bool platformOwned = dynamic_cast<const UserBlock*>(block.get()) != nullptr ||
                                   dynamic_cast<const GroupBlock*>(block.get()) != nullptr;
        if (block->life == Life::live && !platformOwned) {
            result.push_back(block->name + " was not freed");
        }
    }
    return result;
}

Block* HandleTable::find(const void* address) const {
    const auto entry = blocks_.find(address);
    return entry == blocks_.end() ? nullptr : entry->second.get();
}

void HandleTable::end(Block& block, Life life) {
    block.life = life;
    block.poison();
}

} // namespace fake
