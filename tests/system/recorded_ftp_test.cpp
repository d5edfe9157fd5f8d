// What FTP sessions do is written down: each operation once, as it was.
#include "base/unique_fd.h"
#include "standalone/activity/activity_reader.h"
#include "tests/support/files.h"
#include "tests/system/support/recorded_sessions.h"

#include <sys/mount.h>
#include <sys/socket.h>

#include <fstream>
#include <future>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

/// More than the buffers of a connection hold.
std::string megabytes(int count) {
    const std::string one(1 << 20, 'x');
    std::string all;
    for (int i = 0; i < count; ++i) {
        all += one;
    }
    return all;
}

/// A file system of little room at this folder.
class SmallDisk {
public:
    explicit SmallDisk(fs::path folder) : folder_(std::move(folder)) {
        fs::create_directories(folder_);
        EXPECT_EQ(mount("small", folder_.c_str(), "tmpfs", 0, "size=64k,mode=0700"), 0);
    }
    ~SmallDisk() { umount2(folder_.c_str(), MNT_DETACH); }
    SmallDisk(const SmallDisk&) = delete;
    SmallDisk& operator=(const SmallDisk&) = delete;

    void fill() const {
        std::ofstream file(folder_ / "filling");
        for (int i = 0; i < 100 && file; ++i) {
            file << std::string(1024, 'x') << std::flush;
        }
        EXPECT_FALSE(file);
    }
    void clear() const { fs::remove(folder_ / "filling"); }

private:
    fs::path folder_;
};

class RecordedFtp : public RecordedSessions {};

TEST_F(RecordedFtp, showsWhoIsLoggedIn) {
    start();
    {
        FtpSession session(port);
        EXPECT_TRUE(sessions().empty());
        ASSERT_EQ(session.logIn("alice"), 230);
        const OpenSession shown = await([](const OpenSession& each) { return !each.busy; });
        EXPECT_EQ(shown.user, "alice");
        EXPECT_EQ(shown.account, "alice");
        EXPECT_EQ(shown.address, "127.0.0.1");
        EXPECT_EQ(shown.protocol, SessionProtocol::ftp);
        EXPECT_EQ(shown.security, "");
        EXPECT_EQ(shown.command, "PASS");
        EXPECT_EQ(shown.path, "");
        EXPECT_FALSE(shown.transfer);
    }
    EXPECT_TRUE(waitUntil([] { return sessions().empty(); }, patience));
    const auto all = awaitRecords(2);
    ASSERT_EQ(all.size(), 2U);
    EXPECT_EQ(all[0].operation, Operation::sessionOpened);
    EXPECT_EQ(all[1].operation, Operation::sessionClosed);
    EXPECT_EQ(all[0].session, all[1].session);
}

TEST_F(RecordedFtp, recordsWhatIsDone) {
    share("music", {{"alice", Access::write}});
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.send("STOR /music/new file", "12345"), 226);
    EXPECT_EQ(session.send("APPE /music/new file", "678"), 226);
    EXPECT_EQ(session.receive("RETR /music/new file"), "12345678");
    EXPECT_EQ(session.command("SITE CHMOD 640 /music/new file").code, 200);
    EXPECT_EQ(session.command("MKD music/folder").code, 257);
    EXPECT_EQ(session.command("RNFR /music/new file").code, 350);
    EXPECT_EQ(session.command("RNTO /music/folder/file").code, 250);
    EXPECT_EQ(session.command("CWD music/folder").code, 250);
    EXPECT_EQ(session.command("MFMT 20200102030405 file").code, 213);
    EXPECT_EQ(session.command("DELE file").code, 250);
    EXPECT_EQ(session.command("RMD ../folder").code, 250);
    expectOperations("upload done /music/new file 5\n"
                     "upload done /music/new file 3\n"
                     "download done /music/new file 8\n"
                     "mode done /music/new file 640\n"
                     "make-folder done /music/folder\n"
                     "rename done /music/new file -> /music/folder/file\n"
                     "times done /music/folder/file\n"
                     "delete done /music/folder/file\n"
                     "remove-folder done /music/folder\n");
}

