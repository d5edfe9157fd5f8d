// Tokens over the API, and their file.

#include "base/sha256.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <sys/stat.h>
#include <unistd.h>

#include <fstream>
#include <iterator>
#include <sstream>

namespace {

class HostTokens : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
        settings.workers = 1;
    }
};

TEST_F(HostTokens, TokensAreListedMadeAndRemoved) {
    start();
    const Answer made = post("/api/tokens", R"({"name":"bench","role":"viewer"})");
    EXPECT_EQ(made.status, 201);
    const Json::Value token = made.json();
    EXPECT_EQ(token["role"], "viewer");
    const std::string header = "Authorization: Bearer " + token["token"].asString() + "\r\n";
    EXPECT_EQ(ask("GET", "/healthz", header).status, 200);
    const Json::Value list = get("/api/tokens").json()["tokens"];
    ASSERT_EQ(list.size(), 3U);
    EXPECT_EQ(list[2]["name"], "bench");
    EXPECT_EQ(list[2].getMemberNames(), (std::vector<std::string>{"created", "id", "name", "role"}));
    EXPECT_EQ(ask("DELETE", "/api/tokens/" + token["id"].asString(), admin).status, 204);
    EXPECT_EQ(ask("GET", "/healthz", header).status, 401);
    EXPECT_EQ(ask("DELETE", "/api/tokens/" + token["id"].asString(), admin).status, 404);
}

TEST_F(HostTokens, WhatBecomesOfTokensIsWrittenDownWithoutTheirSecret) {
    start();
    const Json::Value token = post("/api/tokens", R"({"name":"bench","role":"viewer"})").json();
    const std::string id = token["id"].asString();
    ASSERT_EQ(ask("DELETE", "/api/tokens/" + id, admin).status, 204);
    ASSERT_EQ(ask("DELETE", "/api/tokens/" + id, admin).status, 404);
    const FakeStandalone& fake = FakeStandalone::instance();
    EXPECT_EQ(fake.audit, (std::vector<std::string>{"bench: viewer: " + id, "bench: viewer: " + id}));
    EXPECT_EQ(fake.actor, "admin");
    EXPECT_EQ(fake.address, "127.0.0.1");
}

TEST_F(HostTokens, AnEntryThatCannotBeWrittenTakesNothingBack) {
    start();
    FakeStandalone::instance().logFails = true;
    FakeStandalone::instance().sentence = "The disk is full.";
    EXPECT_EQ(post("/api/tokens", R"({"name":"bench","role":"viewer"})").status, 201);
    EXPECT_TRUE(logged("The disk is full."));
}

TEST_F(HostTokens, ADryRunMakesAndDeletesNone) {
    start();
    const std::string bench = R"({"name":"bench","role":"viewer"})";
    const Answer made = post("/api/tokens?dry_run=true", bench);
    EXPECT_EQ(made.status, 200);
    EXPECT_EQ(made.json()["effects"][0]["subject"], "tokens");
    EXPECT_EQ(made.json()["effects"][1]["subject"], "bench: viewer: not known yet");
    EXPECT_FALSE(made.json().isMember("token"));
    EXPECT_EQ(post("/api/tokens?dry_run=true", R"({"name":"","role":"viewer"})").status, 422);
    const std::string id = get("/api/tokens").json()["tokens"][1]["id"].asString();
    EXPECT_EQ(ask("DELETE", "/api/tokens/" + id + "?dry_run=true", admin).json()["dry_run"], true);
    EXPECT_EQ(ask("DELETE", "/api/tokens/absent?dry_run=true", admin).status, 404);
    for (const char* query : {"?dry_run=maybe", "?sessions=keep"}) {
        EXPECT_EQ(post(std::string("/api/tokens") + query, bench).status, 400);
        EXPECT_EQ(ask("DELETE", "/api/tokens/" + id + query, admin).status, 400);
    }
    EXPECT_EQ(get("/api/tokens").json()["tokens"].size(), 2U);
    EXPECT_TRUE(FakeStandalone::instance().audit.empty());
}

