#include "host/api/audit.h"

#include "host/module/platform_request.h"

namespace velt::host {

namespace {

constexpr int logCategory = 2;
constexpr int logLevel = 1;

} // namespace

Result<> writeAudit(const AuditEntry& entry) {
    const auto& [event, texts] = entry;
    return logEvent(logCategory, logLevel, static_cast<unsigned>(event),
                    {texts[0].c_str(), texts[1].c_str(), texts[2].c_str(), texts[3].c_str()});
}

void writeAudit(const AuditEntry& entry, HostLog& log, const Call& call) {
    const PlatformRequest platform(call.principal.actor, call.principal.address);
    if (const auto written = writeAudit(entry); !written) {
        log.write(call.id,
                  "not in the administrator log: " + stepOf(entry).subject + " " + written.error().message);
    }
}

ChangeStep stepOf(const AuditEntry& entry) {
    return {StepKind::logEntry, velt::sentenceOf(static_cast<std::uint32_t>(entry.event), entry.texts)};
}

} // namespace velt::host
