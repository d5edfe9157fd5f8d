// What the shares grant, held against everything that a client can try.
#include "tests/support/files.h"
#include "tests/system/support/shared_folders.h"

#include <thread>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr auto none = Access::none;
constexpr auto read = Access::read;
constexpr auto write = Access::write;

class ShareGrants : public SharedFolders {};

TEST_F(ShareGrants, decideWhichSharesAUserSees) {
    share("rw", {{"alice", write}, {"bob", none}});
    share("ro", {{"alice", read}, {"bob", read}});
    share("no", {{"alice", none}, {"bob", write}});
    share("silent", {});
    start();
    EXPECT_EQ(seenBy("alice"), "ro rw");
    EXPECT_EQ(seenBy("bob"), "no ro");
    EXPECT_EQ(seenBy("carol"), "") << "nothing is granted to her";
    EXPECT_EQ(accessOf("alice", "/rw"), "write");
    EXPECT_EQ(accessOf("alice", "/ro"), "read");
    EXPECT_EQ(accessOf("alice", "/no"), "none");
    EXPECT_EQ(accessOf("alice", "/silent"), "none");
}

TEST_F(ShareGrants, doNotReplaceTheRightsOfTheFileSystem) {
    fs::permissions(share("locked", {{"alice", write}}), fs::perms(0755));
    fs::permissions(share("barred", {{"alice", write}}), fs::perms(0700));
    start();
    EXPECT_EQ(seenBy("alice"), "locked");
    EXPECT_EQ(accessOf("alice", "/locked"), "read");
}

TEST_F(ShareGrants, leaveNothingToBeChangedInAShareForReading) {
    const auto folder = share("ro", {{"alice", read}});
    fs::create_directory(folder / "sub");
    fs::permissions(folder / "sub", fs::perms(0777));
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    for (const char* path : {"/ro/file", "/ro/new", "/ro/sub/new"}) {
        EXPECT_EQ(session.send(std::string("STOR ") + path, "x"), 550) << path;
        EXPECT_EQ(session.send(std::string("APPE ") + path, "x"), 550) << path;
    }
    session.command("CWD /ro");
    EXPECT_GE(session.send("STOU", "x"), 400);
    session.command("REST 2");
    EXPECT_EQ(session.send("STOR /ro/file", "x"), 550);
    for (const char* command :
         {"DELE /ro/file", "MKD /ro/made", "RMD /ro/sub", "SITE CHMOD 600 /ro/file",
          "SITE CHGRP 1001 /ro/file", "MFMT 20200101000000 /ro/file", "SITE UTIME 202001010000 /ro/file",
          "SITE MKDIR /ro/made", "SITE RMDIR /ro/sub", "SITE SYMLINK /ro/file /ro/link",
          "MFF Modify=20200101000000; /ro/file"}) {
        EXPECT_GE(session.command(command).code, 500) << command;
    }
    session.command("RNFR /ro/file");
    EXPECT_GE(session.command("RNTO /ro/other").code, 500);
    EXPECT_EQ(contentsOf(folder / "file"), "ro");
    EXPECT_EQ(modeOf(folder / "file"), 0666U);
    EXPECT_EQ(std::distance(fs::directory_iterator(folder), {}), 2);
    EXPECT_TRUE(fs::is_empty(folder / "sub"));
    EXPECT_GT(fs::last_write_time(folder / "file"), fs::file_time_type::clock::now() - std::chrono::hours(1));
}

TEST_F(ShareGrants, letNothingBeMovedThatCannotBeRemoved) {
    const auto locked = share("locked", {{"alice", write}});
    const auto sticky = share("sticky", {{"alice", write}});
    const auto writable = share("rw", {{"alice", write}});
    fs::permissions(locked, fs::perms(0755));
    fs::permissions(sticky, fs::perms(01777));
    writeFile(sticky / "file", "sticky", bobId);
    writeFile(sticky / "own", "own", aliceId);
    fs::create_directory(sticky / "folder");
    fs::permissions(sticky / "folder", fs::perms(0777));
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    for (const std::string from : {"/locked/file", "/sticky/file", "/sticky/folder"}) {
        EXPECT_EQ(session.command("RNFR " + from).code, 350);
        EXPECT_EQ(session.command("RNTO /rw/taken").code, 550) << from;
        EXPECT_FALSE(fs::exists(writable / "taken")) << from;
    }
    EXPECT_TRUE(fs::is_directory(sticky / "folder"));
    EXPECT_EQ(session.command("RNFR /sticky/own").code, 350);
    EXPECT_EQ(session.command("RNTO /rw/taken").code, 250);
    EXPECT_EQ(contentsOf(writable / "taken"), "own");
    EXPECT_FALSE(fs::exists(sticky / "own"));
}

