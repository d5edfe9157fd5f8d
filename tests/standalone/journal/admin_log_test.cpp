#include "base/plain_text.h"
#include "platform/adminlog.h"
#include "platform/core.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/effects.h"
#include "standalone/core/state_root.h"
#include "standalone/standalone.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>
#include <sqlite3.h>

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <thread>

namespace velt {
namespace {

using namespace std::string_literals;

class AdminLogTest : public testing::Test {
protected:
    AdminLogTest() {
        setStateRoot(folder_.path());
        setRequestActor("", "");
        clearLastError();
    }
    ~AdminLogTest() override {
        setEffectHook({});
        setRequestActor("", "");
    }

    static std::vector<LogEntry> query(const LogFilter& filter = {}) {
        const auto entries = queryLog(filter);
        EXPECT_TRUE(entries) << entries.error().message;
        return entries.valueOr({});
    }

    static void logUser(const std::string& name, unsigned event = 0x11B00024) {
        ASSERT_EQ(VELTLogSet1(1, 1, event, name.c_str(), "", "", ""), 0) << lastErrorSentence();
    }

    test::TemporaryFolder folder_;
};

std::vector<std::string> firstTexts(const std::vector<LogEntry>& entries) {
    std::vector<std::string> texts;
    for (const LogEntry& entry : entries)
        texts.push_back(entry.texts[0]);
    return texts;
}

using Lines = std::vector<std::string>;

TEST_F(AdminLogTest, IsEmptyBeforeTheFirstEntry) {
    EXPECT_TRUE(query().empty());
}

TEST_F(AdminLogTest, KeepsEveryPartOfAnEntry) {
    const auto before = std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now());
    setRequestActor("admin", "192.0.2.7");
    ASSERT_EQ(VELTLogSet1(2, 1, 0x11B00012, "21", "2121", "", ""), 0) << lastErrorSentence();
    const auto after = std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now());
    const std::vector<LogEntry> entries = query();
    ASSERT_EQ(entries.size(), 1U);
    const LogEntry& entry = entries[0];
    EXPECT_EQ(entry.id, 1);
    EXPECT_GE(entry.time, before);
    EXPECT_LE(entry.time, after);
    EXPECT_EQ(entry.category, 2);
    EXPECT_EQ(entry.level, 1);
    EXPECT_EQ(entry.event, 0x11B00012U);
    EXPECT_EQ(entry.texts, (std::array<std::string, 4>{"21", "2121", "", ""}));
    EXPECT_EQ(entry.sentence, "The FTP port was changed from 21 to 2121.");
    EXPECT_EQ(entry.actor, "admin");
    EXPECT_EQ(entry.address, "192.0.2.7");
}

TEST_F(AdminLogTest, TheActorBelongsToTheThread) {
    setRequestActor("here", "192.0.2.1");
    std::thread([] {
        setRequestActor("there", "192.0.2.2");
        logUser("a");
    }).join();
    logUser("b");
    const std::vector<LogEntry> entries = query();
    ASSERT_EQ(entries.size(), 2U);
    EXPECT_EQ(entries[0].actor, "here");
    EXPECT_EQ(entries[1].actor, "there");
}

TEST_F(AdminLogTest, AnswersNewestFirstAndPageByPage) {
    for (const char* name : {"1", "2", "3", "4", "5"})
        logUser(name);
    std::vector<LogEntry> page = query({{}, {}, {}, {}, 2});
    EXPECT_EQ(firstTexts(page), (Lines{"5", "4"}));
    page = query({{}, {}, {}, page.back().id, 2});
    EXPECT_EQ(firstTexts(page), (Lines{"3", "2"}));
    page = query({{}, {}, {}, page.back().id, 2});
    EXPECT_EQ(firstTexts(page), Lines{"1"});
}

