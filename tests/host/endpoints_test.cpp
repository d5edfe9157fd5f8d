// The administrator log and the stream of events.

#include "host/admin_log_json.h"
#include "host/clock.h"
#include "host/event_hub.h"
#include "tests/host/fake_access.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <sys/socket.h>

#include <thread>

namespace {

using std::chrono::milliseconds;
using velt::host::AdminLogEntry;

const std::string sftpSet = "/api/VELT.Core.FileServ.FTP.SFTP/v1/set";

class HostEndpoints : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        access = {};
        settings.workers = 1;
    }

    void addEntries(int count) {
        for (int i = 1; i <= count; ++i) {
            AdminLogEntry entry;
            entry.id = i;
            entry.milliseconds = i * std::int64_t{1000};
            entry.category = 2;
            entry.level = 1;
            entry.event = i % 2 == 0 ? 0x11B00035U : 0x11B00036U;
            entry.arguments = {"22", "222", "", ""};
            entry.text = "entry " + std::to_string(i);
            entry.actor = i % 3 == 0 ? "ann b" : "root";
            entry.address = "local";
            access.log.push_back(entry);
        }
    }

    std::vector<int> ids(const std::string& query) const {
        std::vector<int> found;
        const Json::Value page = get("/api/log" + query).json();
        for (const Json::Value& entry : page["entries"]) {
            found.push_back(entry["id"].asInt());
        }
        return found;
    }

    /// A connection on which the stream of events has begun.
    Client listen() const {
        Client client = connect();
        client.send(requestText("GET", "/events", admin));
        EXPECT_NE(client.readUntil(": connected\n\n"), "");
        // The server adds the reader right after that.
        std::this_thread::sleep_for(milliseconds(100));
        return client;
    }

    FakeAccess& access = FakeAccess::instance();
};

TEST_F(HostEndpoints, TheLogIsPagedNewestFirst) {
    start();
    addEntries(7);
    const Json::Value first = get("/api/log?limit=3").json();
    EXPECT_EQ(first["entries"].size(), 3U);
    EXPECT_EQ(first["next"], 5);
    EXPECT_EQ(ids("?limit=3&before=5"), (std::vector<int>{4, 3, 2}));
    const Json::Value last = get("/api/log?limit=3&before=2").json();
    EXPECT_EQ(last["entries"].size(), 1U);
    EXPECT_TRUE(last["next"].isNull());
    EXPECT_TRUE(get("/api/log?limit=7").json()["next"].isNull());
}

TEST_F(HostEndpoints, AnEntryShowsAllOfItself) {
    start();
    addEntries(1);
    const Json::Value entry = get("/api/log").json()["entries"][0];
    EXPECT_EQ(entry["time"], "1970-01-01T00:00:01.000Z");
    EXPECT_EQ(entry["event"], "0x11B00036");
    EXPECT_EQ(entry["text"], "entry 1");
    EXPECT_EQ(entry["args"].size(), 4U);
    EXPECT_EQ(entry["args"][1], "222");
    EXPECT_EQ(entry["actor"], "root");
    EXPECT_EQ(entry["address"], "local");
    EXPECT_EQ(entry["category"], 2);
    EXPECT_EQ(entry["level"], 1);
}

TEST_F(HostEndpoints, TheLogIsFiltered) {
    start();
    addEntries(6);
    EXPECT_EQ(ids("?since=1970-01-01T00:00:05Z"), (std::vector<int>{6, 5}));
    EXPECT_EQ(ids("?event=0x11B00035"), (std::vector<int>{6, 4, 2}));
    EXPECT_EQ(ids("?actor=ann%20b"), (std::vector<int>{6, 3}));
    EXPECT_EQ(ids("?actor=ann+b&event=0x11B00036"), (std::vector<int>{3}));
    EXPECT_EQ(ids("?actor=nobody"), (std::vector<int>{}));
    EXPECT_EQ(ids("?since=&event=&actor="), (std::vector<int>{6, 5, 4, 3, 2, 1}));
}

