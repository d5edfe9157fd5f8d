// The FTP daemon's row: ProFTPD, one process for FTP and FTPS.
#include "standalone/daemons/daemon.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "standalone/daemons/proftpd/session_rights.h"
#include "standalone/ports/port_range.h"

#include <array>

namespace velt {
namespace {

constexpr std::array serviceNames{
    ServiceName{"ftpd", "ftp"},
    ServiceName{"ftpd-pure", "ftp"},
    ServiceName{"ftpd-ssl", "ftps"},
};

Result<DaemonSettings> loadSettings() {
    VELT_ASSIGN_OR_RETURN(const auto stored, loadFtpSettings());
    const auto& record = stored.record;
    const int control = controlPort(record);
    const auto passive = passiveRange(record);
    return DaemonSettings{
        {{"ftp", (record.service_flags & VELT_FTP_SERVICE_PLAIN) != 0},
         {"ftps", (record.service_flags & VELT_FTP_SERVICE_TLS) != 0}},
        {{{control, control}, false, "the FTP service"},
         {passive, true, "the passive range " + formatPortRange(passive) + " of the FTP service"}}};
}

Result<std::string> testStored() {
    VELT_ASSIGN_OR_RETURN(const auto stored, loadFtpSettings());
    return testFtpCandidate(stored);
}

} // namespace

const Daemon ftpDaemon{
    .name = "ftpd",
    .label = "FTP",
    .apiName = "ftp",
    .portName = "ftp",
    .serviceNames = serviceNames,
    .settings = loadSettings,
    .plan = planFtpDaemon,
    .takesRights = takesFtpRights,
    .test = testStored,
};

} // namespace velt