TEST_F(RecordedFtp, recordsWhatClientsDo) {
    record.user_chroot = 1;
    offerTls(true);
    start();
    writeFile("/mnt/source", std::string(300000, 'x'), aliceId);
    const auto done =
        runProcess({"lftp", "-c",
                    "set ssl:verify-certificate no; set net:max-retries 1; set net:timeout 10; "
                    "open -u alice,alice-secret ftp://127.0.0.1:" +
                        std::to_string(port) +
                        "; put /mnt/source -o a; get a -o /mnt/got; mkdir b; mv a b/c; chmod 600 b/c; "
                        "put -c /mnt/source -o b/c; rm b/c; rmdir b"},
                   {}, patience);
    EXPECT_EQ(done.exitCode, 0) << done.errors;
    std::string kinds;
    for (const OperationRecord& each : awaitRecords(11)) {
        EXPECT_EQ(each.protocol, SessionProtocol::ftps);
        EXPECT_EQ(each.result, OperationResult::done) << each.reason;
        kinds += std::string(operationName(each.operation)) + " " + each.place.path +
                 (each.octets ? " " + std::to_string(*each.octets) : "") + "\n";
    }
    EXPECT_EQ(kinds, "session-opened \n"
                     "upload /a 300000\n"
                     "times /a\n"
                     "download /a 300000\n"
                     "make-folder /b\n"
                     "rename /a\n"
                     "mode /b/c\n"
                     "times /b/c\n"
                     "delete /b/c\n"
                     "remove-folder /b\n"
                     "session-closed \n");
}

TEST_F(RecordedFtp, endsAClientThatUploads) {
    record.user_chroot = 1;
    start();
    writeFile("/mnt/source", megabytes(20), aliceId);
    std::future<ProcessResult> client = std::async(std::launch::async, [] {
        return curl({"--limit-rate", "100k", "--upload-file", "/mnt/source", "--user", "alice:alice-secret",
                     "ftp://127.0.0.1:" + std::to_string(port) + "/large"});
    });
    const OpenSession shown = await([](const OpenSession& each) { return each.octetsIn > 0; });
    const auto ended = Clock::now();
    EXPECT_EQ(endSession(shown.id, {"carol", ""}), true);
    EXPECT_NE(client.get().exitCode, 0);
    EXPECT_LT(secondsSince(ended), 1.5);
    const auto all = awaitRecords(3);
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[1].result, OperationResult::incomplete);
    EXPECT_EQ(all[1].octets, fs::file_size("/mnt/home/alice/large"));
    EXPECT_EQ(all[2].reason, "ended by carol");
}

TEST_F(RecordedFtp, saysWhichFilesOfTheServerItMeans) {
    share("music", {{"alice", Access::write}});
    share("old", {{"alice", Access::write}}, {}, "/mnt/srv/music/old");
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.send("STOR /music/a", "1"), 226);
    EXPECT_EQ(session.send("STOR /music/old/b", "1"), 226);
    EXPECT_EQ(session.send("STOR /old/c", "1"), 226);
    fs::create_directory_symlink("old", "/mnt/srv/music/link");
    EXPECT_EQ(session.send("STOR /music/link/d", "1"), 226);
    EXPECT_EQ(session.command("RNFR /music/a").code, 350);
    EXPECT_EQ(session.command("RNTO /music/e").code, 250);
    std::string places;
    for (const OperationRecord& each : awaitRecords(6)) {
        const RecordedPlace& place = each.newPlace.path.empty() ? each.place : each.newPlace;
        places += place.serverPath.empty()
                      ? ""
                      : place.serverPath + " " + place.share + ":" + place.sharePath + "\n";
    }
    EXPECT_EQ(places, "/mnt/srv/music/a music:a\n"
                      "/mnt/srv/music/old/b old:b\n"
                      "/mnt/srv/music/old/c old:c\n"
                      "/mnt/srv/music/old/d old:d\n"
                      "/mnt/srv/music/e music:e\n");
}

TEST_F(RecordedFtp, saysWhereInAHomeItIs) {
    share("homes", {}, {}, "/mnt/home");
    record.user_chroot = 1;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.send("STOR /new", "1"), 226);
    const auto all = awaitRecords(2);
    ASSERT_EQ(all.size(), 2U);
    EXPECT_EQ(all[1].place, (RecordedPlace{"/new", "/mnt/home/alice/new", "homes", "alice/new"}));
}

