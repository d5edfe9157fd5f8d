#include "host/stored_switches.h"

#include "ftp/ftp_library.h"
#include "platform/sftp.h"

namespace velt::host {

std::optional<StoredSwitches> readStoredSwitches() {
    _tag_VELT_FTP_CONF_ ftp{};
    _tag_VELT_SFTP_CONFIG_ sftp{};
    if (VELTFTPConfGet(&ftp) < 0 || VELTSFTPConfigGet(1, &sftp) < 0) {
        return std::nullopt;
    }
    return StoredSwitches{(ftp.service_flags & VELT_FTP_SERVICE_PLAIN) != 0,
                          (ftp.service_flags & VELT_FTP_SERVICE_TLS) != 0, sftp.enable != 0};
}

} // namespace velt::host
