#include "tests/cli/cli_test.h"

using SettingsTest = CliTest;

TEST_F(SettingsTest, GetShowsATableInAFixedOrder) {
    const RunResult result = run({"sftp", "get"});
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out, "SETTING  VALUE  MEANING\n"
                          "enable   off    SFTP is enabled\n"
                          "portnum  22     Port of SFTP\n");
    EXPECT_EQ(result.err, "");
}

TEST_F(SettingsTest, GetShowsEachFtpSetting) {
    const RunResult result = run({"ftp", "get"});
    ASSERT_EQ(result.code, 0);
    EXPECT_EQ(asked(), std::vector<std::string>{ftpGet});
    for (const std::string& key : host.ftp.getMemberNames()) {
        EXPECT_NE(result.out.find("\n" + key + " "), std::string::npos) << key;
    }
}

TEST_F(SettingsTest, GetWritesTheServersObjectAsJson) {
    EXPECT_EQ(jsonOf(run({"ftp", "get", "--json"}).out), host.ftp);
    EXPECT_EQ(jsonOf(run({"--json", "security", "get"}).out), host.security);
    EXPECT_EQ(jsonOf(run({"sftp", "--json", "get"}).out), host.sftp);
}

TEST_F(SettingsTest, SettingsOfNoModuleAreReadFromTheDocument) {
    EXPECT_EQ(jsonOf(run({"confinement", "get", "--json"}).out), host.confinement);
    EXPECT_EQ(run({"confinement", "get"}).out,
              "SETTING  VALUE  MEANING\n"
              "sftp     off    A login over SFTP sees what the same login over FTP sees\n");
    EXPECT_EQ(run({"confinement", "set", "sftp=on"}).out, "sftp: off -> on\n");
    EXPECT_EQ(sent(change).at(0), jsonOf(R"({"confinement": {"sftp": true}})"));
    EXPECT_EQ(run({"confinement", "set", "ftp=on"}).err,
              "veltctl: Unknown confinement setting \"ftp\".\nWhat to do: Known keys: sftp.\n");
}

TEST_F(SettingsTest, OneSettingIsChangedAlone) {
    const RunResult result = run({"ftp", "set", "maxuploadrate=5"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "maxuploadrate: 0 -> 5\n");
    EXPECT_EQ(sent(change).at(0), jsonOf(R"({"ftp": {"maxuploadrate": 5}})"));
    EXPECT_EQ(asked(), std::vector<std::string>{change});
    EXPECT_EQ(run({"sftp", "set", "portnum=2222"}).out, "portnum: 22 -> 2222\n");
    EXPECT_EQ(run({"security", "set", "anonymous_chroot_share=docs"}).out,
              "anonymous_chroot_share: (empty) -> docs\n");
}

TEST_F(SettingsTest, WhatTheServerAddsIsShown) {
    host.report = jsonOf(R"({"sessions_ended": 2, "warnings": ["Not in the history."],
        "down": [{"service": "sftp", "reason": "Port 22 is taken."}]})");
    const RunResult result = run({"ftp", "set", "timeout=5"});
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out, "timeout: 300 -> 5\n2 sessions ended.\n");
    EXPECT_EQ(result.err, "veltctl: warning: Not in the history.\n"
                          "veltctl: warning: the sftp service does not run: Port 22 is taken.\n");
}

TEST_F(SettingsTest, ADryRunSaysWhatItWouldDo) {
    host.report = jsonOf(R"({"sessions_ended": 1, "effects": [
        {"effect": "store", "subject": "ftp settings"}, {"effect": "hand over", "subject": "ftp"},
        {"effect": "stop", "subject": "sftp"}, {"effect": "open port", "subject": "2121"},
        {"effect": "new one", "subject": "x"}]})");
    const RunResult result = run({"ftp", "set", "portnum=2121", "--dry-run"});
    EXPECT_EQ(result.code, 7);
    EXPECT_EQ(result.out, "portnum: 21 -> 2121\n"
                          "  stores the ftp settings\n"
                          "  hands the port of ftp over to a new daemon\n"
                          "  stops sftp and ends its sessions\n"
                          "  opens port 2121\n"
                          "  new one x\n"
                          "Nothing was changed: this was a dry run.\n"
                          "1 session would be ended.\n");
    EXPECT_EQ(host.ftp["portnum"], 21);
    EXPECT_EQ(run({"ftp", "set", "portnum=2121", "-n", "--json"}).code, 7);
    host.report = Json::objectValue;
    const RunResult nothing = run({"ftp", "set", "portnum=21", "--dry-run"});
    EXPECT_EQ(nothing.code, 0);
    EXPECT_EQ(nothing.out, "Nothing to change.\n");
}

