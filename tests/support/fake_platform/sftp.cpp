// The SFTP configuration library.

#include "platform/sftp.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/text.h"

using fake::arguments;
using fake::Platform;

int VELTSFTPConfigGet(int which, _tag_VELT_SFTP_CONFIG_* out) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VELTSFTPConfigGet", arguments(which))) {
        return *failure;
    }
    *out = platform.sftp;
    return 0;
}

int VELTSFTPConfigSet(int enable, int port) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VELTSFTPConfigSet", arguments(enable, port))) {
        return *failure;
    }
    platform.sftp.enable = enable;
    platform.sftp.port = port;
    platform.services["sftp"] = enable != 0 ? 1 : 0;
    platform.storedPorts["ssh"] = {{port, port}};
    return 0;
}

int VELTSFTPIsAlive(void) {
    auto& platform = Platform::instance();
    return platform.enter("VELTSFTPIsAlive", "").value_or(platform.sftpAlive);
}
