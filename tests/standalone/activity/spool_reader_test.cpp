// Taking over what sessions wrote down: nothing is lost, nothing is there twice.
#include "standalone/activity/spool_reader.h"

#include "base/unique_fd.h"
#include "standalone/activity/operation_search.h"
#include "standalone/activity/spool.h"
#include "standalone/core/paths.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <string>

namespace velt {
namespace {

std::string lineOf(int number) {
    return "\x1e{\"kind\":\"upload\",\"result\":\"done\",\"protocol\":\"ftp\",\"session\":\"s\",\"user\":"
           "\"anna\","
           "\"time\":" +
           std::to_string(number + 1) + ",\"number\":" + std::to_string(number) + "}\n";
}

class SpoolReaderTest : public testing::Test {
protected:
    void SetUp() override { open(); }

    void open(SpoolReader::Sizes sizes = {}) {
        reader_.reset();
        store_.reset();
        auto opened = OperationStore::open(statePath(paths::operationDatabase));
        ASSERT_EQ(test::messageOf(opened), "");
        store_ = std::move(*opened);
        reader_ = std::make_unique<SpoolReader>(folder_, *store_, sizes);
    }

    UniqueFd session() const { return UniqueFd(velt_open_spool(root_.path().c_str())); }

    static void write(const UniqueFd& spool, int first, int count = 1) {
        for (int i = first; i < first + count; ++i) {
            const std::string line = lineOf(i);
            EXPECT_EQ(velt_write_spool(spool.get(), line.data(), line.size()), 0);
        }
    }

    /// Takes until there is no more; how many records.
    std::size_t takeAll() {
        std::size_t count = 0;
        for (bool more = true; more;) {
            const auto taken = reader_->take();
            EXPECT_EQ(test::messageOf(taken), "");
            count += taken.valueOr({}).records.size();
            more = taken.valueOr({}).more;
        }
        return count;
    }

    static std::size_t stored() {
        std::size_t count = 0;
        OperationFilter filter;
        filter.limit = 1000;
        do {
            const auto page = searchOperations(filter);
            EXPECT_EQ(test::messageOf(page), "");
            count += page.valueOr({}).records.size();
            filter.before = page.valueOr({}).next;
        } while (filter.before);
        return count;
    }

    std::size_t files() const {
        return static_cast<std::size_t>(std::distance(std::filesystem::directory_iterator(folder_), {}));
    }