TEST_F(AdminLogTest, NarrowsByEventActorAndTime) {
    setRequestActor("anna", "");
    logUser("1", 0x11B00024);
    std::this_thread::sleep_for(std::chrono::milliseconds(3));
    setRequestActor("bob", "");
    logUser("2", 0x11B00025);
    logUser("3", 0x11B00024);
    EXPECT_EQ(firstTexts(query({{}, 0x11B00024, {}, {}, 10})), (Lines{"3", "1"}));
    EXPECT_EQ(firstTexts(query({{}, {}, "bob", {}, 10})), (Lines{"3", "2"}));
    EXPECT_EQ(firstTexts(query({{}, 0x11B00024, "bob", {}, 10})), Lines{"3"});
    EXPECT_EQ(firstTexts(query({query({{}, {}, "bob", {}, 10}).back().time, {}, {}, {}, 10})),
              (Lines{"3", "2"}));
    EXPECT_TRUE(query({{}, {}, "' OR 1=1 --", {}, 10}).empty());
}

TEST_F(AdminLogTest, RefusesAPageOfAnImpossibleSize) {
    for (const int limit : {0, -1, 1001}) {
        const auto refused = queryLog({{}, {}, {}, {}, limit});
        ASSERT_FALSE(refused);
        EXPECT_EQ(refused.error().number, ErrorNumber::invalid);
    }
}

