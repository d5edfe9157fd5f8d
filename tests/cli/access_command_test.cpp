#include "tests/cli/cli_test.h"

namespace {

class AccessCommand : public CliTest {
protected:
    void answer(const std::string& target, const std::string& body) {
        host.answerWith("GET /api/access?" + target, HttpReply{200, body, "application/json", false, false});
    }
};

TEST_F(AccessCommand, ShowsEachFolderWithItsReasons) {
    const std::string report = R"({"user": {"name": "anna"}, "ftp": {"allowed": true, "whole_server": false,
        "reasons": ["No chroot rule applies, and users are not confined: they see the shares."],
        "folders": [{"path": "/docs", "folder": "/srv/docs", "access": "write",
                     "reasons": ["The share docs grants anna reading and writing."],
                     "within": [{"folder": "/srv/docs/old", "access": "none"}]}],
        "unseen_shares": [{"share": "music", "reasons": ["The share music refuses anna."]}],
        "remarks": ["The share gone is left out."]}})";
    answer("user=anna", report);
    EXPECT_EQ(run({"access", "anna"}).out,
              "FTP: No chroot rule applies, and users are not confined: they see the shares.\n"
              "SEEN AS  ACCESS          FOLDER         WHY\n"
              "/docs    read and write  /srv/docs      The share docs grants anna reading and writing.\n"
              "         nothing         /srv/docs/old  A share within it says so.\n"
              "Not seen: music. The share music refuses anna.\n"
              "The share gone is left out.\n");
    EXPECT_EQ(jsonOf(run({"access", "anna", "--json"}).out), jsonOf(report));
}

TEST_F(AccessCommand, SaysWhyALoginWouldBeRefused) {
    answer("user=anna", R"({"ftp": {"allowed": false, "refused": "There is no share for the path /x.",
        "reasons": ["The chroot rule of the user anna confines the login to /x."]}})");
    EXPECT_EQ(run({"access", "anna"}).out,
              "FTP: The chroot rule of the user anna confines the login to /x.\n"
              "The login would be refused: There is no share for the path /x.\n");
}

TEST_F(AccessCommand, TellsAboutOneFile) {
    answer("user=anna%20b&path=%2Fsrv%2Fa", R"({"ftp": {}, "sftp": {}, "path": {
        "ftp": {"access": "read", "path": "/docs/a", "reason": "It is shown for reading only."},
        "sftp": {"access": "none", "reason": "It is in no folder that the login sees."}}})");
    EXPECT_EQ(run({"access", "anna b", "/srv/a"}).out,
              "FTP: read only, as /docs/a. It is shown for reading only.\n"
              "SFTP: nothing. It is in no folder that the login sees.\n");
}

TEST_F(AccessCommand, WantsAUser) {
    EXPECT_EQ(run({"access"}).code, 2);
}

} // namespace
