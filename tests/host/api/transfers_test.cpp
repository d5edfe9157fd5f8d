// What sessions did, in all forms.

#include "host/base/json.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <sstream>

namespace {

using std::chrono::microseconds;
using std::chrono::system_clock;
using velt::Operation;
using velt::OperationRecord;
using velt::OperationResult;
using velt::host::toJson;

constexpr const char* titles =
    "time,operation,result,reason,protocol,user,account,address,session,number,path,server_path,share,"
    "share_path,new_path,new_server_path,new_share,new_share_path,detail,octets,octets_in,octets_out,"
    "duration_us,rate,left_out,cut,escaped\r\n";

class HostTransfers : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        fake = {};
        start();
    }

    static OperationRecord upload() {
        OperationRecord record;
        record.id = 42;
        record.time = system_clock::time_point(microseconds(1'800'000'000'123'456));
        record.operation = Operation::upload;
        record.session = "s1";
        record.number = 3;
        record.protocol = velt::SessionProtocol::sftp;
        record.user = "anna";
        record.account = "anna";
        record.address = "192.0.2.1";
        record.place = {"/docs/a", "/srv/docs/a", "docs", "a"};
        record.octets = 3'000'000'000;
        record.duration = microseconds(1'500'000);
        return record;
    }

    /// The CSV line of an upload by a user of that name, from the user's cell to the next.
    std::string userCell(const std::string& name) {
        fake.operations = {upload()};
        fake.operations[0].user = name;
        const std::string csv = get("/api/transfers?format=csv").body;
        const std::string before = ",done,,sftp,";
        const auto begin = csv.find(before) + before.size();
        return csv.substr(begin, csv.find(",anna,192.0.2.1", begin) - begin);
    }

    FakeStandalone& fake = FakeStandalone::instance();
};

TEST_F(HostTransfers, TellAllOfARecord) {
    OperationRecord rename = upload();
    rename.id = 41;
    rename.operation = Operation::rename;
    rename.result = OperationResult::refused;
    rename.reason = "it is kept";
    rename.octets.reset();
    rename.duration.reset();
    rename.newPlace = {"/docs/%FF", "/srv/docs/%FF", "docs", "%FF"};
    rename.detail = "x";
    rename.escaped = true;
    rename.cut = true;
    rename.leftOut = 7;
    OperationRecord closed;
    closed.operation = Operation::sessionClosed;
    closed.octetsIn = 5;
    closed.octetsOut = 0;
    fake.operations = {upload(), rename, closed};
    const Json::Value page = ask("GET", "/api/transfers", viewer).json();
    EXPECT_TRUE(page["next"].isNull());
    ASSERT_EQ(page["records"].size(), 3U);
    Json::Value expected;
    for (const auto& [key, value] :
         {std::pair("time", "2027-01-15T08:00:00.123Z"), std::pair("operation", "upload"),
          std::pair("result", "done"), std::pair("protocol", "sftp"), std::pair("user", "anna"),
          std::pair("account", "anna"), std::pair("address", "192.0.2.1"), std::pair("session", "s1"),
          std::pair("path", "/docs/a"), std::pair("server_path", "/srv/docs/a"), std::pair("share", "docs"),
          std::pair("share_path", "a")}) {
        expected[key] = value;
    }
    expected["number"] = 3;
    Json::Value expectedRename = expected;
    expected["octets"] = Json::UInt64{3'000'000'000};
    expected["duration_us"] = 1'500'000;
    expected["rate"] = Json::UInt64{2'000'000'000};
    EXPECT_EQ(toJson(page["records"][0]), toJson(expected));
    expectedRename["operation"] = "rename";
    expectedRename["result"] = "refused";
    expectedRename["reason"] = "it is kept";
    expectedRename["new_path"] = "/docs/%FF";
    expectedRename["new_server_path"] = "/srv/docs/%FF";
    expectedRename["new_share"] = "docs";
    expectedRename["new_share_path"] = "%FF";
    expectedRename["detail"] = "x";
    expectedRename["escaped"] = true;
    expectedRename["cut"] = true;
    expectedRename["left_out"] = 7;
    EXPECT_EQ(toJson(page["records"][1]), toJson(expectedRename));
    EXPECT_EQ(page["records"][2]["octets_in"], 5);
    EXPECT_EQ(page["records"][2]["octets_out"], 0);
    EXPECT_FALSE(page["records"][2].isMember("rate"));
}

TEST_F(HostTransfers, AreFiltered) {
    EXPECT_EQ(get("/api/transfers?user=an%20na&session=s1&share=docs&path=%2Fa&operation=upload,delete"
                  "&result=incomplete&from=2027-01-15&until=2027-01-15T08:00:00.5Z&before=99-42&limit=7")
                  .status,
              200);
    const velt::OperationFilter& asked = fake.askedOperations;
    EXPECT_EQ(asked.user, "an na");
    EXPECT_EQ(asked.session, "s1");
    EXPECT_EQ(asked.share, "docs");
    EXPECT_EQ(asked.pathPrefix, "/a");
    EXPECT_EQ(asked.operations, (std::vector{Operation::upload, Operation::remove}));
    EXPECT_EQ(asked.result, OperationResult::incomplete);
    EXPECT_EQ(asked.from, system_clock::time_point(std::chrono::seconds(1'799'971'200)));
    EXPECT_EQ(asked.until, system_clock::time_point(std::chrono::milliseconds(1'800'000'000'500)));
    EXPECT_EQ(asked.before, (velt::OperationKey{99, 42}));
    EXPECT_EQ(asked.limit, 7);
}

TEST_F(HostTransfers, EmptyFiltersLetEverythingThrough) {
    EXPECT_EQ(get("/api/transfers?user=&operation=&from=&before=&limit=").status, 200);
    const velt::OperationFilter& asked = fake.askedOperations;
    EXPECT_FALSE(asked.user || asked.from || asked.before || asked.until || asked.result);
    EXPECT_TRUE(asked.operations.empty());
    EXPECT_EQ(asked.limit, 100);
}

TEST_F(HostTransfers, AFilterThatIsNoneIsRefused) {
    for (const auto& [query, field] :
         {std::pair("operation=upload,erase", "operation"), std::pair("operation=,", "operation"),
          std::pair("operation=Upload", "operation"), std::pair("result=failed", "result"),
          std::pair("from=yesterday", "from"), std::pair("until=x", "until"), std::pair("before=x", "before"),
          std::pair("limit=0", "limit"), std::pair("limit=1001", "limit"), std::pair("limit=-1", "limit"),
          std::pair("limit=99999999999999999999", "limit"), std::pair("limit=1.5", "limit"),
          std::pair("format=xml", "format"), std::pair("format=", "format"), std::pair("user=%ff", "user"),
          std::pair("path=%00", "path"), std::pair("user=a&user=b", "user"),
          std::pair("address=x", "address")}) {
        const Answer answer = get(std::string("/api/transfers?") + query);
        EXPECT_EQ(answer.status, 400) << query;
        EXPECT_EQ(answer.json()["errors"][0]["field"], field) << query;
    }
}

TEST_F(HostTransfers, ArePagedInEveryForm) {
    for (int id = 5; id > 0; --id) {
        OperationRecord record = upload();
        record.id = id;
        record.number = id;
        fake.operations.push_back(record);
    }
    const Answer first = get("/api/transfers?limit=2&user=an%26na");
    EXPECT_EQ(first.json()["next"], "7-4");
    EXPECT_EQ(first.header("link"), "</api/transfers?before=7-4&limit=2&user=an%26na>; rel=\"next\"");
    const Answer second = get("/api/transfers?before=7-4&limit=2&format=jsonl");
    EXPECT_EQ(second.header("link"), "</api/transfers?before=7-2&limit=2&format=jsonl>; rel=\"next\"");
    const Answer last = get("/api/transfers?before=7-2&limit=2&format=csv");
    EXPECT_EQ(last.header("link"), "");
    EXPECT_NE(last.body.find(",s1,1,"), std::string::npos);
    EXPECT_EQ(last.body.find(",s1,2,"), std::string::npos);
}

TEST_F(HostTransfers, AreJsonLinesWhereAskedFor) {
    fake.operations = {upload(), upload()};
    fake.operations[1].user = "be\nn";
    for (const auto& [query, header] :
         {std::pair("?format=jsonl", ""), std::pair("", "Accept: application/x-ndjson\r\n"),
          std::pair("", "Accept: text/html, Application/X-NDJSON ;q=0.5, text/csv\r\n"),
          std::pair("?format=jsonl", "Accept: text/csv\r\n")}) {
        const Answer answer = ask("GET", std::string("/api/transfers") + query, admin + header);
        EXPECT_EQ(answer.header("content-type"), "application/x-ndjson");
        std::istringstream lines(answer.body);
        std::vector<std::string> users;
        for (std::string line; std::getline(lines, line);) {
            Answer one;
            one.body = line;
            users.push_back(one.json()["user"].asString());
        }
        EXPECT_EQ(users, (std::vector<std::string>{"anna", "be\nn"}));
    }
    EXPECT_EQ(ask("GET", "/api/transfers", admin + "Accept: */*\r\n").header("content-type"),
              "application/json");
}

TEST_F(HostTransfers, AreCsvWhereAskedFor) {
    EXPECT_EQ(get("/api/transfers?format=csv").body, titles);
    fake.operations = {upload()};
    const Answer answer = ask("GET", "/api/transfers", admin + "Accept: text/csv\r\n");
    EXPECT_EQ(answer.header("content-type"), "text/csv; charset=utf-8; header=present");
    EXPECT_EQ(answer.body, std::string(titles) +
                               "2027-01-15T08:00:00.123Z,upload,done,,sftp,anna,anna,192.0.2.1,s1,3,"
                               "/docs/a,/srv/docs/a,docs,a,,,,,,3000000000,,,1500000,2000000000,,,\r\n");
}

TEST_F(HostTransfers, ACsvCellIsQuotedWhereItHasTo) {
    EXPECT_EQ(userCell("an na"), "an na");
    EXPECT_EQ(userCell("a,b"), "\"a,b\"");
    EXPECT_EQ(userCell("a\"b"), "\"a\"\"b\"");
    EXPECT_EQ(userCell("a\r\nb\tc"), "a\\x0d\\x0ab\\x09c") << "no line of its own";
    EXPECT_EQ(userCell("\x1b[31m"), "\\x1b[31m") << "for a terminal";
    EXPECT_EQ(userCell("Ä"), "Ä");
}

TEST_F(HostTransfers, NoCsvCellIsAFormula) {
    EXPECT_EQ(userCell("=1+1"), "'=1+1");
    EXPECT_EQ(userCell("+1"), "'+1");
    EXPECT_EQ(userCell("-1"), "'-1");
    EXPECT_EQ(userCell("@SUM(A1)"), "'@SUM(A1)");
    EXPECT_EQ(userCell("  =1"), "  '=1");
    EXPECT_EQ(userCell("'=1"), "''=1") << "so that what was there is known";
    EXPECT_EQ(userCell("\uFF1D1"), "'\uFF1D1");
    EXPECT_EQ(userCell("a;=1"), "\"a;'=1\"") << "where the semicolon separates";
    EXPECT_EQ(userCell("a;\"=1"), "\"a;\"\"'=1\"");
    EXPECT_EQ(userCell("a=b-c@d"), "a=b-c@d");
    EXPECT_EQ(userCell("\t=1"), "\\x09=1");
}

TEST_F(HostTransfers, ThatCannotBeSearchedAreAFailure) {
    fake.sentence = "The store is damaged.";
    fake.operationsFail = true;
    const Answer answer = get("/api/transfers?format=csv");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["detail"], "The store is damaged.");
}

} // namespace
