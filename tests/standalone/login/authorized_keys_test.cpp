#include "standalone/login/authorized_keys.h"

#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

namespace velt::test {
namespace {
namespace fs = std::filesystem;
using namespace std::string_view_literals;

TEST(KeysForTransfer, areThoseThatAreNotRestrictedToACommand) {
    EXPECT_EQ(keysForTransfer("# mine\n\n  ssh-ed25519 AAAA alice@home \n"
                              "from=\"192.0.2.0/24\",no-pty ssh-rsa BBBB command=\n"
                              "restrict ssh-rsa CCCC"),
              "ssh-ed25519 AAAA alice@home\n"
              "from=\"192.0.2.0/24\",no-pty ssh-rsa BBBB command=\n"
              "restrict ssh-rsa CCCC\n");
    for (const char* const line : {
             "command=\"/bin/false\" ssh-ed25519 AAAA",
             "restrict,Command=\"/bin/false\" ssh-ed25519 AAAA",
             "\tcommand=\"say \\\"hi\\\" now\",restrict ssh-ed25519 AAAA",
             "environment=\"A=b c\",command=\"x\" ssh-ed25519 AAAA",
             "cert-authority,command=\"x\" ssh-ed25519 AAAA",
             "from=\"a b ssh-ed25519 AAAA",
         }) {
        EXPECT_EQ(keysForTransfer(line), "") << line;
    }
    EXPECT_EQ(keysForTransfer("ssh-rsa A\0command=\"x\" ssh-rsa B\nssh-rsa C"sv), "ssh-rsa C\n");
}

TEST(KeysForTransfer, letAnAuthorityVouchForNoOtherCommand) {
    EXPECT_EQ(keysForTransfer("Cert-Authority,principals=\"a\" ssh-ed25519 AAAA"),
              "command=\"internal-sftp\",Cert-Authority,principals=\"a\" ssh-ed25519 AAAA\n");
}

class ReadKeysForTransfer : public testing::Test {
protected:
    void SetUp() override {
        root_.write("home/.ssh/authorized_keys", "ssh-rsa A\n");
        mode("home", 0755);
        mode("home/.ssh", 0700);
        mode("home/.ssh/authorized_keys", 0600);
    }
    void mode(const fs::path& path, unsigned bits) const {
        ASSERT_EQ(chmod((root_.path() / path).c_str(), bits), 0);
    }
    /// The keys, or "refused: " and the file or folder that the reason names.
    std::string read() const {
        const auto keys = readKeysForTransfer(root_.path() / "home", geteuid());
        if (keys) {
            return *keys;
        }
        const std::string reason = keys.error().message;
        const std::string top = fs::canonical(root_.path()) / "";
        const auto name = reason.find(top);
        return "refused: " +
               (name == std::string::npos
                    ? reason
                    : reason.substr(name + top.size(), reason.find_first_of(" :", name) - name - top.size()));
    }

    TemporaryFolder root_;
};

TEST_F(ReadKeysForTransfer, ofBothFiles) {
    root_.write("home/.ssh/authorized_keys2", "command=\"x\" ssh-rsa B\nssh-rsa C");
    EXPECT_EQ(read(), "ssh-rsa A\nssh-rsa C\n");
}

TEST_F(ReadKeysForTransfer, areNoneWithoutTheFiles) {
    fs::remove_all(root_.path() / "home/.ssh");
    EXPECT_EQ(read(), "");
    fs::remove_all(root_.path() / "home");
    EXPECT_EQ(read().substr(0, 9), "refused: ");
}

TEST_F(ReadKeysForTransfer, onlyOfFilesThatNobodyElseWrites) {
    for (const char* const path : {"home/.ssh/authorized_keys", "home/.ssh", "home"}) {
        struct stat before {};
        ASSERT_EQ(stat((root_.path() / path).c_str(), &before), 0);
        for (const unsigned others : {0020U, 0002U}) {
            mode(path, (before.st_mode & 07777) | others);
            EXPECT_EQ(read(), "refused: " + std::string(path));
        }
        mode(path, before.st_mode & 07777);
        if (geteuid() == 0) {
            ASSERT_EQ(chown((root_.path() / path).c_str(), 54321, 0), 0);
            EXPECT_EQ(read(), "refused: " + std::string(path));
            ASSERT_EQ(chown((root_.path() / path).c_str(), 0, 0), 0);
        }
    }
    EXPECT_EQ(read(), "ssh-rsa A\n");
}

TEST_F(ReadKeysForTransfer, lookAtTheFolderThatALinkLeadsTo) {
    root_.write("elsewhere/keys", "ssh-rsa B\n");
    fs::remove(root_.path() / "home/.ssh/authorized_keys");
    fs::create_symlink("../../elsewhere/keys", root_.path() / "home/.ssh/authorized_keys");
    mode("elsewhere/keys", 0644);
    mode("elsewhere", 0777);
    EXPECT_EQ(read(), "refused: elsewhere");
}

TEST_F(ReadKeysForTransfer, onlyOfFilesOfAUsualSize) {
    root_.write("home/.ssh/authorized_keys", std::string(1024 * 1024 + 1, '\n'));
    EXPECT_EQ(read(), "refused: home/.ssh/authorized_keys");
    fs::remove(root_.path() / "home/.ssh/authorized_keys");
    ASSERT_EQ(mkfifo((root_.path() / "home/.ssh/authorized_keys").c_str(), 0600), 0);
    EXPECT_EQ(read(), "refused: home/.ssh/authorized_keys");
}

} // namespace
} // namespace velt::test
