// Passing a configuration through the test that a daemon itself offers.
#ifndef VELT_STANDALONE_DAEMON_TEST_H
#define VELT_STANDALONE_DAEMON_TEST_H

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// A folder of its own below the state root, gone with this object.
class ScratchFolder {
public:
    ScratchFolder();
    ~ScratchFolder();
    ScratchFolder(const ScratchFolder&) = delete;
    ScratchFolder& operator=(const ScratchFolder&) = delete;

    /// False when it could not be made; the last error is then set.
    explicit operator bool() const { return !path_.empty(); }
    const std::filesystem::path& path() const { return path_; }

private:
    std::filesystem::path path_;
};

/// Runs the test; negative when the daemon refuses, with its own words in the last error. `daemon` is its name for people.
int runDaemonTest(const std::string& daemon, const std::vector<std::string>& arguments);

} // namespace velt

#endif
