// What the daemons write about a login, in which the user's name is a stranger's.
#include "standalone/bans/failed_login.h"

#include "fuzz/target.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string name = velt::fuzz::textOf(data, size);
    velt::failedSftpLogin(name);
    velt::failedFtpLogin(name);
    const auto client = velt::parseIpAddress("192.0.2.7");
    velt::fuzz::check(velt::failedSftpLogin("Failed password for invalid user " + name +
                                            " from 192.0.2.7 port 53076 ssh2\r\n") == client,
                      "no name hides or replaces the address");
    velt::fuzz::check(velt::failedSftpLogin("PAM: Authentication failure for illegal user " + name +
                                            " from 192.0.2.7\r\n") == client,
                      "nor where PAM refuses");
    velt::fuzz::check(!velt::failedSftpLogin("Invalid user " + name + " from 192.0.2.7 port 53076\r\n"),
                      "no name makes a failure of another message");
    velt::fuzz::check(!velt::failedFtpLogin("2026-11-22 08:00:00,123 server proftpd[123] 192.0.2.1 "
                                            "(192.0.2.7[192.0.2.7]): USER " +
                                            name + " (Login failed): Incorrect password\n"),
                      "nor does it over FTP");
    return 0;
}
