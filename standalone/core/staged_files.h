// Files that a thread changes aside, before anybody else sees the change.
#ifndef VELT_STANDALONE_CORE_STAGED_FILES_H
#define VELT_STANDALONE_CORE_STAGED_FILES_H

#include "base/result.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_root.h"

#include <sys/types.h>

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// A file as it is stored, and as it is to be.
struct StagedFile {
    std::string name;                  ///< as in paths.h
    std::optional<std::string> before; ///< nothing: there is none
    std::string after;
    mode_t mode = 0; ///< that it is to have

    bool operator==(const StagedFile&) const = default;
};

/// While it lives, what its thread writes at a place from storePath goes to a copy, which this thread alone
/// reads from then on. Hold the StateLock meanwhile, else others may change the files underneath. One at a
/// time on a thread, where it stays.
class StagedFiles {
public:
    static Result<StagedFiles> begin();
    ~StagedFiles();
    StagedFiles(StagedFiles&&) = default;
    StagedFiles& operator=(StagedFiles&&) = delete;

    /// The files that differ from what is stored, in the order in which they were written first.
    Result<std::vector<StagedFile>> changes() const;

private:
    friend Result<std::filesystem::path> storePath(std::string_view absolutePath);

    struct Copies {
        ScratchFolder folder;
        OtherPlaces places;
        std::vector<std::string> order; ///< of the first writes
    };
    static Copies*& ofThisThread();

    explicit StagedFiles(std::unique_ptr<Copies> copies) : copies_(std::move(copies)) {}

    std::unique_ptr<Copies> copies_;
};

/// Where to write one of the files of paths.h, or one below a folder of these: the place that statePath
/// gives, or that of the copy where this thread stages its changes.
Result<std::filesystem::path> storePath(std::string_view absolutePath);

/// Writes the file as it is to be at its place, for all to see. To be called when nothing is staged.
Result<> store(const StagedFile& file);

/// Whether the file is as it was; false also when that cannot be told.
bool isAsBefore(const StagedFile& file);

/// Brings the file back as it was. One that is so already is left alone, where nothing can be written, too.
Result<> restore(const StagedFile& file);

} // namespace velt

#endif
