// The file tree that a login sees, made of mounts in this process's own mount namespace.
#ifndef VELT_STANDALONE_LOGIN_VIEW_MOUNTS_H
#define VELT_STANDALONE_LOGIN_VIEW_MOUNTS_H

#include "base/result.h"
#include "base/unique_fd.h"
#include "standalone/shares/access.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// A folder within a visible one that may be used less than what is around it.
struct Restriction {
    std::filesystem::path place;  ///< relative to the visible folder, free of links; outer ones come first
    Access access = Access::none; ///< none: nothing of it can be seen
};

struct VisibleFolder {
    UniqueFd folder;
    Access access = Access::read; ///< read or write
    std::vector<Restriction> restrictions;
};

/// Lets nothing that is mounted from now on reach other mount namespaces.
Result<> isolateMounts();

/// Makes `root` show this folder. After an error `root` must not be used: it may show more.
Result<> showFolder(const std::filesystem::path& root, const VisibleFolder& visible);

/// Several folders side by side below a root in which nothing else can be made.
class SideBySide {
public:
    explicit SideBySide(std::filesystem::path root) : root_(std::move(root)) {}

    /// To be called first.
    Result<> begin();
    /// An error when the folder cannot be shown exactly so; it is left out then.
    Result<> add(const std::string& name, const VisibleFolder& visible);
    /// To be called last. After an error the root must not be used.
    Result<> finish();

private:
    std::filesystem::path root_;
    bool spoiled_ = false; ///< something is there with more rights than it should give
};

} // namespace velt

#endif
