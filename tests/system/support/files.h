// Files that the tests make and look at.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_FILES_H
#define VELT_TESTS_SYSTEM_SUPPORT_FILES_H

#include <filesystem>
#include <string>

namespace velt::test {

void writeFile(const std::filesystem::path& path, const std::string& contents, unsigned owner = 0);
/// The permission bits; 0 when there is no such file.
unsigned modeOf(const std::filesystem::path& path);

/// Puts a file "home-of" with the user's name into each home of the world.
void furnishHomes();
/// Removes what lies in the state root, in /mnt/srv and in the homes.
void clearFolders();

} // namespace velt::test

#endif
