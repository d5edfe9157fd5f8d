#ifndef VELT_TESTS_SUPPORT_FILES_H
#define VELT_TESTS_SUPPORT_FILES_H

#include <filesystem>
#include <string>

namespace velt::test {

/// What a file holds; "" where there is none.
std::string contentsOf(const std::filesystem::path& path);

} // namespace velt::test

#endif