TEST_F(ShareGrants, holdBetweenTwoServers) {
    share("rw", {{"alice", write}});
    share("ro", {{"alice", read}});
    record.enable_fxp = 1;
    start();
    FtpSession from(port);
    FtpSession to(port);
    ASSERT_EQ(from.logIn("alice"), 230);
    ASSERT_EQ(to.logIn("alice"), 230);
    to.passive();
    EXPECT_EQ(to.command("STOR /ro/copy").code, 550);
    const auto address = to.passive();
    ASSERT_TRUE(address);
    from.command("PORT 127,0,0,1," + std::to_string(address->port / 256) + "," +
                 std::to_string(address->port % 256));
    std::thread receiver([&] { EXPECT_EQ(to.command("STOR /rw/copy").code, 150); });
    EXPECT_EQ(from.command("RETR /ro/file").code, 150);
    receiver.join();
    EXPECT_EQ(from.read().code, 226);
    EXPECT_EQ(to.read().code, 226);
    EXPECT_EQ(contentsOf("/mnt/srv/rw/copy"), "ro");
}

TEST_F(ShareGrants, ofAUserComeBeforeThoseOfGroups) {
    share("own-read", {{"alice", read}}, {{"staff", write}});
    share("own-none", {{"alice", none}}, {{"staff", write}});
    share("own-write", {{"alice", write}}, {{"staff", none}});
    share("of-staff", {}, {{"staff", read}});
    share("refused-once", {}, {{"staff", none}, {"alice", write}});
    share("best-of-two", {}, {{"staff", read}, {"alice", write}});
    start();
    EXPECT_EQ(seenBy("alice"), "best-of-two of-staff own-read own-write");
    EXPECT_EQ(seenBy("bob"), "best-of-two of-staff own-none own-read");
    EXPECT_EQ(accessOf("alice", "/own-read"), "read");
    EXPECT_EQ(accessOf("bob", "/own-read"), "write");
    EXPECT_EQ(accessOf("alice", "/best-of-two"), "write");
    EXPECT_EQ(accessOf("bob", "/best-of-two"), "read");
}

TEST_F(ShareGrants, holdForRules) {
    const auto readable = share("ro", {{"alice", read}});
    share("no", {{"alice", none}, {"bob", write}});
    entry("no").offeredToFtp = false;
    store();
    fs::create_directory(readable / "below");
    fs::permissions(readable / "below", fs::perms(0777));
    writeFile(readable / "below/file", "deep");
    start();
    storeRules({"u:1001:/ro/below", "u:1002:/no", "u:1003:/no"});
    EXPECT_EQ(accessOf("alice", ""), "read");
    EXPECT_EQ(accessOf("bob", ""), "write") << "a rule may name a share that is not offered";
    EXPECT_EQ(seenBy("carol"), "530");
    storeRules({"u:1001:/no"});
    EXPECT_EQ(seenBy("alice"), "530");
}

TEST_F(ShareGrants, refuseInTheWordsOfAWrongPassword) {
    share("no", {{"alice", none}});
    start();
    storeRules({"u:1001:/no"});
    FtpSession session(port);
    session.command("USER alice");
    const Reply refused = session.command("PASS alice-secret");
    session.command("USER alice");
    const Reply wrong = session.command("PASS wrong");
    EXPECT_EQ(refused.code, 530);
    EXPECT_EQ(refused.text, wrong.text);
}

