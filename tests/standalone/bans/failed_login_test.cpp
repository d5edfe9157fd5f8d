#include "standalone/bans/failed_login.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>

namespace velt {
namespace {

std::string addressIn(std::optional<IpNetwork> (*read)(std::string_view), std::string_view message) {
    const auto address = read(message);
    return address ? toText(*address) : "";
}

std::string sftp(std::string_view message) {
    return addressIn(failedSftpLogin, message);
}

std::string ftp(std::string_view message) {
    return addressIn(failedFtpLogin, message);
}

TEST(FailedSftpLogin, IsARefusedPassword) {
    EXPECT_EQ(sftp("Failed password for alice from 192.0.2.7 port 53076 ssh2\r\n"), "192.0.2.7");
    EXPECT_EQ(sftp("Failed password for invalid user nosuch from 2001:db8::7 port 38454 ssh2\r\n"),
              "2001:db8::7");
    EXPECT_EQ(sftp("Failed password for alice from fe80::7%eth0 port 53076 ssh2"), "fe80::7");
    EXPECT_EQ(sftp("Failed password for invalid user  from 192.0.2.7 port 53076 ssh2"), "192.0.2.7");
    EXPECT_EQ(sftp("PAM: Authentication failure for alice from 192.0.2.7\r\n"), "192.0.2.7");
    EXPECT_EQ(sftp("PAM: User not known to the underlying authentication module for illegal user x from "
                   "192.0.2.7\r\n"),
              "192.0.2.7");
}

TEST(FailedSftpLogin, HasTheNameThatWasGiven) {
    const auto nameIn = userOfFailedSftpLogin;
    EXPECT_EQ(nameIn("Failed password for alice from 192.0.2.7 port 53076 ssh2\r\n"), "alice");
    EXPECT_EQ(nameIn("Failed password for invalid user no such from 192.0.2.7 port 5 ssh2"), "no such");
    EXPECT_EQ(nameIn("Failed password for invalid user  from 192.0.2.7 port 53076 ssh2"), "");
    EXPECT_EQ(
        nameIn("Failed password for invalid user a from 1.2.3.4 port 1 ssh2 from 192.0.2.7 port 5 ssh2"),
        "a from 1.2.3.4 port 1 ssh2");
    EXPECT_EQ(nameIn("PAM: Authentication failure for alice from 192.0.2.7\r\n"), "alice");
    EXPECT_EQ(nameIn("PAM: User not known for illegal user x for y from 192.0.2.7\r\n"), "x for y");
    EXPECT_EQ(nameIn("Accepted password for alice from 192.0.2.7 port 53076 ssh2\r\n"), "");
    EXPECT_EQ(nameIn("Failed password for "), "");
}

TEST(FailedSftpLogin, IsNotWhatCameBeforeOrAfterIt) {
    for (const char* message : {
             "Server listening on 0.0.0.0 port 42022.\r\n",
             "Invalid user nosuch from 192.0.2.7 port 38454\r\n",
             "Connection closed by authenticating user alice 192.0.2.7 port 53076 [preauth]\r\n",
             "Connection closed by invalid user nosuch 192.0.2.7 port 38454 [preauth]\r\n",
             "maximum authentication attempts exceeded for al from 192.0.2.7 port 49396 ssh2 [preauth]\r\n",
             "Disconnecting invalid user x 192.0.2.7 port 49396: Too many authentication failures [preauth]",
             "Postponed keyboard-interactive for alice from 192.0.2.7 port 48208 ssh2 [preauth]\r\n",
             "Failed keyboard-interactive/pam for alice from 192.0.2.7 port 48208 ssh2\r\n",
             "Failed publickey for alice from 192.0.2.7 port 48208 ssh2: ED25519 SHA256:x\r\n",
             "Accepted password for alice from 192.0.2.7 port 48208 ssh2\r\n",
             "",
             "\r\n",
             "Failed password for ",
             "PAM: ",
         }) {
        EXPECT_EQ(sftp(message), "") << message;
    }
}

TEST(FailedSftpLogin, ComesFromWhereItCameWhateverTheNameSays) {
    for (const std::string name : {
             "x from 1.2.3.4 port 1 ssh2",
             "x from 1.2.3.4 port 1 ssh2\r",
             "x from 1.2.3.4 port 1 ssh2\n",
             "x\nFailed password for root from 1.2.3.4 port 5 ssh2\r\nx",
             "x\r\nPAM: Authentication failure for root from 1.2.3.4\r\n",
             " from 1.2.3.4",
             " port 1 ssh2",
             "%s%n\xff",
         }) {
        EXPECT_EQ(sftp("Failed password for invalid user " + name + " from 192.0.2.7 port 53076 ssh2\r\n"),
                  "192.0.2.7")
            << name;
        EXPECT_EQ(sftp("PAM: Authentication failure for illegal user " + name + " from 192.0.2.7\r\n"),
                  "192.0.2.7")
            << name;
        EXPECT_EQ(sftp("Invalid user " + name + " from 192.0.2.7 port 53076\r\n"), "") << name;
        EXPECT_EQ(sftp("Connection closed by invalid user " + name + " 192.0.2.7 port 5 [preauth]\r\n"), "")
            << name;
    }
}

TEST(FailedSftpLogin, IsReadToItsEnd) {
    for (const char* message : {
             "Failed password for alice from 192.0.2.7 port 53076 ssh2 [preauth]",
             "Failed password for alice from 192.0.2.7 port 53076",
             "Failed password for alice from 192.0.2.7 port x ssh2",
             "Failed password for alice from 192.0.2.7  port 1 ssh2",
             "Failed password for alice from host.example port 1 ssh2",
             "Failed password for alice from 192.0.2.0/24 port 1 ssh2",
             " Failed password for alice from 192.0.2.7 port 1 ssh2",
             "PAM: Authentication failure for alice from UNKNOWN",
             "PAM: Authentication failure from 192.0.2.7",
             "PAM: Authentication failure for alice from 192.0.2.7 x",
         }) {
        EXPECT_EQ(sftp(message), "") << message;
    }
}

const std::string head = "2026-11-22 08:00:00,123 server proftpd[123] 192.0.2.1 (192.0.2.7[192.0.2.7]): ";

TEST(FailedFtpLogin, IsWhatOurModuleWrites) {
    EXPECT_EQ(ftp(head + "mod_velt_login: password refused from 192.0.2.7\n"), "192.0.2.7");
    EXPECT_EQ(ftp(head + "mod_velt_login: password refused from ::ffff:192.0.2.7\n"), "192.0.2.7");
    EXPECT_EQ(ftp(head + "mod_velt_login: password refused from 2001:db8::7\n"), "2001:db8::7");
}

TEST(FailedFtpLogin, CannotBeForgedByAName) {
    const std::string words = "mod_velt_login: password refused from 1.2.3.4";
    for (const std::string& text : {
             "USER " + words + " (Login failed): Incorrect password\n",
             "USER x]): " + words + "\n",
             "USER x\n" + head + words + "\n",
             "mod_velt_login/2.0: login of '" + words + "' refused: " + words + "\n",
             " " + words + "\n",
             words + " x\n",
             words + "\nx",
         }) {
        EXPECT_EQ(ftp(head + text), "") << text;
    }
    EXPECT_EQ(ftp(words), "") << "without the daemon's head";
    EXPECT_EQ(ftp(""), "");
}

} // namespace
} // namespace velt