TEST_F(HostTokens, OnlyATokensOwnPathRemovesIt) {
    start();
    const std::string id = post("/api/tokens", R"({"name":"bench","role":"viewer"})").json()["id"].asString();
    const std::string path = "/api/tokens/";
    for (const std::string& target : {path + "a/" + id, path + id + "/", path + "/" + id, path + "a%2F" + id,
                                      path + "../tokens/" + id, path, path + id + "%00", path + "*"}) {
        EXPECT_EQ(ask("DELETE", target, admin).status, 404) << target;
    }
    EXPECT_EQ(get("/api/tokens").json()["tokens"].size(), 3U);
    std::ostringstream escaped;
    escaped << path << '%' << std::hex << static_cast<int>(id[0]) << id.substr(1);
    EXPECT_EQ(ask("DELETE", escaped.str(), admin).status, 204) << escaped.str();
}

TEST_F(HostTokens, ATokenNeedsANameAndARole) {
    start();
    for (const char* body : {"{}",
                             R"({"name":"x"})",
                             R"({"name":"","role":"admin"})",
                             R"({"name":7,"role":"admin"})",
                             R"({"name":"x","role":"root"})",
                             R"({"name":"a\nb","role":"admin"})",
                             R"({"name":"a\u007f","role":"admin"})",
                             R"({"name":"\u0080","role":"admin"})",
                             R"({"name":"a\u009bb","role":"admin"})",
                             R"({"name":"\u202a","role":"admin"})",
                             R"({"name":"a\u202eb","role":"admin"})",
                             R"({"name":"a\u200bb","role":"admin"})",
                             R"({"name":"a\u00adb","role":"admin"})",
                             R"({"name":"a\u061cb","role":"admin"})",
                             R"({"name":"\ufeffa","role":"admin"})",
                             R"({"name":"a\udb40\udc41","role":"admin"})",
                             R"({"name":"\u2066","role":"admin"})",
                             R"({"name":"a\u2069","role":"admin"})",
                             R"({"name":"\u3164","role":"admin"})",
                             R"({"name":"a\u115f","role":"admin"})",
                             R"({"name":"a\u2800b","role":"admin"})",
                             R"({"name":"a\u034fb","role":"admin"})",
                             R"({"name":"a\ufe0f","role":"admin"})",
                             R"({"name":"a\udb40\udd00","role":"admin"})",
                             R"({"name":"a\u00a0b","role":"admin"})",
                             R"({"name":"\u200a","role":"admin"})",
                             R"({"name":" ","role":"admin"})",
                             R"({"name":" a","role":"admin"})",
                             R"({"name":"a ","role":"admin"})",
                             R"({"name":"a  b","role":"admin"})"}) {
        EXPECT_EQ(post("/api/tokens", body).status, 422) << body;
    }
    EXPECT_EQ(post("/api/tokens", "[").status, 400);
    EXPECT_EQ(get("/api/tokens").json()["tokens"].size(), 2U);
    for (const char* body : {R"({"name":"\u2010\u2027 \u2070","role":"admin"})",
                             R"({"name":"Zo\u00eb, \u05d0","role":"admin"})"}) {
        EXPECT_EQ(post("/api/tokens", body).status, 201) << body;
    }
}

TEST_F(HostTokens, NoTwoTokensHaveOneName) {
    start();
    const std::string body = R"({"name":"bench","role":"viewer"})";
    ASSERT_EQ(post("/api/tokens", body).status, 201);
    EXPECT_EQ(post("/api/tokens?dry_run=true", body).status, 409);
    const Answer again = post("/api/tokens", body);
    EXPECT_EQ(again.status, 409);
    EXPECT_EQ(again.json()["detail"], "There is a token of this name. Delete it, or choose another name. "
                                      "No token was created.");
    EXPECT_EQ(get("/api/tokens").json()["tokens"].size(), 3U) << "two of the test's own";
}

