// Texts that nobody can guess.
#ifndef VELT_HOST_BASE_RANDOM_TEXT_H
#define VELT_HOST_BASE_RANDOM_TEXT_H

#include <cstddef>
#include <string>

namespace velt::host {

/// That many bytes from the kernel's generator, in hexadecimal. Throws std::system_error when it gives none.
std::string randomHexadecimal(std::size_t bytes);

/// Names one request, uniquely among those of all runs of the host.
std::string nextRequestId();

} // namespace velt::host

#endif