TEST_F(SettingsTest, OptionsOfAChangeReachTheServer) {
    run({"ftp", "set", "timeout=5", "--keep-sessions"});
    run({"ftp", "set", "timeout=6", "--end-sessions", "--confirm-within", "60", "--dry-run"});
    EXPECT_EQ(asked(), (std::vector<std::string>{change + "?sessions=keep",
                                                 change + "?dry_run=true&sessions=end&confirm_within=60"}));
    EXPECT_EQ(run({"ftp", "set", "timeout=5", "--keep-sessions", "--end-sessions"}).code, 2);
    EXPECT_EQ(run({"ftp", "set", "timeout=5", "--confirm-within", "0"}).code, 2);
}

TEST_F(SettingsTest, TheExternalAddressCanBeTakenAway) {
    host.ftp["ext_ip"] = "192.0.2.1";
    EXPECT_EQ(run({"ftp", "set", "ext_ip="}).out, "ext_ip: 192.0.2.1 -> (empty)\n");
}

TEST_F(SettingsTest, AnEmptyRangeIsRefused) {
    const RunResult result = run({"ftp", "set", "custom_port="});
    EXPECT_EQ(result.code, 2);
    EXPECT_NE(result.err.find("custom_port_range=off"), std::string::npos) << result.err;
    EXPECT_TRUE(asked().empty());
}

TEST_F(SettingsTest, AllWordsForASwitchAreKnown) {
    for (const char* word : {"true", "on", "yes", "ON", "Yes"}) {
        host.ftp["enable_fxp"] = false;
        EXPECT_EQ(run({"ftp", "set", std::string("enable_fxp=") + word}).out, "enable_fxp: off -> on\n")
            << word;
    }
    for (const char* word : {"false", "off", "no"}) {
        host.ftp["enable_fxp"] = true;
        EXPECT_EQ(run({"ftp", "set", std::string("enable_fxp=") + word}).out, "enable_fxp: on -> off\n")
            << word;
    }
}

TEST_F(SettingsTest, SeveralSettingsGoInOneRequest) {
    EXPECT_EQ(run({"ftp", "set", "enable_ftp=no", "portnum=2121"}).out,
              "enable_ftp: on -> off\nportnum: 21 -> 2121\n");
    EXPECT_EQ(sent(change).at(0), jsonOf(R"({"ftp": {"enable_ftp": false, "portnum": 2121}})"));
}

TEST_F(SettingsTest, ATextMayHoldEqualsSignsAndBeEmpty) {
    EXPECT_EQ(run({"security", "set", "anonymous_chroot_share=a=b"}).code, 0);
    EXPECT_EQ(host.security["anonymous_chroot_share"], "a=b");
    EXPECT_EQ(run({"security", "set", "anonymous_chroot_share="}).code, 0);
    EXPECT_EQ(host.security["anonymous_chroot_share"], "");
}

TEST_F(SettingsTest, ARangeAloneSwitchesTheRangeOn) {
    EXPECT_EQ(run({"ftp", "set", "custom_port=6000:6010"}).out,
              "custom_port: 55536:55567 -> 6000:6010\ncustom_port_range: off -> on\n");
    EXPECT_EQ(run({"ftp", "set", "custom_port=6000:6010", "custom_port_range=off"}).out,
              "custom_port_range: on -> off\n");
}

