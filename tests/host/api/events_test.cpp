// The stream of events.

#include "host/api/events.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/waiting.h"

#include <sys/socket.h>

#include <thread>

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using velt::LogEntry;
using velt::test::waitUntil;

const std::string sftpSet = "/api/VELT.Core.FileServ.FTP.SFTP/v1/set";

class HostEvents : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        access = {};
        settings.workers = 1;
    }

    /// A connection on which the stream of events has begun.
    Client listen(const std::string& query = "") const {
        Client client = connect();
        client.send(requestText("GET", "/events" + query, admin));
        EXPECT_NE(client.readUntil(": connected\n\n"), "");
        // The server adds the reader right after that.
        std::this_thread::sleep_for(milliseconds(100));
        return client;
    }

    FakeStandalone& access = FakeStandalone::instance();
};

TEST_F(HostEvents, EventsTellWhatAChangeDid) {
    start();
    Client events = listen();
    EXPECT_EQ(post(sftpSet, R"({"enable":true,"portnum":2222})").status, 204);
    std::string text = events.readUntil("event: change\n");
    text += events.readUntil("\n\n");
    EXPECT_NE(text.find("event: log\ndata: {"), std::string::npos) << text;
    EXPECT_NE(text.find(R"("way":"VELT.Core.FileServ.FTP.SFTP v1 set")"), std::string::npos) << text;
    EXPECT_NE(text.find(R"("actor":"admin")"), std::string::npos) << text;
}

TEST_F(HostEvents, AServiceActionIsAnEvent) {
    start();
    Client events = listen();
    access.announce("ftpd-pure", "stop");
    EXPECT_EQ(events.readUntil("\n\n"),
              "event: service\ndata: {\"action\":\"stop\",\"service\":\"ftpd-pure\"}\n\n");
}

TEST_F(HostEvents, WhatChangesNothingIsNoEvent) {
    start();
    Client events = listen();
    EXPECT_EQ(post(sftpSet, R"({"enable":false})").status, 204);
    EXPECT_EQ(post(sftpSet, R"({"enable":7})").status, 422);
    EXPECT_EQ(get("/api/status").status, 200);
    access.announce("mark", "mark");
    EXPECT_EQ(events.readUntil("\n\n").find("event: service"), 0U);
}

TEST_F(HostEvents, AnIdleStreamBeats) {
    limits.heartbeat = milliseconds(50);
    start();
    Client events = listen();
    EXPECT_EQ(events.readUntil(": beat\n\n").substr(0, 8), ": beat\n\n");
    EXPECT_NE(events.readUntil(": beat\n\n"), "");
}

TEST_F(HostEvents, ViewersMayListen) {
    start();
    Client client = connect();
    client.send(requestText("GET", "/events", viewer));
    const std::string head = client.readUntil("\r\n\r\n");
    EXPECT_NE(head.find("200 OK"), std::string::npos);
    EXPECT_NE(head.find("Content-Type: text/event-stream"), std::string::npos);
}

TEST_F(HostEvents, AReaderThatLeavesIsForgotten) {
    start();
    {
        Client events = listen();
        EXPECT_GE(server->connections(), 1U);
    }
    for (int i = 0; i < 300 && server->connections() > 0; ++i) {
        std::this_thread::sleep_for(milliseconds(10));
    }
    EXPECT_EQ(server->connections(), 0U);
    access.announce("ftpd", "start");
}

