// The base of the handlers: one error code, one answer.

#include "handler/handler.h"

#include "chroot/chroot.h"
#include "chroot/chrootuser.h"
#include "ftp/ftp.h"
#include "handler/log.h"
#include "security/security.h"
#include "sftp/sftp.h"
#include "tests/support/handler_test.h"

#include <type_traits>

namespace {

class Handler : public HandlerTest {
protected:
    fake::Request request;
    fake::Response response;
    ServiceHandler handler{&request, &response};
};

/// A handler class whose version can be seen.
template<typename Base> class Opened : public Base {
public:
    using Base::Base;
    using Base::version_;
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
    EXPECT_FALSE(std::is_polymorphic_v<FTPServiceHandler>);
    EXPECT_FALSE(std::is_polymorphic_v<FTPSecurityServiceHandler>);
    EXPECT_FALSE(std::is_polymorphic_v<FTPChrootUserServiceHandler>);
    EXPECT_FALSE(std::is_polymorphic_v<FTPChrootServiceHandler>);
    EXPECT_FALSE(std::is_polymorphic_v<SFTPServiceHandler>);
}

TEST_F(Handler, ServesVersion1WhenNoneIsGiven) {
    EXPECT_EQ(Opened<FTPServiceHandler>(&request, &response).version_, 1);
    EXPECT_EQ(Opened<FTPSecurityServiceHandler>(&request, &response).version_, 1);
    EXPECT_EQ(Opened<FTPChrootUserServiceHandler>(&request, &response).version_, 1);
    EXPECT_EQ(Opened<FTPChrootServiceHandler>(&request, &response).version_, 1);
    EXPECT_EQ(Opened<SFTPServiceHandler>(&request, &response).version_, 1);
}

TEST_F(Handler, ServesTheVersionThatIsGiven) {
    EXPECT_EQ(Opened<FTPServiceHandler>(&request, &response, 3).version_, 3);
    EXPECT_EQ(Opened<SFTPServiceHandler>(&request, &response, 3).version_, 3);
}

TEST_F(Handler, OfSFTPAnswersTheRequestWhateverItsVersion) {
    SFTPServiceHandler(&request, &response, 3).Get();
    EXPECT_EQ(platform.journal, (Lines{"VELTSFTPConfigGet(1)", "VELTSFTPIsAlive()",
                                       succeeded(R"({"enable":false,"portnum":22})")}));
}

TEST(SourceName, IsTheFileWithoutFolderAndExtension) {
    EXPECT_STREQ(velt::sourceName("a/b/chrootuser.cpp").data(), "chrootuser");
    EXPECT_STREQ(velt::sourceName("ftp.cpp").data(), "ftp");
    EXPECT_STREQ(velt::sourceName("/x.y/plain").data(), "plain");
}

} // namespace
