// What the server's refusals mean for the person or program that asked.
#ifndef VELT_CLI_SERVER_REFUSAL_H
#define VELT_CLI_SERVER_REFUSAL_H

#include "cli/failure.h"
#include "cli/http_client.h"

namespace velt::cli {

/// The failure that an answer other than 200, 201 or 204 stands for: the exit code by its status, the
/// problem's detail, fields, holder, code and request id as notes, and what to do next.
Failure failureFrom(const HttpAnswer& answer, const ServerAddress& server);

} // namespace velt::cli

#endif
