#include "tests/system/support/files.h"

#include "tests/system/support/private_world.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fstream>

namespace velt::test {
namespace fs = std::filesystem;

void writeFile(const fs::path& path, const std::string& contents, unsigned owner) {
    std::ofstream(path, std::ios::binary) << contents;
    EXPECT_EQ(chown(path.c_str(), owner, owner), 0) << path;
}

unsigned modeOf(const fs::path& path) {
    struct stat facts {};
    return stat(path.c_str(), &facts) == 0 ? facts.st_mode & 07777U : 0;
}

void furnishHomes() {
    unsigned id = aliceId;
    for (const char* name : {"alice", "bob", "carol"}) {
        writeFile(fs::path("/mnt/home") / name / "home-of", name, id++);
    }
}

void clearFolders() {
    for (const fs::path& folder : {worldRoot, fs::path("/mnt/srv"), fs::path("/mnt/home/alice"),
                                   fs::path("/mnt/home/bob"), fs::path("/mnt/home/carol")}) {
        std::error_code error;
        for (const auto& entry : fs::directory_iterator(folder, error)) {
            fs::remove_all(entry, error);
        }
    }
}

} // namespace velt::test
