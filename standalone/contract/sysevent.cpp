#include "platform/sysevent.h"

#include "standalone/contract/boundary.h"
#include "standalone/contract/string_map.h"
#include "standalone/journal/announce.h"

int VLIBSyseventEmit(const char* event, VLIBCSzHash* params, int /*flags*/) {
    return velt::atBoundary([&]() -> velt::Result<> {
        if (event == nullptr || *event == '\0') {
            return velt::Error(velt::ErrorNumber::invalid, "A system event needs a name.");
        }
        return velt::announce(event,
                              params == nullptr ? std::map<std::string, std::string>() : params->entries);
    });
}
