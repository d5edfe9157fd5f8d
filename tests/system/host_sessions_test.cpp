// Who is logged in and what they do, from the real daemon to veltctl.
#include "tests/support/waiting.h"
#include "tests/system/support/host_service.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <thread>

namespace velt::test {
namespace {

namespace fs = std::filesystem;
using std::chrono::milliseconds;
using std::chrono::seconds;

const std::string server = "ftp://127.0.0.1:2121/";

class WatchedSessions : public HostService {
protected:
    void SetUp() override {
        HostService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        done({"ftp", "set", "enable_ftp=on"});
        std::ofstream("/mnt/small") << std::string(1000, 's');
    }

    void TearDown() override {
        HostService::TearDown();
        fs::remove("/mnt/small");
    }

    static int curlAs(const std::string& user, std::vector<std::string> arguments) {
        arguments.insert(arguments.begin(), {"curl", "--silent", "--user", user + ":" + user + "-secret"});
        return runProcess(arguments, {}, seconds(60)).exitCode;
    }

    static Json::Value sessions() { return jsonOf(done({"sessions", "--json"}))["sessions"]; }

    static Json::Value records(Words filters) {
        filters.insert(filters.begin(), {"transfers", "--json"});
        return jsonOf(done(filters))["records"];
    }

    /// The records that these filters find, once there are so many.
    static Json::Value recordsOnceThereAre(unsigned count, const Words& filters) {
        Json::Value found;
        EXPECT_TRUE(waitUntil(
            [&] {
                found = records(filters);
                return found.size() >= count;
            },
            patience))
            << textOf(found);
        EXPECT_EQ(found.size(), count) << textOf(found);
        return found;
    }

