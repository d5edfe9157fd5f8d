#include "standalone/core/strict_file.h"

#include "base/file.h"
#include "base/number_text.h"
#include "base/text.h"
#include "standalone/core/error_number.h"
#include "standalone/core/quoted_text.h"

namespace velt {

namespace {

constexpr std::string_view versionKey = "version";

std::string_view withoutComment(std::string_view line) {
    bool quoted = false;
    for (std::size_t at = 0; at < line.size(); ++at) {
        if (line[at] == '"')
            quoted = !quoted;
        else if (quoted && line[at] == '\\')
            ++at;
        else if (!quoted && line[at] == '#')
            return line.substr(0, at);
    }
    return line;
}

} // namespace

Result<StrictFile> StrictFile::load(const std::filesystem::path& path, FileVersions versions) {
    VELT_ASSIGN_OR_RETURN(const auto contents, readOptionalFile(path));
    return contents ? parse(path.string(), *contents, versions) : StrictFile(path.string());
}

Result<StrictFile> StrictFile::parse(std::string name, std::string_view contents, FileVersions versions) {
    StrictFile file(std::move(name));
    int number = 0;
    while (!contents.empty())
        file.readLine(cut(contents, '\n'), ++number);
    // A newer version tells more than a line whose form only that version knows.
    VELT_RETURN_IF_ERROR(file.readVersion(versions));
    if (file.problem_)
        return *file.problem_;
    return file;
}

void StrictFile::readLine(std::string_view line, int number) {
    const std::string_view content = trimmed(withoutComment(line));
    if (content.empty())
        return;
    const auto equals = content.find('=');
    const std::string_view key = trimmed(content.substr(0, equals));
    if (equals == std::string_view::npos || key.empty())
        return note(problemAt(number, "expected \"key = value\""));
    const std::string_view value = trimmed(content.substr(equals + 1));
    if (!values_.emplace(key, Value{std::string(value), number}).second)
        note(problemAt(number, "duplicate key " + quotedText(key)));
}

Result<> StrictFile::readVersion(FileVersions versions) {
    const auto found = values_.find(versionKey);
    if (found == values_.end()) {
        version_ = 1;
        if (versions.required && !problem_)
            return problemAt(0, "missing key " + quotedText(versionKey));
        return {};
    }
    found->second.asked = true;
    const auto version = parseNumber(found->second.text);
    if (!version || *version < 1)
        return problemAt(found->second.line, "version: expected " + numberText(1, versions.newest));
    if (*version > versions.newest)
        return problemAt(found->second.line,
                         "version " + std::to_string(*version) +
                             " is newer than this program, which knows files up to version " +
                             std::to_string(versions.newest));
    version_ = static_cast<int>(*version);
    return {};
}

std::optional<std::string> StrictFile::value(std::string_view key, int since) {
    const auto found = values_.find(key);
    if (found != values_.end()) {
        found->second.asked = true;
        return found->second.text;
    }
    if (since <= version_)
        note(problemAt(0, "missing key " + quotedText(key)));
    return std::nullopt;
}

std::int64_t StrictFile::number(std::string_view key, std::int64_t least, std::int64_t most,
                                std::int64_t fallback, int since) {
    const auto text = value(key, since);
    if (!text)
        return fallback;
    const auto number = parseNumber(*text);
    if (number && *number >= least && *number <= most)
        return *number;
    refuse(key, numberText(least, most));
    return fallback;
}

bool StrictFile::boolean(std::string_view key, bool fallback, int since) {
    const auto text = value(key, since);
    if (!text)
        return fallback;
    if (*text != "0" && *text != "1")
        refuse(key, "0 or 1");
    return *text == "1";
}

std::string StrictFile::text(std::string_view key, std::size_t limit, std::string fallback, int since) {
    const auto quoted = value(key, since);
    if (!quoted)
        return fallback;
    auto text = readQuotedText(*quoted);
    if (text && text->size() <= limit)
        return *std::move(text);
    refuse(key, text ? "at most " + std::to_string(limit) + " bytes" : "a text in double quotes");
    return fallback;
}

void StrictFile::refuse(std::string_view key, std::string_view expected) {
    const auto found = values_.find(key);
    note(problemAt(found == values_.end() ? 0 : found->second.line,
                   std::string(key).append(": expected ").append(expected)));
}

Result<> StrictFile::finish() {
    if (problem_)
        return *problem_;
    for (const auto& [key, value] : values_)
        if (!value.asked)
            return problemAt(value.line, "unknown key " + quotedText(key));
    return {};
}

Error StrictFile::problemAt(int line, const std::string& what) const {
    const std::string place = line == 0 ? "" : ", line " + std::to_string(line);
    return {ErrorNumber::damaged, "Cannot read " + name_ + place + ": " + what + "."};
}

void StrictFile::note(Error problem) {
    if (!problem_)
        problem_ = std::move(problem);
}

} // namespace velt
