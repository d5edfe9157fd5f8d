// Tests of the FTP service with real clients.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_FTP_SERVICE_H
#define VELT_TESTS_SYSTEM_SUPPORT_FTP_SERVICE_H

#include "ftp/ftp_library.h"
#include "standalone/shares/share_store.h"
#include "tests/support/run_program.h"
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/files.h"
#include "tests/system/support/ftp_session.h"
#include "tests/system/support/private_world.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace velt::test {

class FtpService : public testing::Test {
protected:
    static constexpr int port = 2121;

    /// A fresh state root with plain FTP on the port above, and three homes.
    void SetUp() override;
    void TearDown() override;

    /// The record to be stored by start(); the defaults but for port, flags and confined users.
    _tag_VELT_FTP_CONF_ record{};
    void offerTls(bool plainToo) {
        record.service_flags = VELT_FTP_SERVICE_TLS | (plainToo ? VELT_FTP_SERVICE_PLAIN : 0);
    }
    void letAnonymousIn(const std::string& share = {});

    /// A folder below /mnt/srv, owned by root with mode 0777, and a share for it, in which alice, bob and
    /// carol may write.
    std::filesystem::path addShare(const std::string& name, const std::string& folder, Access anonymous,
                                   bool offered = true);

    /// Stores the record and starts the daemon from its plan, in place of the one that runs.
    void start();
    void stop() { daemon_.stop(); }
    pid_t daemonPid() const { return daemon_.pid(); }

    /// Replaces all rules; each one is "u:1001:/path" or "g:2001:/path".
    static void storeRules(const std::vector<std::string>& rules);

    static ProcessResult curl(std::vector<std::string> arguments);

private:
    DaemonProcess daemon_;
    std::vector<ShareEntry> shares_;
};

} // namespace velt::test

#endif
