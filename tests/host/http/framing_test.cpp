// HTTP that is malformed, ambiguous, split or hurried.

#include "host/http/request_reader.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <algorithm>

namespace {

using velt::host::RequestReader;

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

TEST_F(HostFraming, TrailersAreNotTakenForHeaders) {
    const std::string head =
        "POST " + target + "set HTTP/1.1\r\nHost: localhost\r\nTransfer-Encoding: chunked\r\n";
    const std::string chunks = "\r\nf\r\n{\"enable\":true}\r\n0\r\n";
    EXPECT_EQ(refused(head + chunks + admin + "\r\n").status, 401);
    Client client = connect();
    for (const char* trailer : {"Connection: close\r\n", "If-Match: \"other\"\r\n", "Host: evil.example\r\n",
                                "Authorization: Bearer wrong\r\n", "Expect: 100-continue\r\n"}) {
        EXPECT_EQ(client.ask(head + admin + chunks + trailer + "\r\n").status, 204) << trailer;
    }
}

/// The reader's answer to the text, which arrives in pieces that begin at these places.
RequestReader::Step readInPieces(RequestReader& reader, const std::string& text,
                                 const std::vector<std::size_t>& places) {
    auto step = RequestReader::Step::needMore;
    for (std::size_t i = 0; i < places.size(); ++i) {
        const std::size_t end = i + 1 < places.size() ? places[i + 1] : text.size();
        const std::string piece = text.substr(places[i], end - places[i]);
        const auto [space, size] = reader.space();
        EXPECT_GE(size, piece.size());
        std::copy(piece.begin(), piece.end(), space);
        reader.added(piece.size());
        do {
            step = reader.next();
        } while (step == RequestReader::Step::head);
    }
    return step;
}

TEST(RequestReading, ChunksMayArriveInAnyPieces) {
    for (const std::string trailers : {"", "X-Sum: 1\r\n"}) {
        for (const std::string chunks : {"", "5\r\n{\"ena\r\n0a;x=y\r\nble\":true}\r\n"}) {
            const std::string text = "POST / HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n" +
                                     chunks + "0\r\n" + trailers + "\r\n";
            for (std::size_t first = 1; first < text.size(); ++first) {
                for (std::size_t second = first + 1; second < text.size(); ++second) {
                    RequestReader reader(1000, 1000);
                    ASSERT_EQ(readInPieces(reader, text, {0, first, second}), RequestReader::Step::request)
                        << first << " " << second;
                    ASSERT_EQ(reader.request().body, chunks.empty() ? "" : R"({"enable":true})");
                }
            }
            for (std::size_t size = 1; size < text.size(); ++size) {
                std::vector<std::size_t> places;
                for (std::size_t place = 0; place < text.size(); place += size) {
                    places.push_back(place);
                }
                RequestReader reader(1000, 1000);
                ASSERT_EQ(readInPieces(reader, text, places), RequestReader::Step::request) << size;
            }
        }
    }
}

TEST_F(HostFraming, TheHeaderOfAChunkIsOfLimitedLength) {
    const std::string head = "POST " + target + "get HTTP/1.1\r\nHost: localhost\r\n" + admin +
                             "Transfer-Encoding: chunked\r\n\r\n";
    const Answer answer = refused(head + "2;" + std::string(limits.head, 'x'));
    EXPECT_EQ(answer.status, 400);
    EXPECT_EQ(answer.json()["detail"], "The header of a chunk is too long.");
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
    EXPECT_EQ(refused("POST /api HTTP/1.0\r\nTransfer-Encoding: chunked\r\n" + host + "\r\n0\r\n\r\n").status,
              400);
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
