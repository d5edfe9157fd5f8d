// Loading modules, and calling those that break their contract.

#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/text.h"

namespace {

using velt::host::LoadError;
using velt::host::ModuleTable;
using velt::test::contains;

/// Why the files cannot be loaded together; "" when they can.
std::string reason(const std::vector<std::string>& files) {
    ModuleTable table;
    try {
        for (const std::string& file : files) {
            table.load(file);
        }
        return "";
    } catch (const LoadError& error) {
        return error.what();
    }
}

TEST(Modules, SeveralAreLoaded) {
    ModuleTable table;
    table.load(MODULE_PATH);
    table.load(RUDE_MODULE);
    table.load(COUNTING_MODULE);
    EXPECT_EQ(table.rows().size(), 16U + 6U + 4U);
    ASSERT_NE(table.find("VELT.Core.FileServ.FTP", 3, "get"), nullptr);
    EXPECT_NE(table.find("VELT.Core.FileServ.FTP", 3, "get")->entry,
              table.find("VELT.Core.FileServ.FTP", 2, "get")->entry);
    EXPECT_EQ(table.find("VELT.Core.FileServ.FTP", 4, "get"), nullptr);
}

TEST(Modules, WhatCannotBeLoadedIsNamed) {
    EXPECT_TRUE(contains(reason({"/nowhere/module.so"}), "Cannot load the module: /nowhere/module.so"));
    EXPECT_TRUE(contains(reason({WRONG_NO_TABLE}), " is not a module: it does not export GetAPITable."));
    EXPECT_TRUE(contains(reason({WRONG_NULL_TABLE}), "returns no API table."));
    EXPECT_TRUE(contains(reason({WRONG_INCOMPLETE_ROW}), "Row 2 of the API table of "));
    EXPECT_TRUE(contains(reason({WRONG_UNDEFINED_SYMBOL}), "undefined symbol: VELTNobodyDefinesThis"));
}

TEST(Modules, ARowIsServedOnce) {
    EXPECT_TRUE(
        contains(reason({WRONG_DUPLICATE_ROW}), "The row VELT.Test.Wrong v1 get is served twice: by "));
    const std::string twice = reason({MODULE_PATH, MODULE_PATH});
    EXPECT_TRUE(contains(twice, "VELT.Core.FileServ.FTP v1 get is served twice")) << twice;
}

TEST(Modules, ReadMethodsAreKnownByTheirNames) {
    ModuleTable table;
    table.load(MODULE_PATH);
    std::string reads;
    std::string byGet;
    for (const auto* row : table.rows()) {
        if (row->version == 1 || row->method == "load" || row->method == "save") {
            reads += row->reads() ? row->method + " " : "";
            byGet += row->callableByGet() ? row->method + " " : "";
        }
    }
    EXPECT_EQ(reads, "get list load get get list_ftp_share ");
    EXPECT_EQ(byGet, "get load get get list_ftp_share ");
}

class RudeModule : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
        modules = {RUDE_MODULE};
        start();
    }

    Answer call(const std::string& method, const std::string& body = "") const {
        return post("/api/VELT.Test.Rude/v1/" + method, body);
    }
};

TEST_F(RudeModule, NoAnswerAndTwoAnswersAreErrorsOfTheModule) {
    const Answer none = call("no_answer");
    EXPECT_EQ(none.status, 500);
    EXPECT_TRUE(contains(none.body, "gave 0 answers instead of one"));
    const Answer two = call("two_answers");
    EXPECT_EQ(two.status, 500);
    EXPECT_TRUE(contains(two.body, "gave 2 answers instead of one"));
    EXPECT_TRUE(logged("defect of the module: the entry function gave 2 answers"));
}

TEST_F(RudeModule, WhateverIsThrownIsAnAnswer) {
    const Answer exception = call("throws_exception");
    EXPECT_EQ(exception.status, 500);
    EXPECT_TRUE(contains(exception.body, "threw an exception: out of luck"));
    EXPECT_EQ(exception.json()["request_id"], exception.header("x-request-id"));
    const Answer other = call("throws_int");
    EXPECT_EQ(other.status, 500);
    EXPECT_TRUE(contains(other.body, "threw something other than an exception"));
    EXPECT_EQ(call("parameters").status, 200);
}

TEST_F(RudeModule, ACodeWithoutMeaningIsAFailure) {
    const Answer answer = call("unknown_code");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["code"], 4242);
}

TEST_F(RudeModule, ParametersAreGivenByNameAndAllAtOnce) {
    EXPECT_EQ(call("parameters", R"({"one":1,"two":[2]})").json(),
              Answer({200, {}, R"({"all":{"one":1,"two":[2]},"one":1})"}).json());
    EXPECT_EQ(call("parameters").json(), Answer({200, {}, R"({"all":{},"one":"default"})"}).json());
}

} // namespace
