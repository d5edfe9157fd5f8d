// A world of the tests' own: mounts, network, processes and accounts that nobody else sees.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_PRIVATE_WORLD_H
#define VELT_TESTS_SYSTEM_SUPPORT_PRIVATE_WORLD_H

#include <filesystem>
#include <string>

namespace velt::test {

/// Enters the world in a child process and returns true there. In the calling process it returns false once
/// the child has ended, whose exit code it stores. Where the machine does not allow it, it returns true in
/// the calling process itself and whyNoWorld says why.
bool enterPrivateWorld(int& exitCode);

/// "" in the private world.
const std::string& whyNoWorld();

/// The state root of the tests, on a file system that ends with the world.
inline const std::filesystem::path worldRoot = "/mnt/root";

// The accounts of the world; each one's password is its name followed by "-secret". The homes are below
// /mnt/home.
inline constexpr unsigned aliceId = 1001; // member of "staff"
inline constexpr unsigned bobId = 1002;   // member of "staff"
inline constexpr unsigned carolId = 1003; // member of "velt-admin"
inline constexpr unsigned staffId = 2001;

} // namespace velt::test

#endif
