// Requests through the rows of the loaded module, as the framework sends them.

#include "platform/webapi.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <dlfcn.h>
#include <gtest/gtest.h>
#include <json/reader.h>

#include <sstream>
#include <string>
#include <vector>

namespace {

using GetTable = const VELT::APITableRow* (*)();

Json::Value parse(const std::string& text) {
    Json::Value value;
    std::istringstream(text) >> value;
    return value;
}

class Rows : public testing::Test {
protected:
    void SetUp() override {
        platform.reset();
        module_ = dlopen(MODULE_PATH, RTLD_NOW | RTLD_LOCAL);
        ASSERT_NE(module_, nullptr) << dlerror();
        platform.shares["public"] = {"", "/", 1};
        platform.ftpShares = {"homes", "public"};
        platform.users["bob"] = {"Bob", 1000};
        platform.groups["staff"] = 50;
        platform.chrootUsers = {"bob"};
        platform.nonChrootUsers = {"eve"};
        platform.rules = {"user:1000:/public"};
    }
    void TearDown() override {
        EXPECT_EQ(platform.handleErrors(), std::vector<std::string>{});
        EXPECT_EQ(dlclose(module_), 0);
    }

    fake::Answer call(const std::string& api, int version, const std::string& method,
                      const std::string& params = "{}") {
        fake::Request request(parse(params));
        fake::Response response;
        const auto getTable =
            reinterpret_cast<GetTable>(dlsym(module_, "GetAPITable")); // NOLINT(*-reinterpret-cast)
        for (const VELT::APITableRow* row = getTable(); row->api != nullptr; ++row) {
            if (row->api == api && row->version == version && row->method == method) {
                row->entry(&request, &response);
            }
        }
        EXPECT_EQ(response.answers.size(), 1U) << api << " " << version << " " << method;
        return response.answers.empty() ? fake::Answer{} : response.answers.front();
    }

    fake::Platform& platform = fake::Platform::instance();

private:
    void* module_ = nullptr;
};

constexpr char ftp[] = "VELT.Core.FileServ.FTP";
constexpr char security[] = "VELT.Core.FileServ.FTP.Security";
constexpr char chroot[] = "VELT.Core.FileServ.FTP.ChrootUser";
constexpr char sftp[] = "VELT.Core.FileServ.FTP.SFTP";

TEST_F(Rows, EachVersionOfTheFTPSettingsHasItsOwnUtf8Key) {
    platform.conf.support_utf8 = 1;
    const Json::Value first = call(ftp, 1, "get").data;
    const Json::Value second = call(ftp, 2, "get").data;
    const Json::Value third = call(ftp, 3, "get").data;
    EXPECT_EQ(first["enable_utf8"], true);
    EXPECT_EQ(second["use_utf8"], false);
    EXPECT_EQ(third["utf8_mode"], 1);
    EXPECT_FALSE(first.isMember("use_utf8") || first.isMember("utf8_mode"));
    EXPECT_FALSE(second.isMember("enable_utf8") || second.isMember("utf8_mode"));
    EXPECT_FALSE(third.isMember("enable_utf8") || third.isMember("use_utf8"));
}

TEST_F(Rows, EachVersionOfTheFTPSetReadsItsOwnUtf8Key) {
    const std::string all =
        R"({"enable_ftp":true,"enable_ftps":false,"enable_utf8":true,"use_utf8":9,"utf8_mode":9})";
    EXPECT_TRUE(call(ftp, 1, "set", all).success);
    EXPECT_EQ(platform.conf.support_utf8, 1);
    EXPECT_EQ(platform.conf.service_flags, 1);
    const std::string used =
        R"({"enable_ftp":true,"enable_ftps":false,"enable_utf8":9,"use_utf8":true,"utf8_mode":9})";
    EXPECT_TRUE(call(ftp, 2, "set", used).success);
    EXPECT_EQ(platform.useUtf8, 1);
    const std::string mode =
        R"({"enable_ftp":true,"enable_ftps":false,"enable_utf8":9,"use_utf8":9,"utf8_mode":0})";
    EXPECT_TRUE(call(ftp, 3, "set", mode).success);
    EXPECT_EQ(platform.conf.support_utf8, 0);
    EXPECT_EQ(platform.useUtf8, 0);
}

TEST_F(Rows, SecurityIsReadAndSet) {
    EXPECT_TRUE(call(security, 1, "set", R"({"anonymous":true})").success);
    EXPECT_EQ(call(security, 1, "get").data["anonymous"], true);
    EXPECT_EQ(call(security, 1, "list_ftp_share").data, parse(R"({"share":["public"]})"));
}

TEST_F(Rows, VersionOneOfTheChrootAPIServesUsers) {
    EXPECT_EQ(call(chroot, 1, "list", R"({"chroot":true})").data,
              parse(R"({"total":1,"user":[{"id":"bob","name":"bob","descr":"Bob"}]})"));
    EXPECT_EQ(call(chroot, 1, "add", R"({"id":["eve"]})").data, parse(R"({"chrootuser_id":["eve"]})"));
    EXPECT_TRUE(call(chroot, 1, "delete", R"({"id":["eve","bob"]})").success);
    EXPECT_EQ(call(chroot, 1, "list", R"({"chroot":true})").data, parse(R"({"total":0,"user":[]})"));
}

TEST_F(Rows, VersionTwoOfTheChrootAPIServesRules) {
    const Json::Value loaded = call(chroot, 2, "load").data;
    EXPECT_EQ(loaded, parse(R"({"total":1,"rules":[
        {"name":"bob","type":"user","path":"/public","path_exist":true}]})"));
    EXPECT_TRUE(
        call(chroot, 2, "save", R"({"rules":[{"name":"staff","type":"group","path":"/home"}]})").success);
    EXPECT_EQ(platform.rules, std::vector<std::string>{"group:50:/home"});
}

TEST_F(Rows, SFTPIsReadAndSet) {
    EXPECT_TRUE(call(sftp, 1, "set", R"({"enable":true,"portnum":2222})").success);
    EXPECT_EQ(call(sftp, 1, "get").data["portnum"], 2222U);
}

TEST_F(Rows, ARefusedRequestIsAnsweredWithItsCode) {
    const fake::Answer answer = call(sftp, 1, "set", R"({"enable":true,"portnum":0})");
    EXPECT_FALSE(answer.success);
    EXPECT_EQ(answer.code, 1901);
    EXPECT_TRUE(answer.data.isNull());
}

TEST_F(Rows, AnExceptionOfTheFrameworkReachesTheFramework) {
    platform.throwFrom("APIRequest::GetParam");
    EXPECT_THROW(call(sftp, 1, "set"), fake::Thrown);
}

} // namespace