TEST(Events, ReadersThatLeaveBeforeAnyEventAreForgotten) {
    class Reader : public velt::host::EventReader {
    public:
        void deliver(const std::shared_ptr<const std::string>& event) override { last = *event; }
        void end() override {}
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
    hub.publish("log", Json::Value(7));
    EXPECT_EQ(stays->last, "event: log\ndata: 7\n\n");
    EXPECT_EQ(next->last, stays->last);
}

TEST_F(HostEvents, AStreamHasTheKindsThatWereAskedFor) {
    start();
    Client all = listen();
    Client bans = listen("?kinds=ban");
    Client some = listen("?kinds=ban%2Cservice");
    access.announce("ftpd", "stop");
    velt::SystemEvent ban;
    ban.name = "velt.login.ban";
    access.eventSubscriber(ban);
    EXPECT_EQ(all.readUntil("\n\n").find("event: service"), 0U);
    EXPECT_EQ(all.readUntil("\n\n").find("event: ban"), 0U);
    EXPECT_EQ(bans.readUntil("\n\n").find("event: ban"), 0U);
    EXPECT_EQ(some.readUntil("\n\n").find("event: service"), 0U);
    EXPECT_EQ(some.readUntil("\n\n").find("event: ban"), 0U);
}

TEST_F(HostEvents, AKindThatThereIsNotIsRefused) {
    start();
    for (const auto& [query, field] :
         {std::pair("kinds=", "kinds"), std::pair("kinds", "kinds"), std::pair("kinds=ban,Log", "kinds"),
          std::pair("kinds=ban,,", "kinds"), std::pair("kinds=%ff", "kinds"), std::pair("kind=ban", "kind"),
          std::pair("kinds=ban&kinds=log", "kinds"), std::pair("kinds=ban&x=1", "x")}) {
        const Answer answer = get(std::string("/events?") + query);
        EXPECT_EQ(answer.status, 400) << query;
        EXPECT_EQ(answer.json()["errors"][0]["field"], field) << query;
    }
}

TEST_F(HostEvents, StreamsOfEventsAreCounted) {
    start();
    EXPECT_NE(get("/metrics").body.find("\nvelt_event_readers 0\n"), std::string::npos);
    const Client events = listen();
    EXPECT_NE(get("/metrics").body.find("\nvelt_event_readers 1\n"), std::string::npos);
}

TEST_F(HostEvents, ADeletedTokenReadsNoFurther) {
    start();
    Client others = listen();
    const Json::Value token = post("/api/tokens", R"({"name":"bench","role":"viewer"})").json();
    Client events = connect();
    events.send(requestText("GET", "/events", "Authorization: Bearer " + token["token"].asString() + "\r\n"));
    ASSERT_NE(events.readUntil(": connected\n\n"), "");
    ASSERT_EQ(ask("DELETE", "/api/tokens/" + token["id"].asString(), admin).status, 204);
    EXPECT_TRUE(waitUntil([&] { return server->connections() == 1; }, seconds(5)));
    access.announce("ftpd", "stop");
    EXPECT_EQ(events.readUntil("event: service"), "") << "it ends without a further event";
    EXPECT_NE(others.readUntil("event: service"), "");
}

TEST_F(HostEvents, AReaderThatLagsIsLeftBehind) {
    limits.queuedEvents = 50'000;
    start();
    const Client events = listen();
    const int small = 4096;
    setsockopt(events.descriptor(), SOL_SOCKET, SO_RCVBUF, &small, sizeof small);
    LogEntry entry;
    entry.sentence = std::string(10'000, 'x');
    for (int i = 0; i < 1000 && server->connections() > 0; ++i) {
        access.logSubscriber(entry);
        std::this_thread::sleep_for(milliseconds(1));
    }
    for (int i = 0; i < 300 && server->connections() > 0; ++i) {
        std::this_thread::sleep_for(milliseconds(10));
    }
    EXPECT_EQ(server->connections(), 0U);
}

TEST_F(HostEvents, AStopEndsStreamsAndIdleConnectionsAtOnce) {
    start();
    Client events = listen();
    Client idle = connect();
    EXPECT_EQ(idle.ask(requestText("GET", "/healthz", admin)).status, 200);
    const auto begin = std::chrono::steady_clock::now();
    stop();
    EXPECT_LT(std::chrono::steady_clock::now() - begin, seconds(3));
    EXPECT_TRUE(events.ended());
    EXPECT_TRUE(idle.ended());
    EXPECT_FALSE(Client::unixSocket(socketPath).connected());
    EXPECT_FALSE(std::filesystem::exists(socketPath));
}

} // namespace
