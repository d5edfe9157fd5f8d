// The SFTP daemon's row: an OpenSSH of its own.
#include "standalone/daemons/daemon.h"
#include "standalone/daemons/sshd/sshd_plan.h"

#include <array>

namespace velt {
namespace {

constexpr std::array serviceNames{ServiceName{"sftp", "sftp"}};

constexpr std::array dropIns{
    // /run/sshd is that unit's, and gone when it is stopped; but each of our connections needs it, too.
    UnitDropIn{"ssh.service.d/velt-sftp.conf", "[Service]\nRuntimeDirectoryPreserve=yes\n"},
};

Result<DaemonSettings> loadSettings() {
    VELT_ASSIGN_OR_RETURN(const auto stored, loadSftpSettings());
    return DaemonSettings{{{"sftp", stored.enabled}},
                          {{{stored.port, stored.port}, false, "the SFTP service"}}};
}

Result<std::string> testStored() {
    VELT_ASSIGN_OR_RETURN(const auto stored, loadSftpSettings());
    VELT_ASSIGN_OR_RETURN(const auto confinement, loadConfinementSettings());
    return testSftpCandidate(stored, confinement);
}

} // namespace

const Daemon sftpDaemon{
    .name = "sftp",
    .label = "SFTP",
    .apiName = "sftp",
    .portName = "ssh",
    .serviceNames = serviceNames,
    .canPause = true,
    .dropIns = dropIns,
    .settings = loadSettings,
    .plan = planSftpDaemon,
    .takesRights = [](const auto&, const auto&) { return false; }, // its settings are its port, on and off
    .test = testStored,
};

} // namespace velt
