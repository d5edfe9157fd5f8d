// The services of a state root of the test's own, with the test daemon in the place of the real ones.
#ifndef VELT_TESTS_STANDALONE_CONTROL_SERVICES_FIXTURE_H
#define VELT_TESTS_STANDALONE_CONTROL_SERVICES_FIXTURE_H

#include "base/file.h"
#include "ftp/ftp_library.h"
#include "platform/service.h"
#include "platform/sftp.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/effects.h"
#include "standalone/core/state_root.h"
#include "tests/standalone/control/plan_double.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/standalone/support/daemon_states.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"

#include <cstdio>
#include <string>

namespace velt::test {

inline constexpr int plain = VELT_FTP_SERVICE_PLAIN;
inline constexpr int tls = VELT_FTP_SERVICE_TLS;

class ServicesTest : public DaemonTest {
protected:
    void SetUp() override {
        DaemonTest::SetUp();
        planDouble() = {};
        ASSERT_TRUE(replaceFile(statePath("/etc/velt/firewall.conf"), "version = 1\nmode = off\n", 0644));
        storeFtp(plain);
        storeSftp(false);
    }

    void TearDown() override {
        setEffectHook({});
        EXPECT_EQ(VLIBServiceStop("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
        DaemonTest::TearDown();
    }

    void storeFtp(int flags, int uploadRate = 0) const {
        _tag_VELT_FTP_CONF_ record{};
        ASSERT_EQ(VELTFTPConfGet(&record), 0) << lastErrorSentence();
        std::snprintf(record.portnum, sizeof record.portnum, "%d", ftpPort_);
        record.service_flags = flags;
        record.maxuploadrate = uploadRate;
        ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
    }

    void storeSftp(bool enabled) const {
        ASSERT_EQ(VELTSFTPConfigSet(enabled ? 1 : 0, sftpPort_), 0) << lastErrorSentence();
    }

    static ProcessId daemonOf(const std::string& service) { return serviceState(service).daemon; }
    static std::string runKey(const std::string& service) {
        return readFile(statePath("/etc/velt/run-keys/" + service)).valueOr("none");
    }

    int ftpPort_ = freePort();
    int sftpPort_ = freePort();
};

} // namespace velt::test

#endif