TEST_F(AdminLogTest, TextsCanNeitherForgeALineNorBreakTheStatement) {
    const std::string attempts[] = {"a\nUser \"root\" was confined.",
                                    "a\r\n",
                                    "\x1b[2Jx",
                                    "x'); DROP TABLE entry; --",
                                    "\"quoted\" 'text'",
                                    "../../etc/passwd",
                                    "%1%2%s%n",
                                    "\xff\xfe",
                                    "\xC3",
                                    "-rf",
                                    "\xE2\x80\xA8",
                                    std::string(100'000, 'x')};
    for (const std::string& attempt : attempts) {
        setRequestActor(attempt, attempt);
        ASSERT_EQ(
            VELTLogSet1(1, 1, 0x11B00024, attempt.c_str(), attempt.c_str(), attempt.c_str(), attempt.c_str()),
            0);
        const LogEntry entry = query({{}, {}, {}, {}, 1}).at(0);
        for (const std::string& text :
             {entry.texts[0], entry.texts[3], entry.sentence, entry.actor, entry.address})
            EXPECT_TRUE(isPlainText(text)) << text;
        EXPECT_EQ(entry.texts[0], plainText(attempt, 1024));
        EXPECT_LE(entry.actor.size(), 255U);
    }
    EXPECT_EQ(query().size(), std::size(attempts));
}

TEST_F(AdminLogTest, TakesNullForAnEmptyText) {
    ASSERT_EQ(VELTLogSet1(1, 1, 0x11B00013, nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(query().at(0).texts, (std::array<std::string, 4>{}));
}

TEST_F(AdminLogTest, IsReadableByItsOwnerAlone) {
    logUser("a");
    for (const char* name : {"log.db", "log.db-wal", "log.db-shm"}) {
        struct stat status {};
        ASSERT_EQ(stat((folder_.path() / "var/lib/velt" / name).c_str(), &status), 0) << name;
        EXPECT_EQ(status.st_mode & 0777U, 0600U) << name;
    }
}

TEST_F(AdminLogTest, TellsSubscribersOnceTheEntryIsStored) {
    std::vector<std::string> heard;
    const Subscription subscription = subscribeLog([&heard](const LogEntry& entry) {
        heard.push_back(std::to_string(entry.id) + " " + entry.sentence + " " +
                        std::to_string(queryLog({})->size()));
    });
    ASSERT_EQ(VELTLogSet1(2, 1, 0x11B00036, "", "", "", ""), 0);
    unsubscribe(subscription);
    logUser("unheard");
    EXPECT_EQ(heard, Lines{"1 The SFTP service was enabled. 1"});
}

TEST_F(AdminLogTest, IsAnEffectWithTheSentenceForItsSubject) {
    std::string seen;
    setEffectHook([&seen](Effect effect, std::string_view subject) {
        seen = std::string(effectName(effect)) + ": " + std::string(subject);
        return EffectDecision(Result<>());
    });
    EXPECT_EQ(VELTLogSet1(2, 1, 0x11B00036, "", "", "", ""), 0);
    EXPECT_EQ(seen, "log: The SFTP service was enabled.");
    setEffectHook({});
    EXPECT_TRUE(query().empty());
}

TEST_F(AdminLogTest, ADamagedDatabaseIsAnErrorThatNamesIt) {
    folder_.write("/var/lib/velt/log.db", std::string(5000, 'x'));
    int heard = 0;
    const Subscription subscription = subscribeLog([&heard](const LogEntry&) { ++heard; });
    EXPECT_LT(VELTLogSet1(2, 1, 0x11B00036, "", "", "", ""), 0);
    unsubscribe(subscription);
    EXPECT_EQ(heard, 0) << "of what was not stored";
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::log));
    EXPECT_NE(lastErrorSentence().find("log.db"), std::string::npos) << lastErrorSentence();
    EXPECT_FALSE(queryLog({}));
}

TEST_F(AdminLogTest, AFormFromTheFutureIsLeftAlone) {
    logUser("a");
    sqlite3* database = nullptr;
    ASSERT_EQ(sqlite3_open((folder_.path() / "var/lib/velt/log.db").c_str(), &database), SQLITE_OK);
    ASSERT_EQ(sqlite3_exec(database, "PRAGMA user_version = 2", nullptr, nullptr, nullptr), SQLITE_OK);
    sqlite3_close(database);
    test::TemporaryFolder other;
    setStateRoot(other.path());
    logUser("elsewhere");
    setStateRoot(folder_.path());
    const std::string refused = test::messageOf(queryLog({}));
    EXPECT_NE(refused.find("has format 2"), std::string::npos) << refused;
}

TEST_F(AdminLogTest, ALogOfAnEarlierReleaseGetsItsIndexes) {
    logUser("a");
    test::TemporaryFolder other;
    setStateRoot(other.path());
    logUser("elsewhere");
    sqlite3* database = nullptr;
    ASSERT_EQ(sqlite3_open((folder_.path() / "var/lib/velt/log.db").c_str(), &database), SQLITE_OK);
    const char* const drop = "DROP INDEX entry_actor; DROP INDEX entry_event";
    ASSERT_EQ(sqlite3_exec(database, drop, nullptr, nullptr, nullptr), SQLITE_OK);
    setStateRoot(folder_.path());
    EXPECT_EQ(firstTexts(query()), Lines{"a"});
    EXPECT_EQ(sqlite3_exec(database, drop, nullptr, nullptr, nullptr), SQLITE_OK) << sqlite3_errmsg(database);
    sqlite3_close(database);
}

TEST_F(AdminLogTest, StartsAnewWhenTheFileWasMovedAway) {
    logUser("old");
    for (const char* name : {"log.db", "log.db-wal", "log.db-shm"})
        std::filesystem::rename(folder_.path() / "var/lib/velt" / name, folder_.path() / name);
    setRequestActor("anna", "192.0.2.1");
    logUser("new");
    setRequestActor("", "");
    const auto entries = query();
    ASSERT_EQ(entries.size(), 2U);
    EXPECT_EQ(entries[0].texts[0], "new");
    EXPECT_EQ(entries[1].sentence,
              "The administrator log begins here: its former file was moved away or deleted.");
    EXPECT_EQ(entries[1].actor, "") << "whoever comes next has not done it";
}

TEST_F(AdminLogTest, SaysThatItWasDeletedBeforeTheStart) {
    folder_.write("var/lib/velt/initialized", "");
    logUser("new");
    EXPECT_EQ(query().size(), 2U);
    EXPECT_EQ(query().back().event, 0x11BF0015U);
}

TEST_F(AdminLogTest, AForkedChildIsRefusedInsteadOfBreakingTheDatabase) {
    logUser("parent");
    const pid_t child = fork();
    if (child == 0)
        _exit(VELTLogSet1(1, 1, 0x11B00024, "child", "", "", "") < 0 && !lastErrorSentence().empty() ? 0 : 1);
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    logUser("parent again");
    EXPECT_EQ(firstTexts(query()), (Lines{"parent again", "parent"}));
}

} // namespace
} // namespace velt
