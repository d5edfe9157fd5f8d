// Being a client of a service for a moment.
#ifndef VELT_STANDALONE_HEALTH_GREETING_H
#define VELT_STANDALONE_HEALTH_GREETING_H

#include "base/result.h"

#include <chrono>
#include <filesystem>
#include <string>
#include <string_view>

namespace velt {

/// Connects to the port of 127.0.0.1 and waits for a first line that begins in this way. The error's message
/// is a part of a sentence. Ends within the limit, as the others do.
Result<> awaitGreeting(int port, std::string_view beginning, std::chrono::milliseconds limit);

/// Asks the FTP service on the port for TLS, and takes it up. Gives the digest of the certificate that was
/// served, whoever issued it.
Result<std::string> certificateServedAt(int port, std::chrono::milliseconds limit);

/// The digest of the first certificate in a PEM file; "" when there is none.
std::string digestOf(const std::filesystem::path& certificate);

} // namespace velt

#endif
