#include "cli/server_events.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

std::vector<std::string> eventsOf(const std::vector<std::string>& pieces) {
    std::vector<std::string> events;
    velt::cli::EventStream stream(
        [&](const std::string& event, const std::string& data) { events.push_back(event + "|" + data); });
    for (const std::string& piece : pieces) {
        stream.feed(piece);
    }
    return events;
}

using Events = std::vector<std::string>;

} // namespace

TEST(EventStreamTest, AnEventEndsWithAnEmptyLine) {
    EXPECT_EQ(eventsOf({"event: log\ndata: {}\n\n"}), Events{"log|{}"});
    EXPECT_EQ(eventsOf({"event: log\ndata: {}\n"}), Events{});
}

TEST(EventStreamTest, PiecesMayEndAnywhere) {
    const std::string text = "event: log\r\ndata: a\r\n\r\nid: 5\ndata:b\n\n";
    std::vector<std::string> pieces;
    for (const char c : text) {
        pieces.emplace_back(1, c);
    }
    EXPECT_EQ(eventsOf(pieces), (Events{"log|a", "message|b"}));
}

TEST(EventStreamTest, LinesOfDataAreJoined) {
    EXPECT_EQ(eventsOf({"data: a\ndata:\ndata:  b\n\n"}), Events{"message|a\n\n b"});
}

TEST(EventStreamTest, CommentsAndUnknownFieldsAreIgnored) {
    EXPECT_EQ(eventsOf({": heartbeat\n\nretry: 5\n\nevent: lonely\n\ndata\n\n"}), Events{"message|"});
}
