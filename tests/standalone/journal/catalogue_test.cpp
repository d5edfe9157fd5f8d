#include "standalone/journal/catalogue.h"

#include "base/plain_text.h"

#include <gtest/gtest.h>

#include <set>

namespace velt {
namespace {

using Texts = std::array<std::string, 4>;

TEST(Catalogue, KnowsEveryEventOnce) {
    std::set<std::uint32_t> events;
    for (const CatalogueEntry& entry : catalogue())
        events.insert(entry.event);
    EXPECT_EQ(events, (std::set<std::uint32_t>{
                          0x11B00002, 0x11B00006, 0x11B00008, 0x11B00009, 0x11B0000A, 0x11B00010, 0x11B00011,
                          0x11B00012, 0x11B00013, 0x11B00019, 0x11B00020, 0x11B00021, 0x11B00022, 0x11B00024,
                          0x11B00025, 0x11B00026, 0x11B00027, 0x11B00028, 0x11B00035, 0x11B00036, 0x11BF0001,
                          0x11BF0002, 0x11BF0003, 0x11BF0004, 0x11BF0005, 0x11BF0006, 0x11BF0007, 0x11BF0008,
                          0x11BF0009, 0x11BF000A, 0x11BF000B, 0x11BF0010, 0x11BF0011, 0x11BF0012, 0x11BF0013,
                          0x11BF0014, 0x11BF0015, 0x11BF0016, 0x11BF0020, 0x11BF0021}));
    EXPECT_EQ(events.size(), catalogue().size());
}

TEST(Catalogue, HasOneWholeSentenceForEachEvent) {
    for (const CatalogueEntry& entry : catalogue()) {
        const std::string sentence = sentenceOf(entry.event, {"first", "second", "", ""});
        EXPECT_TRUE(sentence[0] >= 'A' && sentence[0] <= 'Z') << sentence;
        EXPECT_EQ(sentence.back(), '.') << sentence;
        EXPECT_EQ(sentence.find('%'), std::string::npos) << sentence;
        EXPECT_TRUE(isPlainText(sentence));
        const std::string pattern = entry.sentence;
        EXPECT_EQ(pattern.find("%1") != std::string::npos, sentence.find("first") != std::string::npos);
        EXPECT_EQ(pattern.find("%2") != std::string::npos, sentence.find("second") != std::string::npos);
    }
}

TEST(Catalogue, PutsTheTextsWhereTheyBelong) {
    EXPECT_EQ(sentenceOf(0x11B00012, {"21", "2121", "", ""}), "The FTP port was changed from 21 to 2121.");
    EXPECT_EQ(sentenceOf(0x11B0000A, {"55536 - 55899", "30000 - 30100", "", ""}),
              "The passive port range of the FTP service was changed from 55536 - 55899 to 30000 - 30100.");
    EXPECT_EQ(sentenceOf(0x11B00008, {"0 KB/s", "100 KB/s", "", ""}),
              "The FTP upload limit was changed from 0 KB/s to 100 KB/s.");
    EXPECT_EQ(sentenceOf(0x11B00009, {"0 KB/s", "100 KB/s", "", ""}),
              "The FTP download limit was changed from 0 KB/s to 100 KB/s.");
    EXPECT_EQ(sentenceOf(0x11B00024, {"anna", "", "", ""}),
              "User \"anna\" was confined to the home folder in the FTP service.");
    EXPECT_EQ(sentenceOf(0x11B00026, {"started", "", "", ""}),
              "Confining anonymous FTP users to one share was started.");
    EXPECT_EQ(sentenceOf(0x11B00035, {"22", "222", "", ""}), "The SFTP port was changed from 22 to 222.");
    EXPECT_EQ(sentenceOf(0x11BF0001, {"192.0.2.1", "600", "10", "SFTP"}),
              "Logins from 192.0.2.1 are refused for 600 seconds after 10 failed ones at SFTP.");
    EXPECT_EQ(sentenceOf(0x11BF000B, {"3f2-1", "anna", "192.0.2.1", ": too much"}),
              "The session 3f2-1 of \"anna\" from 192.0.2.1 was ended: too much.");
    EXPECT_EQ(sentenceOf(0x11B00028, {}),
              "The share that anonymous FTP users are confined to was set to \"\".");
}

TEST(Catalogue, NeverReadsATextAsAPlace) {
    EXPECT_EQ(sentenceOf(0x11B00012, {"%2", "%1", "", ""}), "The FTP port was changed from %2 to %1.");
    EXPECT_EQ(sentenceOf(0x11B00012, {"%s%n", "100%", "", ""}),
              "The FTP port was changed from %s%n to 100%.");
}

TEST(Catalogue, NamesAnUnknownEventByItsNumber) {
    EXPECT_EQ(sentenceOf(0x11B000FF, {"a", "", "b", ""}), "Event 0x11B000FF: a, b.");
    EXPECT_EQ(sentenceOf(7, {}), "Event 0x00000007.");
}

} // namespace
} // namespace velt
