// The model of access: what one step of a session must come to.
#ifndef VELT_TESTS_MODEL_EXPECTATION_H
#define VELT_TESTS_MODEL_EXPECTATION_H

#include "tests/model/policy.h"
#include "tests/model/step.h"

namespace velt::model {

enum class Verdict {
    allowed,
    refused,
    undecided, ///< protocols and servers differ here; only mayReach binds
};

struct Expectation {
    Verdict verdict = Verdict::refused;
    std::string content;         ///< of a file that is read
    std::set<std::string> names; ///< in a folder that is listed
    std::optional<Tree> after;   ///< nothing: all stays as it is
};

/// Whether the step makes a folder, or moves or removes something. A session that is older than the last
/// change of the shares or rules may not do that any more.
bool changesNames(const Step& step);

/// Of a step like "read SESSION PATH" in a view of this account. `data` is what a file gets that is written.
Expectation expect(const Tree& tree, const View& view, const Account& account, const Step& step,
                   const std::string& data);

} // namespace velt::model

#endif
