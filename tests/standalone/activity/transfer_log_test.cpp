// What other programs read of what sessions did.
#include "standalone/activity/transfer_log.h"

#include "standalone/activity/activity_reader.h"
#include "standalone/activity/session_activity.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <ctime>
#include <filesystem>

namespace velt::test {
namespace {
namespace fs = std::filesystem;
using namespace std::chrono_literals;

class TransferLog : public testing::Test {
protected:
    void SetUp() override {
        setenv("TZ", "UTC", 1);
        tzset();
        record_.time = OperationRecord::TimePoint(1700000000s);
        record_.operation = Operation::upload;
        record_.protocol = SessionProtocol::sftp;
        record_.user = "anna";
        record_.address = "192.0.2.1";
        record_.place = {"/docs/a b", "/srv/docs/a b", "docs", "a b"};
        record_.octets = 250;
        record_.duration = 1200ms;
    }

    fs::path file() const { return root_.path() / "var/log/velt/xferlog"; }

    StateFolder root_;
    OperationRecord record_;
};

TEST_F(TransferLog, HasTheFormThatProgramsRead) {
    EXPECT_EQ(xferlogLine(record_), "Tue Nov 14 22:13:20 2023 2 192.0.2.1 250 /srv/docs/a_b b _ i r anna "
                                    "sftp 0 * c\n");
    record_.operation = Operation::download;
    record_.result = OperationResult::incomplete;
    record_.user = "anonymous";
    record_.place = {"/a\nb\tc", "", "", ""};
    record_.duration.reset();
    EXPECT_EQ(xferlogLine(record_), "Tue Nov 14 22:13:20 2023 0 192.0.2.1 250 /a_b_c b _ o a anonymous "
                                    "sftp 0 * i\n");
    record_.operation = Operation::remove;
    record_.result = OperationResult::done;
    record_.octets.reset();
    record_.user = "an na";
    EXPECT_EQ(xferlogLine(record_),
              "Tue Nov 14 22:13:20 2023 0 192.0.2.1 0 /a_b_c b _ d r an_na sftp 0 * c\n");
}

TEST_F(TransferLog, HasNothingOfWhatTheFormDoesNotKnow) {
    record_.operation = Operation::rename;
    EXPECT_EQ(xferlogLine(record_), "");
    record_.operation = Operation::upload;
    record_.result = OperationResult::refused;
    EXPECT_EQ(xferlogLine(record_), "");
}

TEST_F(TransferLog, SaysAllInASentence) {
    EXPECT_EQ(operationSentence(record_), "anna (192.0.2.1, sftp): upload done /srv/docs/a b, 250 octets");
    record_.operation = Operation::rename;
    record_.result = OperationResult::refused;
    record_.newPlace.path = "/docs/c\nd";
    record_.octets.reset();
    record_.reason = "Permission denied";
    EXPECT_EQ(operationSentence(record_), "anna (192.0.2.1, sftp): rename refused /srv/docs/a b -> "
                                          "/docs/c\\x0ad, Permission denied");
}

TEST_F(TransferLog, IsWrittenWhereTheSettingsSaySo) {
    fs::create_directories(file().parent_path());
    EXPECT_EQ(messageOf(writeTransferLog({}, std::span(&record_, 1))), "");
    EXPECT_FALSE(fs::exists(file()));
    ActivitySettings settings;
    settings.xferlog = true;
    EXPECT_EQ(messageOf(writeTransferLog(settings, std::span(&record_, 1))), "");
    fs::rename(file(), file().string() + ".1"); // as those who rotate logs do
    EXPECT_EQ(messageOf(writeTransferLog(settings, std::span(&record_, 1))), "");
    EXPECT_EQ(messageOf(writeTransferLog(settings, std::span(&record_, 1))), "");
    EXPECT_EQ(contentsOf(file()), xferlogLine(record_) + xferlogLine(record_));
    struct stat status {};
    ASSERT_EQ(stat(file().c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0640U);
}

TEST_F(TransferLog, LeadsNowhereElse) {
    fs::create_directories(file().parent_path());
    fs::create_symlink(root_.path() / "victim", file());
    ActivitySettings settings;
    settings.xferlog = true;
    EXPECT_EQ(messageOf(writeTransferLog(settings, std::span(&record_, 1))),
              "Cannot write " + file().string() + ": Too many levels of symbolic links.");
    EXPECT_FALSE(fs::exists(root_.path() / "victim"));
}

TEST_F(TransferLog, FollowsWhatIsTakenOver) {
    root_.write("etc/velt/transfers.conf", "version = 1\nxferlog = 1\n");
    fs::create_directories(file()); // no file
    const velt_session anna{velt_sftp, "", "anna", "anna", "192.0.2.1", ""};
    velt_begin_activity(root_.path().c_str());
    velt_expect_session();
    velt_session_opened(&anna);
    const velt_record upload{"upload", "done", nullptr, "/a", nullptr, nullptr, 250, 1000};
    velt_record_operation(&upload);
    startActivityReader();
    ASSERT_TRUE(waitUntil([] { return !transferLogProblem().empty(); }, patience));
    EXPECT_TRUE(activityProblem().empty());
    fs::remove(file());
    velt_record_operation(&upload);
    EXPECT_TRUE(waitUntil([this] { return contentsOf(file()).ends_with(" sftp 0 * c\n"); }, patience));
    EXPECT_TRUE(waitUntil([] { return transferLogProblem().empty(); }, patience));
    stopActivityReader();
}

} // namespace
} // namespace velt::test
