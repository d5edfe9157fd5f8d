// Comparing a text with the file that says what it should be.
#ifndef VELT_TESTS_STANDALONE_SUPPORT_GOLDEN_H
#define VELT_TESTS_STANDALONE_SUPPORT_GOLDEN_H

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

namespace velt::test {

/// Expects the file to hold the text. With VELT_UPDATE_GOLDEN in the environment it writes the file instead,
/// for a person to look through; the test then fails, so that such a run cannot count.
inline void expectGolden(const std::filesystem::path& file, const std::string& text) {
    if (std::getenv("VELT_UPDATE_GOLDEN") != nullptr) {
        std::ofstream(file, std::ios::binary | std::ios::trunc) << text;
        ADD_FAILURE() << "wrote " << file;
        return;
    }
    std::ifstream stream(file, std::ios::binary);
    ASSERT_TRUE(stream) << "there is no " << file;
    EXPECT_EQ(std::string(std::istreambuf_iterator<char>(stream), {}), text) << file;
}

} // namespace velt::test

#endif
