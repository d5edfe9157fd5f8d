#include "tests/support/temporary_folder.h"

#include "tests/support/files.h"

#include <cstdlib>
#include <fstream>
#include <stdexcept>

namespace velt::test {
namespace fs = std::filesystem;

TemporaryFolder::TemporaryFolder() {
    std::string pattern = (fs::temp_directory_path() / "velt-test-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) {
        throw std::runtime_error("cannot make a temporary folder");
    }
    path_ = pattern;
}

TemporaryFolder::~TemporaryFolder() {
    std::error_code ignored;
    fs::remove_all(path_, ignored);
}

fs::path TemporaryFolder::write(std::string_view below, std::string_view contents) const {
    fs::path file = path_ / fs::path(below).relative_path();
    fs::create_directories(file.parent_path());
    std::ofstream(file, std::ios::binary | std::ios::trunc) << contents;
    return file;
}

std::string TemporaryFolder::read(std::string_view below) const {
    return contentsOf(path_ / fs::path(below).relative_path());
}

} // namespace velt::test
