// HTTP that is malformed, ambiguous, split or hurried.

#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

const std::string target = "/api/VELT.Core.FileServ.FTP.SFTP/v1/";

class HostFraming : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
        settings.workers = 1;
        start();
    }

    /// The answer to raw text on a connection of its own, which must be over afterwards.
    Answer refused(const std::string& text) const {
        Client client = connect();
        Answer answer = client.ask(text);
        EXPECT_EQ(answer.header("connection"), "close") << text;
        EXPECT_TRUE(client.ended()) << text;
        return answer;
    }
};

TEST_F(HostFraming, ConnectionsAreKept) {
    Client client = connect();
    for (int i = 0; i < 3; ++i) {
        const Answer answer = client.ask(requestText("GET", target + "get", admin));
        EXPECT_EQ(answer.status, 200);
        EXPECT_EQ(answer.header("connection"), "keep-alive");
    }
}

TEST_F(HostFraming, ConnectionsAreClosedWhenTheClientWantsIt) {
    EXPECT_EQ(refused(requestText("GET", "/healthz", admin + "Connection: close\r\n")).status, 200);
    EXPECT_EQ(refused("GET /healthz HTTP/1.0\r\nHost: localhost\r\n" + admin + "\r\n").status, 200);
}

TEST_F(HostFraming, PipelinedRequestsAreAnsweredInOrder) {
    Client client = connect();
    std::string text;
    for (int i = 0; i < 20; ++i) {
        text += requestText("GET", "/missing/" + std::to_string(i), admin);
    }
    client.send(text);
    for (int i = 0; i < 20; ++i) {
        const Answer answer = client.receive();
        EXPECT_EQ(answer.status, 404);
        EXPECT_NE(answer.body.find("/missing/" + std::to_string(i) + "."), std::string::npos) << answer.body;
    }
}

TEST_F(HostFraming, ARequestMayArriveByteByByte) {
    Client client = connect();
    const std::string text = requestText("POST", target + "set", admin, R"({"enable":true,"portnum":2222})");
    for (const char byte : text) {
        ASSERT_TRUE(client.send(std::string(1, byte)));
    }
    EXPECT_EQ(client.receive().status, 204);
}

TEST_F(HostFraming, ChunkedBodiesAreUnderstood) {
    Client client = connect();
    const std::string head = "POST " + target + "set HTTP/1.1\r\nHost: localhost\r\n" + admin +
                             "Transfer-Encoding: chunked\r\n\r\n";
    EXPECT_EQ(client.ask(head + "5\r\n{\"ena\r\na\r\nble\":true}\r\n0\r\n\r\n").status, 204);
    EXPECT_EQ(client.ask(head + "2\r\n[]\r\n0\r\n\r\n").status, 400) << "complete, but no object";
    EXPECT_EQ(refused(head + "zz\r\n{}\r\n0\r\n\r\n").status, 400);
}

TEST_F(HostFraming, UnknownTransferCodingsAreNotImplemented) {
    for (const char* coding : {"gzip", "identity", "gzip, chunked", "chunked, gzip", "xchunked"}) {
        const Answer answer = refused("POST " + target + "set HTTP/1.1\r\nHost: localhost\r\n" + admin +
                                      "Transfer-Encoding: " + coding + "\r\n\r\n" +
                                      requestText("POST", target + "set", admin, R"({"enable":true})"));
        EXPECT_EQ(answer.status, 501) << coding;
    }
    EXPECT_EQ(fake::Platform::instance().count("VELTSFTPConfigSet"), 0) << "a body was taken for a request";
}

TEST_F(HostFraming, ExactlyOneHostIsNeeded) {
    EXPECT_EQ(refused("GET /healthz HTTP/1.1\r\n" + admin + "\r\n").status, 400);
    EXPECT_EQ(
        refused("GET /healthz HTTP/1.1\r\nHost: localhost\r\nHost: localhost\r\n" + admin + "\r\n").status,
        400);
}

