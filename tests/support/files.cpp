#include "tests/support/files.h"

#include <fstream>
#include <iterator>

namespace velt::test {

std::string contentsOf(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

} // namespace velt::test
