#include "tests/system/support/clients.h"

#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"
#include "tests/system/support/files.h"
#include "tests/system/support/private_world.h"

#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <sstream>

namespace velt::test {
namespace fs = std::filesystem;

namespace {

constexpr std::size_t ratedSize = 150'000;
const std::string latin1 = "gr\xfc\xdf";
const std::string utf8 = "gr\xc3\xbc\xc3\x9f";

} // namespace

std::string namesIn(FtpSession& session) {
    return session.receive("NLST").value_or("(refused)");
}

void makeShares() {
    std::string text;
    for (const std::string name : {"public", "music", "upload", "closed"}) {
        const fs::path folder = fs::path("/mnt/srv") / name;
        fs::create_directories(folder);
        EXPECT_EQ(chmod(folder.c_str(), 0777), 0);
        writeFile(folder / "about", name);
        const char* grant = name == "public" ? "read" : name == "upload" ? "write" : "none";
        text += (text.empty() ? "" : ",") + (R"({"name": ")" + name) + R"(", "path": ")" + folder.string() +
                R"(", "ftp": true, "users": {"ftp": ")" + grant +
                R"(", "alice": "write", "bob": "write", "carol": "write"}})";
    }
    fs::create_directories(worldRoot / "etc/velt");
    writeFile(worldRoot / "etc/velt/shares.json", R"({"version": 1, "shares": [)" + text + "]}\n");
}

std::string fetchHome(int fromPort, std::vector<std::string> curlArguments) {
    curlArguments.insert(curlArguments.begin(),
                         {"curl", "--silent", "--max-time", "20", "--user", "alice:alice-secret",
                          "ftp://127.0.0.1:" + std::to_string(fromPort) + "/home-of"});
    return runProcess(curlArguments, {}, std::chrono::seconds(30)).output;
}

bool fetchesUnderTls(int fromPort) {
    return fetchHome(fromPort, {"--ssl-reqd", "--cacert", worldRoot / "var/lib/velt/tls/server.crt"}) ==
           "alice";
}

FtpSession aliceAt(int atPort) {
    FtpSession session(atPort);
    EXPECT_EQ(session.logIn("alice"), 230);
    return session;
}

UniqueFd listenOn(int atPort) {
    UniqueFd listener(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const int on = 1;
    EXPECT_EQ(setsockopt(listener.get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on), 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<in_port_t>(atPort));
    EXPECT_EQ(bind(listener.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    EXPECT_EQ(listen(listener.get(), 1), 0);
    return listener;
}

bool handshakes(std::vector<std::string> opensslArguments) {
    opensslArguments.insert(opensslArguments.begin(),
                            {"openssl", "s_client", "-connect", "127.0.0.1:2121", "-starttls", "ftp",
                             "-CAfile", worldRoot / "var/lib/velt/tls/server.crt"});
    const auto result = runProcess(opensslArguments, "QUIT\r\n", std::chrono::seconds(20));
    return contains(result.output, "Verify return code: 0 (ok)") &&
           !contains(result.output, "Cipher is (NONE)");
}

std::string rootOf(const std::string& user) {
    FtpSession session(ftpTestPort);
    if (const int code = session.logIn(user); code != 230) {
        return std::to_string(code);
    }
    session.command("CDUP");
    std::istringstream names(namesIn(session));
    std::vector<std::string> lines;
    for (std::string line; std::getline(names, line);) {
        lines.push_back(line + "\n");
    }
    std::ranges::sort(lines);
    std::string sorted;
    for (const std::string& line : lines) {
        sorted += line;
    }
    return sorted;
}

int anonymousLogin() {
    return FtpSession(ftpTestPort).logIn("anonymous", "a@b");
}

double secondsToFetch() {
    writeFile("/mnt/home/alice/data", std::string(ratedSize, 'x'), aliceId);
    FtpSession session = aliceAt();
    EXPECT_EQ(session.command("TYPE I").code, 200);
    const auto begin = Clock::now();
    EXPECT_EQ(session.receive("RETR data").value_or("").size(), ratedSize);
    return secondsSince(begin);
}

double secondsToSend() {
    FtpSession session = aliceAt();
    EXPECT_EQ(session.command("TYPE I").code, 200);
    const auto begin = Clock::now();
    EXPECT_EQ(session.send("STOR sent", std::string(ratedSize, 'x')), 226);
    return secondsSince(begin);
}

NameForms nameForms(FtpSession session) {
    writeFile("/mnt/home/alice/" + utf8, "x", aliceId);
    const std::string names = namesIn(session);
    EXPECT_TRUE(contains(names, utf8) || contains(names, latin1)) << names;
    return {contains(session.command("FEAT").text, "UTF8"), contains(names, utf8)};
}

void furnishSftp() {
    fs::create_directories("/mnt/srv");
    ASSERT_EQ(runProcess({"ssh-keygen", "-q", "-t", "ed25519", "-N", "", "-f", "/mnt/srv/key"}).exitCode, 0);
    fs::create_directories("/mnt/home/alice/.ssh");
    writeFile("/mnt/home/alice/.ssh/authorized_keys", contentsOf("/mnt/srv/key.pub"), aliceId);
    ASSERT_EQ(::chown("/mnt/home/alice/.ssh", aliceId, aliceId), 0);
    writeFile("/mnt/home/alice/large", std::string(largeSize, 'x'), aliceId);
}

ProcessResult sftp(int atPort, const std::string& commands, const std::string& speed) {
    return runProcess({"sftp",
                       "-F",
                       "/dev/null",
                       "-i",
                       "/mnt/srv/key",
                       "-B",
                       "32768",
                       "-l",
                       speed,
                       "-P",
                       std::to_string(atPort),
                       "-o",
                       "BatchMode=yes",
                       "-o",
                       "StrictHostKeyChecking=no",
                       "-o",
                       "UserKnownHostsFile=/dev/null",
                       "-b",
                       "-",
                       "alice@127.0.0.1"},
                      commands, std::chrono::seconds(30));
}

bool servesSftp(int atPort) {
    const bool done = sftp(atPort, "get large /mnt/srv/got\n").exitCode == 0;
    return done && fs::file_size("/mnt/srv/got") == largeSize;
}

} // namespace velt::test
