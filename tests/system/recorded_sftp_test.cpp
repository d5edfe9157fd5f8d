// What SFTP sessions do is written down: each operation once, as it was.
#include "platform/sftp.h"
#include "standalone/daemons/sshd/sshd_plan.h"
#include "standalone/settings/confinement_settings.h"
#include "tests/system/support/clients.h"
#include "tests/system/support/recorded_sessions.h"
#include "tests/system/support/sftp_session.h"

#include <sys/stat.h>

#include <algorithm>
#include <iterator>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class RecordedSftp : public RecordedSessions {
protected:
    static constexpr int port = 2222;

    void TearDown() override {
        sftp_.stop();
        RecordedSessions::TearDown();
    }

    void start() {
        ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
        ASSERT_EQ(messageOf(storeConfinementSettings({true})), "");
        ASSERT_EQ(VELTSFTPConfigSet(1, port), 0) << lastErrorSentence();
        const auto plan = planSftpDaemon();
        ASSERT_EQ(messageOf(plan), "");
        hash_ = (*plan)->order.configurationHash;
        // What was not set shows (mallopt(3)).
        ASSERT_EQ(setenv("MALLOC_PERTURB_", "165", 1), 0);
        ASSERT_TRUE(sftp_.start((*plan)->order));
    }

    std::string hash_;

private:
    DaemonProcess sftp_;
};

TEST_F(RecordedSftp, showsWhoIsLoggedIn) {
    start();
    {
        SftpSession session(port, "alice");
        ASSERT_TRUE(session.isOpen());
        const OpenSession shown = await([](const OpenSession&) { return true; });
        EXPECT_EQ(shown.user, "alice");
        EXPECT_EQ(shown.account, "alice");
        EXPECT_EQ(shown.address, "127.0.0.1");
        EXPECT_EQ(shown.protocol, SessionProtocol::sftp);
        EXPECT_FALSE(shown.transfer);
    }
    EXPECT_TRUE(waitUntil([] { return sessions().empty(); }, patience));
    const auto all = awaitRecords(2);
    ASSERT_EQ(all.size(), 2U);
    EXPECT_EQ(all[0].operation, Operation::sessionOpened);
    EXPECT_EQ(all[1].operation, Operation::sessionClosed);
    EXPECT_EQ(all[1].reason, "the connection ended");
}

TEST_F(RecordedSftp, recordsWhatIsDone) {
    share("music", {{"alice", Access::write}});
    start();
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    EXPECT_EQ(session.send("/music/new file", "12345"), sftpGood);
    EXPECT_EQ(session.receive("/music/new file"), "12345");
    EXPECT_EQ(session.setMode("/music/new file", 0640), sftpGood);
    EXPECT_EQ(session.makeFolder("/music/folder"), sftpGood);
    EXPECT_EQ(session.rename("/music/new file", "/music/folder/a"), sftpGood);
    EXPECT_EQ(session.move("/music/folder/a", "/music/folder/b"), sftpGood);
    EXPECT_EQ(session.setTimes("/music/folder/b", 1000000000), sftpGood);
    EXPECT_EQ(session.hardLink("/music/folder/b", "/music/folder/c"), sftpGood);
    EXPECT_EQ(session.cut("/music/folder/b", 2), sftpGood);
    EXPECT_EQ(session.remove("/music/folder/b"), sftpGood);
    EXPECT_EQ(session.remove("/music/folder/c"), sftpGood);
    EXPECT_EQ(session.removeFolder("/music/folder"), sftpGood);
    expectOperations("upload done /music/new file 5\n"
                     "download done /music/new file 5\n"
                     "mode done /music/new file 640\n"
                     "make-folder done /music/folder\n"
                     "rename done /music/new file -> /music/folder/a\n"
                     "rename done /music/folder/a -> /music/folder/b\n"
                     "times done /music/folder/b\n"
                     "link done /music/folder/b -> /music/folder/c\n"
                     "truncate done /music/folder/b\n"
                     "delete done /music/folder/b\n"
                     "delete done /music/folder/c\n"
                     "remove-folder done /music/folder\n");
    EXPECT_EQ(records()[1].place,
              (RecordedPlace{"/music/new file", "/mnt/srv/music/new file", "music", "new file"}));
}

TEST_F(RecordedSftp, recordsWhatIsDoneByWayOfAFolderNamedLikeTheSystems) {
    record.user_chroot = 1;
    start();
    writeFile("/mnt/home/alice/secret", "1234", aliceId);
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    EXPECT_EQ(session.makeFolder("/dev"), sftpGood);
    EXPECT_EQ(session.receive("/dev/../secret"), "1234");
    EXPECT_EQ(session.send("/dev/../up", "123"), sftpGood);
    EXPECT_EQ(session.move("/dev/../up", "/dev/null"), sftpGood);
    EXPECT_EQ(session.remove("/dev/../secret"), sftpGood);
    expectOperations("make-folder done /dev\n"
                     "download done /secret 4\n"
                     "upload done /up 3\n"
                     "rename done /up -> /dev/null\n"
                     "delete done /secret\n");
}

