// Tests of what a login may see and do, each over FTP and over SFTP.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_EACH_PROTOCOL_H
#define VELT_TESTS_SYSTEM_SUPPORT_EACH_PROTOCOL_H

#include "tests/system/support/file_client.h"
#include "tests/system/support/shared_folders.h"

#include <gtest/gtest.h>

#include <functional>

namespace velt::test {

class EachProtocol : public SharedFolders, public testing::WithParamInterface<Protocol> {
protected:
    static bool overFtp() { return GetParam() == Protocol::ftp; }

    /// The service of the protocol alone.
    void start() {
        if (overFtp()) {
            FtpService::start();
        } else {
            startSftp();
        }
    }

    static std::unique_ptr<FileClient> tryToLogIn(const std::string& user) {
        return logInBy(GetParam(), overFtp() ? port : sftpPort, user);
    }
    static std::unique_ptr<FileClient> tryToLogIn(const std::string& user, const std::string& password) {
        return logInBy(GetParam(), overFtp() ? port : sftpPort, user, password);
    }
    static bool isRefused(const std::string& user) { return !tryToLogIn(user)->isLoggedIn(); }
    static std::unique_ptr<FileClient> logIn(const std::string& user = "alice") {
        auto client = tryToLogIn(user);
        EXPECT_TRUE(client->isLoggedIn()) << user << DaemonProcess::output();
        return client;
    }

    static std::string namesIn(FileClient& client, const std::string& folder = "/") {
        std::string all;
        for (const auto& name : client.list(folder).value_or(std::set<std::string>{"(closed)"})) {
            all += (all.empty() ? "" : " ") + name;
        }
        return all;
    }
    /// What stands in the root of the user's session, which has nothing above it; "refused" where the login
    /// is.
    static std::string rootOf(const std::string& user) {
        const auto client = tryToLogIn(user);
        if (!client->isLoggedIn()) {
            return "refused";
        }
        const std::string names = namesIn(*client);
        EXPECT_EQ(namesIn(*client, "/.."), names);
        return names;
    }
};

/// A change that somebody tries in a folder, in which there are a file "file" of a user's own with mode 0666,
/// and an empty folder "sub".
struct Change {
    const char* name;
    bool overFtp; ///< else FTP has no words for it, and nobody does it there
    std::function<bool(FileClient& client, const std::string& folder)> make;
};

/// All kinds of changes. Each leaves what the next one needs.
inline const std::vector<Change>& allChanges() {
    using Opening = FileClient::Opening;
    static const std::vector<Change> all{
        {"a new file", true, [](auto& to, auto& at) { return to.write(at + "/new", "x"); }},
        {"a file anew", true, [](auto& to, auto& at) { return to.write(at + "/file", "x"); }},
        {"more of a file", true, [](auto& to, auto& at) { return to.append(at + "/file", "y"); }},
        {"a file deeper", true, [](auto& to, auto& at) { return to.write(at + "/sub/new", "x"); }},
        {"no file deeper", true, [](auto& to, auto& at) { return to.remove(at + "/sub/new"); }},
        {"a folder", true, [](auto& to, auto& at) { return to.makeFolder(at + "/made"); }},
        {"another name", true, [](auto& to, auto& at) { return to.rename(at + "/file", at + "/other"); }},
        {"the name again", true, [](auto& to, auto& at) { return to.rename(at + "/other", at + "/file"); }},
        {"a folder's name", true, [](auto& to, auto& at) { return to.rename(at + "/sub", at + "/bus"); }},
        {"its name again", true, [](auto& to, auto& at) { return to.rename(at + "/bus", at + "/sub"); }},
        {"the mode", true, [](auto& to, auto& at) { return to.setMode(at + "/file", 0600); }},
        {"the times", true, [](auto& to, auto& at) { return to.setTimes(at + "/file", 1000000000); }},
        {"a symbolic link", false, [](auto& to, auto& at) { return to.symbolicLink("file", at + "/link"); }},
        {"a hard link", false, [](auto& to, auto& at) { return to.hardLink(at + "/file", at + "/twin"); }},
        {"one in its place", false, [](auto& to, auto& at) { return to.replace(at + "/file", at + "/new"); }},
        {"a file to write", false,
         [](auto& to, auto& at) { return to.open(at + "/file", Opening::toWrite) && to.writeOpen("z"); }},
        {"no length", false, [](auto& to, auto& at) { return to.cut(at + "/file"); }},
        {"no file", true, [](auto& to, auto& at) { return to.remove(at + "/file"); }},
        {"no folder", true, [](auto& to, auto& at) { return to.removeFolder(at + "/sub"); }},
    };
    return all;
}

inline std::string nameOfProtocol(const testing::TestParamInfo<Protocol>& protocol) {
    return protocol.param == Protocol::ftp ? "ftp" : "sftp";
}

} // namespace velt::test

/// After the tests of a suite.
#define VELT_OVER_EACH_PROTOCOL(Suite)                                                                       \
    INSTANTIATE_TEST_SUITE_P(, Suite, testing::Values(Protocol::ftp, Protocol::sftp), nameOfProtocol)

#endif
