// What the server finds wrong with itself, counted.
#ifndef VELT_CLI_HEALTH_COUNT_H
#define VELT_CLI_HEALTH_COUNT_H

#include <json/value.h>

namespace velt::cli {

struct HealthCount {
    int errors = 0;
    int warnings = 0;

    int grave() const { return errors + warnings; }
};

/// Of the answer of /api/health.
HealthCount countFindings(const Json::Value& health);

} // namespace velt::cli

#endif
