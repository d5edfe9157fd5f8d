#include "cli/health_count.h"

#include "cli/failure.h"
#include "cli/server_refusal.h"

namespace velt::cli {

HealthCount countFindings(const Json::Value& health) {
    if (!health.isObject() || !health["findings"].isArray()) {
        throw unexpectedAnswer("The server's answer is not what veltctl expects.");
    }
    HealthCount count;
    for (const Json::Value& finding : health["findings"]) {
        count.errors += finding["severity"] == "error" ? 1 : 0;
        count.warnings += finding["severity"] == "warning" ? 1 : 0;
    }
    return count;
}

} // namespace velt::cli
