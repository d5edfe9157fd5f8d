#include "standalone/core/key_value_file.h"

#include "base/file.h"
#include "base/text.h"
#include "standalone/core/error_number.h"

#include <sys/stat.h>

#include <algorithm>

namespace velt {

namespace {

constexpr std::size_t longestValue = 4096;

std::string_view unquoted(std::string_view value) {
    if (value.size() >= 2 && value.front() == '"' && value.back() == '"')
        return value.substr(1, value.size() - 2);
    return value;
}

// What a reader would trim or unquote goes into quotes, of which the reader takes one pair away.
std::string quotedIfNeeded(std::string_view value) {
    if (value == trimmed(value) && value == unquoted(value))
        return std::string(value);
    return '"' + std::string(value) + '"';
}

struct FoundLine {
    std::size_t begin = 0;
    std::size_t length = 0; ///< without the line's end
    std::string_view value;
};

std::optional<FoundLine> findKey(std::string_view contents, std::string_view key) {
    std::optional<FoundLine> found;
    for (std::size_t at = 0; at < contents.size();) {
        const std::string_view line = contents.substr(at, contents.find('\n', at) - at);
        const auto equals = line.find('=');
        if (equals != std::string_view::npos && trimmed(line.substr(0, equals)) == key)
            found = FoundLine{at, line.size(), unquoted(trimmed(line.substr(equals + 1)))};
        at += line.size() + 1;
    }
    return found;
}

bool isKeyByte(char byte) {
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') ||
           byte == '_' || byte == '-' || byte == '.';
}

Result<> checkKeyValue(std::string_view key, std::string_view value) {
    if (key.empty() || !std::all_of(key.begin(), key.end(), isKeyByte))
        return Error(ErrorNumber::invalid, "Expected a key of letters, digits, \"_\", \"-\" and \".\".");
    const std::string name(key);
    if (value.size() > longestValue)
        return Error(ErrorNumber::invalid,
                     "The value of " + name + " is longer than " + std::to_string(longestValue) + " bytes.");
    if (std::any_of(value.begin(), value.end(), isControl))
        return Error(ErrorNumber::invalid,
                     "The value of " + name + " contains a line break or control character.");
    return {};
}

mode_t modeOf(const std::filesystem::path& file) {
    struct stat status {};
    return ::stat(file.c_str(), &status) == 0 ? status.st_mode & 0777 : 0644;
}

} // namespace

Result<std::optional<std::string>> readKeyValue(const std::filesystem::path& file, std::string_view key) {
    VELT_ASSIGN_OR_RETURN(const auto contents, readOptionalFile(file));
    if (!contents)
        return std::nullopt;
    const auto found = findKey(*contents, key);
    return found ? std::optional(std::string(found->value)) : std::nullopt;
}

Result<> writeKeyValue(const std::filesystem::path& file, std::string_view key, std::string_view value) {
    VELT_RETURN_IF_ERROR(checkKeyValue(key, value));
    VELT_ASSIGN_OR_RETURN(const auto read, readOptionalFile(file));
    std::string contents = read.value_or("");
    const std::string line = std::string(key) + '=' + quotedIfNeeded(value);
    if (const auto found = findKey(contents, key)) {
        contents.replace(found->begin, found->length, line);
    } else {
        if (!contents.empty() && contents.back() != '\n')
            contents += '\n';
        contents += line + '\n';
    }
    return replaceFile(file, contents, modeOf(file));
}

} // namespace velt
