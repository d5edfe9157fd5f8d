// What the service did, held against the model.
#ifndef VELT_TESTS_MODEL_COMPARISON_H
#define VELT_TESTS_MODEL_COMPARISON_H

#include "tests/model/expectation.h"

namespace velt::model {

/// What came of a step.
struct Outcome {
    bool allowed = false;
    std::optional<std::string> content;
    std::optional<std::set<std::string>> names;
    Tree after;
};

/// How it differs from what must come of it; "" when it does not.
std::string disagreement(const Tree& before, const Expectation& expected, const Outcome& outcome);

/// What was read or changed though nothing that the login was given leads there; "" when there is nothing.
/// Holds whatever the model says of the step. `open` is the number of a file that the session has open, or 0.
std::string breach(const Tree& before, const View& view, std::uint64_t open, const Outcome& outcome);

} // namespace velt::model

#endif
