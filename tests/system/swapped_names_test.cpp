// Changes while somebody swaps a file for a link to one that is kept: the name is looked at and changed at
// different moments.
#include "tests/support/files.h"
#include "tests/system/support/each_protocol.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <thread>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

const fs::path home = "/mnt/home/alice";

/// Swaps the two names until its end.
class Swapping {
public:
    Swapping(fs::path one, fs::path other)
        : thread_([this, one, other] {
              while (!ends_) {
                  failed_ = failed_ ||
                            ::renameat2(AT_FDCWD, one.c_str(), AT_FDCWD, other.c_str(), RENAME_EXCHANGE) != 0;
              }
          }) {}
    ~Swapping() {
        ends_ = true;
        thread_.join();
        EXPECT_FALSE(failed_);
    }
    Swapping(const Swapping&) = delete;
    Swapping& operator=(const Swapping&) = delete;

private:
    std::atomic<bool> ends_ = false;
    std::atomic<bool> failed_ = false;
    std::thread thread_; // last: it uses the others
};

class SwappedNames : public EachProtocol {};

TEST_P(SwappedNames, leadNoChangeToAKeptFile) {
    writeFile(home / ".profile", "start", aliceId);
    writeFile(home / "file", "mine", aliceId);
    fs::create_symlink(".profile", home / "link");
    const auto before = fs::last_write_time(home / ".profile");
    record.user_chroot = 1;
    start();
    const auto session = logIn();
    int done = 0;
    {
        const Swapping swapping(home / "file", home / "link");
        const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(3);
        while (std::chrono::steady_clock::now() < end) {
            done += session->setMode("/file", 0666) ? 1 : 0;
            session->setTimes("/file", 1000);
            session->append("/file", "x");
            session->cut("/file");
        }
    }
    EXPECT_GT(done, 0) << "it was a file at times";
    EXPECT_EQ(modeOf(home / ".profile"), 0644U);
    EXPECT_EQ(fs::last_write_time(home / ".profile"), before);
    EXPECT_EQ(contentsOf(home / ".profile"), "start");
}

VELT_OVER_EACH_PROTOCOL(SwappedNames);

} // namespace
} // namespace velt::test