TEST_F(RecordedSftp, recordsWhatIsDoneInAShareNamedLikeTheSystemsFolder) {
    share("dev", {{"alice", Access::write}});
    start();
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    EXPECT_EQ(session.send("/dev/null", "1"), sftpGood);
    EXPECT_EQ(session.remove("/dev/null"), sftpGood);
    expectOperations("upload done /dev/null 1\n"
                     "delete done /dev/null\n");
    EXPECT_EQ(records().at(1).place.share, "dev");
}

TEST_F(RecordedSftp, recordsOfAFileThatIsOpenForBothWhatWasDone) {
    record.user_chroot = 1;
    start();
    writeFile("/mnt/home/alice/pay", "12345", aliceId);
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    const auto onlyRead = session.open("/pay", sftpRead | sftpWrite);
    ASSERT_TRUE(onlyRead);
    EXPECT_EQ(session.read(*onlyRead), "12345");
    EXPECT_EQ(session.close(*onlyRead), sftpGood);
    const auto both = session.open("/pay", sftpRead | sftpWrite);
    ASSERT_TRUE(both);
    EXPECT_EQ(session.read(*both), "12345");
    const OpenSession reading = await([](const OpenSession& each) { return each.transfer.has_value(); });
    EXPECT_FALSE(reading.transfer->upload);
    EXPECT_EQ(session.sendOpen(*both, "abc"), sftpGood);
    const OpenSession writing =
        await([](const OpenSession& each) { return each.transfer && each.transfer->upload; });
    EXPECT_EQ(writing.transfer->path, "/pay");
    EXPECT_EQ(session.close(*both), sftpGood);
    const auto fresh = session.open("/fresh", sftpRead | sftpWrite | sftpMake);
    ASSERT_TRUE(fresh);
    EXPECT_EQ(session.close(*fresh), sftpGood);
    expectOperations("download done /pay 5\n"
                     "upload done /pay 3\n"
                     "download done /pay 5\n"
                     "upload done /fresh 0\n");
}

TEST_F(RecordedSftp, recordsThatAnOpenFileWasCut) {
    record.user_chroot = 1;
    start();
    writeFile("/mnt/home/alice/pay", "12345", aliceId);
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    const auto handle = session.open("/pay", sftpRead | sftpWrite);
    ASSERT_TRUE(handle);
    EXPECT_EQ(session.cutHandle(*handle, 2), sftpGood);
    expectOperations("truncate done /pay\n");
    EXPECT_EQ(contentsOf("/mnt/home/alice/pay"), "12");
}

TEST_F(RecordedSftp, recordsWhereASymbolicLinkLeads) {
    share("music", {{"alice", Access::write}});
    start();
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    EXPECT_EQ(session.symbolicLink("file", "/music/link"), sftpGood);
    expectOperations("link done /music/link file\n");
}

TEST_F(RecordedSftp, makesWhatIsRootsWhoeverComesFirst) {
    start();
    const fs::path pages = worldRoot / "run/velt/sessions";
    fs::remove_all(pages);
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    ASSERT_EQ(awaitRecords(1).size(), 1U);
    std::vector<fs::path> made{pages, spool().parent_path(), spool()};
    std::ranges::copy(fs::directory_iterator(pages), std::back_inserter(made));
    EXPECT_EQ(made.size(), 5U) << "with the page and the count of what was lost";
    for (const fs::path& each : made) {
        struct stat status {};
        ASSERT_EQ(::stat(each.c_str(), &status), 0) << each;
        EXPECT_EQ(status.st_uid, 0U) << each;
        EXPECT_EQ(status.st_gid, 0U) << each;
    }
}

TEST_F(RecordedSftp, recordsNoTransferOfWhatIsNoFile) {
    share("music", {{"alice", Access::write}});
    start();
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    for (const char* const folder : {"/music", "/"}) {
        const auto handle = session.open(folder, sftpRead);
        ASSERT_TRUE(handle) << folder;
        EXPECT_EQ(session.close(*handle), sftpGood);
    }
    EXPECT_EQ(session.makeFolder("/music/next"), sftpGood);
    expectOperations("make-folder done /music/next\n");
}

