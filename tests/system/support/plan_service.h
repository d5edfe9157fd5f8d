// Changes whose plan is compared with what happens.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_PLAN_SERVICE_H
#define VELT_TESTS_SYSTEM_SUPPORT_PLAN_SERVICE_H

#include "tests/system/support/host_service.h"
#include "tests/system/support/system_moment.h"

#include <functional>
#include <set>
#include <string>

namespace velt::test {

/// How a change is asked for: with this behind its path.
using Ask = std::function<HttpResult(const std::string& query)>;

class PlanService : public HostService {
protected:
    /// The packet filter shows which ports are opened and closed.
    void SetUp() override;
    void TearDown() override;

    HttpResult patch(const std::string& body, const std::string& query = "") const;

    /// When former daemons are gone.
    static SystemMoment settled();

    /// The dry run does nothing, and the change does what it said, no more and no less, as far as that can be
    /// seen from outside; the same for the sessions that it ends, of some that are open. `what` is for the
    /// message of a failure.
    void expectAsPlanned(const std::string& what, const Ask& ask);
    /// The same for a patch of the document.
    void expectAsPlanned(const std::string& patchBody);

    std::set<std::string> covered; ///< fields that such changes gave another value
};

} // namespace velt::test

#endif
