#include "tests/support/text.h"

namespace velt::test {

bool contains(std::string_view text, std::string_view part) {
    return text.find(part) != std::string_view::npos;
}

} // namespace velt::test
