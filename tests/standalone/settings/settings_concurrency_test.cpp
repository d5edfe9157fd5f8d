#include "ftp/ftp_library.h"
#include "platform/sftp.h"
#include "tests/standalone/settings/settings_fixture.h"

#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <functional>
#include <thread>
#include <vector>

namespace velt {
namespace {

class SettingsConcurrency : public test::SettingsTest {
protected:
    // Each in a process of its own, all at once.
    static void runAtOnce(const std::vector<std::function<bool()>>& works) {
        std::vector<pid_t> children;
        for (const auto& work : works) {
            children.push_back(::fork());
            if (children.back() == 0)
                ::_exit(work() ? 0 : 1);
        }
        for (const pid_t child : children) {
            int status = -1;
            ASSERT_EQ(::waitpid(child, &status, 0), child);
            EXPECT_EQ(status, 0);
        }
    }
};

bool addKeys(const std::string& prefix) {
    for (int i = 0; i < 200; ++i)
        if (VLIBCINFOSetKeyValue((prefix + std::to_string(i)).c_str(), "x") < 0)
            return false;
    return true;
}

TEST_F(SettingsConcurrency, TwoProcessesThatAddKeysLoseNone) {
    runAtOnce({[] { return addKeys("a"); }, [] { return addKeys("b"); }});
    std::array<char, 4> value{};
    for (int i = 0; i < 200; ++i)
        for (const char* prefix : {"a", "b"}) {
            const std::string key = prefix + std::to_string(i);
            EXPECT_GT(VLIBCFileGetKeyValue("/etc/veltinfo.conf", key.c_str(), value.data(), 4, 0), 0) << key;
        }
}

TEST_F(SettingsConcurrency, SettingsOfOneFileDoNotOverwriteEachOther) {
    const auto setTimeOut = [] {
        for (int i = 1; i <= 200; ++i)
            if (VELTFTPTimeOutSet(i) < 0 || VELTFTPTimeOutGet() != i)
                return false;
        return true;
    };
    const auto setRecord = [] {
        for (int i = 1; i <= 200; ++i) {
            _tag_VELT_FTP_CONF_ conf{};
            if (VELTFTPConfGet(&conf) < 0)
                return false;
            conf.max_conn_per_ip = i;
            if (VELTFTPConfSet(conf) < 0 || VELTFTPConfGet(&conf) < 0 || conf.max_conn_per_ip != i)
                return false;
        }
        return true;
    };
    runAtOnce({setTimeOut, setRecord});
    EXPECT_EQ(VELTFTPTimeOutGet(), 200);
    _tag_VELT_FTP_CONF_ conf{};
    ASSERT_GE(VELTFTPConfGet(&conf), 0);
    EXPECT_EQ(conf.max_conn_per_ip, 200);
}

// Reads the whole record, changes one field and stores it, again and again, as a request does.
bool changeOften(std::int32_t _tag_VELT_FTP_CONF_::*field) {
    for (int i = 1; i <= 200; ++i) {
        _tag_VELT_FTP_CONF_ conf{};
        if (VELTFTPConfGet(&conf) < 0 || conf.*field != i - 1)
            return false;
        conf.*field = i;
        if (VELTFTPConfSet(conf) < 0)
            return false;
    }
    return true;
}

TEST_F(SettingsConcurrency, ProcessesThatChangeDifferentFieldsOfTheRecordLoseNone) {
    const std::vector fields{&_tag_VELT_FTP_CONF_::max_conn_per_ip, &_tag_VELT_FTP_CONF_::maxuploadrate,
                             &_tag_VELT_FTP_CONF_::maxdownloadrate};
    std::vector<std::function<bool()>> works;
    works.reserve(fields.size());
    for (const auto field : fields)
        works.push_back([field] { return changeOften(field); });
    runAtOnce(works);
    _tag_VELT_FTP_CONF_ conf{};
    ASSERT_GE(VELTFTPConfGet(&conf), 0);
    for (const auto field : fields)
        EXPECT_EQ(conf.*field, 200);
}

// Switches one bit of the service flags on and off, and ends with it on.
bool toggleOften(int bit) {
    for (int i = 0; i < 201; ++i) {
        _tag_VELT_FTP_CONF_ conf{};
        if (VELTFTPConfGet(&conf) < 0 || ((conf.service_flags & bit) != 0) != (i % 2 == 1))
            return false;
        conf.service_flags ^= bit;
        if (VELTFTPConfSet(conf) < 0)
            return false;
    }
    return true;
}

TEST_F(SettingsConcurrency, ProcessesThatSwitchDifferentServicesLoseNone) {
    runAtOnce({[] { return toggleOften(VELT_FTP_SERVICE_PLAIN); },
               [] { return toggleOften(VELT_FTP_SERVICE_TLS); }});
    _tag_VELT_FTP_CONF_ conf{};
    ASSERT_GE(VELTFTPConfGet(&conf), 0);
    EXPECT_EQ(conf.service_flags, VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS);
}

TEST_F(SettingsConcurrency, ProcessesThatChangeTheSftpPortAndItsSwitchLoseNeither) {
    const auto movePort = [] {
        for (int port = 2001; port <= 2200; ++port) {
            _tag_VELT_SFTP_CONFIG_ conf{};
            if (VELTSFTPConfigGet(1, &conf) < 0 || VELTSFTPConfigSet(conf.enable, port) < 0 ||
                VELTSFTPConfigGet(1, &conf) < 0 || conf.port != port)
                return false;
        }
        return true;
    };
    const auto toggle = [] {
        for (int i = 1; i <= 201; ++i) {
            _tag_VELT_SFTP_CONFIG_ conf{};
            if (VELTSFTPConfigGet(1, &conf) < 0 || VELTSFTPConfigSet(i % 2, conf.port) < 0 ||
                VELTSFTPConfigGet(1, &conf) < 0 || conf.enable != i % 2)
                return false;
        }
        return true;
    };
    runAtOnce({movePort, toggle});
    _tag_VELT_SFTP_CONFIG_ conf{};
    ASSERT_GE(VELTSFTPConfigGet(1, &conf), 0);
    EXPECT_EQ(conf.port, 2200);
    EXPECT_EQ(conf.enable, 1);
}

TEST_F(SettingsConcurrency, AReaderSeesWholeSettingsOnly) {
    const pid_t reader = ::fork();
    if (reader == 0) {
        for (int i = 0; i < 3000; ++i)
            if (VELTFTPTimeOutGet() < 0)
                ::_exit(1);
        ::_exit(0);
    }
    for (int i = 0; i < 100; ++i)
        EXPECT_GE(VELTFTPTimeOutSet(i), 0);
    int status = -1;
    ASSERT_EQ(::waitpid(reader, &status, 0), reader);
    EXPECT_EQ(status, 0);
}

TEST_F(SettingsConcurrency, AProcessKilledInTheMiddleOfStoringLeavesWholeSettings) {
    for (int round = 0; round < 30; ++round) {
        const pid_t writer = ::fork();
        if (writer == 0)
            for (int i = 0;; ++i)
                if (VELTFTPTimeOutSet(i) < 0)
                    ::_exit(1);
        std::this_thread::sleep_for(std::chrono::microseconds(500 * round));
        ::kill(writer, SIGKILL);
        int status = 0;
        ASSERT_EQ(::waitpid(writer, &status, 0), writer);
        ASSERT_TRUE(WIFSIGNALED(status));
        ASSERT_GE(VELTFTPTimeOutGet(), 0) << lastErrorSentence();
        ASSERT_GE(VELTFTPASCIIEnabledSet(round % 2), 0) << lastErrorSentence();
    }
}

} // namespace
} // namespace velt
