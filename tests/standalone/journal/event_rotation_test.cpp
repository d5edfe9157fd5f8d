// The event files over a long time, with several writers, and after crashes.
#include "platform/sysevent.h"
#include "standalone/contract/last_error.h"
#include "standalone/contract/string_map.h"
#include "standalone/journal/event_file.h"
#include "tests/standalone/support/state_folder.h"

#include <gtest/gtest.h>
#include <json/json.h>

#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <map>
#include <sstream>
#include <thread>
#include <vector>

namespace velt {
namespace {

constexpr const char* currentFile = "/var/log/velt/events.jsonl";
constexpr int fillerSize = 60'000;
// What one file takes of the events below.
constexpr int eventsInAFile = static_cast<int>(largestEventFile) / (fillerSize + 100);

class EventRotationTest : public testing::Test {
protected:
    static bool emit(const std::string& name, int number) {
        VLIBCSzHash parameters;
        parameters.entries["number"] = std::to_string(number);
        parameters.entries["filler"] = std::string(fillerSize, 'x');
        return VLIBSyseventEmit(name.c_str(), &parameters, 1) == 0;
    }

    std::string nameOf(int file) const { return currentFile + (file == 0 ? "" : "." + std::to_string(file)); }

    /// The numbers of each name's events, from the oldest file to the newest; every line has to be whole.
    std::map<std::string, std::vector<int>> events() const {
        std::map<std::string, std::vector<int>> found;
        for (int file = keptEventFiles; file >= 0; --file) {
            std::istringstream lines(folder_.read(nameOf(file)));
            for (std::string line; std::getline(lines, line);) {
                Json::Value event;
                std::istringstream text(line);
                EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), text, &event, nullptr));
                found[event["event"].asString()].push_back(
                    std::stoi(event["parameters"]["number"].asString()));
            }
        }
        return found;
    }

    static std::vector<int> upTo(int count) {
        std::vector<int> numbers;
        for (int number = 0; number < count; ++number) {
            numbers.push_back(number);
        }
        return numbers;
    }

    test::StateFolder folder_;
};

TEST_F(EventRotationTest, KeepsTheNewestEventsInFilesOfALimitedSize) {
    constexpr int count = eventsInAFile * (keptEventFiles + 2);
    for (int number = 0; number < count; ++number) {
        ASSERT_TRUE(emit("e", number)) << lastErrorSentence();
    }
    for (int file = 0; file <= keptEventFiles; ++file) {
        const std::string text = folder_.read(nameOf(file));
        EXPECT_GT(text.size(), 0U) << nameOf(file);
        EXPECT_LE(text.size(), largestEventFile) << nameOf(file);
    }
    EXPECT_EQ(folder_.read(nameOf(keptEventFiles + 1)), "") << "the oldest are gone";
    const std::vector<int> kept = events()["e"];
    ASSERT_GE(kept.size(), static_cast<std::size_t>(eventsInAFile) * keptEventFiles);
    for (std::size_t i = 0; i < kept.size(); ++i) {
        EXPECT_EQ(kept[i], count - static_cast<int>(kept.size() - i)) << "none is missing in between";
    }
}

TEST_F(EventRotationTest, ProcessesThatWriteAtOnceLoseNoEvent) {
    constexpr int each = eventsInAFile;
    std::vector<pid_t> writers;
    for (const char* name : {"one", "two", "three"}) {
        writers.push_back(fork());
        if (writers.back() == 0) {
            int number = 0;
            while (number < each && emit(name, number)) {
                ++number;
            }
            _exit(number == each ? 0 : 1);
        }
    }
    for (const pid_t writer : writers) {
        int status = -1;
        ASSERT_EQ(waitpid(writer, &status, 0), writer);
        EXPECT_EQ(status, 0);
    }
    const auto found = events();
    EXPECT_EQ(found.size(), writers.size());
    for (const auto& [name, numbers] : found) {
        EXPECT_EQ(numbers, upTo(each)) << name;
    }
}

TEST_F(EventRotationTest, ARotationCutShortLosesNoEventOfAFileThatIsKept) {
    for (int file = 1; file <= keptEventFiles; ++file) {
        folder_.write(nameOf(file), std::to_string(file) + "\n");
    }
    // As a process leaves it that was killed when it had renamed the oldest two.
    std::filesystem::rename(folder_.path() / (nameOf(3).substr(1)), folder_.path() / (nameOf(4).substr(1)));
    std::filesystem::rename(folder_.path() / (nameOf(2).substr(1)), folder_.path() / (nameOf(3).substr(1)));
    folder_.write(nameOf(0), std::string(largestEventFile, '0') + "\n");
    ASSERT_TRUE(emit("e", 0)) << lastErrorSentence();
    EXPECT_EQ(folder_.read(nameOf(2)), "1\n");
    EXPECT_EQ(folder_.read(nameOf(3)), "");
    EXPECT_EQ(folder_.read(nameOf(4)), "2\n");
    EXPECT_EQ(folder_.read(nameOf(1)).size(), largestEventFile + 1);
}

TEST_F(EventRotationTest, HalfALineIsNotContinued) {
    folder_.write(currentFile, "{\"event\":\"half");
    ASSERT_TRUE(emit("e", 7)) << lastErrorSentence();
    const std::string text = folder_.read(currentFile);
    const std::string half = "{\"event\":\"half\n";
    ASSERT_TRUE(text.starts_with(half));
    folder_.write(currentFile, text.substr(half.size()));
    EXPECT_EQ(events()["e"], std::vector<int>{7});
}

TEST_F(EventRotationTest, AFileThatCannotBePutAwayGrowsOn) {
    folder_.write(currentFile, std::string(largestEventFile, '0') + "\n");
    folder_.write(nameOf(3), "3\n");
    folder_.write(nameOf(4) + "/in-the-way", "");
    EXPECT_TRUE(emit("e", 0)) << lastErrorSentence();
    EXPECT_GT(folder_.read(currentFile).size(), largestEventFile + fillerSize);
    EXPECT_EQ(folder_.read(nameOf(3)), "3\n");
}

} // namespace
} // namespace velt