TEST_F(ShareGrants, holdWithinTheHome) {
    share("lent", {{"alice", read}}, {}, "/mnt/home/alice/lent");
    share("barred", {{"alice", none}}, {}, "/mnt/home/alice/barred");
    share("homes", {{"alice", none}}, {}, "/mnt/home");
    record.user_chroot = 1;
    start();
    EXPECT_EQ(seenBy("alice"), "barred home-of lent");
    EXPECT_EQ(accessOf("alice", "/lent"), "read");
    EXPECT_EQ(accessOf("alice", "/barred"), "none");
    EXPECT_EQ(seenBy("alice", "/barred"), "(closed)");
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.send("STOR sent", "x"), 226) << "the home stays the user's own";
    fs::remove("/mnt/home/file");
}

TEST_F(ShareGrants, ofAnInnerShareTakeFromThoseOfAnOuterOne) {
    share("outer", {{"alice", write}, {"bob", read}});
    share("inner-ro", {{"alice", read}, {"bob", write}}, {}, "/mnt/srv/outer/a/ro");
    share("inner-no", {{"alice", none}, {"bob", none}}, {}, "/mnt/srv/outer/a/no");
    share("under-no", {{"alice", write}}, {}, "/mnt/srv/outer/a/no/under");
    start();
    EXPECT_EQ(seenBy("alice"), "inner-ro outer") << "what lies in a folder refused to her is, too";
    EXPECT_EQ(accessOf("alice", "/outer"), "write");
    EXPECT_EQ(accessOf("alice", "/outer/a/ro"), "read");
    EXPECT_EQ(accessOf("alice", "/outer/a/no"), "none");
    EXPECT_EQ(accessOf("alice", "/outer/a/no/under"), "none");
    EXPECT_EQ(accessOf("bob", "/outer/a/ro"), "read");
    EXPECT_EQ(accessOf("bob", "/inner-ro"), "read") << "another name for the same place";
    storeRules({"u:1001:/outer/a/ro", "u:1002:/outer/a/no"});
    EXPECT_EQ(accessOf("alice", ""), "read") << "a rule leads no way around";
    EXPECT_EQ(seenBy("bob"), "530");
}

TEST_F(ShareGrants, holdWhateverAWriterPutsInTheWay) {
    share("outer", {{"alice", write}});
    share("inner", {{"alice", read}, {"bob", read}}, {}, "/mnt/srv/outer/a/inner");
    start();
    fs::rename("/mnt/srv/outer/a", "/mnt/srv/outer/moved");
    fs::create_directory("/mnt/srv/outer/a");
    fs::create_directory_symlink("/", "/mnt/srv/outer/a/inner");
    EXPECT_EQ(seenBy("alice"), "outer") << "the link could be anybody's";
    EXPECT_EQ(seenBy("bob"), "");
    EXPECT_EQ(accessOf("alice", "/outer"), "read") << "until the folder is back";
    fs::remove_all("/mnt/srv/outer/a");
    fs::rename("/mnt/srv/outer/moved", "/mnt/srv/outer/a");
    EXPECT_EQ(accessOf("alice", "/outer"), "write");
    EXPECT_EQ(seenBy("bob"), "inner");
}

TEST_F(ShareGrants, countFromTheNextLoginOn) {
    share("data", {{"alice", write}, {"ftp", write}});
    letAnonymousIn();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    entry("data").users["alice"] = read;
    entry("data").users["ftp"] = read;
    store();
    EXPECT_EQ(session.send("STOR /data/still", "x"), 226);
    EXPECT_EQ(accessOf("alice", "/data"), "read");
    FtpSession anonymous(port);
    ASSERT_EQ(anonymous.logIn("anonymous", "a@b"), 230);
    EXPECT_EQ(anonymous.send("STOR /data/new", "x"), 550);
    entry("data").users["alice"] = none;
    store();
    EXPECT_EQ(seenBy("alice"), "");
    EXPECT_EQ(session.receive("RETR /data/file"), "data");
}

