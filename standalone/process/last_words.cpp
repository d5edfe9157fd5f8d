#include "standalone/process/last_words.h"

#include "base/plain_text.h"
#include "base/text.h"

#include <algorithm>
#include <array>
#include <sstream>
#include <string_view>

namespace velt {
namespace {

constexpr std::size_t longestWords = 400;

/// "2026-01-31 12:00:00,123 host proftpd[42] address: ..." begins each line of ProFTPD's.
std::string withoutPrefix(std::string line) {
    constexpr std::string_view fatal = ": fatal: ";
    if (const auto at = line.find(fatal); at != std::string::npos) {
        return line.substr(at + fatal.size());
    }
    if (const auto process = line.find(" proftpd["); process != std::string::npos) {
        if (const auto colon = line.find(": ", process); colon != std::string::npos) {
            line.erase(0, colon + 2);
        }
    }
    return line;
}

// Daemons name the cause first, and then what they or the reader should do about it.
bool namesACause(const std::string& line) {
    constexpr std::array<std::string_view, 5> signs{": fatal: ", "error: ", "Failed ", " failed", "Bad "};
    return std::any_of(signs.begin(), signs.end(),
                       [&line](std::string_view sign) { return line.find(sign) != std::string::npos; });
}

} // namespace

std::string lastWords(const std::string& errors) {
    std::string words;
    std::istringstream lines(errors);
    for (std::string line; std::getline(lines, line);) {
        if (line.find_first_not_of(" \r\t") != std::string::npos) {
            words = line;
        }
        if (namesACause(line)) {
            break;
        }
    }
    return plainText(trimmedEnd(withoutPrefix(std::move(words)), "\r ."), longestWords);
}

std::string reasonOfEnd(std::string words, int status, const std::string& program) {
    return words.empty() ? program + " ended with status " + std::to_string(status) : std::move(words);
}

std::string reasonOfEnd(const Result<ProcessResult>& failed, const std::string& program) {
    return failed ? reasonOfEnd(lastWords(failed->errors), failed->exitCode, program)
                  : lastWords(failed.error().message);
}

} // namespace velt
