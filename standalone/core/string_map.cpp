#include "standalone/core/string_map.h"

#include "standalone/core/boundary.h"

VLIBCSzHash* VLIBCSzHashAlloc(int /*initialSize*/) {
    VLIBCSzHash* map = nullptr;
    const int result = velt::atBoundary([&] {
        map = new VLIBCSzHash();
        return 0;
    });
    return result < 0 ? nullptr : map;
}

int VLIBCSzHashSetValue(VLIBCSzHash** map, const char* key, const char* value) {
    if (map == nullptr || *map == nullptr || key == nullptr || value == nullptr)
        return velt::fail(velt::ErrorNumber::invalid, "There is no map, no key or no value to set in it.");
    return velt::atBoundary([&] {
        (*map)->entries.insert_or_assign(key, value);
        return 0;
    });
}

void VLIBCSzHashFree(VLIBCSzHash* map) {
    delete map;
}
