#include "tests/cli/cli_test.h"

namespace {

const std::string key = R"({"user": "anna", "fingerprint": "SHA256:a/b+c", "type": "ssh-ed25519", "bits": 256,
    "comment": "desk", "state": "active", "added": "2026-11-23T04:00:00.000Z", "by": "root"})";
const std::string other = R"({"user": "anna", "fingerprint": "SHA256:d", "type": "ssh-rsa", "bits": 3072,
    "comment": "phone", "from": "192.0.2.0/24", "expires": "2027-12-31T00:00:00.000Z", "state": "expired",
    "added": "2026-11-23T04:00:00.000Z", "by": "t1"})";

HttpReply json(int status, const std::string& body) {
    return HttpReply{status, body, "application/json", false, false};
}

class KeysTest : public CliTest {
protected:
    void answerList(const std::string& target, const std::string& keys, const std::string& damaged = "") {
        host.answerWith("GET " + target,
                        json(200, R"({"keys": [)" + keys + R"(], "damaged": [)" + damaged + "]}"));
    }
};

TEST_F(KeysTest, AreListed) {
    answerList("/api/keys", key + "," + other);
    answerList("/api/keys?user=anna", key, R"("The file of the keys of ben is damaged.\u001b")");
    EXPECT_EQ(
        run({"keys", "list"}).out,
        "USER  FINGERPRINT   TYPE         BITS  COMMENT  FROM          EXPIRES                   STATE   "
        " ADDED                     BY\n"
        "anna  SHA256:a/b+c  ssh-ed25519  256   desk                                             active  "
        " 2026-11-23T04:00:00.000Z  root\n"
        "anna  SHA256:d      ssh-rsa      3072  phone    192.0.2.0/24  2027-12-31T00:00:00.000Z  expired "
        " 2026-11-23T04:00:00.000Z  t1\n");
    const RunResult annas = run({"keys", "list", "anna"});
    EXPECT_EQ(annas.err, "The file of the keys of ben is damaged.\\x1b\n");
    EXPECT_EQ(jsonOf(run({"keys", "list", "anna", "--json"}).out)["keys"][0], jsonOf(key));
    host.answerWith("GET /api/keys?user=x", problemReply(404, R"({"title": "There is no user \"x\"."})"));
    const RunResult unknown = run({"keys", "list", "x"});
    EXPECT_EQ(unknown.code, 3);
    EXPECT_NE(unknown.err.find("'veltctl keys list' lists"), std::string::npos) << unknown.err;
}

TEST_F(KeysTest, AreAddedFromWhereverTheyAre) {
    host.answerWith("POST /api/keys", json(201, key));
    const std::string file = folder.write("id.pub", "\n# mine\nssh-ed25519 AAAA desk\r\n\n");
    const std::string said = "anna can log in over SFTP with the key SHA256:a/b+c.\n";
    EXPECT_EQ(run({"keys", "add", "anna", file}).out, said);
    EXPECT_EQ(run({"keys", "add", "anna", "-"}, "ssh-ed25519 AAAA desk\n").out, said);
    EXPECT_EQ(run({"keys", "add", "anna"}, "ssh-ed25519 AAAA desk").out, said);
    EXPECT_EQ(run({"keys", "add", "anna", "ssh-ed25519 AAAA desk"}).out, said);
    EXPECT_EQ(run({"keys", "add", "anna", "ssh-ed25519", "AAAA", "desk"}).out, said);
    const auto bodies = sent("POST /api/keys");
    ASSERT_EQ(bodies.size(), 5U);
    for (const Json::Value& body : bodies) {
        EXPECT_EQ(body, jsonOf(R"({"user": "anna", "key": "ssh-ed25519 AAAA desk"})"));
    }
    EXPECT_EQ(jsonOf(run({"keys", "add", "anna", file, "--json"}).out), jsonOf(key));
    EXPECT_EQ(run({"keys", "add"}).code, 2);
}

