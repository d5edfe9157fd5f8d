// Unguessable texts.
#ifndef VELT_HOST_BASE_RANDOM_TEXT_H
#define VELT_HOST_BASE_RANDOM_TEXT_H

#include <cstddef>
#include <string>

namespace velt::host {

/// Random bytes of the kernel in hexadecimal. Throws std::system_error.
std::string randomHexadecimal(std::size_t bytes);

/// A new id, unique among all runs of the host.
std::string nextRequestId();

} // namespace velt::host

#endif
