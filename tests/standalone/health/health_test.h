// Looking into findings.
#ifndef VELT_TESTS_STANDALONE_HEALTH_HEALTH_TEST_H
#define VELT_TESTS_STANDALONE_HEALTH_HEALTH_TEST_H

#include "standalone/health/checks.h"

#include <ostream>

namespace velt {

// For the messages of failed comparisons.
inline void PrintTo(const Finding& finding, std::ostream* out) {
    *out << severityName(finding.severity) << " " << finding.id << " (" << finding.subject
         << "): " << finding.sentence << " -> " << finding.mend;
}

namespace test {

/// "error certificate-expired, warning ...": all of them in their order.
inline std::string summary(const Findings& findings) {
    std::string text;
    for (const Finding& each : findings) {
        text += (text.empty() ? "" : ", ") + std::string(severityName(each.severity)) + " " + each.id;
    }
    return text;
}

} // namespace test
} // namespace velt

#endif