TEST_F(SettingsTest, AChangeWithoutEffectIsReported) {
    EXPECT_EQ(run({"ftp", "set", "portnum=21"}).out, "Nothing changed.\n");
    EXPECT_EQ(sent(change).size(), 1U); // the server decides
}

TEST_F(SettingsTest, SetWritesTheServersReportAsJson) {
    const Json::Value result = jsonOf(run({"ftp", "set", "portnum=2121", "--json"}).out);
    EXPECT_EQ(result["changes"], jsonOf(R"([{"field": "/ftp/portnum", "from": 21, "to": 2121}])"));
}

TEST_F(SettingsTest, EachVersionOfFtpIsRead) {
    EXPECT_EQ(run({"ftp", "set", "use_utf8=on"}).code, 2);
    EXPECT_EQ(run({"ftp", "get", "--api-version", "4"}).code, 2);
    EXPECT_EQ(run({"ftp", "get", "--api-version", "2"}).code, 0);
    EXPECT_EQ(asked().back(), "GET /api/VELT.Core.FileServ.FTP/v2/get");
}

TEST_F(SettingsTest, AnUnknownKeyNamesTheKnownOnesAndAsksNothing) {
    const RunResult result = run({"sftp", "set", "port=22"});
    EXPECT_EQ(result.code, 2);
    EXPECT_EQ(result.err,
              "veltctl: Unknown sftp setting \"port\".\nWhat to do: Known keys: enable, portnum.\n");
    EXPECT_TRUE(asked().empty());
}

TEST_F(SettingsTest, AValueOfTheWrongTypeAsksNothing) {
    for (const char* word : {"portnum=", "portnum=abc", "portnum=21x", "portnum=99999999999", "portnum=1.5",
                             "enable_ftp=1", "enable_ftp=", "enable_ftp", "portnum"}) {
        const RunResult result = run({"ftp", "set", word});
        EXPECT_EQ(result.code, 2) << word;
        EXPECT_EQ(result.out, "") << word;
    }
    EXPECT_EQ(run({"ftp", "set", "portnum=1", "portnum=2"}).code, 2);
    EXPECT_EQ(run({"ftp", "set"}).code, 2);
    EXPECT_TRUE(asked().empty());
}

TEST_F(SettingsTest, ANumberOutOfItsRangeAsksNothing) {
    EXPECT_EQ(run({"ftp", "set", "timeout=-5"}).err,
              "veltctl: timeout: expected a number from 0 to 86400.\n"
              "What to do: Run 'veltctl ftp set --help' for all settings.\n");
    for (const char* word :
         {"portnum=0", "portnum=65536", "utf8_mode=3", "maxuploadrate=-1", "timeout=2147483648"}) {
        EXPECT_EQ(run({"ftp", "set", word}).code, 2) << word;
    }
    EXPECT_EQ(run({"sftp", "set", "portnum=70000"}).code, 2);
    EXPECT_TRUE(asked().empty());
}

TEST_F(SettingsTest, HelpHasTheFactsOfEachSetting) {
    const std::string help = run({"ftp", "set", "--help"}).out;
    for (const char* line :
         {"  timeout                 Idle time after which a session ends; 0 means never (seconds, 0 to "
          "86400, "
          "default 300)\n",
          "  portnum                 Port of FTP and FTPS (1 to 65535, default 21)\n",
          "  enable_fxp              Transfers between two servers are allowed (on or off, default off)\n",
          "  ext_ip                  External address (an IPv4 address such as 192.0.2.1, default none)\n"}) {
        EXPECT_NE(help.find(line), std::string::npos) << line << help;
    }
    EXPECT_EQ(help.find("use_utf8"), std::string::npos) << help;
}

TEST_F(SettingsTest, AnAnswerWithoutTheSwitchesIsNotShown) {
    host.ftp.removeMember("enable_ftps");
    EXPECT_EQ(run({"ftp", "get"}).code, 5);
}

