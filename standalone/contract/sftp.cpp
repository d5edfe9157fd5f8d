// The contract's operations on the SFTP settings.
#include "platform/sftp.h"
#include "standalone/contract/boundary.h"
#include "standalone/contract/last_error.h"
#include "standalone/control/change_settings.h"
#include "standalone/settings/record_merge.h"

namespace velt {

namespace {

LastSeen<SftpSettings>& lastSeenSettings() {
    thread_local LastSeen<SftpSettings> seen;
    return seen;
}

Result<> loadRecord(_tag_VELT_SFTP_CONFIG_& record) {
    lastSeenSettings().forget();
    VELT_ASSIGN_OR_RETURN(const SftpSettings settings, loadSftpSettings());
    record = _tag_VELT_SFTP_CONFIG_{};
    record.enable = settings.enabled ? 1 : 0;
    record.port = settings.port;
    lastSeenSettings().note(settings);
    return {};
}

Result<> storeSettings(const SftpSettings& wanted) {
    VELT_RETURN_IF_ERROR(changeSftpSettings(
        [&wanted](SftpSettings& settings) { settings = lastSeenSettings().merge(settings, wanted); }));
    // Not what was stored: the caller continues with its own copy.
    lastSeenSettings().note(wanted);
    return {};
}

} // namespace

} // namespace velt

int VELTSFTPConfigGet(int which, _tag_VELT_SFTP_CONFIG_* out) {
    if (which != 1 || out == nullptr)
        return velt::fail(velt::ErrorNumber::invalid, "Expected record 1 and a place for the SFTP settings.");
    return velt::atBoundary([out] { return velt::loadRecord(*out); });
}

int VELTSFTPConfigSet(int enable, int port) {
    return velt::atBoundary([=] { return velt::storeSettings({enable != 0, port}); });
}
