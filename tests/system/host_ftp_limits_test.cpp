// Each FTP setting by veltctl and by curl, seen by clients: time-out, rates, connections, names and contents.
#include "tests/support/text.h"
#include "tests/system/support/setting_table.h"

#include <thread>

namespace velt::test {
namespace {

class HostFtpLimits : public SettingTable {
protected:
    void SetUp() override {
        SettingTable::SetUp();
        if (!IsSkipped() && !HasFatalFailure()) {
            done({"ftp", "set", "enable_ftp=on"});
        }
    }
};

TEST_F(HostFtpLimits, timeOutAndConnections) {
    check({
        {"ftp",
         "timeout",
         1,
         100,
         [](const Json::Value& seconds) {
             FtpSession session(port);
             const int code = session.logIn("alice");
             if (seconds == 1) {
                 // On a busy machine the time may be out before the login is done.
                 EXPECT_EQ(code == 230 ? session.read().code : code, 421);
             } else {
                 EXPECT_EQ(code, 230);
                 std::this_thread::sleep_for(std::chrono::milliseconds(1300));
                 EXPECT_EQ(session.command("NOOP").code, 200);
             }
         },
         {},
         {}},
        {"ftp",
         "max_conn_per_ip",
         2,
         0,
         [](const Json::Value& most) {
             FtpSession first(port);
             FtpSession second(port);
             EXPECT_EQ(first.greeting().code, 220);
             EXPECT_EQ(second.greeting().code, 220);
             EXPECT_EQ(FtpSession(port).greeting().code, most == 2 ? 530 : 220);
         },
         {},
         {}},
    });
}

TEST_F(HostFtpLimits, rates) {
    const auto isSlow = [](double seconds, bool slow) { EXPECT_EQ(seconds > 1.0, slow) << seconds; };
    check({
        {"ftp",
         "maxuploadrate",
         100,
         0,
         [&](const Json::Value& rate) {
             isSlow(secondsToSend(), rate == 100);
             isSlow(secondsToFetch(), false);
         },
         {"enable_flow_ctrl=on"},
         {}},
        {"ftp",
         "maxdownloadrate",
         100,
         0,
         [&](const Json::Value& rate) {
             isSlow(secondsToFetch(), rate == 100);
             isSlow(secondsToSend(), false);
         },
         {},
         {}},
        {"ftp",
         "enable_flow_ctrl",
         false,
         true,
         [&](const Json::Value& on) { isSlow(secondsToFetch(), on.asBool()); },
         {"maxdownloadrate=100"},
         {}},
    });
}

TEST_F(HostFtpLimits, fileNamesAndContents) {
    writeFile("/mnt/home/alice/text", "a\nb\n", aliceId);
    check({
        {"ftp",
         "utf8_mode",
         0,
         2,
         [](const Json::Value& mode) {
             EXPECT_EQ(nameForms(aliceAt()), (NameForms{mode == 2, mode == 2}));
         },
         {},
         {}},
        {"ftp",
         "utf8_mode",
         1,
         2,
         [](const Json::Value& mode) {
             EXPECT_EQ(nameForms(aliceAt()), (NameForms{true, mode == 2}));
         },
         {},
         {}},
        {"ftp",
         "use_utf8",
         false,
         true,
         [](const Json::Value& on) {
             EXPECT_EQ(nameForms(aliceAt()), (NameForms{true, on.asBool()}));
         },
         {},
         {},
         2},
        {"ftp",
         "enable_utf8",
         false,
         true,
         [](const Json::Value& on) {
             EXPECT_EQ(nameForms(aliceAt()), (NameForms{on.asBool(), false}));
         },
         {"utf8_mode=1"},
         {},
         1},
        {"ftp",
         "enable_ascii",
         true,
         false,
         [](const Json::Value& on) {
             FtpSession session = aliceAt();
             EXPECT_EQ(session.command("TYPE A").code, 200);
             EXPECT_EQ(session.receive("RETR text"), on.asBool() ? "a\r\nb\r\n" : "a\nb\n");
         },
         {},
         {}},
    });
}

} // namespace
} // namespace velt::test