TEST_F(RecordedFtp, recordsWhatIsRefused) {
    share("films", {{"alice", Access::read}});
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_NE(session.send("STOR /films/x", "12345"), 226);
    EXPECT_EQ(session.command("DELE /films/file").code, 550);
    EXPECT_EQ(session.command("DELE /films/none").code, 550);
    EXPECT_EQ(session.command("MKD /films/folder").code, 550);
    EXPECT_EQ(session.command("RNFR /films/none").code, 550);
    EXPECT_EQ(session.command("RNFR /films/file").code, 350);
    EXPECT_EQ(session.command("RNTO /films/other").code, 550);
    EXPECT_EQ(session.receive("RETR /films/none"), std::nullopt);
    expectOperations("upload refused /films/x (Permission denied)\n"
                     "delete refused /films/file (Permission denied)\n"
                     "delete refused /films/none (No such file or directory)\n"
                     "make-folder refused /films/folder (Permission denied)\n"
                     "rename refused /films/none (No such file or directory)\n"
                     "rename refused /films/file -> /films/other (Permission denied)\n"
                     "download refused /films/none (No such file or directory)\n");
}

TEST_F(RecordedFtp, recordsRefusedLogins) {
    start();
    EXPECT_EQ(FtpSession(port).logIn("alice", "wrong"), 530);
    EXPECT_EQ(FtpSession(port).logIn("nobody-of-that-name", "wrong"), 530);
    storeRules({"u:1001:/none"});
    EXPECT_EQ(FtpSession(port).logIn("alice"), 530);
    const auto all = awaitRecords(3);
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[0].operation, Operation::loginRefused);
    EXPECT_EQ(all[0].user + " " + all[0].reason, "alice password");
    EXPECT_EQ(all[1].user + " " + all[1].reason, "nobody-of-that-name password");
    EXPECT_EQ(all[2].user + " " + all[2].reason, "alice configuration");
    EXPECT_EQ(all[0].address, "127.0.0.1");
}

TEST_F(RecordedFtp, tellsNothingOfWhoIsNotLoggedIn) {
    start();
    FtpSession session(port);
    EXPECT_EQ(session.command("DELE x").code, 530);
    EXPECT_EQ(session.command("SITE").code / 100, 5);
    EXPECT_EQ(records().size(), 0U);
}

TEST_F(RecordedFtp, knowsGuestsByWhatTheyCallThemselves) {
    letAnonymousIn();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("anonymous", "me@example.com"), 230);
    const OpenSession shown = await([](const OpenSession&) { return true; });
    EXPECT_EQ(shown.user, "anonymous");
    EXPECT_EQ(shown.account, "ftp");
}

TEST_F(RecordedFtp, tellsVersionAndCipherOfTls) {
    record.user_chroot = 1;
    offerTls(true);
    start();
    const auto result = curl({"--ssl-reqd", "--insecure", "--user", "alice:alice-secret",
                              "ftp://127.0.0.1:" + std::to_string(port) + "/home-of"});
    EXPECT_EQ(result.exitCode, 0) << result.errors;
    const auto all = awaitRecords(2);
    ASSERT_GE(all.size(), 2U);
    EXPECT_EQ(all[0].protocol, SessionProtocol::ftps);
    EXPECT_TRUE(all[0].detail.starts_with("TLSv1.3 TLS_")) << all[0].detail;
}

TEST_F(RecordedFtp, showsARunningTransferAndEndsIt) {
    record.user_chroot = 1;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    const auto address = session.passive();
    ASSERT_TRUE(address);
    UniqueFd data = connectTo(address->host, address->port);
    ASSERT_EQ(session.command("STOR upload").code, 150);
    const std::string part(100000, 'x');
    ASSERT_EQ(::send(data.get(), part.data(), part.size(), MSG_NOSIGNAL), static_cast<ssize_t>(part.size()));
    const OpenSession shown = await([](const OpenSession& each) { return each.octetsIn == 100000; });
    ASSERT_TRUE(shown.transfer);
    EXPECT_TRUE(shown.transfer->upload);
    EXPECT_EQ(shown.transfer->path, "/upload");
    EXPECT_TRUE(shown.busy);
    EXPECT_EQ(shown.command, "STOR");

    const auto took = timeOf([&] { EXPECT_EQ(endSession(shown.id, {"carol", "too much"}), true); });
    EXPECT_LT(took, std::chrono::seconds(1));
    EXPECT_EQ(session.command("NOOP").code, 0);
    EXPECT_EQ(endSession(shown.id, {"carol", ""}), false);
    const auto all = awaitRecords(3);
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[1].result, OperationResult::incomplete);
    EXPECT_EQ(all[1].octets, 100000U);
    EXPECT_EQ(all[2].reason, "ended by carol: too much");
    EXPECT_EQ(all[2].octetsIn, 100000U);
}