TEST_F(HostTokens, OnlyHashesOfTokensAreStored) {
    start();
    std::ifstream stream(settings.tokenFile);
    const std::string text{std::istreambuf_iterator<char>(stream), {}};
    const std::string token = admin.substr(22, admin.size() - 24);
    EXPECT_EQ(token.size(), 5U + 64U);
    EXPECT_EQ(text.find(token.substr(5, 16)), std::string::npos) << "nor a part of it";
    EXPECT_NE(text.find("\"" + velt::sha256(token) + "\""), std::string::npos);
    struct stat status {};
    ASSERT_EQ(stat(settings.tokenFile.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777U, 0600U);
}

TEST_F(HostTokens, TokensOutliveTheHost) {
    start();
    const std::string before = admin;
    stop();
    start();
    EXPECT_EQ(ask("GET", "/healthz", before).status, 200);
}

TEST_F(HostTokens, ADamagedTokenFileStopsTheStart) {
    std::filesystem::create_directories(settings.tokenFile.parent_path());
    for (const char* text : {"{", "{}", R"({"tokens":[{"id":"1"}]})", R"({"tokens":[7]})"}) {
        std::ofstream(settings.tokenFile) << text;
        EXPECT_THROW(start(), velt::host::TokenError) << text;
    }
    std::filesystem::remove(settings.tokenFile);
    std::filesystem::create_directories(settings.tokenFile);
    EXPECT_THROW(start(), velt::host::TokenError) << "a folder";
}

TEST_F(HostTokens, ATokenFileThatOthersCouldHaveWrittenStopsTheStart) {
    start();
    stop();
    const auto refusal = [this]() -> std::string {
        try {
            start();
        } catch (const velt::host::TokenError& error) {
            return error.what();
        }
        stop();
        return "";
    };
    const std::string file = settings.tokenFile.string();
    const std::string advice = " Correct that, or remove it and make new tokens.";
    for (const mode_t mode : {0620U, 0602U, 0666U}) {
        ASSERT_EQ(chmod(file.c_str(), mode), 0);
        EXPECT_EQ(refusal(), "The token file " + file +
                                 " belongs to another account, or other accounts may write to it." + advice)
            << mode;
    }
    ASSERT_EQ(chmod(file.c_str(), 0600), 0);
    const auto target = folder / "planted.json";
    std::filesystem::rename(file, target);
    std::filesystem::create_symlink(target, file);
    EXPECT_NE(refusal(), "") << "a link";
    std::filesystem::rename(target, file);
    EXPECT_EQ(refusal(), "");
    if (geteuid() == 0) {
        ASSERT_EQ(chown(file.c_str(), 54321, 54321), 0);
        EXPECT_NE(refusal(), "") << "of another account";
    }
}

TEST_F(HostTokens, ATokenThatCannotBeStoredIsNotGivenOut) {
    start();
    const auto parent = settings.tokenFile.parent_path();
    std::filesystem::remove_all(parent);
    std::ofstream(parent) << "in the way";
    const Answer answer = post("/api/tokens", R"({"name":"x","role":"admin"})");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["detail"],
              "Cannot make " + (parent / ".tokens.json.new").string() + ": Not a directory.");
    EXPECT_EQ(get("/api/tokens").json()["tokens"].size(), 2U);
}

TEST_F(HostTokens, ATokenThatCannotBeRemovedFromTheFileStays) {
    start();
    const std::string id = get("/api/tokens").json()["tokens"][1]["id"].asString();
    const auto parent = settings.tokenFile.parent_path();
    std::filesystem::remove_all(parent);
    std::ofstream(parent) << "in the way";
    EXPECT_EQ(ask("DELETE", "/api/tokens/" + id, admin).status, 500);
    EXPECT_EQ(get("/api/tokens").json()["tokens"].size(), 2U);
    EXPECT_EQ(ask("GET", "/healthz", viewer).status, 200) << "it comes back with the next start";
}

} // namespace
