#include "platform/adminlog.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/standalone.h"
#include "tests/standalone/support/process.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/waiting.h"

#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <map>
#include <set>
#include <string>
#include <thread>

namespace velt {
namespace {

constexpr int each = 100;

/// How many entries each actor has, and that no id is there twice.
std::map<std::string, int> countByActor() {
    std::map<std::string, int> counts;
    std::set<std::int64_t> ids;
    LogFilter filter;
    for (filter.limit = 1000;;) {
        const auto page = queryLog(filter);
        EXPECT_TRUE(page) << page.error().message;
        if (!page || page->empty())
            return counts;
        for (const LogEntry& entry : *page) {
            ++counts[entry.actor];
            EXPECT_TRUE(ids.insert(entry.id).second);
        }
        filter.beforeId = page->back().id;
    }
}

int killedEntries() {
    const std::map<std::string, int> counts = countByActor();
    const auto found = counts.find("killed");
    return found == counts.end() ? 0 : found->second;
}

TEST(LogProcesses, SeveralProcessesThatStartAtOnceLoseNothing) {
    const test::TemporaryFolder folder;
    std::vector<pid_t> writers;
    for (const char* name : {"one", "two", "three"})
        writers.push_back(test::start({LOG_WRITER, folder.path().string(), name, std::to_string(each)}));
    for (const pid_t writer : writers)
        EXPECT_EQ(test::finish(writer), 0);
    setStateRoot(folder.path());
    EXPECT_EQ(countByActor(), (std::map<std::string, int>{{"one", each}, {"two", each}, {"three", each}}));
}

TEST(LogProcesses, ThreadsBesideAnotherProcessLoseNothing) {
    const test::TemporaryFolder folder;
    setStateRoot(folder.path());
    const pid_t writer = test::start({LOG_WRITER, folder.path().string(), "process", std::to_string(each)});
    std::vector<std::thread> threads;
    for (const char* name : {"first", "second"})
        threads.emplace_back([name] {
            setRequestActor(name, "");
            for (int i = 0; i < each; ++i)
                EXPECT_EQ(VELTLogSet1(1, 1, 0x11B00024, "x", "", "", ""), 0) << lastErrorSentence();
        });
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(test::finish(writer), 0);
    EXPECT_EQ(countByActor(),
              (std::map<std::string, int>{{"process", each}, {"first", each}, {"second", each}}));
}

// Whoever closes the database last deletes its side files, and finds out by the locks of the others.
TEST(LogProcesses, OneThatEndsTakesNothingFromThoseThatGoOn) {
    const test::TemporaryFolder folder;
    setStateRoot(folder.path());
    setRequestActor("stays", "");
    ASSERT_EQ(VELTLogSet1(1, 1, 0x11B00024, "x", "", "", ""), 0) << lastErrorSentence();
    ASSERT_TRUE(recordChange({}));
    ASSERT_TRUE(queryChanges({}));
    const auto wal = folder.path() / "var/lib/velt/log.db-wal";
    ASSERT_TRUE(std::filesystem::exists(wal));
    EXPECT_EQ(test::finish(test::start({LOG_WRITER, folder.path().string(), "ends", std::to_string(each)})),
              0);
    EXPECT_TRUE(std::filesystem::exists(wal));
    ASSERT_EQ(VELTLogSet1(1, 1, 0x11B00024, "x", "", "", ""), 0) << lastErrorSentence();
    EXPECT_TRUE(recordChange({}));
    EXPECT_EQ(test::finish(test::start({LOG_WRITER, folder.path().string(), "next", std::to_string(each)})),
              0);
    EXPECT_EQ(countByActor(), (std::map<std::string, int>{{"stays", 2}, {"ends", each}, {"next", each}}));
    EXPECT_EQ(queryChanges({}).valueOr({}).size(), 2U);
    setRequestActor("", "");
}

TEST(LogProcesses, AWriterThatIsKilledLeavesAWholeLog) {
    const test::TemporaryFolder folder;
    setStateRoot(folder.path());
    for (int round = 0; round < 10; ++round) {
        const pid_t writer = test::start({LOG_WRITER, folder.path().string(), "killed", "1000000"});
        ASSERT_GT(writer, 0);
        const int before = killedEntries();
        ASSERT_TRUE(test::waitUntil([before] { return killedEntries() > before; }, test::patience));
        // At another moment of what it does each time.
        std::this_thread::sleep_for(std::chrono::milliseconds(round));
        kill(writer, SIGKILL);
        test::finish(writer);
        ASSERT_EQ(VELTLogSet1(1, 1, 0x11B00024, "x", "", "", ""), 0) << lastErrorSentence();
    }
    const std::map<std::string, int> counts = countByActor();
    EXPECT_EQ(counts.at(""), 10);
    EXPECT_GE(counts.at("killed"), 10);
}

} // namespace
} // namespace velt