TEST_F(SettingsTest, ARefusedChangeNamesTheField) {
    host.answerWith(change,
                    problemReply(422, R"({"title": "A parameter is not valid", "status": 422, "code": 1901,
        "detail": "Wrong UTF-8 webapi parameter", "request_id": "r-7",
        "errors": [{"field": "utf8_mode", "expected": "0, 1 or 2"}]})"));
    const RunResult result = run({"ftp", "set", "utf8_mode=0"});
    EXPECT_EQ(result.code, 3);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "veltctl: A parameter is not valid (HTTP 422, code 1901).\n"
                          "  Wrong UTF-8 webapi parameter\n"
                          "  utf8_mode: expected 0, 1 or 2\n"
                          "  request id r-7\n"
                          "What to do: Correct the input and try again.\n");
}

TEST_F(SettingsTest, EachFactOfARefusalIsSaidOnce) {
    host.answerWith(change,
                    problemReply(422, R"({"title": "A parameter is not valid", "status": 422, "code": 1901,
        "detail": "utf8_mode: expected 0, 1 or 2. Nothing was changed.", "changed": false,
        "errors": [{"field": "utf8_mode", "expected": "0, 1 or 2"}]})"));
    EXPECT_EQ(run({"ftp", "set", "utf8_mode=0"}).err,
              "veltctl: A parameter is not valid (HTTP 422, code 1901).\n"
              "  utf8_mode: expected 0, 1 or 2. Nothing was changed.\n"
              "What to do: Correct the input and try again.\n");
    host.answerWith(change, problemReply(409, R"({"title": "The FTP port is taken", "code": 1903,
        "detail": "Port 2222 is held by the SFTP service.", "holder": "the SFTP service", "changed": false})"));
    EXPECT_EQ(run({"ftp", "set", "portnum=2222"}).err,
              "veltctl: The FTP port is taken (HTTP 409, code 1903).\n"
              "  Port 2222 is held by the SFTP service.\n"
              "  Nothing was changed.\n"
              "What to do: Choose another port, or free this one.\n");
    host.answerWith(change, problemReply(409, R"({"title": "The FTP port is taken", "code": 1903,
        "holder": "the SFTP service"})"));
    EXPECT_EQ(run({"ftp", "set", "portnum=2222"}).err,
              "veltctl: The FTP port is taken (HTTP 409, code 1903).\n"
              "  held by the SFTP service\n"
              "What to do: Choose another port, or free this one.\n");
}

TEST_F(SettingsTest, WhatTheServerSaysIsSafeToShow) {
    host.answerWith(change, problemReply(409, R"({"title": "Taken\u001b[2J", "code": 1903,
        "detail": "first\nsecond\u001b]0;x\u0007", "holder": "\u009b31m", "request_id": "r\u007f"})"));
    EXPECT_EQ(run({"ftp", "set", "portnum=2222"}).err,
              "veltctl: Taken\\x1b[2J (HTTP 409, code 1903).\n"
              "  first\n"
              "  second\\x1b]0;x\\x07\n"
              "  held by \\x9b31m\n"
              "  request id r\\x7f\n"
              "What to do: Choose another port, or free this one.\n");
    host.answerWith(change, problemReply(422, R"({"errors": [{"field": "\u001bc", "expected": "\r"}]})"));
    EXPECT_NE(run({"ftp", "set", "portnum=2222"}).err.find("  \\x1bc: expected \\x0d\n"), std::string::npos);
    host.sftp["note"] = "\x1b\x7f\xC2\x9B";
    EXPECT_NE(run({"sftp", "get", "--json"}).out.find(R"("\u001b\u007f\u009b")"), std::string::npos);
}

TEST_F(SettingsTest, SharesAreListed) {
    host.answerWith(
        "GET /api/VELT.Core.FileServ.FTP.Security/v1/list_ftp_share",
        HttpReply{200, R"({"share": ["docs", "m\u00fcll\u001b[31m"]})", "application/json", false, false});
    EXPECT_EQ(run({"shares"}).out, "SHARE\ndocs\nm\u00fcll\\x1b[31m\n");
    EXPECT_EQ(jsonOf(run({"shares", "--json"}).out)["share"][0], "docs");
}
