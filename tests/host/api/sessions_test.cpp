// Who is logged in, and who is logged out.

#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <algorithm>

namespace {

using Texts = std::vector<std::string>;
using std::chrono::milliseconds;
using std::chrono::system_clock;
using velt::OpenSession;
using velt::SessionProtocol;

class HostSessions : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        fake = {};
        start();
        for (const auto& [id, user, address, protocol] :
             {std::tuple("s1", "anna", "192.0.2.1", SessionProtocol::ftp),
              std::tuple("s2", "ben", "192.0.2.77", SessionProtocol::sftp),
              std::tuple("s3", "anna", "2001:db8::1", SessionProtocol::sftp)}) {
            OpenSession session;
            session.id = id;
            session.user = user;
            session.address = address;
            session.protocol = protocol;
            fake.openSessions.push_back(session);
        }
    }

    static Texts idsIn(const Json::Value& answer) {
        Texts ids;
        for (const Json::Value& session : answer["sessions"]) {
            ids.push_back(session["id"].asString());
        }
        return ids;
    }

    Texts ids(const std::string& query) const { return idsIn(get("/api/sessions" + query).json()); }

    FakeStandalone& fake = FakeStandalone::instance();
};

TEST_F(HostSessions, AreListedWithAllThatIsKnown) {
    OpenSession& session = fake.openSessions[0];
    session.protocol = SessionProtocol::ftps;
    session.security = "TLSv1.3 TLS_AES_256_GCM_SHA384";
    session.account = "ftp-anna";
    session.since = system_clock::time_point(milliseconds(1'800'000'000'123));
    session.idleSince = session.since + milliseconds(1000);
    session.busy = true;
    session.command = "STOR";
    session.path = "/docs/\"a\\\n\u00e4\U0001F600";
    session.transfer = {true, "/docs/a b", 7'000'000'000, session.since};
    session.octetsIn = 8'000'000'000;
    session.octetsOut = 5;
    session.rate = 123;
    session.current = false;
    const Json::Value list = ask("GET", "/api/sessions", viewer).json();
    EXPECT_EQ(idsIn(list), (Texts{"s1", "s2", "s3"}));
    const Json::Value first = list["sessions"][0];
    for (const auto& [key, value] :
         {std::pair("protocol", "ftps"), std::pair("security", "TLSv1.3 TLS_AES_256_GCM_SHA384"),
          std::pair("user", "anna"), std::pair("account", "ftp-anna"), std::pair("address", "192.0.2.1"),
          std::pair("since", "2027-01-15T08:00:00.123Z"), std::pair("idle_since", "2027-01-15T08:00:01.123Z"),
          std::pair("command", "STOR"), std::pair("path", "/docs/\"a\\\n\u00e4\U0001F600")}) {
        EXPECT_EQ(first[key], value) << key;
    }
    EXPECT_EQ(first["busy"], true);
    EXPECT_EQ(first["octets_in"].asUInt64(), 8'000'000'000U);
    EXPECT_EQ(first["octets_out"], 5);
    EXPECT_EQ(first["rate"], 123);
    EXPECT_EQ(first["current"], false);
    EXPECT_EQ(first["transfer"]["direction"], "upload");
    EXPECT_EQ(first["transfer"]["path"], "/docs/a b");
    EXPECT_EQ(first["transfer"]["octets"].asUInt64(), 7'000'000'000U);
    EXPECT_EQ(first["transfer"]["since"], "2027-01-15T08:00:00.123Z");
    EXPECT_TRUE(list["sessions"][1]["transfer"].isNull());
    EXPECT_EQ(list["sessions"][1]["current"], true);
}

TEST_F(HostSessions, AreFiltered) {
    EXPECT_EQ(ids("?user=anna"), (Texts{"s1", "s3"}));
    EXPECT_EQ(ids("?user=ann"), Texts{});
    EXPECT_EQ(ids("?protocol=sftp"), (Texts{"s2", "s3"}));
    EXPECT_EQ(ids("?user=anna&protocol=sftp"), Texts{"s3"});
    EXPECT_EQ(ids("?address=192.0.2.1"), Texts{"s1"});
    EXPECT_EQ(ids("?address=192.0.2.0%2F24"), (Texts{"s1", "s2"}));
    EXPECT_EQ(ids("?address=2001%3Adb8%3A%3A%2F64"), Texts{"s3"});
}

TEST_F(HostSessions, AFilterThatIsNoneIsRefused) {
    for (const char* const query :
         {"?user=", "?user", "?address=anna", "?address=192.0.2.1%2F24", "?address=", "?protocol=ssh",
          "?protocol=", "?user=a&user=b", "?user=%ff", "?id=s1", "?reason=x", "?dry_run=true"}) {
        const Answer answer = get(std::string("/api/sessions") + query);
        EXPECT_EQ(answer.status, 400) << query;
        EXPECT_EQ(answer.json()["errors"].size(), 1U) << query;
    }
}

TEST_F(HostSessions, OneIsEnded) {
    fake.actor.clear();
    EXPECT_EQ(ask("DELETE", "/api/sessions/s2?reason=too%20much", admin).status, 204);
    EXPECT_EQ(fake.endedSessions, Texts{"s2 admin too much"});
    EXPECT_EQ(fake.audit, Texts{"s2: ben: 192.0.2.77: : too much"});
    EXPECT_EQ(fake.actor, "admin") << "for the administrator log";
    EXPECT_EQ(ids(""), (Texts{"s1", "s3"}));
    EXPECT_TRUE(logged("session s2 ended by admin"));
}

TEST_F(HostSessions, OneThatIsNotThereIsNotFound) {
    const Answer answer = ask("DELETE", "/api/sessions/s9", admin);
    EXPECT_EQ(answer.status, 404);
    EXPECT_EQ(answer.json()["detail"], "There is no session s9.");
    EXPECT_EQ(ask("DELETE", "/api/sessions/s9?dry_run=true", admin).status, 404);
    EXPECT_EQ(fake.audit, Texts{});
}

TEST_F(HostSessions, AreEndedByUserOrAddress) {
    Answer answer = ask("DELETE", "/api/sessions?user=anna", admin);
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.json()["ended"], 2);
    std::ranges::sort(fake.audit);
    EXPECT_EQ(fake.audit, (Texts{"s1: anna: 192.0.2.1", "s3: anna: 2001:db8::1"}));
    answer = ask("DELETE", "/api/sessions?address=192.0.2.0%2F24&reason=maintenance", admin);
    EXPECT_EQ(answer.json()["ended"], 1);
    EXPECT_EQ(fake.endedSessions.back(), "s2 admin maintenance");
    EXPECT_EQ(ask("DELETE", "/api/sessions?user=anna", admin).json()["ended"], 0);
}

TEST_F(HostSessions, AreNotEndedWithoutAFilter) {
    for (const char* const query : {"", "?reason=x", "?user=", "?address=", "?dry_run=false",
                                    "?user=anna&address=", "?user=anna&x=1", "?user=anna&user=ben"}) {
        const Answer answer = ask("DELETE", std::string("/api/sessions") + query, admin);
        EXPECT_EQ(answer.status, 400) << query;
        EXPECT_NE(answer.json()["detail"].asString().find("No session was ended."), std::string::npos);
    }
    EXPECT_EQ(fake.openSessions.size(), 3U);
}

TEST_F(HostSessions, AReasonIsOneShortLine) {
    for (const std::string& reason :
         {std::string("a%0Ab"), std::string("%1B[31m"), std::string("%ff"), std::string("a%00b"),
          std::string("%E2%80%AE"), std::string(201, 'x')}) {
        EXPECT_EQ(ask("DELETE", "/api/sessions/s1?reason=" + reason, admin).status, 400) << reason;
        EXPECT_EQ(ask("DELETE", "/api/sessions?user=anna&reason=" + reason, admin).status, 400) << reason;
    }
    EXPECT_EQ(fake.openSessions.size(), 3U);
    EXPECT_EQ(ask("DELETE", "/api/sessions/s1?reason=" + std::string(200, 'x'), admin).status, 204);
}

TEST_F(HostSessions, StayInADryRun) {
    const Json::Value one = ask("DELETE", "/api/sessions/s1?dry_run=true&reason=why", admin).json();
    ASSERT_EQ(one["effects"].size(), 1U);
    EXPECT_EQ(one["effects"][0]["subject"], "s1: anna: 192.0.2.1: : why");
    EXPECT_EQ(one["sessions_ended"], 1);
    const Json::Value some = ask("DELETE", "/api/sessions?user=anna&dry_run=true", admin).json();
    EXPECT_EQ(some["effects"].size(), 2U);
    EXPECT_EQ(some["sessions_ended"], 2);
    EXPECT_EQ(fake.openSessions.size(), 3U);
    EXPECT_EQ(fake.audit, Texts{});
}

TEST_F(HostSessions, AreEndedByAdministratorsOnly) {
    EXPECT_EQ(ask("DELETE", "/api/sessions/s1", viewer).status, 403);
    EXPECT_EQ(ask("DELETE", "/api/sessions?user=anna", viewer).status, 403);
    EXPECT_EQ(fake.openSessions.size(), 3U);
}

TEST_F(HostSessions, OneThatCannotBeEndedDoesNotSaveTheOthers) {
    fake.sentence = "The session s1 does not end.";
    fake.immortal = {"s1"};
    EXPECT_EQ(ask("DELETE", "/api/sessions/s1", admin).json()["detail"], "The session s1 does not end.");
    EXPECT_EQ(fake.audit, Texts{});
    const Answer answer = ask("DELETE", "/api/sessions?user=anna", admin);
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["detail"], "Sessions that were ended: 1. The session s1 does not end.");
    EXPECT_EQ(answer.json()["ended"], 1);
    EXPECT_EQ(ids(""), (Texts{"s1", "s2"}));
    EXPECT_EQ(fake.audit.size(), 1U);
}

TEST_F(HostSessions, ThatCannotBeListedAreAFailure) {
    fake.sentence = "Cannot read the folder.";
    fake.sessionsFail = true;
    EXPECT_EQ(get("/api/sessions").status, 500);
    EXPECT_EQ(ask("DELETE", "/api/sessions/s1", admin).json()["detail"], "Cannot read the folder.");
    EXPECT_EQ(ask("DELETE", "/api/sessions?user=anna", admin).status, 500);
}

TEST_F(HostSessions, AThousandAreListedWholeAndEnded) {
    fake.openSessions.resize(1000, fake.openSessions[0]);
    for (std::size_t i = 0; i < fake.openSessions.size(); ++i) {
        fake.openSessions[i].id = "s" + std::to_string(i);
    }
    EXPECT_EQ(ids("").size(), 1000U);
    EXPECT_EQ(ask("DELETE", "/api/sessions?user=anna", admin).json()["ended"], 999);
    EXPECT_EQ(fake.endedSessions.size(), 999U);
    EXPECT_EQ(fake.audit.size(), 999U);
    EXPECT_EQ(ids(""), Texts{"s1"}) << "ben's";
}

} // namespace
