// Where the server is, and how the user proves who they are.
#ifndef VELT_CLI_SERVER_ADDRESS_H
#define VELT_CLI_SERVER_ADDRESS_H

#include "cli/console.h"

#include <string>

namespace velt::cli {

inline constexpr const char* defaultSocket = "/run/velt/veltd.sock";
inline constexpr int defaultTimeoutSeconds = 60;

/// What to do when something other than veltd seems to answer.
inline constexpr const char* checkAddress = "Check that --url or VELT_URL is the address of veltd.";

/// What the command line says about the server. An empty text was not given.
struct AddressOptions {
    std::string url;
    std::string socket;
    std::string tokenFile;
    std::string caFile;
    int timeoutSeconds = defaultTimeoutSeconds;
};

struct ServerAddress {
    std::string url;    ///< scheme, host and port, without a slash at the end
    std::string socket; ///< path of a Unix socket; empty for TCP
    std::string token;  ///< bearer token; empty for none
    std::string caFile; ///< certificates to trust; empty for the system's
    int timeoutSeconds = defaultTimeoutSeconds;

    /// For messages.
    std::string name() const { return socket.empty() ? url : socket; }
};

/// The options first, then VELT_URL, VELT_SOCKET and VELT_TOKEN, then the default socket. Throws Failure
/// (usage) for an address that is not an http or https URL, and for a token that would be sent unencrypted to
/// another machine.
ServerAddress findServer(const AddressOptions& options, Console& console);

} // namespace velt::cli

#endif