    test::StateFolder root_;
    std::filesystem::path folder_ = statePath(paths::spools);
    std::unique_ptr<OperationStore> store_;
    std::unique_ptr<SpoolReader> reader_;
};

TEST_F(SpoolReaderTest, TakesWhatIsThere) {
    EXPECT_EQ(takeAll(), 0U);
    const UniqueFd spool = session();
    write(spool, 0, 3);
    EXPECT_EQ(takeAll(), 3U);
    EXPECT_EQ(takeAll(), 0U);
    write(spool, 3, 2);
    EXPECT_EQ(takeAll(), 2U);
    EXPECT_EQ(stored(), 5U);
}

TEST_F(SpoolReaderTest, GoesOnWhereAFormerReaderStopped) {
    const UniqueFd spool = session();
    write(spool, 0, 3);
    EXPECT_EQ(takeAll(), 3U);
    open();
    write(spool, 3, 2);
    EXPECT_EQ(takeAll(), 2U);
}

TEST_F(SpoolReaderTest, KnowsRecordsAgain) {
    const UniqueFd spool = session();
    write(spool, 0, 3);
    EXPECT_EQ(takeAll(), 3U);
    write(spool, 0, 3);
    EXPECT_EQ(takeAll(), 0U);
    EXPECT_EQ(stored(), 3U);
}

TEST_F(SpoolReaderTest, GivesRoomBack) {
    const UniqueFd spool = session();
    write(spool, 0, 2000);
    struct stat before {};
    struct stat after {};
    ASSERT_EQ(fstat(spool.get(), &before), 0);
    EXPECT_EQ(takeAll(), 2000U);
    ASSERT_EQ(fstat(spool.get(), &after), 0);
    EXPECT_EQ(after.st_size, before.st_size);
    EXPECT_LE(after.st_blocks, 16) << "of " << before.st_blocks;
    write(spool, 2000);
    EXPECT_EQ(takeAll(), 1U);
}

TEST_F(SpoolReaderTest, ExchangesALargeSpool) {
    open({4096, 10000});
    const UniqueFd former = session();
    write(former, 0, 200);
    EXPECT_EQ(takeAll(), 200U);
    EXPECT_EQ(files(), 1U);
    UniqueFd next = session();
    EXPECT_EQ(files(), 2U);
    write(former, 200, 5);
    write(next, 300, 5);
    EXPECT_EQ(takeAll(), 10U);
    EXPECT_EQ(files(), 2U) << "a session still has the former one";
}

TEST_F(SpoolReaderTest, RemovesAFormerSpoolThatNobodyHas) {
    open({4096, 10000});
    UniqueFd former = session();
    write(former, 0, 200);
    EXPECT_EQ(takeAll(), 200U);
    write(former, 200, 100);
    former.reset();
    EXPECT_EQ(takeAll(), 100U);
    EXPECT_EQ(takeAll(), 0U);
    EXPECT_EQ(files(), 0U);
    EXPECT_EQ(stored(), 300U);
}

TEST_F(SpoolReaderTest, RemovesAFormerSpoolThatEndsInTheMiddleOfARecord) {
    open({4096, 10000});
    UniqueFd former = session();
    write(former, 0, 200);
    EXPECT_EQ(takeAll(), 200U);
    EXPECT_EQ(::write(former.get(), "\x1e{\"kind\"", 8), 8);
    former.reset();
    takeAll();
    takeAll();
    EXPECT_EQ(files(), 0U);
}

TEST_F(SpoolReaderTest, LosesADamagedLineOnly) {
    const std::string good = lineOf(1);
    const std::string json = good.substr(1, good.size() - 2);
    for (const std::string& damaged :
         {good.substr(0, good.size() / 2) + "\n", good.substr(0, good.size() / 2), std::string("\x1e\n"),
          std::string("rubbish\n"), "\x1e" + json + json + "\n", "\x1e[" + json + "]\n",
          std::string("\x1e{\"kind\":\"upload\"}\n"), std::string("\x1e\xff\xfe{}\n"),
          "\x1e" + std::string(10000, '[') + "\n", "\x1e" + std::string(15000, 'x') + "\n", json + "\n"}) {
        reader_.reset();
        store_.reset();
        std::filesystem::remove_all(statePath("/var"));
        open();
        const UniqueFd spool = session();
        write(spool, 10);
        EXPECT_EQ(::write(spool.get(), damaged.data(), damaged.size()), static_cast<ssize_t>(damaged.size()));
        write(spool, 11);
        const auto taken = reader_->take();
        ASSERT_EQ(test::messageOf(taken), "");
        EXPECT_EQ(taken->records.size(), 2U) << damaged.substr(0, 60);
        EXPECT_EQ(taken->damaged, 1U) << damaged.substr(0, 60);
    }
}

TEST_F(SpoolReaderTest, CountsARecordThatNobodyWillEnd) {
    open({4096, 10000});
    UniqueFd former = session();
    write(former, 0, 200);
    EXPECT_EQ(takeAll(), 200U);
    EXPECT_EQ(::write(former.get(), "\x1e{\"kind\"", 9), 9);
    EXPECT_EQ(reader_->take().valueOr({}).damaged, 0U) << "it may be going on";
    former.reset();
    EXPECT_EQ(reader_->take().valueOr({}).damaged, 1U);
    EXPECT_EQ(reader_->take().valueOr({}).damaged, 0U);
}

TEST_F(SpoolReaderTest, TakesMoreThanFitsIntoItsMemory) {
    open({32768, 1 << 30});
    const UniqueFd spool = session();
    write(spool, 0, 3000);
    EXPECT_EQ(takeAll(), 3000U);
}

TEST_F(SpoolReaderTest, PassesOverALongStretchWithoutARecord) {
    open({32768, 1 << 30});
    const UniqueFd spool = session();
    const std::string rubbish(100000, 'x');
    EXPECT_EQ(::write(spool.get(), rubbish.data(), rubbish.size()), static_cast<ssize_t>(rubbish.size()));
    write(spool, 0, 3);
    EXPECT_EQ(takeAll(), 3U);
}

TEST_F(SpoolReaderTest, LosesAndDoublesNothingWhenItIsKilled) {
    constexpr int count = 20000;
    store_.reset();
    reader_.reset();
    const pid_t writer = fork();
    if (writer == 0) {
        const UniqueFd spool = session();
        write(spool, 0, count);
        _exit(0);
    }
    int kills = 0;
    for (bool writing = true; writing || kills < 20;) {
        const pid_t victim = fork();
        if (victim == 0) {
            open({16384, 200000});
            for (;;) {
                static_cast<void>(reader_->take());
            }
        }
        usleep(static_cast<useconds_t>(7000 + 1300 * (kills % 10)));
        kill(victim, SIGKILL);
        waitpid(victim, nullptr, 0);
        ++kills;
        writing = writing && waitpid(writer, nullptr, WNOHANG) == 0;
    }
    open({1 << 20, 200000});
    takeAll();
    EXPECT_EQ(stored(), static_cast<std::size_t>(count)) << "after " << kills << " kills";
    EXPECT_GE(kills, 20);
}

} // namespace
} // namespace velt