TEST_F(ShareGrants, areReadFromAFileThatWasEditedByHand) {
    share("data", {{"alice", write}});
    start();
    const fs::path file = worldRoot / "etc/velt/shares.json";
    std::string text = contentsOf(file);
    text.replace(text.find("\"write\""), 7, "\"read\"");
    writeFile(file, text);
    EXPECT_EQ(accessOf("alice", "/data"), "read");
}

TEST_F(ShareGrants, refuseEveryLoginWhenTheirFileCannotBeTrusted) {
    share("data", {{"alice", write}, {"ftp", read}});
    letAnonymousIn();
    start();
    const fs::path file = worldRoot / "etc/velt/shares.json";
    const std::string text = contentsOf(file);
    const auto expectRefused = [&](const char* why) {
        EXPECT_EQ(seenBy("alice"), "530") << why;
        EXPECT_EQ(FtpSession(port).logIn("anonymous", "a@b"), 530) << why;
    };
    writeFile(file, text.substr(0, text.size() / 2));
    expectRefused("damaged");
    writeFile(file, text);
    fs::permissions(file, fs::perms(0646));
    expectRefused("anybody could have written it");
    fs::permissions(file, fs::perms(0664));
    expectRefused("its group could have written it");
    fs::permissions(file, fs::perms(0644));
    EXPECT_EQ(seenBy("alice"), "data");
    fs::rename(file, file.string() + ".away");
    fs::create_symlink("shares.json.away", file);
    expectRefused("a link");
}

TEST_F(ShareGrants, restrictAnonymousUsersWithinTheirShare) {
    share("public", {{"ftp", write}});
    share("inbox", {{"ftp", read}}, {}, "/mnt/srv/public/inbox");
    share("private", {{"ftp", none}}, {}, "/mnt/srv/public/private");
    letAnonymousIn("public");
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("anonymous", "a@b"), 230);
    EXPECT_EQ(session.send("STOR /new", "x"), 226);
    EXPECT_EQ(session.receive("RETR /inbox/file"), "inbox");
    EXPECT_EQ(session.send("STOR /inbox/new", "x"), 550);
    EXPECT_EQ(seenIn(session, "/private"), "(closed)");
    entry("public").offeredToFtp = false;
    store();
    EXPECT_EQ(FtpSession(port).logIn("anonymous", "a@b"), 530);
}

TEST_F(ShareGrants, holdForRealClients) {
    share("rw", {{"alice", write}});
    share("ro", {{"alice", read}});
    offerTls(true);
    start();
    writeFile("/mnt/srv/upload-this", "sent");
    const auto lftp = [](const std::string& commands) {
        return runProcess({"lftp", "-u", "alice,alice-secret", "-e",
                           "set ssl:verify-certificate no; set net:max-retries 1; " + commands + "; bye",
                           "ftp://127.0.0.1:2121"},
                          {}, std::chrono::seconds(30));
    };
    EXPECT_EQ(lftp("cls -1 /").output, "/ro/\n/rw/\n");
    EXPECT_EQ(lftp("set ftp:ssl-force yes; put /mnt/srv/upload-this -o /rw/sent").exitCode, 0);
    EXPECT_EQ(contentsOf("/mnt/srv/rw/sent"), "sent");
    EXPECT_NE(lftp("set ftp:ssl-force yes; put /mnt/srv/upload-this -o /ro/sent").exitCode, 0);
    EXPECT_NE(lftp("rm /ro/file").exitCode, 0);
    EXPECT_NE(lftp("mv /ro/file /ro/other").exitCode, 0);
    EXPECT_EQ(lftp("mirror -R --delete /mnt/srv/rw /ro").exitCode, 1);
    EXPECT_EQ(contentsOf("/mnt/srv/ro/file"), "ro");
    EXPECT_NE(curl({"--append", "-T", "/mnt/srv/upload-this", "--user", "alice:alice-secret",
                    "ftp://127.0.0.1:2121/ro/file"})
                  .exitCode,
              0);
    EXPECT_EQ(curl({"--user", "alice:alice-secret", "ftp://127.0.0.1:2121/ro/file"}).output, "ro");
    EXPECT_EQ(contentsOf("/mnt/srv/ro/file"), "ro");
}

} // namespace
} // namespace velt::test
