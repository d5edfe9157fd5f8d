// One veltd for each state root.
#ifndef VELT_HOST_BASE_INSTANCE_LOCK_H
#define VELT_HOST_BASE_INSTANCE_LOCK_H

#include "base/result.h"
#include "base/unique_fd.h"

#include <sys/types.h>

#include <filesystem>
#include <optional>

namespace velt::host {

/// Held by the process for as long as it lives. The kernel knows who holds it, so it is never stale.
class InstanceLock {
public:
    /// An error when another process holds it, which the message names.
    static Result<InstanceLock> take(const std::filesystem::path& stateRoot);

    /// Keeps it when the process becomes another program, too, which then takes it once more.
    void keepOverExec() const;

    /// The process that holds it, if one does. To be asked by other processes.
    static std::optional<pid_t> holder(const std::filesystem::path& stateRoot);

private:
    explicit InstanceLock(UniqueFd file) : file_(std::move(file)) {}

    UniqueFd file_;
};

} // namespace velt::host

#endif