TEST_F(HostFraming, ContinuedLinesAreRefused) {
    for (const char* blank : {" ", "\t"}) {
        EXPECT_EQ(refused("GET /healthz HTTP/1.1\r\nHost: localhost\r\nX-Long: a\r\n" + std::string(blank) +
                          "b\r\n" + admin + "\r\n")
                      .status,
                  400);
    }
}

TEST_F(HostFraming, ABodyMayBeginWithABlank) {
    Client client = connect();
    EXPECT_EQ(client.ask(requestText("POST", target + "set", admin, R"( {"enable":true})")).status, 204);
}

TEST_F(HostFraming, MalformedHeadsAreRefused) {
    const std::string host = "Host: localhost\r\n" + admin;
    for (const std::string& text : {
             std::string("NONSENSE\r\n\r\n"),
             std::string("GET /healthz HTTP/1.1\nHost: localhost\n\n"),
             "GET  HTTP/1.1\r\n" + host + "\r\n",
             "GET /healthz HTTP/1.1\r\nNo colon\r\n" + host + "\r\n",
             "GET /healthz HTTP/1.1\r\nBad name: x\r\n" + host + "\r\n",
             "GET /healthz HTTP/1.1\r\nContent-Length: -1\r\n" + host + "\r\n",
             "GET /healthz HTTP/1.1\r\nContent-Length: 1\r\nContent-Length: 2\r\n" + host + "\r\n",
             "POST /api HTTP/1.1\r\nContent-Length: 2\r\nTransfer-Encoding: chunked\r\n" + host + "\r\n{}",
             "GET http://localhost/healthz HTTP/1.1\r\n" + host + "\r\n",
             "GET /a\x01"
             "b HTTP/1.1\r\n" +
                 host + "\r\n",
         }) {
        EXPECT_EQ(refused(text).status, 400) << text;
    }
    EXPECT_EQ(refused("GET /healthz HTTP/2.0\r\n" + host + "\r\n").status, 505);
}

TEST_F(HostFraming, EmptyLinesBeforeARequestAreLetPass) {
    Client client = connect();
    EXPECT_EQ(client.ask("\r\n\r\n" + requestText("GET", "/healthz", admin)).status, 200);
}

TEST_F(HostFraming, AClientMayWaitForContinue) {
    Client client = connect();
    client.send("POST " + target + "set HTTP/1.1\r\nHost: localhost\r\n" + admin +
                "Content-Length: 15\r\nExpect: 100-continue\r\n\r\n");
    EXPECT_EQ(client.receive().status, 100);
    EXPECT_EQ(client.ask(R"({"enable":true})").status, 204);
}

TEST_F(HostFraming, ABodyThatWouldBeTooLargeIsNotAskedFor) {
    EXPECT_EQ(refused("POST " + target + "set HTTP/1.1\r\nHost: localhost\r\n" + admin +
                      "Content-Length: 99999999\r\nExpect: 100-continue\r\n\r\n")
                  .status,
              413);
}

TEST_F(HostFraming, AClientWithoutAccessIsNotToldToContinue) {
    EXPECT_EQ(refused("POST " + target +
                      "set HTTP/1.1\r\nHost: localhost\r\n"
                      "Content-Length: 15\r\nExpect: 100-continue\r\n\r\n")
                  .status,
              401);
}

TEST_F(HostFraming, HeadIsAnsweredWithoutABody) {
    Client client = connect();
    client.send(requestText("HEAD", "/healthz", admin));
    EXPECT_EQ(client.receive(false).status, 405);
    EXPECT_EQ(client.ask(requestText("GET", "/healthz", admin)).status, 200);
}

TEST_F(HostFraming, AClientThatLeavesEarlyHarmsNobody) {
    for (int i = 0; i < 50; ++i) {
        Client client = connect();
        client.send(requestText("POST", target + "set", admin, R"({"enable":true})")
                        .substr(0, 40U + static_cast<unsigned>(i)));
    }
    for (int i = 0; i < 50; ++i) {
        Client client = connect();
        client.send(requestText("GET", target + "get", admin));
    }
    EXPECT_EQ(get("/healthz").status, 200);
}

} // namespace
