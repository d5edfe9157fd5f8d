// The file tree that a login sees, made of mounts in this process's own mount namespace.
#ifndef VELT_STANDALONE_LOGIN_VIEW_MOUNTS_H
#define VELT_STANDALONE_LOGIN_VIEW_MOUNTS_H

#include "base/unique_fd.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// A folder within a visible one that may be used less than what is around it.
struct Restriction {
    std::filesystem::path place; ///< relative to the visible folder, free of links; outer ones come first
    bool hidden = false;         ///< nothing of it can be seen; else it is for reading only
};

struct VisibleFolder {
    UniqueFd folder;
    bool readOnly = false;
    std::vector<Restriction> restrictions;
};

/// Lets nothing that is mounted from now on reach other mount namespaces. False, with the last error set, on
/// failure.
bool isolateMounts();

/// Makes `root` show this folder. False, with the last error set, when it cannot be shown exactly so; what
/// stands at `root` must not be used then.
bool showFolder(const std::filesystem::path& root, const VisibleFolder& visible);

/// Several folders side by side below a root in which nothing else can be made.
class SideBySide {
public:
    explicit SideBySide(std::filesystem::path root) : root_(std::move(root)) {}

    /// To be called first. False, with the last error set, on failure.
    bool begin();
    /// False, with the last error set, when the folder cannot be shown exactly so, and is left out.
    bool add(const std::string& name, const VisibleFolder& visible);
    /// To be called last. False, with the last error set, on failure: what stands at the root must not be
    /// used then.
    bool finish();

private:
    std::filesystem::path root_;
    bool spoiled_ = false;
};

} // namespace velt

#endif
