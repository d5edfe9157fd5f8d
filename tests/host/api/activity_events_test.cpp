// What users do, as events.

#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <thread>

namespace {

using velt::Activity;
using velt::ActivityKind;
using velt::Operation;
using velt::OperationResult;

class HostActivityEvents : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        fake = {};
        start();
    }

    Client listen(const std::string& query) const {
        Client client = connect();
        client.send(requestText("GET", "/events" + query, admin));
        EXPECT_NE(client.readUntil(": connected\n\n"), "");
        // The server adds the reader right after that.
        std::this_thread::sleep_for(std::chrono::milliseconds(100));
        return client;
    }

    static Activity activity(Operation operation, ActivityKind kind = ActivityKind::operation) {
        Activity made;
        made.kind = kind;
        made.record.operation = operation;
        made.record.session = "s1";
        made.record.user = "anna";
        made.record.octets = 7;
        return made;
    }

    /// The next event: "transfer started", and its data.
    static std::pair<std::string, Json::Value> next(Client& client) {
        const std::string text = client.readUntil("\n\n");
        const auto line = text.find('\n');
        Answer data;
        data.body = text.substr(line + 7);
        const std::string kind = text.substr(7, line - 7);
        const Json::Value json = data.json();
        return {kind + " " + json["action"].asString(), json};
    }

    FakeStandalone& fake = FakeStandalone::instance();
};

TEST_F(HostActivityEvents, SessionsAreTold) {
    Client client = listen("?kinds=session");
    fake.activitySubscriber(activity(Operation::sessionOpened));
    fake.activitySubscriber(activity(Operation::upload));
    fake.activitySubscriber(activity(Operation::remove));
    fake.activitySubscriber(activity(Operation::sessionClosed));
    Activity refused = activity(Operation::loginRefused);
    refused.record.result = OperationResult::refused;
    refused.record.reason = "password";
    fake.activitySubscriber(refused);
    EXPECT_EQ(next(client).first, "session opened");
    EXPECT_EQ(next(client).first, "session closed");
    const auto [name, data] = next(client);
    EXPECT_EQ(name, "session refused");
    EXPECT_EQ(data["user"], "anna");
    EXPECT_EQ(data["reason"], "password");
    EXPECT_EQ(data["operation"], "login-refused");
}

TEST_F(HostActivityEvents, TransfersAreTold) {
    Client client = listen("?kinds=transfer");
    fake.activitySubscriber(activity(Operation::sessionOpened));
    Activity running = activity(Operation::upload, ActivityKind::transferStarted);
    running.record.result = OperationResult::incomplete;
    fake.activitySubscriber(running);
    running.kind = ActivityKind::transferProgress;
    running.rate = 99;
    fake.activitySubscriber(running);
    for (const OperationResult result :
         {OperationResult::done, OperationResult::incomplete, OperationResult::refused}) {
        Activity end = activity(Operation::download);
        end.record.result = result;
        fake.activitySubscriber(end);
    }
    const auto [started, first] = next(client);
    EXPECT_EQ(started, "transfer started");
    EXPECT_FALSE(first.isMember("result"));
    const auto [progress, second] = next(client);
    EXPECT_EQ(progress, "transfer progress");
    EXPECT_EQ(second["rate"], 99);
    EXPECT_EQ(second["octets"], 7);
    EXPECT_EQ(second["operation"], "upload");
    const auto [done, third] = next(client);
    EXPECT_EQ(done, "transfer done");
    EXPECT_EQ(third["result"], "done");
    EXPECT_EQ(next(client).first, "transfer incomplete");
    EXPECT_EQ(next(client).first, "transfer refused");
}

TEST_F(HostActivityEvents, OtherOperationsAreTold) {
    Client client = listen("?kinds=operation,session");
    fake.activitySubscriber(activity(Operation::upload));
    fake.activitySubscriber(activity(Operation::rename));
    fake.activitySubscriber(activity(Operation::sessionClosed));
    const auto [name, data] = next(client);
    EXPECT_EQ(name, "operation ");
    EXPECT_EQ(data["operation"], "rename");
    EXPECT_EQ(data["result"], "done");
    EXPECT_EQ(next(client).first, "session closed");
}

TEST_F(HostActivityEvents, ComeOnlyToThoseWhoAskForThem) {
    Client client = listen("");
    for (int i = 0; i < 100; ++i) {
        fake.activitySubscriber(activity(Operation::sessionOpened));
        fake.activitySubscriber(activity(Operation::upload));
        fake.activitySubscriber(activity(Operation::remove));
    }
    fake.announce("ftpd", "stop");
    EXPECT_EQ(next(client).first, "service stop");
}

TEST_F(HostActivityEvents, EndWithTheHost) {
    EXPECT_TRUE(fake.activitySubscriber);
    stop();
    EXPECT_FALSE(fake.activitySubscriber);
}

} // namespace
