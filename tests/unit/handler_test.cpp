// The base of the handlers: one error code, one answer.

#include "handler/handler.h"

#include "handler/log.h"
#include "tests/support/handler_test.h"

#include <type_traits>

namespace {

class Handler : public HandlerTest {
protected:
    fake::Request request;
    fake::Response response;
    ServiceHandler handler{&request, &response};
};

TEST_F(Handler, FailsWithTheFirstCodeThatWasSet) {
    handler.SetError(1901);
    handler.SetError(1902);
    handler.ReportError();
    EXPECT_EQ(platform.journal, (Lines{"APIResponse::SetError(1901, null)"}));
}

TEST_F(Handler, FailsWith1902AndALogLineWhenNoCodeWasSet) {
    handler.ReportError();
    EXPECT_EQ(platform.journal,
              (Lines{logLine("handler", "There is no error setup"), "APIResponse::SetError(1902, null)"}));
}

TEST_F(Handler, KeepsTheDefaultCodeOnceItIsReported) {
    handler.ReportError();
    handler.SetError(1901);
    platform.journal.clear();
    handler.ReportError();
    EXPECT_EQ(platform.journal, (Lines{"APIResponse::SetError(1902, null)"}));
}

TEST_F(Handler, HandsTheDataOfAFailureOn) {
    Json::Value data = json(R"({"port":21})");
    handler.SetError(1903);
    handler.ReportError(data);
    EXPECT_EQ(platform.journal, (Lines{R"(APIResponse::SetError(1903, {"port":21}))"}));
}

TEST_F(Handler, LogsAMissingCodeAlsoWhenAFailureHasData) {
    Json::Value data(7);
    handler.ReportError(data);
    EXPECT_EQ(platform.journal,
              (Lines{logLine("handler", "There is no error setup"), "APIResponse::SetError(1902, 7)"}));
}

TEST_F(Handler, SucceedsWithNullWhenThereIsNoData) {
    handler.ReportSuccess();
    EXPECT_EQ(platform.journal, (Lines{"APIResponse::SetSuccess(null)"}));
}

TEST_F(Handler, SucceedsWithItsData) {
    handler.ReportSuccess(json(R"({"total":0})"));
    EXPECT_EQ(platform.journal, (Lines{R"(APIResponse::SetSuccess({"total":0}))"}));
}

TEST_F(Handler, HasNoVirtualOperations) {
    EXPECT_FALSE(std::is_polymorphic_v<ServiceHandler>);
}

TEST(SourceName, IsTheFileWithoutFolderAndExtension) {
    EXPECT_STREQ(velt::sourceName("a/b/chrootuser.cpp").data(), "chrootuser");
    EXPECT_STREQ(velt::sourceName("ftp.cpp").data(), "ftp");
    EXPECT_STREQ(velt::sourceName("/x.y/plain").data(), "plain");
}

} // namespace
