// Answers as they are sent.
#ifndef VELT_HOST_HTTP_RESPONSE_TEXT_H
#define VELT_HOST_HTTP_RESPONSE_TEXT_H

#include "host/http/message.h"

#include <string>

namespace velt::host {

/// The reason phrase of a status: "Not Found".
const char* reasonPhrase(int status);

/// Status line, headers and body in one text, so that one write sends them. Without body for HEAD.
std::string responseText(const HttpResponse& response, bool keepAlive, bool withBody);

/// The head of a stream of events, which lasts as long as the connection.
std::string eventStreamHead();

} // namespace velt::host

#endif
