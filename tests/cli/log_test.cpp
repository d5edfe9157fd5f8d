#include "cli/http_client.h"
#include "cli/time_text.h"
#include "tests/cli/cli_test.h"

#include <ctime>

namespace {

class LogTest : public CliTest {
protected:
    void answer(const std::string& query, const std::string& body) {
        host.answerWith("GET /api/log?" + query, HttpReply{200, body, "application/json", false, false});
    }
};

constexpr const char* firstPage =
    R"({"entries": [{"id": 9, "time": "2026-11-21T08:00:00Z", "category": 2, "level": 1,
    "event": "0x11B00012", "text": "FTP port changed from 21 to 2121", "args": ["21", "2121"], "actor": "root",
    "address": "unix"}], "next": 9})";
constexpr const char* lastPage = R"({"entries": [{"id": 4, "time": 0, "event": "0x11B00002", "text": "a\nb",
    "actor": "", "address": ""}], "next": null})";

} // namespace

TEST_F(LogTest, OnePageIsShownAndTheNextIsNamed) {
    answer("limit=50", firstPage);
    const RunResult result = run({"log"});
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out,
              "ID  TIME                  EVENT       ACTOR  ADDRESS  TEXT\n"
              "9   2026-11-21T08:00:00Z  0x11B00012  root   unix     FTP port changed from 21 to 2121\n");
    EXPECT_NE(result.err.find("veltctl log --before 9"), std::string::npos) << result.err;
}

TEST_F(LogTest, AllPagesAreJoined) {
    answer("limit=1", firstPage);
    answer("limit=1&before=9", lastPage);
    const RunResult result = run({"log", "--limit", "1", "--all"});
    EXPECT_EQ(result.err, "");
    EXPECT_NE(result.out.find("\n4   1970-01-01T00:00:00Z  0x11B00002                  a\\x0ab\n"),
              std::string::npos)
        << result.out;
    const Json::Value json = jsonOf(run({"log", "--limit", "1", "--all", "--json"}).out);
    EXPECT_EQ(json["entries"].size(), 2U);
    EXPECT_TRUE(json["next"].isNull());
    EXPECT_EQ(jsonOf(run({"log", "--limit", "1", "--json"}).out)["next"], 9);
}

TEST_F(LogTest, AServerThatRepeatsAPageIsNotAskedForEver) {
    answer("limit=1", firstPage);
    answer("limit=1&before=9", firstPage);
    EXPECT_EQ(run({"log", "--limit", "1", "--all"}).code, 0);
    EXPECT_EQ(asked().size(), 2U);
}

TEST_F(LogTest, FiltersAreEncoded) {
    answer("limit=5&since=2026-11-21T08%3A00%3A00%2B01%3A00&event=0x11B00012&actor=a%26b%20c&before=7",
           lastPage);
    EXPECT_EQ(run({"log", "--since", "2026-11-21T08:00:00+01:00", "--event", "0x11B00012", "--actor", "a&b c",
                   "--before", "7", "--limit", "5"})
                  .code,
              0);
}

TEST_F(LogTest, AnAgeBecomesATime) {
    run({"log", "--since", "2h"});
    const std::string target = asked().at(0);
    const std::string before = velt::cli::percentEncode(velt::cli::utcText(std::time(nullptr) - 7200));
    EXPECT_EQ(target.substr(0, 36), "GET /api/log?limit=50&since=" + before.substr(0, 8)) << target;
}

TEST_F(LogTest, AnInvalidTimeIsAUsageError) {
    for (const char* time : {"yesterday", "2w", "h", "-3h", "2026", "26-11-2021"}) {
        EXPECT_EQ(run({"log", std::string("--since=") + time}).code, 2) << time;
    }
    EXPECT_EQ(run({"log", "--limit", "0"}).code, 2);
    EXPECT_EQ(run({"log", "--limit", "1001"}).code, 2);
    EXPECT_EQ(run({"log", "--follow", "--all"}).code, 2);
    EXPECT_EQ(run({"log", "--follow", "--before", "5"}).code, 2);
    EXPECT_TRUE(asked().empty());
}
