#ifndef VELT_TESTS_SUPPORT_TEXT_H
#define VELT_TESTS_SUPPORT_TEXT_H

#include <set>
#include <string>
#include <string_view>

namespace velt::test {

std::set<std::string> linesOf(const std::string& text);

bool contains(std::string_view text, std::string_view part);

} // namespace velt::test

#endif