TEST_F(KeysTest, AreAddedOneAtATime) {
    for (const char* text : {"", "# none\n", "ssh-rsa A\nssh-rsa B\n"}) {
        const RunResult result = run({"keys", "add", "anna", folder.write("keys", text)});
        EXPECT_EQ(result.code, 2) << text;
        EXPECT_NE(result.err.find("'veltctl keys import' adds all"), std::string::npos) << result.err;
    }
    EXPECT_EQ(run({"keys", "add", "anna", folder.path("none.pub")}).code, 1);
    EXPECT_EQ(sent("POST /api/keys").size(), 0U);
}

TEST_F(KeysTest, ThatTheServerRefusesAreAFailure) {
    host.answerWith("POST /api/keys", problemReply(409, R"({"detail": "The key is there already."})"));
    EXPECT_EQ(run({"keys", "add", "anna", "ssh-rsa A"}).code, 4);
    host.answerWith("POST /api/keys", problemReply(422, R"({"detail": "key: expected another.", "errors": [
                        {"field": "key", "expected": "another"}]})"));
    const RunResult refused = run({"keys", "add", "anna", "ssh-rsa A"});
    EXPECT_EQ(refused.code, 3);
    EXPECT_NE(refused.err.find("key: expected another."), std::string::npos) << refused.err;
}

TEST_F(KeysTest, ADryRunOnlySaysWhatWouldBeDone) {
    const std::string plan = R"({"dry_run": true, "changes": [], "effects": [
        {"effect": "store", "subject": "keys"}, {"effect": "log", "subject": "Done."}]})";
    host.answerWith("POST /api/keys?dry_run=true", json(200, plan));
    host.answerWith("DELETE /api/keys/anna/SHA256%3Ad?dry_run=true", json(200, plan));
    for (const Words& words : {Words{"keys", "add", "anna", "ssh-rsa A", "--dry-run"},
                               Words{"keys", "remove", "anna", "SHA256:d", "-n"}}) {
        const RunResult result = run(words);
        EXPECT_EQ(result.code, 7);
        EXPECT_EQ(result.out, "  stores the keys\n  writes into the log: Done.\n"
                              "Nothing was changed: this was a dry run.\n");
    }
}

TEST_F(KeysTest, AreRemovedByFingerprintOrComment) {
    host.answerWith("DELETE /api/keys/anna/SHA256%3Aa%2Fb%2Bc", json(204, ""));
    answerList("/api/keys?user=anna", key + "," + other);
    const std::string said = "The key SHA256:a/b+c of anna is removed.\n";
    EXPECT_EQ(run({"keys", "remove", "anna", "SHA256:a/b+c"}).out, said);
    EXPECT_EQ(run({"keys", "remove", "anna", "desk"}).out, said);
    EXPECT_EQ(jsonOf(run({"keys", "remove", "anna", "desk", "--json"}).out),
              jsonOf(R"({"user": "anna", "removed": "SHA256:a/b+c"})"));
    EXPECT_EQ(run({"keys", "remove", "anna", "des"}).code, 3) << "not the whole comment";
    EXPECT_EQ(run({"keys", "remove", "anna"}).code, 2);
    EXPECT_EQ(run({"keys", "remove", "anna", "a", "b"}).code, 2);
}

TEST_F(KeysTest, AreNotRemovedByACommentThatTwoHave) {
    std::string same = other;
    answerList("/api/keys?user=anna", key + "," + same.replace(same.find("phone"), 5, "desk"));
    const RunResult result = run({"keys", "remove", "anna", "desk"});
    EXPECT_EQ(result.code, 3);
    EXPECT_NE(result.err.find("anna has 2 keys with the comment \"desk\"."), std::string::npos) << result.err;
    EXPECT_NE(result.err.find("SHA256:d"), std::string::npos) << result.err;
}

