#include "standalone/core/staged_files.h"

#include "base/file.h"

#include <sys/stat.h>
#include <unistd.h>

#include <utility>

namespace velt {

namespace {

constexpr mode_t defaultMode = 0644;

mode_t modeOf(const std::filesystem::path& file) {
    struct stat status {};
    return ::stat(file.c_str(), &status) == 0 ? status.st_mode & 0777 : defaultMode;
}

} // namespace

StagedFiles::Copies*& StagedFiles::ofThisThread() {
    thread_local Copies* copies = nullptr;
    return copies;
}

Result<StagedFiles> StagedFiles::begin() {
    VELT_ASSIGN_OR_RETURN(auto folder, ScratchFolder::make());
    auto copies = std::make_unique<Copies>(Copies{std::move(folder), {}, {}});
    ofThisThread() = copies.get();
    setOtherPlaces(&copies->places);
    return StagedFiles(std::move(copies));
}

StagedFiles::~StagedFiles() {
    if (copies_) {
        setOtherPlaces(nullptr);
        ofThisThread() = nullptr;
    }
}

Result<std::vector<StagedFile>> StagedFiles::changes() const {
    std::vector<StagedFile> changed;
    for (const std::string& name : copies_->order) {
        const auto& copy = copies_->places.at(name);
        StagedFile file{name, {}, {}, modeOf(copy)};
        VELT_ASSIGN_OR_RETURN(file.before, readOptionalFile(placeBelowRoot(name)));
        VELT_ASSIGN_OR_RETURN(const auto after, readOptionalFile(copy));
        // Without a copy the write has failed, and its caller knows.
        if (after && after != file.before) {
            file.after = *after;
            changed.push_back(std::move(file));
        }
    }
    return changed;
}

Result<std::filesystem::path> storePath(std::string_view absolutePath) {
    StagedFiles::Copies* const copies = StagedFiles::ofThisThread();
    if (copies == nullptr || copies->places.contains(absolutePath)) {
        return statePath(absolutePath);
    }
    const std::string name(absolutePath);
    const auto original = placeBelowRoot(name);
    const auto copy = copies->folder.path() / std::to_string(copies->order.size());
    // Some writers keep what they do not change.
    VELT_ASSIGN_OR_RETURN(const auto contents, readOptionalFile(original));
    if (contents) {
        VELT_RETURN_IF_ERROR(replaceFile(copy, *contents, modeOf(original)));
    }
    copies->places.emplace(name, copy);
    copies->order.push_back(name);
    return copy;
}

Result<> store(const StagedFile& file) {
    return replaceFile(placeBelowRoot(file.name), file.after, file.mode);
}

bool isAsBefore(const StagedFile& file) {
    const auto now = readOptionalFile(placeBelowRoot(file.name));
    return now && *now == file.before;
}

Result<> restore(const StagedFile& file) {
    if (isAsBefore(file)) {
        return {};
    }
    const auto place = placeBelowRoot(file.name);
    if (file.before) {
        return replaceFile(place, *file.before, file.mode);
    }
    return ::unlink(place.c_str()) == 0 || errno == ENOENT ? Result<>() : cannot("remove", place);
}

} // namespace velt
