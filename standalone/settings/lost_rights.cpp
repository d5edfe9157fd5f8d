#include "standalone/settings/lost_rights.h"

#include <string_view>

namespace velt {
namespace {

bool isOn(int flag) {
    return flag != 0;
}

bool losesService(const _tag_VELT_FTP_CONF_& former, const _tag_VELT_FTP_CONF_& next) {
    return (former.service_flags & ~next.service_flags) != 0;
}

bool confinesOtherwise(const _tag_VELT_FTP_CONF_& former, const _tag_VELT_FTP_CONF_& next) {
    if (isOn(former.user_chroot) != isOn(next.user_chroot)) {
        return true;
    }
    if (!isOn(former.anonymous)) { // there are no such sessions
        return false;
    }
    const auto share = [](const _tag_VELT_FTP_CONF_& record) {
        return isOn(record.anonymous_chroot) ? std::string_view(record.anonymous_chroot_share) : "";
    };
    return !isOn(next.anonymous) || isOn(former.anonymous_chroot) != isOn(next.anonymous_chroot) ||
           share(former) != share(next);
}

} // namespace

bool takesRights(const FtpSettings& former, const FtpSettings& next) {
    const bool encrypts = (former.record.service_flags & VELT_FTP_SERVICE_TLS) != 0;
    return losesService(former.record, next.record) || confinesOtherwise(former.record, next.record) ||
           (isOn(former.record.enable_fxp) && !isOn(next.record.enable_fxp)) ||
           (encrypts && !former.fipsOnly && next.fipsOnly) || former.umask != next.umask;
}

bool takesRights(const SftpTerms& former, const SftpTerms& next) {
    const bool otherFolder = isOn(former.ftp.record.user_chroot) != isOn(next.ftp.record.user_chroot);
    return (next.confinement.sftp && (!former.confinement.sftp || otherFolder)) ||
           (!former.ftp.fipsOnly && next.ftp.fipsOnly) || former.ftp.umask != next.ftp.umask;
}

} // namespace velt