TEST_F(HostEndpoints, AFilterThatIsNoneIsRefused) {
    start();
    const std::map<std::string, std::string> wrong{
        {"limit=0", "limit"},         {"limit=1001", "limit"},
        {"limit=x", "limit"},         {"limit=9999999999", "limit"},
        {"before=-1", "before"},      {"before=1.5", "before"},
        {"event=0xZZ", "event"},      {"event=4294967296", "event"},
        {"since=yesterday", "since"}, {"actor=%zz", "actor"},
        {"actor=%", "actor"},         {"actor=%ff", "actor"},
        {"unknown=1", "unknown"},     {"unknown=", "unknown"},
        {"limit=5&Limit=5", "Limit"}, {"=1", ""},
    };
    for (const auto& [query, field] : wrong) {
        const Answer answer = get("/api/log?" + query);
        EXPECT_EQ(answer.status, 400) << query;
        ASSERT_EQ(answer.json()["errors"].size(), 1U) << query;
        EXPECT_EQ(answer.json()["errors"][0]["field"], field) << query;
        EXPECT_EQ(answer.json()["detail"].asString(),
                  field + ": expected " + answer.json()["errors"][0]["expected"].asString() + ".");
    }
    EXPECT_EQ(get("/api/log?limit=1001").json()["errors"][0]["expected"], "a number from 1 to 1000");
}

TEST_F(HostEndpoints, APageHoldsAsManyAsTheLogGivesAtOnce) {
    start();
    addEntries(1001);
    const Json::Value page = get("/api/log?limit=1000").json();
    EXPECT_EQ(page["entries"].size(), 1000U);
    EXPECT_EQ(page["next"], 2);
    EXPECT_EQ(ids("?limit=1000&before=2"), std::vector<int>{1});
    EXPECT_EQ(access.largestLimit, 1000);
}

TEST_F(HostEndpoints, ALogThatCannotBeReadIsAFailure) {
    start();
    access.logError = "The log cannot be read: disk full.";
    const Answer answer = get("/api/log");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["detail"], "The log cannot be read: disk full.");
}

TEST_F(HostEndpoints, EventsTellWhatAChangeDid) {
    start();
    Client events = listen();
    EXPECT_EQ(post(sftpSet, R"({"enable":true,"portnum":2222})").status, 204);
    std::string text = events.readUntil("event: request\n");
    text += events.readUntil("\n\n");
    EXPECT_NE(text.find("event: log\ndata: {"), std::string::npos) << text;
    EXPECT_NE(text.find(R"("method":"set")"), std::string::npos) << text;
    EXPECT_NE(text.find(R"("actor":"admin")"), std::string::npos) << text;
}

TEST_F(HostEndpoints, AServiceActionIsAnEvent) {
    start();
    Client events = listen();
    access.observer.serviceAction("ftpd-pure", "stop");
    EXPECT_EQ(events.readUntil("\n\n"),
              "event: service\ndata: {\"action\":\"stop\",\"service\":\"ftpd-pure\"}\n\n");
}

TEST_F(HostEndpoints, WhatChangesNothingIsNoEvent) {
    start();
    Client events = listen();
    EXPECT_EQ(post(sftpSet, R"({"enable":false})").status, 204);
    EXPECT_EQ(post(sftpSet, R"({"enable":7})").status, 422);
    EXPECT_EQ(get("/api/status").status, 200);
    access.observer.serviceAction("mark", "mark");
    EXPECT_EQ(events.readUntil("\n\n").find("event: service"), 0U);
}

TEST_F(HostEndpoints, AnIdleStreamBeats) {
    limits.heartbeat = milliseconds(50);
    start();
    Client events = listen();
    EXPECT_EQ(events.readUntil(": beat\n\n").substr(0, 8), ": beat\n\n");
    EXPECT_NE(events.readUntil(": beat\n\n"), "");
}

TEST_F(HostEndpoints, ViewersMayListen) {
    start();
    Client client = connect();
    client.send(requestText("GET", "/events", viewer));
    const std::string head = client.readUntil("\r\n\r\n");
    EXPECT_NE(head.find("200 OK"), std::string::npos);
    EXPECT_NE(head.find("Content-Type: text/event-stream"), std::string::npos);
}