TEST_F(RecordedSftp, recordsWhatIsRefused) {
    share("films", {{"alice", Access::read}});
    start();
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    EXPECT_NE(session.send("/films/x", "1"), sftpGood);
    EXPECT_NE(session.remove("/films/file"), sftpGood);
    EXPECT_NE(session.makeFolder("/films/folder"), sftpGood);
    EXPECT_NE(session.move("/films/file", "/films/other"), sftpGood);
    EXPECT_EQ(session.receive("/films/none"), std::nullopt);
    expectOperations("upload refused /films/x (Permission denied)\n"
                     "delete refused /films/file (Permission denied)\n"
                     "make-folder refused /films/folder (Permission denied)\n"
                     "rename refused /films/file -> /films/other (Permission denied)\n"
                     "download refused /films/none (No such file or directory)\n");
}

TEST_F(RecordedSftp, recordsHowManyWereRefused) {
    constexpr std::size_t many = 300;
    share("films", {{"alice", Access::read}});
    start();
    {
        SftpSession session(port, "alice");
        ASSERT_TRUE(session.isOpen());
        for (std::size_t i = 0; i < many; ++i) {
            EXPECT_EQ(session.remove("/films/file"), sftpDenied);
        }
    }
    const auto closed = [] {
        const auto all = records();
        return !all.empty() && all.back().operation == Operation::sessionClosed;
    };
    EXPECT_TRUE(waitUntil(closed, patience));
    std::size_t told = 0;
    for (const OperationRecord& each : records()) {
        told += each.leftOut + (each.result == OperationResult::refused ? 1 : 0);
    }
    EXPECT_EQ(told, many);
    EXPECT_LT(records().size(), many);
}

TEST_F(RecordedSftp, recordsTransfersThatEndBeforeTheirEnd) {
    record.user_chroot = 1;
    start();
    writeFile("/mnt/home/alice/large", std::string(100000, 'x'), aliceId);
    {
        SftpSession session(port, "alice");
        ASSERT_TRUE(session.isOpen());
        const auto read = session.open("/large", sftpRead);
        ASSERT_TRUE(read);
        EXPECT_EQ(session.close(*read), sftpGood);
        ASSERT_TRUE(session.open("/part", sftpWrite | sftpMake));
    }
    expectOperations("download incomplete /large 0 (closed before the end)\n"
                     "upload incomplete /part 0 (the session ended)\n");
}

TEST_F(RecordedSftp, showsARunningTransferAndEndsIt) {
    record.user_chroot = 1;
    start();
    SftpSession session(port, "alice");
    ASSERT_TRUE(session.isOpen());
    ASSERT_TRUE(session.open("/upload", sftpWrite | sftpMake));
    const OpenSession shown = await([](const OpenSession& each) { return each.transfer.has_value(); });
    EXPECT_TRUE(shown.transfer->upload);
    EXPECT_EQ(shown.transfer->path, "/upload");
    EXPECT_TRUE(shown.busy);
    const auto took = timeOf([&] { EXPECT_EQ(endSession(shown.id, {"carol", "too much"}), true); });
    EXPECT_LT(took, std::chrono::seconds(1));
    EXPECT_EQ(session.makeFolder("/after"), sftpEnded);
    const auto all = awaitRecords(3);
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[1].result, OperationResult::incomplete);
    EXPECT_EQ(all[2].reason, "ended by carol: too much");
}

TEST_F(RecordedSftp, recordsALoginThatIsRefusedForTheSettings) {
    start();
    storeRules({"u:1001:/none"});
    EXPECT_FALSE(SftpSession(port, "alice").isOpen());
    const auto all = awaitRecords(1);
    ASSERT_EQ(all.size(), 1U);
    EXPECT_EQ(all[0].operation, Operation::loginRefused);
    EXPECT_EQ(all[0].user + " " + all[0].reason + " " + all[0].address, "alice configuration 127.0.0.1");
}

TEST_F(RecordedSftp, recordsALargeTransferWithAllItsOctets) {
    record.user_chroot = 1;
    start();
    furnishSftp();
    const ProcessResult done = sftp(port, "put /usr/bin/curl sent\nget sent /mnt/got\nrename sent next\n");
    EXPECT_EQ(done.exitCode, 0) << done.errors;
    const std::string size = std::to_string(fs::file_size("/usr/bin/curl"));
    expectOperations("upload done /sent " + size + "\ndownload done /sent " + size +
                     "\nrename done /sent -> /next\n");
    const auto all = awaitRecords(5);
    ASSERT_EQ(all.size(), 5U);
    EXPECT_EQ(std::to_string(all[4].octetsIn.value_or(0)), size);
    EXPECT_EQ(std::to_string(all[4].octetsOut.value_or(0)), size);
}

} // namespace
} // namespace velt::test
