// The core library's string maps and the system event bus that takes them.

#include "platform/sysevent.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/handles.h"
#include "tests/support/fake_platform/text.h"

#include <algorithm>

using fake::arguments;
using fake::MapBlock;
using fake::Platform;
using fake::Verbatim;

namespace {

MapBlock& moveMap(MapBlock& old) {
    auto entries = std::move(old.record.entries);
    MapBlock& fresh = Platform::instance().handles().createInPlaceOf(old);
    fresh.record.entries = std::move(entries);
    return fresh;
}

void setValue(VLIBCSzHash& map, const std::string& key, const std::string& value) {
    const auto entry = std::find_if(map.entries.begin(), map.entries.end(),
                                    [&](const auto& candidate) { return candidate.first == key; });
    if (entry != map.entries.end()) {
        entry->second = value;
    } else {
        map.entries.emplace_back(key, value);
    }
}

Verbatim mapContents(const VLIBCSzHash* map) {
    const auto& handles = Platform::instance().handles();
    const auto* block = handles.peek<MapBlock>(map);
    return {block == nullptr ? handles.nameOf(map) : fake::render(block->record.entries)};
}

} // namespace

VLIBCSzHash* VLIBCSzHashAlloc(int initialSize) {
    auto& platform = Platform::instance();
    if (platform.enter("VLIBCSzHashAlloc", arguments(initialSize))) {
        return nullptr;
    }
    return &platform.handles().create<MapBlock>().record;
}

int VLIBCSzHashSetValue(VLIBCSzHash** map, const char* key, const char* value) {
    auto& platform = Platform::instance();
    const Verbatim name{platform.handles().nameOf(*map)};
    if (const auto failure = platform.enter("VLIBCSzHashSetValue", arguments(name, key, value))) {
        return *failure;
    }
    auto* block = platform.handles().use<MapBlock>(*map, "VLIBCSzHashSetValue");
    if (block == nullptr || key == nullptr || value == nullptr) {
        return -1;
    }
    if (platform.hashMoves) {
        block = &moveMap(*block);
        *map = &block->record;
    }
    setValue(block->record, key, value);
    return 0;
}

void VLIBCSzHashFree(VLIBCSzHash* map) {
    auto& platform = Platform::instance();
    const Verbatim name{platform.handles().nameOf(map)};
    if (!platform.enter("VLIBCSzHashFree", arguments(name))) {
        platform.handles().release<MapBlock>(map, "VLIBCSzHashFree");
    }
}

int VLIBSyseventEmit(const char* event, VLIBCSzHash* params, int flags) {
    auto& platform = Platform::instance();
    const auto shown = arguments(event, mapContents(params), flags);
    if (const auto failure = platform.enter("VLIBSyseventEmit", shown)) {
        return *failure;
    }
    return platform.handles().use<MapBlock>(params, "VLIBSyseventEmit") == nullptr ? -1 : 0;
}
