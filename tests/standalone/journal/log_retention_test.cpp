#include "standalone/journal/log_retention.h"

#include "platform/adminlog.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/standalone.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>
#include <sqlite3.h>

namespace velt {
namespace {

class LogRetentionTest : public testing::Test {
protected:
    LogRetentionTest() { setStateRoot(folder_.path()); }

    static void log(const std::string& text) {
        ASSERT_EQ(VELTLogSet1(1, 1, 0x11B00024, text.c_str(), "", "", ""), 0) << lastErrorSentence();
    }

    static std::vector<std::string> texts() {
        const auto entries = queryLog({{}, {}, {}, {}, 1000});
        EXPECT_TRUE(entries) << entries.error().message;
        std::vector<std::string> texts;
        for (const LogEntry& entry : entries.valueOr({})) {
            texts.push_back(entry.texts[0]);
        }
        return texts;
    }

    void makeOlder(const std::string& text, int days) {
        sqlite3* database = nullptr;
        ASSERT_EQ(sqlite3_open((folder_.path() / "var/lib/velt/log.db").c_str(), &database), SQLITE_OK);
        const std::string sql = "UPDATE entry SET time = time - " + std::to_string(days) +
                                " * 86400000 WHERE text1 = '" + text + "'";
        EXPECT_EQ(sqlite3_exec(database, sql.c_str(), nullptr, nullptr, nullptr), SQLITE_OK);
        sqlite3_close(database);
    }

    test::TemporaryFolder folder_;
};

using Lines = std::vector<std::string>;

TEST_F(LogRetentionTest, HasDefaults) {
    for (const bool written : {false, true}) {
        if (written) {
            folder_.write("/etc/velt/log.conf", "");
        }
        const auto retention = loadRetention();
        ASSERT_TRUE(retention) << retention.error().message;
        EXPECT_EQ(retention->maxEntries, 100'000);
        EXPECT_EQ(retention->maxAgeDays, 365);
    }
}

TEST_F(LogRetentionTest, ReadsBothKeys) {
    for (const std::string version : {"", "version = 1\n"}) {
        folder_.write("/etc/velt/log.conf",
                      version + "# kept short\n\n max_entries = 50 # fifty\nmax_age_days=0\r\n");
        const auto retention = loadRetention();
        ASSERT_TRUE(retention) << retention.error().message;
        EXPECT_EQ(retention->maxEntries, 50);
        EXPECT_EQ(retention->maxAgeDays, 0);
    }
}

TEST_F(LogRetentionTest, NamesTheLineThatItCannotRead) {
    const std::string file = (folder_.path() / "etc/velt/log.conf").string();
    for (const char* line : {"max_entries", "max_entries=", "max_entries=-1", "max_entries=many",
                             "max_entries=1.5", "max_entries=99999999999999999999", "max_entries=100000001",
                             "max_age_days=36501", "max_size=1", "= 5", "max_entries=5 6"}) {
        folder_.write("/etc/velt/log.conf", "max_age_days=1\n" + std::string(line) + "\n");
        const std::string refused = test::messageOf(loadRetention());
        EXPECT_EQ(refused.rfind("Cannot read " + file + ", line 2: ", 0), 0U) << line << ": " << refused;
    }
}

TEST_F(LogRetentionTest, KeepsTheNewestByCount) {
    folder_.write("/etc/velt/log.conf", "max_entries=3\n");
    for (const char* text : {"1", "2", "3", "4", "5"}) {
        log(text);
    }
    EXPECT_EQ(texts(), (Lines{"5", "4", "3"}));
}

TEST_F(LogRetentionTest, TakesUpAChangedCountAtTheNextEntry) {
    for (const char* text : {"1", "2", "3"}) {
        log(text);
    }
    folder_.write("/etc/velt/log.conf", "max_entries=2\n");
    log("4");
    EXPECT_EQ(texts(), (Lines{"4", "3"}));
}

TEST_F(LogRetentionTest, RemovesWhatIsTooOld) {
    folder_.write("/etc/velt/log.conf", "max_age_days=30\n");
    log("old");
    log("young");
    makeOlder("old", 31);
    makeOlder("young", 29);
    log("new");
    EXPECT_EQ(texts(), (Lines{"new", "young"}));
}

TEST_F(LogRetentionTest, ZeroKeepsForEver) {
    folder_.write("/etc/velt/log.conf", "max_age_days=0\nmax_entries=0\n");
    log("old");
    makeOlder("old", 5000);
    log("new");
    EXPECT_EQ(texts(), (Lines{"new", "old"}));
}

TEST_F(LogRetentionTest, ADamagedConfigurationLosesNoEntry) {
    folder_.write("/etc/velt/log.conf", "max_entries=1\n");
    log("1");
    folder_.write("/etc/velt/log.conf", "max_entries=l\n");
    clearLastError();
    log("2");
    log("3");
    EXPECT_EQ(texts(), (Lines{"3", "2", "1"}));
    EXPECT_EQ(lastErrorSentence(), "") << "the entries were written";
    EXPECT_FALSE(loadRetention());
}

} // namespace
} // namespace velt
