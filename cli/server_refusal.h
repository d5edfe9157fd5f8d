// What the server's refusals mean for the person or program that asked.
#ifndef VELT_CLI_SERVER_REFUSAL_H
#define VELT_CLI_SERVER_REFUSAL_H

#include "cli/failure.h"
#include "cli/http_client.h"

#include <string>

namespace velt::cli {

/// The request that was refused. A GET could change nothing.
struct AskedFor {
    std::string method;
    std::string path;
};

/// The failure that an answer other than 200, 201 or 204 stands for: the exit code by its status, what the
/// problem document says, each fact once, and what to do next.
Failure failureFrom(const HttpAnswer& answer, const ServerAddress& server, const AskedFor& asked);

/// The failure for an answer that a server of this release would not give; `message` says what is wrong with
/// it.
Failure unexpectedAnswer(const std::string& message);

} // namespace velt::cli

#endif
