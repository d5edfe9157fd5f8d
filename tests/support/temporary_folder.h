// A folder of a test's own, gone with the test.
#ifndef VELT_TESTS_SUPPORT_TEMPORARY_FOLDER_H
#define VELT_TESTS_SUPPORT_TEMPORARY_FOLDER_H

#include <filesystem>
#include <string>
#include <string_view>

namespace velt::test {

class TemporaryFolder {
public:
    TemporaryFolder();
    ~TemporaryFolder();
    TemporaryFolder(const TemporaryFolder&) = delete;
    TemporaryFolder& operator=(const TemporaryFolder&) = delete;

    const std::filesystem::path& path() const { return path_; }

    /// Writes a file below the folder, making the folders on the way; its path.
    std::filesystem::path write(std::string_view below, std::string_view contents) const;

    /// What a file below the folder holds; "" where there is none.
    std::string read(std::string_view below) const;

private:
    std::filesystem::path path_;
};

} // namespace velt::test

#endif
