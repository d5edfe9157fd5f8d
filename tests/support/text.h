#ifndef VELT_TESTS_SUPPORT_TEXT_H
#define VELT_TESTS_SUPPORT_TEXT_H

#include <string_view>

namespace velt::test {

bool contains(std::string_view text, std::string_view part);

} // namespace velt::test

#endif
