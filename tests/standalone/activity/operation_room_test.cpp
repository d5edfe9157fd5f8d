// Whose records go when there is no room for all.
#include "standalone/activity/operation_room.h"

#include "standalone/activity/operation_search.h"
#include "standalone/activity/operation_store.h"
#include "standalone/core/paths.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace velt {
namespace {
namespace fs = std::filesystem;

class OperationRoom : public testing::Test {
protected:
    static constexpr std::int64_t limit = 20'000'000;

    void SetUp() override {
        auto opened = OperationStore::open(path_);
        ASSERT_EQ(test::messageOf(opened), "");
        store_ = std::move(*opened);
    }

    OperationRecord by(const std::string& user, Operation operation, std::size_t length) {
        OperationRecord record;
        record.time = start_ + std::chrono::milliseconds(++number_);
        record.operation = operation;
        record.session = "s";
        record.number = number_;
        record.user = user;
        const std::string name = std::to_string(number_) + std::string(length, 'x');
        record.place = {"/" + name, "/srv/" + name, "srv", name};
        return record;
    }

    void add(const std::string& user, int count, std::size_t length = 50,
             Operation operation = Operation::remove) {
        std::vector<OperationRecord> records;
        for (int i = 0; i < count; ++i) {
            records.push_back(by(user, operation, length));
        }
        EXPECT_EQ(test::messageOf(store_->take(1, number_, std::move(records))), "");
    }

    void trim() {
        for (int rounds = 0; store_->trim({std::chrono::days(90), limit}, start_).valueOr(false); ++rounds) {
            ASSERT_LT(rounds, 100);
        }
    }

    /// So much more than there is room for, in parts as the spool is taken over.
    void flood(const std::string& user, Operation operation = Operation::remove) {
        for (int i = 0; i < 60; ++i) {
            add(operation == Operation::loginRefused ? user + std::to_string(i) : user, 80, 4000, operation);
            trim();
            std::error_code error;
            const auto log = fs::file_size(path_.string() + "-wal", error);
            EXPECT_LE(fs::file_size(path_) + (error ? 0 : log), static_cast<std::uintmax_t>(limit));
        }
    }

    static std::size_t countOf(const std::string& user) {
        OperationFilter filter;
        filter.user = user;
        filter.limit = 1000;
        std::size_t count = 0;
        for (auto page = searchOperations(filter); page; page = searchOperations(filter)) {
            count += page->records.size();
            if (!page->next) {
                break;
            }
            filter.before = page->next;
        }
        return count;
    }

    std::vector<std::string> losers() const { return losersOfRecords(start_).valueOr({}); }

    test::StateFolder root_;
    fs::path path_ = statePath(paths::operationDatabase);
    std::unique_ptr<OperationStore> store_;
    OperationRecord::TimePoint start_ =
        std::chrono::floor<std::chrono::seconds>(OperationRecord::TimePoint::clock::now());
    std::int64_t number_ = 0;
};

TEST_F(OperationRoom, IsTakenFromWhoFillsItAndFromNobodyElse) {
    add("alice", 3000);
    add("bert", 1);
    flood("ftp");
    EXPECT_EQ(countOf("alice"), 3000U);
    EXPECT_EQ(countOf("bert"), 1U);
    EXPECT_GT(countOf("ftp"), 100U);
    EXPECT_LT(countOf("ftp"), 4800U);
    EXPECT_EQ(losers(), std::vector<std::string>{"ftp"});
}

TEST_F(OperationRoom, IsTakenFromRefusedLoginsTogetherWhateverTheirNames) {
    add("alice", 3000);
    flood("stranger", Operation::loginRefused);
    EXPECT_EQ(countOf("alice"), 3000U);
    EXPECT_EQ(losers(), std::vector<std::string>{""});
}

TEST_F(OperationRoom, LeavesEachWithItsShareWhoeverCameFirst) {
    for (int i = 0; i < 12; ++i) {
        add("alice", 3000);
        trim();
    }
    const std::size_t before = countOf("alice");
    flood("ftp");
    EXPECT_GT(countOf("alice"), before / 3);
    EXPECT_GT(countOf("ftp"), 100U);
}

TEST_F(OperationRoom, IsKeptByWhoOnlyAddsToHisShare) {
    flood("ftp");
    add("alice", 100);
    trim();
    EXPECT_EQ(countOf("alice"), 100U);
}

TEST_F(OperationRoom, IsCountedTheSameWhenItIsTakenAndWhenItIsGiven) {
    OperationRecord all = by("\u00e4nna", Operation::rename, 5);
    all.reason = "why";
    all.account = "unix";
    all.address = "::1";
    all.detail = "0644";
    all.newPlace = {"/\u00fc", "/srv/n", "new", "n"};
    EXPECT_EQ(test::messageOf(store_->take(1, 1, {all})), "");
    EXPECT_EQ(store_->trim({std::chrono::days(90), 0}, start_ + std::chrono::days(91)), true);
    sqlite3* database = nullptr;
    ASSERT_EQ(sqlite3_open(path_.c_str(), &database), SQLITE_OK);
    const DatabaseOwner owner(database);
    Statement query;
    ASSERT_EQ(query.prepare(database, "SELECT octets, grown FROM holder"), SQLITE_OK);
    ASSERT_EQ(query.step(), SQLITE_ROW);
    EXPECT_EQ(query.number(0), 0);
    EXPECT_EQ(query.number(1), 0);
}

TEST_F(OperationRoom, TellsOfNobodyWhoLosesByAge) {
    add("alice", 10);
    const auto later = start_ + std::chrono::days(91);
    EXPECT_EQ(store_->trim({std::chrono::days(90), limit}, later), true);
    EXPECT_EQ(store_->trim({std::chrono::days(90), limit}, later), false);
    EXPECT_EQ(countOf("alice"), 0U);
    EXPECT_EQ(losers(), std::vector<std::string>());
}

TEST_F(OperationRoom, FindsOthersWhereItsCountsAreWrong) {
    add("alice", 3000);
    flood("ftp");
    sqlite3* database = nullptr;
    ASSERT_EQ(sqlite3_open(path_.c_str(), &database), SQLITE_OK);
    const DatabaseOwner owner(database);
    ASSERT_EQ(
        execute(database, "INSERT INTO holder (name, octets, grown) VALUES ('nobody', 90000000, 90000000)"),
        SQLITE_OK);
    flood("ftp");
    EXPECT_EQ(losers(), std::vector<std::string>{"ftp"});
}

} // namespace
} // namespace velt
