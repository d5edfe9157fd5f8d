// The administrator log.

#include "host/base/clock.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

using velt::LogEntry;

class HostLogPage : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        access = {};
        settings.workers = 1;
        start();
    }

    void addEntries(int count) {
        for (int i = 1; i <= count; ++i) {
            LogEntry entry;
            entry.id = i;
            entry.time += std::chrono::seconds(i);
            entry.category = 2;
            entry.level = 1;
            entry.event = i % 2 == 0 ? 0x11B00035U : 0x11B00036U;
            entry.texts = {"22", "222", "", ""};
            entry.sentence = "entry " + std::to_string(i);
            entry.actor = i % 3 == 0 ? "ann b" : "root";
            entry.address = "local";
            access.log.push_back(entry);
        }
    }

    std::vector<int> ids(const std::string& query) const {
        std::vector<int> found;
        const Json::Value page = get("/api/log" + query).json();
        for (const Json::Value& entry : page["entries"]) {
            found.push_back(entry["id"].asInt());
        }
        return found;
    }

    FakeStandalone& access = FakeStandalone::instance();
};

TEST_F(HostLogPage, TheLogIsPagedNewestFirst) {
    addEntries(7);
    const Json::Value first = get("/api/log?limit=3").json();
    EXPECT_EQ(first["entries"].size(), 3U);
    EXPECT_EQ(first["next"], 5);
    EXPECT_EQ(ids("?limit=3&before=5"), (std::vector<int>{4, 3, 2}));
    const Json::Value last = get("/api/log?limit=3&before=2").json();
    EXPECT_EQ(last["entries"].size(), 1U);
    EXPECT_TRUE(last["next"].isNull());
    EXPECT_TRUE(get("/api/log?limit=7").json()["next"].isNull());
}

TEST_F(HostLogPage, AnEntryShowsAllOfItself) {
    addEntries(1);
    const Json::Value entry = get("/api/log").json()["entries"][0];
    EXPECT_EQ(entry["time"], "1970-01-01T00:00:01.000Z");
    EXPECT_EQ(entry["event"], "0x11B00036");
    EXPECT_EQ(entry["text"], "entry 1");
    EXPECT_EQ(entry["args"].size(), 4U);
    EXPECT_EQ(entry["args"][1], "222");
    EXPECT_EQ(entry["actor"], "root");
    EXPECT_EQ(entry["address"], "local");
    EXPECT_EQ(entry["category"], 2);
    EXPECT_EQ(entry["level"], 1);
}

TEST_F(HostLogPage, TheLogIsFiltered) {
    addEntries(6);
    EXPECT_EQ(ids("?since=1970-01-01T00:00:05Z"), (std::vector<int>{6, 5}));
    EXPECT_EQ(ids("?event=0x11B00035"), (std::vector<int>{6, 4, 2}));
    EXPECT_EQ(ids("?actor=ann%20b"), (std::vector<int>{6, 3}));
    EXPECT_EQ(ids("?actor=ann+b&event=0x11B00036"), (std::vector<int>{3}));
    EXPECT_EQ(ids("?actor=nobody"), (std::vector<int>{}));
    EXPECT_EQ(ids("?since=&event=&actor="), (std::vector<int>{6, 5, 4, 3, 2, 1}));
}

TEST_F(HostLogPage, AFilterThatIsNoneIsRefused) {
    const std::map<std::string, std::string> wrong{
        {"limit=0", "limit"},         {"limit=1001", "limit"},
        {"limit=x", "limit"},         {"limit=9999999999", "limit"},
        {"before=-1", "before"},      {"before=1.5", "before"},
        {"event=0xZZ", "event"},      {"event=4294967296", "event"},
        {"since=yesterday", "since"}, {"actor=%zz", "actor"},
        {"actor=%", "actor"},         {"actor=%ff", "actor"},
        {"unknown=1", "unknown"},     {"unknown=", "unknown"},
        {"limit=5&Limit=5", "Limit"}, {"=1", ""},
    };
    for (const auto& [query, field] : wrong) {
        const Answer answer = get("/api/log?" + query);
        EXPECT_EQ(answer.status, 400) << query;
        ASSERT_EQ(answer.json()["errors"].size(), 1U) << query;
        EXPECT_EQ(answer.json()["errors"][0]["field"], field) << query;
        EXPECT_EQ(answer.json()["detail"].asString(),
                  field + ": expected " + answer.json()["errors"][0]["expected"].asString() + ".");
    }
    EXPECT_EQ(get("/api/log?limit=1001").json()["errors"][0]["expected"], "a number from 1 to 1000");
}

TEST_F(HostLogPage, APageHoldsAsManyAsTheLogGivesAtOnce) {
    addEntries(1001);
    const Json::Value page = get("/api/log?limit=1000").json();
    EXPECT_EQ(page["entries"].size(), 1000U);
    EXPECT_EQ(page["next"], 2);
    EXPECT_EQ(ids("?limit=1000&before=2"), std::vector<int>{1});
    EXPECT_EQ(access.largestLimit, 1000);
}

TEST_F(HostLogPage, ALogThatCannotBeReadIsAFailure) {
    access.logFails = true;
    access.sentence = "The log cannot be read: disk full.";
    const Answer answer = get("/api/log");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["detail"], "The log cannot be read: disk full.");
}

/// In milliseconds after 1970.
std::int64_t read(const char* text) {
    const auto time = velt::host::parseTimestamp(text).value_or(velt::TimePoint::min());
    return std::chrono::duration_cast<std::chrono::milliseconds>(time.time_since_epoch()).count();
}

TEST(Clock, MomentsAreReadInSeveralForms) {
    EXPECT_EQ(read("1970-01-02"), 86'400'000);
    EXPECT_EQ(read("1970-01-01T00:00:01Z"), 1000);
    EXPECT_EQ(read("1970-01-01T00:00:01.25Z"), 1250);
    EXPECT_EQ(read("12"), 12'000);
    for (const char* text : {"", "x", "1970-01-01T00:00", "1970-01-01T00:00:01+01:00", "-1", "1970-13-01"}) {
        EXPECT_FALSE(velt::host::parseTimestamp(text)) << text;
    }
    EXPECT_EQ(velt::timestamp(velt::TimePoint(std::chrono::milliseconds(1'250))), "1970-01-01T00:00:01.250Z");
}

TEST(Clock, MomentsBeyondTheClockAreItsEnds) {
    EXPECT_GT(read("2262-01-01"), read("2261-12-31"));
    for (const char* text :
         {"2263-01-01", "4050-01-01T00:00:00Z", "9999-12-31T23:59:59.999Z", "99999999999"}) {
        EXPECT_EQ(read(text), read("2262-05-01")) << text;
    }
    EXPECT_EQ(read("0001-01-01"), read("1500-01-01"));
    EXPECT_LT(read("1500-01-01"), read("1700-01-01"));
}

TEST(Clock, MomentsAreInUtcWhateverTheMachinesZoneIs) {
    setenv("TZ", "EST5", 1);
    tzset();
    EXPECT_EQ(read("1970-01-01T00:00:01Z"), 1000);
    EXPECT_EQ(read("1970-01-02"), 86'400'000);
    unsetenv("TZ");
    tzset();
}

} // namespace
