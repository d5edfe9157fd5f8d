#include "tests/cli/cli_test.h"

#include "tests/support/files.h"

#include <sys/resource.h>
#include <sys/stat.h>

#include <csignal>
#include <filesystem>
#include <fstream>

namespace {

class DocumentTest : public CliTest {
protected:
    void SetUp() override { host.rules = jsonOf(R"([{"type": "user", "name": "anna", "path": "/docs"}])"); }

    Json::Value exported() { return jsonOf(run({"export"}).out); }
    RunResult import(const Json::Value& document) { return run({"import", "-"}, textOf(document)); }
};

} // namespace

TEST_F(DocumentTest, AllSettingsAreExportedAsOneDocument) {
    const Json::Value document = exported();
    EXPECT_EQ(document["format"], "velt-settings");
    EXPECT_EQ(document["format_version"], 1);
    EXPECT_EQ(document["ftp"], host.ftp);
    EXPECT_EQ(document["security"], host.security);
    EXPECT_EQ(document["sftp"], host.sftp);
    EXPECT_EQ(document["chroot_rules"], host.rules);
}

TEST_F(DocumentTest, AnExportGoesIntoAFile) {
    const RunResult result = run({"export", "--output", folder.path("settings.json")});
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(jsonOf(velt::test::contentsOf(folder.path("settings.json"))), exported());
    EXPECT_EQ(run({"export", "--output", folder.path("absent/settings.json")}).code, 1);
    EXPECT_EQ(run({"export", "--output", "/dev/full"}).code, 1);
}

TEST_F(DocumentTest, AnExportThatCannotBeWrittenKeepsTheFormerOne) {
    const std::string file = folder.path("settings.json");
    const std::string link = folder.path("link.json");
    std::filesystem::create_symlink(file, link);
    std::ofstream(file) << "the former export";
    ASSERT_EQ(::chmod(file.c_str(), 0640), 0);
    // As on a full disk: no file may grow.
    rlimit former{};
    ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &former), 0);
    const rlimit none{0, former.rlim_max};
    const auto handler = std::signal(SIGXFSZ, SIG_IGN);
    ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &none), 0);
    const RunResult result = run({"export", "--output", link});
    ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &former), 0);
    std::signal(SIGXFSZ, handler);
    EXPECT_EQ(result.code, 1);
    EXPECT_NE(result.err.find("with free space"), std::string::npos) << result.err;
    EXPECT_EQ(velt::test::contentsOf(file), "the former export");

    EXPECT_EQ(run({"export", "--output", link}).code, 0);
    EXPECT_EQ(jsonOf(velt::test::contentsOf(file)), exported());
    EXPECT_TRUE(std::filesystem::is_symlink(link));
    EXPECT_EQ(std::filesystem::status(file).permissions(), std::filesystem::perms(0640));
}

TEST_F(DocumentTest, WhatWasExportedChangesNothing) {
    const RunResult result = import(exported());
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "Nothing to change.\n");
    EXPECT_TRUE(sent(ftpSet).empty());
}

TEST_F(DocumentTest, AnImportRestoresEverySetting) {
    host.ftp["ext_ip"] = "192.0.2.9";
    const Json::Value document = exported();
    const FakeHost before = host;
    host.ftp["timeout"] = 1;
    host.ftp["enable_ftps"] = true;
    host.ftp["ext_ip"] = "192.0.2.1";
    host.ftp["custom_port_range"] = true;
    host.ftp["custom_port"] = "6000:6010";
    host.security["anonymous"] = true;
    host.sftp["portnum"] = 2222;
    host.sftp["enable"] = true;
    host.rules = jsonOf(R"([{"type": "group", "name": "staff", "path": "/home"}])");
    const RunResult result = run({"import", folder.write("settings.json", textOf(document))});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "chroot_rules  remove group staff /home\n"
                          "chroot_rules  add user anna /docs\n"
                          "security  anonymous: on -> off\n"
                          "ftp  enable_ftps: on -> off\n"
                          "ftp  timeout: 1 -> 300\n"
                          "ftp  custom_port_range: on -> off\n"
                          "ftp  ext_ip: 192.0.2.1 -> 192.0.2.9\n"
                          "sftp  enable: on -> off\n"
                          "sftp  portnum: 2222 -> 22\n");
    EXPECT_EQ(host.security, before.security);
    EXPECT_EQ(host.sftp, before.sftp);
    EXPECT_EQ(host.rules, before.rules);
    EXPECT_EQ(host.ftp["custom_port_range"], false);
    EXPECT_EQ(host.ftp["timeout"], 300);
}

