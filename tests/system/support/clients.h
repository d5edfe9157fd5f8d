// What real clients of the services see: the proof that a setting has its effect.
//
// The functions run in the private world. Those that have no port to ask take the tests' own.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_CLIENTS_H
#define VELT_TESTS_SYSTEM_SUPPORT_CLIENTS_H

#include "base/unique_fd.h"
#include "tests/support/run_program.h"
#include "tests/system/support/ftp_session.h"

#include <string>
#include <vector>

namespace velt::test {

/// Where the tests have FTP listen.
inline constexpr int ftpTestPort = 2121;

/// Writes the file of the shares: "public" (anonymous users read it), "music", "upload" (they write) and
/// "closed", each a folder of that name below /mnt/srv with one file "about" that holds the name. Alice, bob
/// and carol may write in all of them.
void makeShares();

/// What alice gets when she fetches the file of her home; "" when she is refused.
std::string fetchHome(int fromPort = ftpTestPort, std::vector<std::string> curlArguments = {});
bool fetchesUnderTls(int fromPort = ftpTestPort);
/// Whether a TLS client with these further arguments gets a session on the control connection.
bool handshakes(std::vector<std::string> opensslArguments);

/// A session in which alice is logged in.
FtpSession aliceAt(int atPort = ftpTestPort);
std::string namesIn(FtpSession& session);
/// What stands in the root of the user's session, sorted; "530" when the login is refused.
std::string rootOf(const std::string& user);
/// The code of the answer to the login of an anonymous user.
int anonymousLogin();

/// How long alice takes to fetch, and to send, a file that 100 KB/s make longer than a second.
double secondsToFetch();
double secondsToSend();

/// Whether the server offers UTF-8, and whether a session starts in it.
struct NameForms {
    bool offered = false;
    bool atStart = false;
    bool operator==(const NameForms&) const = default;
};
NameForms nameForms(FtpSession session);

/// Something else that has the port until the descriptor is closed.
UniqueFd listenOn(int atPort);

/// Makes a key for alice and the file "large" in her home.
inline constexpr std::size_t largeSize = 600000;
void furnishSftp();
/// An SFTP session of alice that does the commands; its speed in Kbit/s. The limit holds between two requests
/// of 32 KiB.
ProcessResult sftp(int atPort, const std::string& commands, const std::string& speed = "1000000");
/// Whether alice can fetch the large file.
bool servesSftp(int atPort);

} // namespace velt::test

#endif
