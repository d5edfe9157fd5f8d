// Adding all keys of a file.
#ifndef VELT_CLI_KEY_IMPORT_H
#define VELT_CLI_KEY_IMPORT_H

#include "cli/command.h"

#include <string>
#include <string_view>
#include <vector>

namespace velt::cli {

/// A line of a file that holds a key, or is to.
struct KeyLine {
    int number = 0; ///< the first has 1
    std::string text;
};

/// The lines of an authorized_keys file, without empty ones and comments.
std::vector<KeyLine> keyLinesIn(std::string_view text);

/// Asks the server to add the key.
Json::Value addKey(Context& context, const std::string& user, const std::string& line,
                   const std::string& query = {});

/// Adds the keys of the file, and tells of each line what became of it, or in a dry run what would. A refused
/// one leaves the others; the exit code says so then.
void importKeys(Context& context, const std::string& user, const std::string& file, bool dryRun);

} // namespace velt::cli

#endif
