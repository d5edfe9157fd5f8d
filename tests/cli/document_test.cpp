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
    EXPECT_EQ(result.out, "Nothing changed.\n");
    EXPECT_EQ(sent(change).at(0), exported()) << "the server compares";
}

TEST_F(DocumentTest, AnImportIsOneChange) {
    Json::Value document = exported();
    document["ftp"]["portnum"] = 2121;
    document["sftp"]["enable"] = true;
    document["chroot_rules"] = jsonOf(R"([{"type": "group", "name": "staff", "path": "/home"}])");
    const RunResult dry = run({"import", "-", "--dry-run"}, textOf(document));
    EXPECT_EQ(dry.code, 7);
    EXPECT_EQ(host.ftp["portnum"], 21);
    const RunResult result = import(document);
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "chroot_rules: remove user anna /docs\n"
                          "chroot_rules: add group staff /home\n"
                          "ftp/portnum: 21 -> 2121\n"
                          "sftp/enable: off -> on\n");
    EXPECT_EQ(exported(), document);
}

TEST_F(DocumentTest, TheOrderOfRulesCounts) {
    host.rules.append(jsonOf(R"({"type": "group", "name": "staff", "path": "/home"})"));
    Json::Value document = exported();
    document["chroot_rules"][0].swap(document["chroot_rules"][1]);
    EXPECT_EQ(import(document).out, "chroot_rules: the same rules in another order\n");
}

TEST_F(DocumentTest, WhatIsNoDocumentIsNotSent) {
    EXPECT_EQ(run({"import", "-"}, "{").code, 3);
    EXPECT_EQ(run({"import", folder.path("absent")}).code, 1);
    EXPECT_TRUE(asked().empty());
    host.answerWith(change, problemReply(422, R"({"title": "Unprocessable Content", "changed": false,
        "detail": "/ftp/x: expected one of the settings. Nothing was changed."})"));
    const RunResult refused = run({"import", "-"}, R"({"ftp": {"x": 1}})");
    EXPECT_EQ(refused.code, 3);
    EXPECT_NE(refused.err.find("/ftp/x: expected"), std::string::npos) << refused.err;
}
