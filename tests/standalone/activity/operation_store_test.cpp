// Keeping and finding what sessions did.
#include "standalone/activity/operation_store.h"

#include "standalone/activity/activity_settings.h"
#include "standalone/activity/operation_search.h"
#include "standalone/activity/spool.h"
#include "standalone/core/paths.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <utility>
#include <vector>

namespace velt {
namespace {

using std::chrono::microseconds;

OperationRecord at(std::int64_t time, const std::string& user, const std::string& path) {
    static std::int64_t number = 0;
    OperationRecord record;
    record.time = OperationRecord::TimePoint(microseconds(time));
    record.session = "s";
    record.number = ++number;
    record.user = user;
    record.place = {"/" + path, "/srv/music/" + path, "music", path};
    record.octets = 1;
    return record;
}

class OperationStoreTest : public testing::Test {
protected:
    void SetUp() override {
        auto opened = OperationStore::open(path_);
        ASSERT_EQ(test::messageOf(opened), "");
        store_ = std::move(*opened);
    }

    void add(std::vector<OperationRecord> records) {
        EXPECT_EQ(test::messageOf(store_->take(1, 1, std::move(records))), "");
    }

    /// The paths of the page, and "+" where there are more.
    static std::string found(const OperationFilter& filter) {
        const auto page = searchOperations(filter);
        std::string text = test::messageOf(page);
        for (const OperationRecord& each : page.valueOr({}).records) {
            text += (text.empty() ? "" : " ") + each.place.path;
        }
        return text + (page && page->next ? " +" : "");
    }

