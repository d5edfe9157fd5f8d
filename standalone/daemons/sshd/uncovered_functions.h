// Whether the library that confines SFTP sessions knows this server's OpenSSH.
#ifndef VELT_STANDALONE_DAEMONS_SSHD_UNCOVERED_FUNCTIONS_H
#define VELT_STANDALONE_DAEMONS_SSHD_UNCOVERED_FUNCTIONS_H

#include "base/result.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// The functions by which this program or library calls others (imported), or those that it offers to others,
/// in the order of its file. An error when it is not a dynamic ELF file of this machine's word size.
struct DynamicFunctions {
    std::vector<std::string> imported;
    std::vector<std::string> offered;
};
Result<DynamicFunctions> dynamicFunctionsOf(const std::filesystem::path& file);

/// Functions of the C library that change files by their names, or in other ways than by writing to what is
/// open for it, and that one of the programs calls and the library does not offer in their place. Sorted.
/// What else the library has to offer for a view to come about at all counts, too.
Result<std::vector<std::string>> uncoveredFunctions(const std::vector<std::filesystem::path>& programs,
                                                    const std::filesystem::path& library);

} // namespace velt

#endif
