// Amounts of data as people read them.
#ifndef VELT_CLI_SIZE_TEXT_H
#define VELT_CLI_SIZE_TEXT_H

#include <cstdint>
#include <string>

namespace velt::cli {

/// "999 B", "1.0 KB", "25 MB", "1.5 TB": units of 1000, and at least two digits.
std::string sizeText(std::uint64_t octets);

} // namespace velt::cli

#endif
