// The commands of a page that people copy, and what the page says comes out.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_README_TOUR_H
#define VELT_TESTS_SYSTEM_SUPPORT_README_TOUR_H

#include <cstddef>
#include <string>
#include <vector>

namespace velt::test {

/// A block "```sh" that a block "```text" follows at once.
struct TourStep {
    std::string commands;
    std::string output; ///< as the page has it
    std::size_t begin;  ///< where the output stands in the page
};

std::vector<TourStep> stepsOf(const std::string& page);

/// The page with these outputs in place of its own, one for each step.
std::string withOutputs(const std::string& page, const std::vector<std::string>& outputs);

/// The text with everything replaced that is another at each run: times, sizes, processes, tokens, request
/// ids.
std::string masked(const std::string& text);

} // namespace velt::test

#endif
