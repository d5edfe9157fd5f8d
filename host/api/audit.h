// What the administrator log says of changes that veltd itself makes or takes.
#ifndef VELT_HOST_API_AUDIT_H
#define VELT_HOST_API_AUDIT_H

#include "host/api/route.h"
#include "host/base/host_log.h"
#include "standalone/standalone.h"

#include <array>
#include <string>

namespace velt::host {

/// Events of the catalogue (standalone/journal/catalogue.h).
enum class AuditEvent : unsigned {
    settingsChanged = 0x11BF0003,
    takenBack = 0x11BF0004,
    confirmed = 0x11BF0005,
    tokenMade = 0x11BF0006,
    tokenDeleted = 0x11BF0007,
    restarted = 0x11BF0008,
    takenBackInPart = 0x11BF0009,
    superseded = 0x11BF000A,
    sessionEnded = 0x11BF000B,
    keyAdded = 0x11BF0020,
    keyRemoved = 0x11BF0021,
};

struct AuditEntry {
    AuditEvent event{};
    std::array<std::string, 4> texts; ///< for the places of its sentence
};

/// Writes the entry on behalf of the calling thread's actor.
Result<> writeAudit(const AuditEntry& entry);

/// Writes the entry on behalf of who asked. What it tells of is done, so a failure only goes to veltd's log.
void writeAudit(const AuditEntry& entry, HostLog& log, const Call& call);

/// What writing it is in a plan.
ChangeStep stepOf(const AuditEntry& entry);

} // namespace velt::host

#endif