    /// The session that transfers a file, once there is one.
    static Json::Value transferringSession() {
        Json::Value found;
        EXPECT_TRUE(waitUntil(
            [&] {
                for (const Json::Value& each : sessions()) {
                    found = each["transfer"].isObject() && each["transfer"]["octets"].asUInt64() > 0 ? each
                                                                                                     : found;
                }
                return !found.isNull();
            },
            patience));
        return found;
    }
};

TEST_F(WatchedSessions, areSeenAndEnded) {
    FtpSession client(port);
    ASSERT_EQ(client.logIn("alice"), 230);
    const auto place = client.passive();
    ASSERT_TRUE(place);
    const UniqueFd data = connectTo(place->host, place->port);
    ASSERT_EQ(client.command("STOR slow").code, 150);
    const std::string some(100'000, 's');
    ASSERT_EQ(write(data.get(), some.data(), some.size()), 100'000);
    const Json::Value session = transferringSession();
    ASSERT_FALSE(session.isNull());
    EXPECT_EQ(session["user"], "alice");
    EXPECT_EQ(session["account"], "alice");
    EXPECT_EQ(session["protocol"], "ftp");
    EXPECT_EQ(session["address"], "127.0.0.1");
    EXPECT_EQ(session["busy"], true);
    EXPECT_EQ(session["current"], true);
    EXPECT_EQ(session["transfer"]["direction"], "upload");
    EXPECT_EQ(session["transfer"]["path"], "/slow");
    EXPECT_NE(done({"sessions"}).find("upload"), std::string::npos);

    const std::string id = session["id"].asString();
    EXPECT_EQ(veltctl({"kick", id, "--dry-run"}).exitCode, 7);
    EXPECT_EQ(sessions().size(), 1U);
    const auto begin = Clock::now();
    EXPECT_EQ(done({"kick", id, "--reason", "too slow"}), "1 session was ended.\n");
    EXPECT_EQ(readToEnd(data.get()), "");
    while (client.read().code != 0) { // what the server may have to say to its end
    }
    EXPECT_LT(secondsSince(begin), 3) << "within a second, but for a busy machine";
    EXPECT_EQ(sessions().size(), 0U);
    EXPECT_EQ(veltctl({"kick", id}).exitCode, 3);

    const Json::Value uploads = recordsOnceThereAre(1, {"--session", id, "--operation", "upload"});
    EXPECT_EQ(uploads[0]["result"], "incomplete");
    EXPECT_EQ(uploads[0]["path"], "/slow");
    EXPECT_EQ(uploads[0]["server_path"], "/mnt/home/alice/slow");
    EXPECT_GT(uploads[0]["octets"].asUInt64(), 0U);
    EXPECT_LE(uploads[0]["octets"].asUInt64(), 100'000U);
    const Json::Value ends = recordsOnceThereAre(1, {"--session", id, "--operation", "session-closed"});
    EXPECT_NE(ends[0]["reason"].asString().find("root"), std::string::npos) << textOf(ends);
    EXPECT_NE(ends[0]["reason"].asString().find("too slow"), std::string::npos) << textOf(ends);
    const Json::Value log = jsonOf(done({"log", "--event", "0x11BF000B", "--json"}))["entries"];
    ASSERT_EQ(log.size(), 1U);
    EXPECT_EQ(log[0]["actor"], "root");
    EXPECT_EQ(log[0]["text"], "The session " + id + " of \"alice\" from 127.0.0.1 was ended: too slow.");
}

TEST_F(WatchedSessions, ofAUserAreEndedTogether) {
    FtpSession first(port);
    FtpSession second(port);
    FtpSession other(port);
    ASSERT_EQ(first.logIn("alice"), 230);
    ASSERT_EQ(second.logIn("alice"), 230);
    ASSERT_EQ(other.logIn("bob"), 230);
    ASSERT_EQ(sessions().size(), 3U);
    EXPECT_EQ(done({"kick", "--user", "alice"}), "2 sessions were ended.\n");
    EXPECT_EQ(first.command("NOOP").code, 0);
    EXPECT_EQ(second.command("NOOP").code, 0);
    EXPECT_EQ(other.command("NOOP").code, 200);
    ASSERT_EQ(sessions().size(), 1U);
    EXPECT_EQ(sessions()[0]["user"], "bob");
    EXPECT_EQ(done({"kick", "--address", "127.0.0.0/8"}), "1 session was ended.\n");
    EXPECT_EQ(done({"kick", "--user", "alice"}), "There was no such session.\n");
}

TEST_F(WatchedSessions, whatTheyDoIsFoundInEveryForm) {
    ASSERT_EQ(curlAs("alice", {"--upload-file", "/mnt/small", server + "a"}), 0);
    ASSERT_EQ(curlAs("alice", {"--quote", "RNFR a", "--quote", "RNTO =b", server}), 0);
    ASSERT_EQ(curlAs("alice", {"--output", "/mnt/got", server + "=b"}), 0);
    ASSERT_EQ(curlAs("alice", {"--quote", "DELE =b", server}), 0);
    EXPECT_NE(curlAs("alice", {"--quote", "DELE nothing", server}), 0);
    fs::remove("/mnt/got");
    const Words operations{"--user", "alice", "--operation", "upload,download,rename,delete"};
    const Json::Value found = recordsOnceThereAre(5, operations);
    EXPECT_EQ(found[0]["operation"], "delete");
    EXPECT_EQ(found[0]["result"], "refused");
    EXPECT_EQ(found[1]["operation"], "delete");
    EXPECT_EQ(found[1]["result"], "done");
    EXPECT_EQ(found[2]["operation"], "download");
    EXPECT_EQ(found[2]["octets"], 1000);
    EXPECT_EQ(found[3]["operation"], "rename");
    EXPECT_EQ(found[3]["path"], "/a");
    EXPECT_EQ(found[3]["new_path"], "/=b");
    EXPECT_EQ(found[4]["operation"], "upload");
    EXPECT_EQ(found[4]["octets"], 1000);

    EXPECT_EQ(records({"--path", "/mnt/home/alice/=", "--operation", "delete"}).size(), 1U);
    Words all = operations;
    all.insert(all.begin(), {"transfers", "--csv", "--all", "--limit", "2"});
    const std::string csv = done(all);
    EXPECT_EQ(std::count(csv.begin(), csv.end(), '\n'), 6) << csv;
    const HttpResult lines = curl("/api/transfers?user=alice&format=jsonl&operation=rename");
    EXPECT_EQ(jsonOf(lines.body), found[3]) << lines.body;
}

TEST_F(WatchedSessions, overSftpAreSeenAndEndedToo) {
    furnishSftp();
    done({"sftp", "set", "enable=on"});
    int code = -1;
    std::thread client([&code] { code = sftp(2222, "put /mnt/home/alice/large slow", "200").exitCode; });
    const Json::Value session = transferringSession();
    const std::string id = session["id"].asString();
    EXPECT_EQ(session["user"], "alice");
    EXPECT_EQ(session["protocol"], "sftp");
    EXPECT_EQ(session["transfer"]["direction"], "upload");
    const auto begin = Clock::now();
    EXPECT_EQ(done({"kick", id, "--reason", "too slow"}), "1 session was ended.\n");
    client.join();
    EXPECT_LT(secondsSince(begin), 3) << "within a second, but for a busy machine";
    EXPECT_NE(code, 0);
    EXPECT_EQ(sessions().size(), 0U);
    const Json::Value uploads = recordsOnceThereAre(1, {"--session", id, "--operation", "upload"});
    EXPECT_EQ(uploads[0]["result"], "incomplete");
    EXPECT_EQ(uploads[0]["protocol"], "sftp");
    EXPECT_EQ(uploads[0]["server_path"], "/mnt/home/alice/slow");
    const Json::Value ends = recordsOnceThereAre(1, {"--session", id, "--operation", "session-closed"});
    EXPECT_NE(ends[0]["reason"].asString().find("too slow"), std::string::npos) << textOf(ends);
}

TEST_F(WatchedSessions, areTakenOverWhenVeltdWasAway) {
    killHost();
    ASSERT_EQ(curlAs("alice", {"--upload-file", "/mnt/small", server + "a"}), 0);
    startHost();
    const Json::Value uploads = recordsOnceThereAre(1, {"--operation", "upload"});
    EXPECT_EQ(uploads[0]["octets"], 1000);
    killHost();
    startHost();
    EXPECT_EQ(records({"--operation", "upload"}).size(), 1U);
}

TEST_F(WatchedSessions, areToldAndMeasured) {
    RunningProgram events =
        RunningProgram::start({"/mnt/veltctl", "--socket", worldRoot / "run/velt/veltd.sock", "events",
                               "--json", "--kind", "session,transfer,ban"},
                              {}, "/mnt/events.log");
    std::this_thread::sleep_for(seconds(1)); // until the server sends them
    ASSERT_EQ(curlAs("alice", {"--upload-file", "/mnt/small", server + "a"}), 0);
    ASSERT_TRUE(waitUntil([] { return records({"--operation", "session-closed"}).size() == 1; }, patience));
    FtpSession refused(port);
    EXPECT_EQ(refused.logIn("alice", "wrong"), 530);
    std::string output = events.readUntil("\"login-refused\"");
    output += events.readUntil("\n");
    std::istringstream lines(output);
    events.signal(SIGINT);
    EXPECT_EQ(events.wait(), 0);
    fs::remove("/mnt/events.log");
    std::string told;
    for (std::string line; std::getline(lines, line);) {
        const Json::Value event = jsonOf(line);
        const std::string action = event["data"]["action"].asString();
        if (action != "started" && action != "progress") { // which a short transfer may have
            told += event["event"].asString() + " " + action + " " + event["data"]["user"].asString() + "\n";
        }
    }
    EXPECT_EQ(told,
              "session opened alice\ntransfer done alice\nsession closed alice\nsession refused alice\n");
    const std::string metrics = curl("/metrics").body;
    for (const char* const line :
         {"\nvelt_logins_total{outcome=\"accepted\",protocol=\"ftp\"} 1\n",
          "\nvelt_logins_total{outcome=\"password\",protocol=\"ftp\"} 1\n",
          "\nvelt_transfer_octets_total{direction=\"upload\",protocol=\"ftp\"} 1000\n",
          "\nvelt_records_lost_total 0\n"}) {
        EXPECT_NE(metrics.find(line), std::string::npos) << line << metrics;
    }
}

} // namespace
} // namespace velt::test
