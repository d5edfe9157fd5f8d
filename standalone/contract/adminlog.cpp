#include "platform/adminlog.h"

#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"
#include "standalone/journal/admin_log.h"
#include "standalone/journal/event_bus.h"

int VELTLogSet1(int category, int level, unsigned event, const char* arg1, const char* arg2, const char* arg3,
                const char* arg4) {
    return velt::atBoundary([&] {
        velt::LogEntry entry = velt::makeLogEntry(category, level, event, {arg1, arg2, arg3, arg4});
        return velt::perform(velt::Effect::logEntry, entry.sentence, [&entry] {
            if (velt::storeLogEntry(entry) < 0) {
                return -1;
            }
            velt::publish(entry);
            return 0;
        });
    });
}
