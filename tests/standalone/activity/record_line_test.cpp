// What a session writes down, and what is read of it.
#include "standalone/activity/record_line.h"

#include "standalone/activity/spool_text.h"

#include <gtest/gtest.h>

#include <array>
#include <string>
#include <vector>

namespace velt {
namespace {

std::string lineOf(const std::vector<velt_member>& members, std::size_t longest = velt_longest_text) {
    std::array<char, velt_longest_line> line{};
    return {line.data(), velt_make_line(line.data(), members.data(), members.size(), longest)};
}

/// A record with this path.
std::string recordAt(const std::string& path) {
    return lineOf({{"kind", "upload", 0},
                   {"result", "done", 0},
                   {"protocol", "ftp", 0},
                   {"time", nullptr, 1},
                   {"number", nullptr, 2},
                   {"path", path.c_str(), 0}});
}

OperationRecord readBack(const std::string& path) {
    const SpoolText read = parseSpool(recordAt(path));
    EXPECT_EQ(read.records.size(), 1U);
    return read.records.empty() ? OperationRecord() : read.records.front();
}

TEST(RecordLine, IsASequenceOfJsonTexts) {
    EXPECT_EQ(lineOf({{"path", "/a", 0}, {"octets", nullptr, 5}}), "\x1e{\"path\":\"/a\",\"octets\":5}\n");
}

TEST(RecordLine, LeavesOutWhatDoesNotApply) {
    EXPECT_EQ(lineOf({{"path", "", 0}, {"octets", nullptr, -1}, {"kind", "mode", 0}}),
              "\x1e{\"kind\":\"mode\"}\n");
}

TEST(RecordLine, GivesBackNamesOfAllKinds) {
    for (const std::string name : {"/plain", "/with \"quotes\" and \\", "/line\nbreak\tand\x01\x1e", "/100%",
                                   "/\u00fcber \U0001F600", "/\x7f"}) {
        const OperationRecord record = readBack(name);
        EXPECT_EQ(record.place.path, name);
        EXPECT_FALSE(record.escaped);
    }
}

TEST(RecordLine, EscapesNamesThatAreNotUtf8) {
    const std::vector<std::pair<std::string, std::string>> names{{"/\xfc", "/%FC"},
                                                                 {"/100%\xff", "/100%25%FF"},
                                                                 {"/\xc3", "/%C3"},
                                                                 {"/\xed\xa0\x80", "/%ED%A0%80"},
                                                                 {"/\xc0\xaf", "/%C0%AF"},
                                                                 {"/\xf4\x90\x80\x80", "/%F4%90%80%80"},
                                                                 {"/\xe0\x80\x80", "/%E0%80%80"},
                                                                 {"/\u00fc\x80", "/\u00fc%80"}};
    for (const auto& [name, escaped] : names) {
        const OperationRecord record = readBack(name);
        EXPECT_EQ(record.place.path, escaped);
        EXPECT_TRUE(record.escaped);
    }
}

TEST(RecordLine, CutsNamesThatFillIt) {
    const std::string path = "/" + std::string(3000, '\x01');
    const std::string line =
        lineOf({{"kind", "upload", 0}, {"path", path.c_str(), 0}, {"octets", nullptr, 7}});
    EXPECT_LT(line.size(), 2000U);
    EXPECT_TRUE(line.ends_with(",\"octets\":7,\"cut\":1}\n")) << line;
}

TEST(RecordLine, CutsWhatIsLongerThanItMay) {
    const std::vector<velt_member> members{{"path", "/abc", 0}, {"octets", nullptr, 7}};
    EXPECT_EQ(lineOf(members, 4), "\x1e{\"path\":\"/abc\",\"octets\":7}\n");
    EXPECT_EQ(lineOf(members, 3), "\x1e{\"path\":\"/ab\",\"octets\":7,\"cut\":1}\n");
    EXPECT_EQ(lineOf({{"path", "/\u00fc", 0}, {"kind", "x", 0}}, 2),
              "\x1e{\"path\":\"/\u00fc\",\"kind\":\"x\"}\n")
        << "no character is cut in two";
}

TEST(RecordLine, HasRoomForTheLongestPaths) {
    const std::string path = "/" + std::string(4094, 'x');
    EXPECT_EQ(readBack(path).place.path, path);
}

TEST(SpoolText, ReadsAllLines) {
    const SpoolText read = parseSpool(recordAt("/a") + recordAt("/b"));
    ASSERT_EQ(read.records.size(), 2U);
    EXPECT_EQ(read.records[1].place.path, "/b");
    EXPECT_EQ(read.damaged, 0U);
}

TEST(SpoolText, LeavesWhatIsStillBeingWritten) {
    const std::string whole = recordAt("/a");
    const SpoolText read = parseSpool(whole + recordAt("/b").substr(0, 20));
    EXPECT_EQ(read.records.size(), 1U);
    EXPECT_EQ(read.taken, whole.size());
}

TEST(SpoolText, PassesOverARecordThatWasCut) {
    const SpoolText read = parseSpool(recordAt("/a") + recordAt("/cut").substr(0, 30) + recordAt("/b"));
    ASSERT_EQ(read.records.size(), 2U);
    EXPECT_EQ(read.records[1].place.path, "/b");
    EXPECT_EQ(read.damaged, 1U);
}

TEST(SpoolText, PassesOverRoomThatWasGivenBack) {
    const SpoolText read = parseSpool(std::string(4096, '\0') + recordAt("/a"));
    EXPECT_EQ(read.records.size(), 1U);
    EXPECT_EQ(read.damaged, 0U);
}

TEST(SpoolText, PassesOverWhatIsNoRecord) {
    const SpoolText read =
        parseSpool("rubbish\n\x1e{}\n\x1e[1]\n\x1e{\"kind\":\"upload\"}\n" + recordAt("/a"));
    EXPECT_EQ(read.records.size(), 1U);
    EXPECT_EQ(read.damaged, 4U);
}

} // namespace
} // namespace velt
