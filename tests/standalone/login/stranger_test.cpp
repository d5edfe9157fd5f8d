// How the connections of an address are counted that are not logged in.
#include "base/unique_fd.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <arpa/inet.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

extern "C" {
#include "standalone/login/stranger.h"
}

#include <cerrno>
#include <csignal>
#include <string>
#include <vector>

namespace velt::test {
namespace {

in6_addr addressOf(const std::string& text) {
    in6_addr address{};
    EXPECT_EQ(inet_pton(AF_INET6, text.c_str(), &address), 1) << text;
    return address;
}

class StrangerCount : public testing::Test {
protected:
    UniqueFd come(const std::string& from) const {
        const in6_addr address = addressOf(from);
        return UniqueFd(velt_count_stranger(file_.c_str(), &address));
    }
    bool isFull(const std::string& from) const { return !come(from) && errno == EAGAIN; }
    /// As many as there may be.
    void fill(const std::string& from) {
        for (int i = 0; i < velt_most_strangers; i++) {
            EXPECT_TRUE(held_.emplace_back(come(from))) << from << " " << i;
        }
    }

    TemporaryFolder folder_;
    const std::string file_ = folder_.path() / "strangers";
    std::vector<UniqueFd> held_;
};

TEST_F(StrangerCount, endsAtAHundredOfAnAddress) {
    fill("::ffff:192.0.2.7");
    EXPECT_TRUE(isFull("::ffff:192.0.2.7"));
    for (const char* other : {"::ffff:192.0.2.8", "::ffff:193.0.2.7", "::ffff:0.0.0.0", "2001:db8::192.0.2.7",
                              "::192.0.2.7", "::1"}) {
        EXPECT_FALSE(isFull(other)) << other;
    }
    held_.pop_back();
    EXPECT_FALSE(isFull("::ffff:192.0.2.7"));
}

TEST_F(StrangerCount, goesByNetworksInIPv6) {
    fill("2001:db8:1:2::1");
    EXPECT_TRUE(isFull("2001:db8:1:2:ffff:ffff:ffff:ffff"));
    for (const char* other : {"2001:db8:1:3::1", "2001:db8:1:1::1", "2a01:db8:1:2::1", "3fff:db8:1:2::1"}) {
        EXPECT_FALSE(isFull(other)) << other;
    }
    fill("fe80::1");
    EXPECT_TRUE(isFull("fe80::1"));
    EXPECT_FALSE(isFull("fe80::2")) << "neighbours are one network, and several";
}

TEST_F(StrangerCount, forgetsProcessesThatAreKilled) {
    const pid_t child = fork();
    if (child == 0) {
        std::vector<UniqueFd> all;
        while (all.size() < velt_most_strangers) {
            all.push_back(come("::ffff:192.0.2.7"));
        }
        raise(SIGSTOP);
        _exit(0);
    }
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, WUNTRACED), child);
    ASSERT_TRUE(WIFSTOPPED(status));
    EXPECT_TRUE(isFull("::ffff:192.0.2.7"));
    kill(child, SIGKILL);
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_FALSE(isFull("::ffff:192.0.2.7"));
}

TEST_F(StrangerCount, tellsWhatFails) {
    const in6_addr address = addressOf("::ffff:192.0.2.7");
    EXPECT_EQ(velt_count_stranger((folder_.path() / "absent/file").c_str(), &address), -1);
    EXPECT_EQ(errno, ENOENT);
    symlink("/etc/passwd", (folder_.path() / "link").c_str());
    EXPECT_EQ(velt_count_stranger((folder_.path() / "link").c_str(), &address), -1);
    EXPECT_EQ(errno, ELOOP);
    struct stat status {};
    ASSERT_TRUE(come("::1"));
    ASSERT_EQ(stat(file_.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777U, 0644U);
    EXPECT_EQ(status.st_size, 0);
}

TEST(StrangerNetwork, holdsItsAddresses) {
    const auto holds = [](const char* network, const char* text) {
        const in6_addr address = addressOf(text);
        return velt_is_in_network(&address, network) != 0;
    };
    EXPECT_TRUE(holds("192.0.2.0/24", "::ffff:192.0.2.255"));
    EXPECT_FALSE(holds("192.0.2.0/24", "::ffff:192.0.3.0"));
    EXPECT_TRUE(holds("192.0.2.128/25", "::ffff:192.0.2.200"));
    EXPECT_FALSE(holds("192.0.2.128/25", "::ffff:192.0.2.127"));
    EXPECT_TRUE(holds("192.0.2.7", "::ffff:192.0.2.7"));
    EXPECT_FALSE(holds("192.0.2.7", "::ffff:192.0.2.6"));
    EXPECT_TRUE(holds("127.0.0.0/8", "::ffff:127.1.2.3"));
    EXPECT_TRUE(holds("0.0.0.0/0", "::ffff:9.9.9.9"));
    EXPECT_FALSE(holds("0.0.0.0/0", "2001:db8::1"));
    EXPECT_TRUE(holds("2001:db8::/32", "2001:db8:ffff::1"));
    EXPECT_FALSE(holds("2001:db8::/32", "2001:db9::1"));
    EXPECT_TRUE(holds("::1", "::1"));
    EXPECT_TRUE(holds("::/0", "2001:db8::1"));
    for (const char* nonsense :
         {"", "/", "x", "192.0.2.0/33", "::/129", "::/999999999999999999999", "192.0.2"}) {
        EXPECT_FALSE(holds(nonsense, "::ffff:192.0.2.7")) << nonsense;
    }
    EXPECT_FALSE(holds(std::string(300, '1').c_str(), "::1"));
}

} // namespace
} // namespace velt::test
