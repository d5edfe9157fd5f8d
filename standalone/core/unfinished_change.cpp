#include "standalone/core/unfinished_change.h"

#include "base/file.h"
#include "base/number_text.h"
#include "base/text.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <string>

namespace velt {

namespace {

constexpr std::string_view versionLine = "velt-unfinished-change 1";
constexpr std::string_view endLine = "end\n";
constexpr std::string_view absent = "absent";
constexpr mode_t noteMode = 0600; // it holds what the files hold

// Changes of this process.
std::atomic<unsigned> atWork{0};
std::atomic<unsigned> begun{0};

std::filesystem::path noteFile() {
    return placeBelowRoot(paths::unfinishedChange);
}

/// For each file a line with its mode, its size in bytes (or "absent") and its name, then its bytes and the
/// end of their line.
std::string format(const std::vector<StagedFile>& files) {
    std::string text = std::string(versionLine) + '\n';
    for (const StagedFile& file : files) {
        text += std::to_string(file.mode) + ' ' +
                (file.before ? std::to_string(file.before->size()) : std::string(absent)) + ' ' + file.name +
                '\n' + file.before.value_or("") + '\n';
    }
    return text += endLine;
}

/// Takes the next file off the text; nothing when it is not of this form.
std::optional<StagedFile> parseFile(std::string_view& text) {
    std::string_view head = cut(text, '\n');
    const auto mode = parseNumber(cut(head, ' '));
    const std::string_view size = cut(head, ' ');
    StagedFile file{std::string(head), {}, {}, static_cast<mode_t>(mode.value_or(0))};
    const auto length = size == absent ? 0 : parseNumber(size).value_or(-1);
    if (!mode || length < 0 || static_cast<std::size_t>(length) >= text.size() || !head.starts_with('/')) {
        return std::nullopt;
    }
    if (size != absent) {
        file.before = std::string(text.substr(0, static_cast<std::size_t>(length)));
    }
    text.remove_prefix(static_cast<std::size_t>(length));
    return cut(text, '\n').empty() ? std::optional(std::move(file)) : std::nullopt;
}

} // namespace

Result<> noteChange(const std::vector<StagedFile>& files) {
    return replaceFile(noteFile(), format(files), noteMode);
}

Result<> forgetChange() {
    return ::unlink(noteFile().c_str()) == 0 || errno == ENOENT ? Result<>() : cannot("remove", noteFile());
}

Result<std::vector<StagedFile>> unfinishedChange() {
    VELT_ASSIGN_OR_RETURN(const auto note, readOptionalFile(noteFile()));
    std::vector<StagedFile> files;
    if (!note) {
        return files;
    }
    std::string_view text = *note;
    const bool known = cut(text, '\n') == versionLine;
    while (known && text != endLine) {
        auto file = parseFile(text);
        if (!file) {
            break;
        }
        files.push_back(std::move(*file));
    }
    if (!known || text != endLine) {
        return Error(ErrorNumber::damaged, "Cannot read " + noteFile().string() +
                                               ": it is damaged. Check the settings, then remove it.");
    }
    return files;
}

ChangeAtWork::ChangeAtWork() {
    ++begun;
    ++atWork;
}

ChangeAtWork::~ChangeAtWork() {
    --atWork;
}

ChangeCount changeCount() {
    return {begun, atWork};
}

bool changeWasLeft() {
    // One that is at work during the look has a note, and may begin or end meanwhile.
    const unsigned before = begun;
    return atWork == 0 && fileExists(noteFile()) && atWork == 0 && begun == before;
}

} // namespace velt
