// What nobody changes over FTP: the files of a home that logins, mail and shells obey, and system folders.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/shared_folders.h"

namespace velt::test {
namespace {
namespace fs = std::filesystem;

const fs::path home = "/mnt/home/alice";

class OwnFiles : public SharedFolders {
protected:
    void SetUp() override {
        SharedFolders::SetUp();
        record.user_chroot = 1;
    }

    static void makeFolder(const fs::path& folder) {
        fs::create_directories(folder);
        EXPECT_EQ(chown(folder.c_str(), aliceId, aliceId), 0);
    }
    /// What lies in the home.
    static std::string names() {
        std::string all;
        for (const auto& entry : fs::directory_iterator(home)) {
            all += entry.path().filename().string() + ' ';
        }
        return all;
    }
    /// Sends both names of a move; the code of the last answer.
    static int move(FtpSession& session, const std::string& from, const std::string& to) {
        const int known = session.command("RNFR " + from).code;
        return known == 350 ? session.command("RNTO " + to).code : known;
    }
};

TEST_F(OwnFiles, areNotMadeOverFtp) {
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    for (const std::string name :
         {".profile", ".bashrc", ".zshenv", ".zshenv.zwc", ".dovecot.svbin", "bin", ".forward",
          ".forward+list", ".rhosts", ".qmail-all", ".k5login", ".BASHRC", ".pam_environment", ".ssh"}) {
        EXPECT_EQ(session.send("STOR " + name, "x"), 550) << name;
        EXPECT_EQ(session.send("APPE /" + name, "x"), 550) << name;
        EXPECT_EQ(session.command("MKD " + name).code, 550) << name;
        EXPECT_EQ(session.command("XMKD /" + name).code, 550) << name;
        EXPECT_EQ(move(session, "home-of", name), 550) << name;
        EXPECT_FALSE(fs::exists(home / name)) << name;
    }
    for (const std::string way : {"~/", "//", "./", "/./", "/x/../", "~alice/", "../", "\xc2\xad/../"}) {
        EXPECT_EQ(session.send("STOR " + way + ".profile", "x"), 550) << way;
        EXPECT_EQ(session.command("MKD " + way + ".ssh").code, 550) << way;
        EXPECT_EQ(session.command("MKD " + way + ".ssh/").code, 550) << way;
        EXPECT_GE(move(session, way + "home-of", way + ".profile"), 550) << way;
    }
    for (const char* command : {"SITE CPFR home-of", "SITE SYMLINK home-of .profile", "SITE MKDIR .ssh"}) {
        EXPECT_GE(session.command(command).code, 500) << command;
    }
    EXPECT_EQ(names(), "home-of ");
    ASSERT_EQ(session.command("MKD prepared").code, 257);
    ASSERT_EQ(session.send("STOR prepared/authorized_keys", "x"), 226);
    EXPECT_EQ(move(session, "prepared", "./x/../.ssh"), 550);
    EXPECT_EQ(move(session, "prepared", ".ssh"), 550);
    EXPECT_EQ(move(session, "prepared", ".config"), 550);
    EXPECT_FALSE(fs::exists(home / ".ssh"));
    EXPECT_TRUE(fs::exists(home / "home-of"));
}

TEST_F(OwnFiles, areReadAndNotChanged) {
    makeFolder(home / ".ssh/below");
    makeFolder(home / ".ssh");
    writeFile(home / ".ssh/authorized_keys", "key", aliceId);
    writeFile(home / ".profile", "start", aliceId);
    fs::create_directory_symlink(".ssh", home / "keys");
    fs::create_directory_symlink("/.ssh/below", home / "deep");
    fs::create_symlink(".profile", home / "starter");
    fs::create_hard_link(home / ".profile", home / "twin");
    fs::create_symlink(".bashrc", home / "dangling");
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.receive("RETR .ssh/authorized_keys"), "key");
    EXPECT_EQ(session.receive("RETR keys/authorized_keys"), "key");
    EXPECT_EQ(session.receive("RETR .profile"), "start");
    EXPECT_EQ(session.receive("NLST .ssh"), ".ssh/authorized_keys\r\n.ssh/below\r\n");
    for (const std::string path :
         {".ssh/authorized_keys", ".ssh/new", ".ssh/below/new", "keys/authorized_keys", "keys/new",
          "deep/new", ".profile", "starter", "twin", "dangling"}) {
        EXPECT_EQ(session.send("STOR " + path, "x"), 550) << path;
        EXPECT_EQ(session.send("APPE " + path, "x"), 550) << path;
        session.command("REST 1");
        EXPECT_EQ(session.send("STOR " + path, "x"), 550) << path;
        EXPECT_GE(move(session, "home-of", path), path == "starter" || path == "dangling" ? 250 : 550)
            << path;
        writeFile(home / "home-of", "alice", aliceId);
    }
    for (const std::string path : {".ssh/authorized_keys", ".profile", ".ssh", "keys/authorized_keys"}) {
        for (const std::string command : {"DELE ", "RMD ", "XRMD ", "SITE CHMOD 777 ", "MFMT 20200101000000 ",
                                          "MFF Modify=20200101000000; ", "MFF UNIX.mode=777; ",
                                          "SITE CHGRP 2001 ", "SITE UTIME 202001010000 "}) {
            EXPECT_GE(session.command(command + path).code, 500) << command << path;
        }
        EXPECT_EQ(move(session, path, "away"), 550) << path;
    }
    for (const std::string folder : {".ssh", "/.ssh/below", "/keys"}) {
        ASSERT_EQ(session.command("CWD " + folder).code, 250);
        EXPECT_EQ(session.send("STOU", "x"), 550) << folder;
        EXPECT_EQ(session.command("MKD new").code, 550) << folder;
    }
    EXPECT_EQ(contentsOf(home / ".ssh/authorized_keys"), "key");
    EXPECT_EQ(contentsOf(home / ".profile"), "start");
    EXPECT_FALSE(fs::exists(home / ".bashrc"));
    EXPECT_EQ(std::distance(fs::directory_iterator(home / ".ssh"), {}), 2);
    EXPECT_TRUE(fs::is_empty(home / ".ssh/below"));
    EXPECT_EQ(modeOf(home / ".profile"), 0644U);
    EXPECT_GT(fs::last_write_time(home / ".profile"),
              fs::file_time_type::clock::now() - std::chrono::hours(1));
}

TEST_F(OwnFiles, leaveTheRestOfTheHomeAlone) {
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    for (const std::string name : {"profile", "sshx", ".letter.part", "ssh", "._letter"}) {
        EXPECT_EQ(session.send("STOR " + name, "x"), 226) << name;
        EXPECT_EQ(session.send("APPE " + name, "y"), 226) << name;
        EXPECT_EQ(contentsOf(home / name), "xy") << name;
        EXPECT_EQ(session.command("SITE CHMOD 600 " + name).code, 200) << name;
        EXPECT_EQ(modeOf(home / name), 0600U) << name;
        EXPECT_EQ(session.command("MFMT 20200101000000 " + name).code, 213) << name;
        EXPECT_EQ(move(session, name, "2" + name), 250) << name;
        EXPECT_EQ(session.command("DELE 2" + name).code, 250) << name;
    }
    ASSERT_EQ(session.command("MKD site").code, 257);
    EXPECT_EQ(session.send("STOR site/.profile", "x"), 226) << "only the home's own";
    EXPECT_EQ(move(session, "site", "moved"), 250);
    EXPECT_EQ(session.command("DELE moved/.profile").code, 250);
    EXPECT_EQ(session.command("RMD moved").code, 250);
    EXPECT_EQ(session.send("STOU", "x"), 226);
    EXPECT_EQ(session.send("STOR home-of", "x"), 226);
    EXPECT_EQ(contentsOf(home / "home-of"), "x");
}

TEST_F(OwnFiles, includeTheSystemFoldersOfASessionsRoot) {
    for (const char* name : {"etc", "lib", "usr", "etcetera"}) {
        fs::create_directory(share(name, {{"alice", Access::write}}) / "etc");
        fs::permissions(fs::path("/mnt/srv") / name / "etc", fs::perms(0777));
    }
    record.user_chroot = 0;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    for (const std::string name : {"/etc", "/lib"}) {
        EXPECT_EQ(session.receive("RETR " + name + "/file"), name.substr(1));
        ASSERT_EQ(session.command("CWD " + name).code, 250);
        for (const char* command : {"STOR file", "STOR etc/new", "APPE file", "STOU"}) {
            EXPECT_GE(session.send(command, "x"), 450) << name << command;
        }
        for (const std::string command : {"MKD made", "DELE file", "RMD etc", "SITE CHMOD 600 file"}) {
            EXPECT_EQ(session.command(command).code, 550) << name << command;
        }
        EXPECT_EQ(std::distance(fs::directory_iterator("/mnt/srv" + name), {}), 2);
        EXPECT_TRUE(
            contains(DaemonProcess::output(), "The share " + name.substr(1) + " is read-only in sessions"))
            << name;
    }
    EXPECT_EQ(session.send("STOR /usr/etc/new", "x"), 226);
    EXPECT_EQ(session.send("STOR /etcetera/etc/new", "x"), 226);
    record.user_chroot = 1;
    start();
    fs::create_directory("/mnt/home/alice/lib");
    EXPECT_EQ(chown("/mnt/home/alice/lib", aliceId, aliceId), 0);
    FtpSession confined(port);
    ASSERT_EQ(confined.logIn("alice"), 230);
    EXPECT_EQ(confined.command("MKD etc").code, 550);
    EXPECT_EQ(confined.send("STOR lib/libnss.so", "x"), 550);
    ASSERT_EQ(confined.command("CWD lib").code, 250);
    EXPECT_EQ(confined.send("STOU", "x"), 550);
    EXPECT_TRUE(fs::is_empty("/mnt/home/alice/lib"));
}

} // namespace
} // namespace velt::test
