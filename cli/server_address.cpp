#include "cli/server_address.h"

#include "base/text.h"
#include "cli/failure.h"

#include <algorithm>

namespace velt::cli {

namespace {

std::string hostOf(const std::string& url) {
    const std::size_t start = url.find("://") + 3;
    std::string authority = url.substr(start, url.find_first_of("/?#", start) - start);
    authority.erase(0, authority.rfind('@') + 1);
    if (!authority.empty() && authority.front() == '[') {
        return authority.substr(0, authority.find(']') + 1);
    }
    return authority.substr(0, authority.find(':'));
}

// Digits only after "127.": a name such as 127.example.org is another machine.
bool isLoopback(const std::string& host) {
    return host == "localhost" || host == "[::1]" ||
           (host.rfind("127.", 0) == 0 && host.find_first_not_of("0123456789.") == std::string::npos);
}

void checkUrl(const std::string& url) {
    const bool known = url.rfind("http://", 0) == 0 || url.rfind("https://", 0) == 0;
    if (!known || hostOf(url).empty()) {
        throw Failure(ExitCode::usage, "Invalid server address \"" + url + "\".",
                      "Use an address such as http://127.0.0.1:8443 or https://server:8443.");
    }
}

std::string readToken(const AddressOptions& options, Console& console) {
    if (options.tokenFile.empty()) {
        return console.environment("VELT_TOKEN").value_or("");
    }
    return std::string(trimmedEnd(readInput(console, options.tokenFile), " \t\r\n"));
}

// A line end in the token would start a header of its own.
void checkToken(const ServerAddress& server) {
    const std::string& token = server.token;
    if (std::ranges::any_of(token, [](unsigned char c) { return c <= 0x20 || c >= 0x7F; })) {
        throw Failure(ExitCode::usage, "The token contains characters that are not allowed.",
                      "Copy the token again; it is a single word.");
    }
    const bool encrypted = server.url.rfind("https://", 0) == 0;
    if (!token.empty() && server.socket.empty() && !encrypted && !isLoopback(hostOf(server.url))) {
        throw Failure(ExitCode::usage, "The token would be sent unencrypted to " + hostOf(server.url) + ".",
                      "Use an https:// address, or run veltctl on the server itself.");
    }
}

} // namespace

ServerAddress findServer(const AddressOptions& options, Console& console) {
    ServerAddress server;
    server.url = options.url;
    server.socket = options.socket;
    if (server.url.empty() && server.socket.empty()) {
        server.url = console.environment("VELT_URL").value_or("");
    }
    if (server.url.empty()) {
        if (server.socket.empty()) {
            server.socket = console.environment("VELT_SOCKET").value_or("");
        }
        if (server.socket.empty()) {
            server.socket = defaultSocket;
        }
        server.url = "http://localhost";
    }
    checkUrl(server.url);
    server.url.erase(server.url.find_last_not_of('/') + 1);
    server.token = readToken(options, console);
    server.caFile = options.caFile;
    server.timeoutSeconds = options.timeoutSeconds;
    checkToken(server);
    return server;
}

} // namespace velt::cli
