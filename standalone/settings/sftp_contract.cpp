// The contract's operations on the SFTP settings.
#include "platform/sftp.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"
#include "standalone/settings/settings_store.h"

int VELTSFTPConfigGet(int which, _tag_VELT_SFTP_CONFIG_* out) {
    if (which != 1 || out == nullptr)
        return velt::fail(velt::ErrorNumber::invalid, "There is no such SFTP record, or no place for it.");
    return velt::atBoundary([&] {
        const auto settings = velt::loadSftpSettings();
        if (!settings)
            return -1;
        *out = _tag_VELT_SFTP_CONFIG_{};
        out->enable = settings->enabled ? 1 : 0;
        out->port = settings->port;
        return 0;
    });
}

int VELTSFTPConfigSet(int enable, int port) {
    return velt::atBoundary([&] {
        return velt::changeSftpSettings([&](velt::SftpSettings& settings) {
            settings.enabled = enable != 0;
            settings.port = port;
        });
    });
}