TEST_F(HostEndpoints, AReaderThatLeavesIsForgotten) {
    start();
    {
        Client events = listen();
        EXPECT_GE(server->connections(), 1U);
    }
    for (int i = 0; i < 300 && server->connections() > 0; ++i) {
        std::this_thread::sleep_for(milliseconds(10));
    }
    EXPECT_EQ(server->connections(), 0U);
    access.observer.serviceAction("ftpd", "start");
}

TEST(Events, ReadersThatLeaveBeforeAnyEventAreForgotten) {
    class Reader : public velt::host::EventReader {
    public:
        void deliver(const std::shared_ptr<const std::string>& event) override { last = *event; }
        std::string last;
    };
    velt::host::EventHub hub;
    const auto stays = std::make_shared<Reader>();
    hub.add(stays);
    const std::weak_ptr<Reader> leaves = [&hub] {
        const auto reader = std::make_shared<Reader>();
        hub.add(reader);
        EXPECT_EQ(hub.readers(), 2U);
        return reader;
    }();
    EXPECT_TRUE(leaves.expired());
    const auto next = std::make_shared<Reader>();
    hub.add(next);
    EXPECT_EQ(leaves.use_count(), 0);
    EXPECT_EQ(hub.readers(), 2U);
    hub.publish("type", Json::Value(7));
    EXPECT_EQ(stays->last, "event: type\ndata: 7\n\n");
    EXPECT_EQ(next->last, stays->last);
}

TEST_F(HostEndpoints, StreamsOfEventsAreCounted) {
    start();
    EXPECT_NE(get("/metrics").body.find("\nvelt_event_readers 0\n"), std::string::npos);
    const Client events = listen();
    EXPECT_NE(get("/metrics").body.find("\nvelt_event_readers 1\n"), std::string::npos);
}

TEST_F(HostEndpoints, AReaderThatLagsIsLeftBehind) {
    limits.queuedEvents = 50'000;
    start();
    const Client events = listen();
    const int small = 4096;
    setsockopt(events.descriptor(), SOL_SOCKET, SO_RCVBUF, &small, sizeof small);
    AdminLogEntry entry;
    entry.text = std::string(10'000, 'x');
    for (int i = 0; i < 1000 && server->connections() > 0; ++i) {
        access.observer.logEntry(entry);
        std::this_thread::sleep_for(milliseconds(1));
    }
    for (int i = 0; i < 300 && server->connections() > 0; ++i) {
        std::this_thread::sleep_for(milliseconds(10));
    }
    EXPECT_EQ(server->connections(), 0U);
}

TEST_F(HostEndpoints, AStopEndsStreamsAndIdleConnectionsAtOnce) {
    start();
    Client events = listen();
    Client idle = connect();
    EXPECT_EQ(idle.ask(requestText("GET", "/healthz", admin)).status, 200);
    const auto begin = std::chrono::steady_clock::now();
    stop();
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(3));
    EXPECT_TRUE(events.ended());
    EXPECT_TRUE(idle.ended());
    EXPECT_FALSE(Client::unixSocket(socketPath).connected());
    EXPECT_FALSE(std::filesystem::exists(socketPath));
}

TEST(Clock, MomentsAreReadInSeveralForms) {
    using velt::host::parseTimestamp;
    EXPECT_EQ(parseTimestamp("1970-01-02"), 86'400'000);
    EXPECT_EQ(parseTimestamp("1970-01-01T00:00:01Z"), 1000);
    EXPECT_EQ(parseTimestamp("1970-01-01T00:00:01.25Z"), 1250);
    EXPECT_EQ(parseTimestamp("12"), 12'000);
    for (const char* text : {"", "x", "1970-01-01T00:00", "1970-01-01T00:00:01+01:00", "-1", "1970-13-01"}) {
        EXPECT_FALSE(parseTimestamp(text)) << text;
    }
    EXPECT_EQ(velt::host::timestamp(1'250), "1970-01-01T00:00:01.250Z");
}

} // namespace