TEST_F(RecordedFtp, recordsTransfersThatEndBeforeTheirEnd) {
    record.user_chroot = 1;
    start();
    writeFile("/mnt/home/alice/large", megabytes(20), aliceId);
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    const auto address = session.passive();
    ASSERT_TRUE(address);
    UniqueFd data = connectTo(address->host, address->port);
    ASSERT_EQ(session.command("RETR large").code, 150);
    data.reset();
    EXPECT_EQ(session.read().code, 426);

    const auto all = awaitRecords(2);
    ASSERT_EQ(all.size(), 2U);
    EXPECT_EQ(all[1].operation, Operation::download);
    EXPECT_EQ(all[1].result, OperationResult::incomplete);
    EXPECT_GT(all[1].octets, 0U);
    EXPECT_LT(all[1].octets, 20U << 20);
}

TEST_F(RecordedFtp, recordsAnUploadWhoseClientIsGone) {
    record.user_chroot = 1;
    start();
    {
        FtpSession session(port);
        ASSERT_EQ(session.logIn("alice"), 230);
        const auto address = session.passive();
        ASSERT_TRUE(address);
        const UniqueFd data = connectTo(address->host, address->port);
        ASSERT_EQ(session.command("STOR part").code, 150);
        ASSERT_EQ(::send(data.get(), "123", 3, MSG_NOSIGNAL), 3);
        await([](const OpenSession& each) { return each.octetsIn == 3; });
        const linger abort{1, 0}; // with a reset, not an end
        ASSERT_EQ(setsockopt(data.get(), SOL_SOCKET, SO_LINGER, &abort, sizeof abort), 0);
    }
    EXPECT_TRUE(waitUntil([] { return sessions().empty(); }, patience));
    const auto all = awaitRecords(3);
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[1].operation, Operation::upload);
    EXPECT_EQ(all[1].result, OperationResult::incomplete);
    EXPECT_EQ(all[1].octets, 3U);
    EXPECT_EQ(all[2].octetsIn, 3U);
}

TEST_F(RecordedFtp, goesOnWhereTheDiskIsFullAndSaysHowMuchIsLost) {
    record.user_chroot = 1;
    start();
    const SmallDisk disk(spool().parent_path());
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.send("STOR first", "1"), 226);
    const std::uint64_t before = lostRecords();
    disk.fill();
    for (int i = 0; i < 50; ++i) {
        ASSERT_EQ(session.send("STOR lost", "12"), 226);
    }
    const std::uint64_t lost = lostRecords() - before;
    EXPECT_GE(lost, 30U) << "the last block has room for some";
    EXPECT_EQ(contentsOf("/mnt/home/alice/lost"), "12");
    EXPECT_EQ(sessions().size(), 1U);
    disk.clear();
    EXPECT_EQ(session.send("STOR last", "1"), 226);
    EXPECT_EQ(lostRecords() - before, lost);
    const auto all = awaitRecords(2 + (50 - lost) + 1);
    EXPECT_EQ(all.size(), 2 + (50 - lost) + 1) << "those of the login, of three names";
    EXPECT_EQ(all.back().place.path, "/last");
}

TEST_F(RecordedFtp, recordsATransferWhoseClientIsGone) {
    record.user_chroot = 1;
    start();
    writeFile("/mnt/home/alice/large", megabytes(20), aliceId);
    {
        FtpSession session(port);
        ASSERT_EQ(session.logIn("alice"), 230);
        const auto address = session.passive();
        ASSERT_TRUE(address);
        const UniqueFd data = connectTo(address->host, address->port);
        ASSERT_EQ(session.command("RETR large").code, 150);
        await([](const OpenSession& each) { return each.octetsOut > 0; });
    }
    EXPECT_TRUE(waitUntil([] { return sessions().empty(); }, patience));
    const auto all = awaitRecords(3);
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[1].result, OperationResult::incomplete);
    EXPECT_GT(all[1].octets, 0U);
    EXPECT_EQ(all[2].operation, Operation::sessionClosed);
    EXPECT_EQ(all[2].octetsOut, all[1].octets);
}

} // namespace
} // namespace velt::test