TEST_F(DocumentTest, OnlyWhatIsDifferentIsSent) {
    Json::Value document = exported();
    document["ftp"]["portnum"] = 2121;
    EXPECT_EQ(import(document).code, 0);
    ASSERT_EQ(sent(ftpSet).size(), 1U);
    EXPECT_EQ(sent(ftpSet)[0], jsonOf(R"({"enable_ftp": true, "enable_ftps": false, "portnum": 2121})"));
    EXPECT_TRUE(sent(sftpSet).empty());
    EXPECT_TRUE(sent(securitySet).empty());
    EXPECT_TRUE(sent(rulesSave).empty());
}

TEST_F(DocumentTest, APassiveRangeGoesWithItsSwitch) {
    Json::Value document = exported();
    document["ftp"]["custom_port_range"] = true;
    document["ftp"]["custom_port"] = "6000:6010";
    EXPECT_EQ(import(document).code, 0);
    EXPECT_EQ(host.ftp["custom_port"], "6000:6010");
    document["ftp"]["custom_port"] = "7000:7010";
    EXPECT_EQ(import(document).out, "ftp  custom_port: 6000:6010 -> 7000:7010\n");
    EXPECT_EQ(host.ftp["custom_port"], "7000:7010");
}

TEST_F(DocumentTest, AnAddressIsTakenAwayAgain) {
    const Json::Value document = exported();
    host.ftp["ext_ip"] = "192.0.2.1";
    const RunResult result = import(document);
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out, "ftp  ext_ip: 192.0.2.1 -> (empty)\n");
    EXPECT_EQ(exported(), document);
}

TEST_F(DocumentTest, AServiceThatIsDownIsExportedAsSwitchedOn) {
    host.down = {"sftp", "ftps"};
    const Json::Value document = exported();
    EXPECT_EQ(document["sftp"]["enable"], true);
    EXPECT_EQ(document["ftp"]["enable_ftps"], true);
    EXPECT_EQ(import(document).out, "Nothing to change.\n");
}

TEST_F(DocumentTest, ARangeOverTheFormerControlPortComesAfterThePortHasMoved) {
    Json::Value document = exported();
    host.ftp["portnum"] = 2121;
    document["ftp"]["portnum"] = 2001;
    document["ftp"]["custom_port_range"] = true;
    document["ftp"]["custom_port"] = "2100:2200";
    EXPECT_EQ(import(document).code, 0);
    ASSERT_EQ(sent(ftpSet).size(), 2U);
    EXPECT_EQ(sent(ftpSet)[0]["portnum"], 2001);
    EXPECT_EQ(sent(ftpSet)[0]["custom_port_range"], false);
    EXPECT_EQ(sent(ftpSet)[1]["custom_port"], "2100:2200");
    EXPECT_EQ(exported(), document);
}

TEST_F(DocumentTest, SftpGivesUpAPortBeforeFtpTakesIt) {
    Json::Value document = exported();
    document["ftp"]["portnum"] = 22;
    document["sftp"]["portnum"] = 2222;
    EXPECT_EQ(import(document).out, "sftp  portnum: 22 -> 2222\nftp  portnum: 21 -> 22\n");
    document["ftp"]["custom_port_range"] = true;
    document["ftp"]["custom_port"] = "2000:2300";
    document["sftp"]["portnum"] = 2400;
    EXPECT_EQ(import(document).out.substr(0, 4), "sftp");
}

TEST_F(DocumentTest, ADryRunChangesNothing) {
    Json::Value document = exported();
    document["sftp"]["enable"] = true;
    document["chroot_rules"] = Json::Value(Json::arrayValue);
    const RunResult result = run({"import", "--dry-run", "-"}, textOf(document));
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out, "chroot_rules  remove user anna /docs\n"
                          "sftp  enable: off -> on\n"
                          "Nothing was changed: this was a dry run.\n");
    for (const std::string& request : asked()) {
        EXPECT_EQ(request.substr(0, 4), "GET ") << request;
    }
}

