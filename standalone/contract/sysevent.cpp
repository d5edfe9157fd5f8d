#include "platform/sysevent.h"

#include "standalone/contract/string_map.h"
#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"
#include "standalone/core/last_error.h"
#include "standalone/journal/event_bus.h"
#include "standalone/journal/event_file.h"
#include "standalone/journal/request_actor.h"

#include <chrono>

int VLIBSyseventEmit(const char* event, VLIBCSzHash* params, int /*flags*/) {
    return velt::atBoundary([&] {
        if (event == nullptr || *event == '\0') {
            return velt::fail(velt::ErrorNumber::invalid, "A system event needs a name.");
        }
        velt::SystemEvent announced;
        announced.time = std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now());
        announced.name = event;
        if (params != nullptr) {
            announced.parameters = params->entries;
        }
        announced.actor = velt::requestActor().actor;
        announced.address = velt::requestActor().address;
        return velt::perform(velt::Effect::event, announced.name, [&announced] {
            // Subscribers hear of it even when the file cannot take it: it is not undone by that.
            const int written = velt::appendEvent(announced);
            velt::publish(announced);
            return written;
        });
    });
}
