// The file tree that a login sees, made of mounts in this process's mount namespace.
#ifndef VELT_STANDALONE_LOGIN_VIEW_MOUNTS_H
#define VELT_STANDALONE_LOGIN_VIEW_MOUNTS_H

#include "base/result.h"
#include "base/unique_fd.h"
#include "standalone/shares/access.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// A folder within a visible one that can be neither moved nor removed there, and to which there may be less
/// access.
struct Restriction {
    std::filesystem::path place;  ///< relative to the visible folder, without links; outer ones come first
    Access access = Access::none; ///< none: it looks empty
};

struct VisibleFolder {
    UniqueFd folder;
    Access access = Access::read; ///< read or write
    std::vector<Restriction> restrictions;
};

/// From now on no mount made here reaches other mount namespaces.
Result<> isolateMounts();

/// Makes `root` show this folder. After an error `root` must not be used: it may show too much.
Result<> showFolder(const std::filesystem::path& root, const VisibleFolder& visible);

/// Several folders side by side below a root in which nothing else can be made.
class SideBySide {
public:
    explicit SideBySide(std::filesystem::path root) : root_(std::move(root)) {}

    /// To be called first.
    Result<> begin();
    /// After an error the folder is left out.
    Result<> add(const std::string& name, const VisibleFolder& visible);
    /// To be called last. After an error the root must not be used.
    Result<> finish();

private:
    std::filesystem::path root_;
    bool spoiled_ = false; ///< a folder that gives too much could not be removed
};

} // namespace velt

#endif