TEST_F(DocumentTest, AbsentSectionsAndKeysStayAsTheyAre) {
    Json::Value document =
        jsonOf(R"({"format": "velt-settings", "format_version": 1, "ftp": {"timeout": 60}})");
    EXPECT_EQ(import(document).out, "ftp  timeout: 300 -> 60\n");
    EXPECT_EQ(host.rules.size(), 1U);
}

TEST_F(DocumentTest, TheOrderOfRulesCounts) {
    host.rules = jsonOf(
        R"([{"type": "user", "name": "anna", "path": "/a"}, {"type": "user", "name": "ben", "path": "/b"}])");
    Json::Value document = exported();
    std::swap(document["chroot_rules"][0], document["chroot_rules"][1]);
    EXPECT_EQ(import(document).out, "chroot_rules  the same rules in another order\n");
    EXPECT_EQ(host.rules[0]["name"], "ben");
}

TEST_F(DocumentTest, EveryFaultOfADocumentIsNamedAndNothingIsAsked) {
    const RunResult result =
        run({"import", "-"}, R"({"format": "velt-settings", "format_version": 2, "smb": {},
        "ftp": {"portnum": "21", "port": 1, "enable_ftp": null}, "security": [], "chroot_rules": [{"type": "x"}]})");
    EXPECT_EQ(result.code, 3);
    for (const char* fault :
         {"format: expected", "smb: unknown", "ftp.portnum: expected a number from 1 to 65535",
          "ftp.port: unknown", "ftp.enable_ftp: expected on or off", "security: expected an object",
          "chroot_rules: rule 1:"}) {
        EXPECT_NE(result.err.find(fault), std::string::npos) << fault << "\n" << result.err;
    }
    EXPECT_TRUE(asked().empty());
    EXPECT_EQ(run({"import", "-"}, "[]").code, 3);
    const RunResult unfinished = run({"import", "-"}, "{");
    EXPECT_EQ(unfinished.code, 3);
    EXPECT_EQ(unfinished.err,
              "veltctl: Invalid JSON in standard input: line 1, column 2: Missing '}' or object "
              "member name.\n  Nothing was changed.\nWhat to do: Correct it and try again.\n");
    EXPECT_EQ(run({"import", folder.path("absent")}).code, 2);
    EXPECT_EQ(run({"import", folder.path(".")}).code, 2);
}

TEST_F(DocumentTest, AFailureMidwaySaysWhatWasAppliedAndWhatNot) {
    Json::Value document = exported();
    document["security"]["anonymous"] = true;
    document["ftp"]["portnum"] = 80;
    document["sftp"]["portnum"] = 2222;
    host.answerWith(
        ftpSet, problemReply(
                    409, R"json({"title": "The port is taken", "code": 1903, "holder": "web (pid 4)"})json"));
    const RunResult result = import(document);
    EXPECT_EQ(result.code, 4);
    EXPECT_EQ(result.out, "security  anonymous: off -> on\n");
    for (const char* line :
         {"held by web (pid 4)", "ftp: failed", "security: applied", "sftp: not applied"}) {
        EXPECT_NE(result.err.find(line), std::string::npos) << line << "\n" << result.err;
    }
    EXPECT_EQ(host.sftp["portnum"], 22);
}

TEST_F(DocumentTest, AnImportReportsItselfAsJson) {
    Json::Value document = exported();
    document["sftp"]["portnum"] = 2222;
    const Json::Value expected =
        jsonOf(R"({"dry_run": false, "sections": [{"section": "sftp", "applied": true,
        "changes": [{"key": "portnum", "from": 22, "to": 2222}]}]})");
    EXPECT_EQ(jsonOf(run({"import", "-", "--json"}, textOf(document)).out), expected);
    host.sftp["portnum"] = 22;
    EXPECT_EQ(jsonOf(run({"import", "-n", "-", "--json"}, textOf(document)).out)["sections"][0]["applied"],
              false);
}