    test::StateFolder root_;
    std::filesystem::path path_ = statePath(paths::operationDatabase);
    std::unique_ptr<OperationStore> store_;
};

TEST_F(OperationStoreTest, GivesBackAllOfARecord) {
    OperationRecord all = at(5, "anna", "x");
    all.operation = Operation::rename;
    all.result = OperationResult::refused;
    all.protocol = SessionProtocol::sftp;
    all.reason = "why";
    all.session = "a-b-c";
    all.account = "unix";
    all.address = "::1";
    all.newPlace = {"/n", "/srv/n", "new", "n"};
    all.detail = "0644";
    all.octets = 1;
    all.octetsIn = 2;
    all.octetsOut = 3;
    all.duration = microseconds(4);
    all.escaped = true;
    all.leftOut = 6;
    all.cut = true;
    add({all});
    const auto page = searchOperations({});
    ASSERT_EQ(page.valueOr({}).records.size(), 1U) << test::messageOf(page);
    const OperationRecord& read = page->records[0];
    EXPECT_EQ(
        std::tie(read.time, read.operation, read.result, read.reason, read.session, read.number,
                 read.protocol),
        std::tie(all.time, all.operation, all.result, all.reason, all.session, all.number, all.protocol));
    EXPECT_EQ(std::tie(read.user, read.account, read.address, read.place, read.newPlace, read.detail),
              std::tie(all.user, all.account, all.address, all.place, all.newPlace, all.detail));
    EXPECT_EQ(
        std::tie(read.octets, read.octetsIn, read.octetsOut, read.duration, read.escaped, read.leftOut,
                 read.cut),
        std::tie(all.octets, all.octetsIn, all.octetsOut, all.duration, all.escaped, all.leftOut, all.cut));
}

TEST_F(OperationStoreTest, FindsNewestFirst) {
    add({at(1, "anna", "a"), at(3, "bert", "c"), at(2, "anna", "b")});
    EXPECT_EQ(found({}), "/c /b /a");
}

TEST_F(OperationStoreTest, FindsByEachField) {
    OperationRecord other = at(4, "bert", "d");
    other.place.share = "films";
    other.operation = Operation::remove;
    other.result = OperationResult::refused;
    other.session = "t";
    add({at(1, "anna", "a"), at(2, "anna", "b/x"), at(3, "bert", "c"), other});
    const auto with = [](auto change) {
        OperationFilter filter;
        change(filter);
        return found(filter);
    };
    EXPECT_EQ(with([](auto& filter) { filter.user = "anna"; }), "/b/x /a");
    EXPECT_EQ(with([](auto& filter) { filter.share = "films"; }), "/d");
    EXPECT_EQ(with([](auto& filter) { filter.session = "t"; }), "/d");
    EXPECT_EQ(with([](auto& filter) { filter.operations = {Operation::remove, Operation::rename}; }), "/d");
    EXPECT_EQ(with([](auto& filter) { filter.result = OperationResult::refused; }), "/d");
    EXPECT_EQ(with([](auto& filter) { filter.pathPrefix = "/srv/music/b"; }), "/b/x");
    EXPECT_EQ(with([](auto& filter) {
                  filter.share = "music";
                  filter.pathPrefix = "b/";
              }),
              "/b/x");
    EXPECT_EQ(with([](auto& filter) { filter.from = OperationRecord::TimePoint(microseconds(3)); }), "/d /c");
    EXPECT_EQ(with([](auto& filter) { filter.until = OperationRecord::TimePoint(microseconds(3)); }),
              "/b/x /a");
}

TEST_F(OperationStoreTest, FindsWhatWasMovedThere) {
    OperationRecord moved = at(1, "anna", "a");
    moved.newPlace = {"/n", "/srv/films/n", "films", "n"};
    add({moved});
    OperationFilter filter;
    filter.pathPrefix = "/srv/films/";
    EXPECT_EQ(found(filter), "/a");
    filter.share = "films";
    filter.pathPrefix = "n";
    EXPECT_EQ(found(filter), "/a");
    filter.pathPrefix = "a";
    EXPECT_EQ(found(filter), "");
}

TEST_F(OperationStoreTest, GivesPages) {
    add({at(1, "anna", "a"), at(2, "anna", "b"), at(2, "anna", "c"), at(2, "anna", "d")});
    OperationFilter filter;
    filter.limit = 2;
    EXPECT_EQ(found(filter), "/d /c +");
    const auto page = searchOperations(filter);
    ASSERT_TRUE(page && page->next);
    filter.before = parseOperationKey(keyText(*page->next));
    EXPECT_EQ(found(filter), "/b /a");
}

TEST_F(OperationStoreTest, KnowsWhatIsStored) {
    OperationRecord record = at(1, "anna", "a");
    record.id = 0;
    EXPECT_EQ(store_->take(7, 10, {record}).valueOr({}).size(), 1U);
    EXPECT_EQ(store_->take(7, 20, {record, at(2, "anna", "b")}).valueOr({}).size(), 1U);
    EXPECT_EQ(store_->taken(7), 20);
    EXPECT_EQ(store_->taken(8), 0);
    EXPECT_EQ(found({}), "/b /a");
    EXPECT_EQ(test::messageOf(store_->forget(7)), "");
    EXPECT_EQ(store_->taken(7), 0);
}

TEST_F(OperationStoreTest, KeepsNoRecordOutWhoseNumberWasTakenBefore) {
    OperationRecord forged = at(1, "anna", "forged");
    OperationRecord real = at(2, "anna", "real");
    real.number = forged.number;
    add({forged});
    EXPECT_EQ(store_->take(1, 2, {real}).valueOr({}).size(), 1U);
    EXPECT_EQ(found({}), "/real /forged");
}

TEST_F(OperationStoreTest, TakesOverTheFirstForm) {
    add({at(1, "anna", "a")});
    store_.reset();
    sqlite3* database = nullptr;
    ASSERT_EQ(sqlite3_open(path_.c_str(), &database), SQLITE_OK);
    const DatabaseOwner owner(database);
    ASSERT_EQ(execute(database, "DROP TABLE holder; DROP INDEX operation_nobody; DROP INDEX operation_number;"
                                "ALTER TABLE operation DROP COLUMN leftout;"
                                "ALTER TABLE operation DROP COLUMN cut;"
                                "CREATE UNIQUE INDEX operation_number ON operation (session, number);"
                                "PRAGMA user_version = 1"),
              SQLITE_OK);
    SetUp();
    add({at(2, "anna", "b")});
    EXPECT_EQ(found({}), "/b /a");
}

TEST_F(OperationStoreTest, RemovesWhatIsTooOld) {
    const auto now = OperationRecord::TimePoint(std::chrono::days(100));
    const auto day = [](int number) {
        return std::chrono::floor<microseconds>(std::chrono::days(number)).count();
    };
    add({at(day(9), "anna", "a"), at(day(11), "anna", "b")});
    EXPECT_EQ(store_->trim({std::chrono::days(90), 0}, now), true);
    EXPECT_EQ(store_->trim({std::chrono::days(90), 0}, now), false);
    EXPECT_EQ(found({}), "/b");
    EXPECT_EQ(store_->trim({std::chrono::days(0), 0}, now), false);
    EXPECT_EQ(found({}), "/b");
}

TEST_F(OperationStoreTest, RemovesTheOldestWhereItIsTooLarge) {
    std::vector<OperationRecord> many;
    for (int i = 0; i < 12000; ++i) {
        many.push_back(at(i + 1, "anna", "a folder with a long name/and a file"));
    }
    add(many);
    const OperationLimits limits{std::chrono::days(0), 1'000'000};
    const auto now = OperationRecord::TimePoint(std::chrono::days(100));
    int rounds = 0;
    while (store_->trim(limits, now).valueOr(false)) {
        ASSERT_LT(++rounds, 10);
    }
    EXPECT_GT(rounds, 0);
    OperationFilter filter;
    filter.limit = 1;
    const auto newest = searchOperations(filter);
    ASSERT_EQ(newest.valueOr({}).records.size(), 1U);
    EXPECT_EQ(newest->records[0].time, OperationRecord::TimePoint(microseconds(12000)));
    filter.until = OperationRecord::TimePoint(microseconds(100));
    EXPECT_EQ(found(filter), "");
}

TEST_F(OperationStoreTest, RefusesADatabaseOfALaterVersion) {
    store_.reset();
    sqlite3* database = nullptr;
    ASSERT_EQ(sqlite3_open(path_.c_str(), &database), SQLITE_OK);
    const DatabaseOwner owner(database);
    ASSERT_EQ(execute(database, "PRAGMA user_version = 99"), SQLITE_OK);
    EXPECT_EQ(test::messageOf(OperationStore::open(path_)),
              "The record of operations " + path_.string() +
                  " has format 99, which this version does not know.");
}

TEST(OperationSearch, FindsNothingWithoutAStore) {
    const test::StateFolder root;
    const auto page = searchOperations({});
    ASSERT_EQ(test::messageOf(page), "");
    EXPECT_TRUE(page->records.empty());
    EXPECT_FALSE(std::filesystem::exists(statePath(paths::operationDatabase)));
}

TEST(OperationSearch, ReadsKeysStrictly) {
    EXPECT_EQ(parseOperationKey("12-3"), (OperationKey{12, 3}));
    for (const char* const text : {"", "12", "12-", "-3", "a-3", "12-3x"}) {
        EXPECT_FALSE(parseOperationKey(text)) << text;
    }
}

TEST(ActivitySettingsFile, IsReadStrictly) {
    const test::StateFolder root;
    EXPECT_EQ(loadActivitySettings().valueOr({}).limits.age, std::chrono::days(90));
    root.write("etc/velt/transfers.conf", "version = 1\nmax_age_days = 7\nmax_size_mb = 5\nrecord = 0\n");
    EXPECT_EQ(loadActivitySettings().valueOr({}).limits.age, std::chrono::days(7));
    EXPECT_EQ(loadActivitySettings().valueOr({}).limits.size, 5'000'000);
    EXPECT_FALSE(loadActivitySettings().valueOr({}).record);
    root.write("etc/velt/transfers.conf", "version = 1\nmax_age_days = -1\n");
    EXPECT_NE(test::messageOf(loadActivitySettings()), "");
}

TEST(ActivitySettingsFile, SaysTheSameToSessions) {
    const test::StateFolder root;
    EXPECT_EQ(velt_may_record(root.path().c_str()), 1);
    for (const std::string line : {"record = 0", "record=0", " record =\t0 # for privacy", "record = 0\r",
                                   "# record = 0", "record = 1", "max_age_days = 0", "record = 1 # = 0"}) {
        root.write("etc/velt/transfers.conf", "version = 1\n" + line + "\nmax_size_mb = 5\n");
        const auto settings = loadActivitySettings();
        ASSERT_EQ(test::messageOf(settings), "") << line;
        EXPECT_EQ(velt_may_record(root.path().c_str()) != 0, settings->record) << line;
    }
}

} // namespace
} // namespace velt
