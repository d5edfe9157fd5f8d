#include "standalone/journal/announce.h"

#include "standalone/core/effects.h"
#include "standalone/journal/event_bus.h"
#include "standalone/journal/event_file.h"
#include "standalone/journal/held_journal.h"
#include "standalone/journal/request_actor.h"

namespace velt {

Result<> announce(const std::string& name, const std::map<std::string, std::string>& parameters) {
    const auto now = std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now());
    return announce(SystemEvent{now, name, parameters, requestActor().actor, requestActor().address});
}

Result<> announce(const SystemEvent& event) {
    return perform(Effect::event, event.name, [&event]() -> Result<> {
        if (holdBack(event)) {
            return {};
        }
        // It has happened, whether the file can take it or not.
        Result<> written = appendEvent(event);
        publish(event);
        return written;
    });
}

} // namespace velt
