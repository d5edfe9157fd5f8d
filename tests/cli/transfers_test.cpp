// What users did, as administrators see it.
#include "tests/cli/cli_test.h"

#include <algorithm>

namespace {

class TransfersTest : public CliTest {
protected:
    void answer(const std::string& query, const std::string& body, const std::string& link = "") {
        HttpReply reply;
        reply.body = body;
        reply.link = link;
        host.answerWith("GET /api/transfers?" + query, reply);
    }
};

constexpr const char* newest = R"({"next": "7-4", "records": [
    {"time": "2026-11-21T08:00:00.000Z", "user": "anna", "protocol": "sftp", "address": "192.0.2.1",
     "operation": "upload", "result": "incomplete", "reason": "the client left", "octets": 25000000, "rate": 999,
     "path": "/docs/a\nb"},
    {"time": "2026-11-21T07:00:00.000Z", "user": "ben", "protocol": "ftp", "address": "192.0.2.2",
     "operation": "rename", "result": "done", "path": "/a", "new_path": "/b"}]})";
constexpr const char* oldest = R"({"next": null, "records": [
    {"time": "2026-11-20T07:00:00.000Z", "user": "ben", "protocol": "ftp", "address": "192.0.2.2",
     "operation": "delete", "result": "done", "path": "/a"}]})";

} // namespace

TEST_F(TransfersTest, APageIsShownAndTheNextIsNamed) {
    answer("limit=50", newest);
    const RunResult result = run({"transfers"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out,
              "TIME                      USER  PROTOCOL  ADDRESS    OPERATION  RESULT                   "
              "    SIZE   RATE     PATH\n"
              "2026-11-21T08:00:00.000Z  anna  sftp      192.0.2.1  upload     incomplete: the client "
              "left  25 MB  999 B/s  /docs/a\\x0ab\n"
              "2026-11-21T07:00:00.000Z  ben   ftp       192.0.2.2  rename     done                     "
              "                    /a -> /b\n");
    EXPECT_EQ(result.err,
              "For older ones: veltctl transfers --before 7-4 (with the same filters), or --all\n");
    EXPECT_EQ(jsonOf(run({"transfers", "--json"}).out), jsonOf(newest));
}

TEST_F(TransfersTest, ASymbolicLinkIsShownWithItsTarget) {
    answer("limit=50", R"({"next": null, "records": [
        {"time": "x", "operation": "link", "result": "done", "path": "/sl", "detail": "../a"}]})");
    EXPECT_TRUE(run({"transfers"}).out.ends_with("/sl (symbolic link to ../a)\n"));
}

TEST_F(TransfersTest, WhatIsNotWholeAndWhatHasNoRecordIsSaid) {
    answer("limit=50", R"({"next": null, "records": [
        {"time": "x", "operation": "delete", "result": "refused", "reason": "denied", "path": "/long", "cut": true,
         "left_out": 412}]})");
    const std::string out = run({"transfers"}).out;
    EXPECT_TRUE(out.ends_with("  /long...\n")) << out;
    EXPECT_NE(out.find("refused: denied (after 412 refused ones without a record)"), std::string::npos)
        << out;
}

TEST_F(TransfersTest, AllPagesAreJoined) {
    answer("limit=1000", newest);
    answer("limit=1000&before=7-4", oldest);
    const RunResult result = run({"transfers", "--all"});
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(std::count(result.out.begin(), result.out.end(), '\n'), 4);
    const Json::Value json = jsonOf(run({"transfers", "--all", "--json"}).out);
    EXPECT_EQ(json["records"].size(), 3U);
    EXPECT_TRUE(json["next"].isNull());
}

TEST_F(TransfersTest, AServerThatRepeatsAPageIsNotAskedForEver) {
    answer("limit=1000", newest);
    answer("limit=1000&before=7-4", newest);
    EXPECT_EQ(run({"transfers", "--all"}).code, 0);
    EXPECT_EQ(asked().size(), 2U);
    const std::string link = "</api/transfers?before=7-4&format=csv>; rel=\"next\"";
    answer("limit=1000&format=csv", "a\r\n1\r\n", link);
    answer("limit=1000&before=7-4&format=csv", "a\r\n1\r\n", link);
    EXPECT_EQ(run({"transfers", "--all", "--csv"}).code, 0);
    EXPECT_EQ(asked().size(), 4U);
}

TEST_F(TransfersTest, CsvIsHandedOnAndItsTitlesComeOnce) {
    answer("limit=2&format=csv", "title,x\r\n1,a\r\n2,b\r\n",
           "</api/transfers?before=7-2&limit=2&format=csv>; rel=\"next\"");
    answer("limit=2&before=7-2&format=csv", "title,x\r\n3,c\r\n");
    RunResult result = run({"transfers", "--csv", "--limit", "2"});
    EXPECT_EQ(result.out, "title,x\r\n1,a\r\n2,b\r\n");
    EXPECT_NE(result.err.find("--before 7-2"), std::string::npos) << result.err;
    result = run({"transfers", "--csv", "--limit", "2", "--all"});
    EXPECT_EQ(result.out, "title,x\r\n1,a\r\n2,b\r\n3,c\r\n");
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(run({"transfers", "--csv", "--json"}).code, 2);
}

TEST_F(TransfersTest, FiltersAreEncoded) {
    answer("limit=5&user=a%26b&session=s1&share=do%20cs&path=%2Fa&operation=upload%2Cdelete&result=refused"
           "&from=2026-11-21T08%3A00%3A00Z&until=2026-11-22&before=7-4",
           oldest);
    const RunResult result = run({"transfers",
                                  "--user",
                                  "a&b",
                                  "--session",
                                  "s1",
                                  "--share",
                                  "do cs",
                                  "--path",
                                  "/a",
                                  "--operation",
                                  "upload,delete",
                                  "--result",
                                  "refused",
                                  "--from",
                                  "2026-11-21T08:00:00Z",
                                  "--until",
                                  "2026-11-22",
                                  "--before",
                                  "7-4",
                                  "--limit",
                                  "5"});
    EXPECT_EQ(result.code, 0) << result.err;
}

TEST_F(TransfersTest, WhatCannotBeAFilterIsAUsageError) {
    for (const Words& words : {Words{"--from=yesterday"}, Words{"--until=2w"}, Words{"--result=failed"},
                               Words{"--limit=0"}, Words{"--limit=1001"}}) {
        EXPECT_EQ(run({"transfers", words[0]}).code, 2) << words[0];
    }
    EXPECT_TRUE(asked().empty());
}

TEST_F(TransfersTest, ARefusedFilterIsNamed) {
    host.answerWith("GET /api/transfers?limit=50&operation=erase",
                    problemReply(400, R"({"detail": "operation: expected one or several of upload."})"));
    const RunResult result = run({"transfers", "--operation", "erase"});
    EXPECT_EQ(result.code, 3);
    EXPECT_NE(result.err.find("operation: expected one or several of upload."), std::string::npos);
}