TEST_F(KeysTest, AreImportedLineByLine) {
    answerList("/api/keys?user=anna", "");
    host.answerWith("POST /api/keys", json(201, key));
    const std::string text = "# old ones\nssh-ed25519 A desk\n\n  ssh-rsa B\n";
    const RunResult all = run({"keys", "import", "anna", "-"}, text);
    EXPECT_EQ(all.code, 0);
    EXPECT_EQ(all.out, "line 2: added SHA256:a/b+c desk\nline 4: added SHA256:a/b+c desk\n"
                       "2 added, 0 already there, 0 refused.\n");
    EXPECT_EQ(sent("POST /api/keys").at(1)["key"], "ssh-rsa B");
    host.answerWith("POST /api/keys", problemReply(409, R"({"detail": "It is there already."})"));
    const RunResult again = run({"keys", "import", "anna", folder.write("keys", text), "--json"});
    EXPECT_EQ(again.code, 0);
    EXPECT_EQ(jsonOf(again.out),
              jsonOf(R"({"added": 0, "present": 2, "refused": 0, "dry_run": false, "lines": [
        {"line": 2, "result": "present", "reason": "It is there already."},
        {"line": 4, "result": "present", "reason": "It is there already."}]})"));
    host.answerWith("POST /api/keys", problemReply(422, R"({"detail": "key: expected another."})"));
    const RunResult refused = run({"keys", "import", "anna", "-"}, text);
    EXPECT_EQ(refused.code, 3);
    EXPECT_EQ(refused.out,
              "line 2: refused: key: expected another.\nline 4: refused: key: expected another.\n"
              "0 added, 0 already there, 2 refused.\n");
}

TEST_F(KeysTest, ADryRunOfAnImportCountsEachKeyOnce) {
    answerList("/api/keys?user=anna", "");
    host.answerWith("POST /api/keys?dry_run=true",
                    json(200, R"({"dry_run": true, "changes": [], "effects": []})"));
    const std::string text = "ssh-rsa AAAAB a\nfrom=\"192.0.2.1\" ssh-rsa AAAAB b\nssh-rsa AAAAC c\n";
    const RunResult plan = run({"keys", "import", "anna", "-", "--dry-run"}, text);
    EXPECT_EQ(plan.code, 7);
    EXPECT_EQ(plan.out, "line 1: added\nline 2: present\nline 3: added\n"
                        "2 added, 1 already there, 0 refused.\nNothing was changed: this was a dry run.\n");
    host.answerWith("POST /api/keys?dry_run=true", problemReply(409, R"({"detail": "It is there."})"));
    EXPECT_EQ(run({"keys", "import", "anna", "-", "--dry-run"}, text).code, 0);
    EXPECT_EQ(sent("POST /api/keys").size(), 0U);
}

TEST_F(KeysTest, AnImportThatIsCutOffSaysHowFarItCame) {
    answerList("/api/keys?user=anna", "");
    host.answerWith("POST /api/keys", problemReply(500, R"({"detail": "The disk is full."})"));
    const RunResult result = run({"keys", "import", "anna", "-"}, "ssh-rsa A\nssh-rsa B\n");
    EXPECT_EQ(result.code, 5);
    EXPECT_EQ(result.out, "0 added, 0 already there, 0 refused.\n");
    EXPECT_EQ(sent("POST /api/keys").size(), 1U);
    host.answerWith("GET /api/keys?user=x", problemReply(404, R"({"detail": "There is no user \"x\"."})"));
    EXPECT_EQ(run({"keys", "import", "x", "-"}, "ssh-rsa A\n").code, 3);
    EXPECT_EQ(sent("POST /api/keys").size(), 1U);
}

TEST_F(KeysTest, HelpShowsExamples) {
    const RunResult help = run({"keys", "add", "--help"});
    EXPECT_EQ(help.code, 0);
    EXPECT_NE(help.out.find("veltctl keys add anna id_ed25519.pub"), std::string::npos) << help.out;
}

} // namespace
