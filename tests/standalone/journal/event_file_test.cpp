#include "platform/core.h"
#include "platform/sysevent.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/effects.h"
#include "standalone/core/state_root.h"
#include "standalone/journal/event_file.h"
#include "standalone/standalone.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>
#include <json/json.h>

#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <sstream>

namespace velt {
namespace {

using namespace std::string_literals;

constexpr const char* file = "/var/log/velt/events.jsonl";

class EventFileTest : public testing::Test {
protected:
    EventFileTest() {
        setStateRoot(folder_.path());
        setRequestActor("admin", "192.0.2.7");
        clearLastError();
    }
    ~EventFileTest() override {
        setEffectHook({});
        setRequestActor("", "");
    }

    static int emit(const std::string& name, const std::map<std::string, std::string>& parameters) {
        VLIBCSzHash* map = VLIBCSzHashAlloc(1024);
        for (const auto& [key, value] : parameters) {
            EXPECT_GE(VLIBCSzHashSetValue(&map, key.c_str(), value.c_str()), 0);
        }
        const int result = VLIBSyseventEmit(name.c_str(), map, 1);
        VLIBCSzHashFree(map);
        return result;
    }

    /// Each line of the file, as the JSON object that it has to be.
    std::vector<Json::Value> lines() const {
        std::vector<Json::Value> values;
        std::istringstream text(folder_.read(file));
        for (std::string line; std::getline(text, line);) {
            Json::Value value;
            std::string errors;
            std::istringstream one(line);
            EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), one, &value, &errors)) << line;
            values.push_back(std::move(value));
        }
        return values;
    }

    test::TemporaryFolder folder_;
};

TEST_F(EventFileTest, WritesOneObjectALine) {
    ASSERT_EQ(emit("velt.service.action", {{"SERVICE_NAME", "ftpd"}, {"SERVICE_ACTION", "stop"}}), 0)
        << lastErrorSentence();
    ASSERT_EQ(emit("velt.service.action", {{"SERVICE_NAME", "ftpd"}, {"SERVICE_ACTION", "start"}}), 0);
    const std::vector<Json::Value> events = lines();
    ASSERT_EQ(events.size(), 2U);
    EXPECT_EQ(events[0]["event"], "velt.service.action");
    EXPECT_EQ(events[0]["parameters"]["SERVICE_NAME"], "ftpd");
    EXPECT_EQ(events[0]["parameters"]["SERVICE_ACTION"], "stop");
    EXPECT_EQ(events[0]["actor"], "admin");
    EXPECT_EQ(events[0]["address"], "192.0.2.7");
    EXPECT_EQ(events[1]["parameters"]["SERVICE_ACTION"], "start");
}

TEST_F(EventFileTest, RendersTheTimeInUtcWithMilliseconds) {
    SystemEvent event;
    event.time = std::chrono::system_clock::time_point(std::chrono::milliseconds(1'795'242'611'007));
    EXPECT_NE(renderEvent(event).find("\"2026-11-21T06:30:11.007Z\""), std::string::npos)
        << renderEvent(event);
}

TEST_F(EventFileTest, TellsSubscribersWhatWasAnnounced) {
    std::vector<SystemEvent> heard;
    const Subscription subscription =
        subscribeEvents([&heard](const SystemEvent& event) { heard.push_back(event); });
    ASSERT_EQ(emit("velt.service.action", {{"SERVICE_NAME", "sftp"}}), 0);
    unsubscribe(subscription);
    ASSERT_EQ(heard.size(), 1U);
    EXPECT_EQ(heard[0].name, "velt.service.action");
    EXPECT_EQ(heard[0].parameters, (std::map<std::string, std::string>{{"SERVICE_NAME", "sftp"}}));
    EXPECT_EQ(heard[0].actor, "admin");
}

TEST_F(EventFileTest, NoTextEndsItsLineOrItsQuotes) {
    const std::string attempts[] = {"a\n{\"event\":\"forged\"}",
                                    "a\"},{\"x\":\"",
                                    "\\",
                                    "\r",
                                    "../..",
                                    "%{env:HOME}",
                                    "\xE2\x80\xA8",
                                    "\x1b[2J",
                                    "Ünïcode"};
    for (const std::string& attempt : attempts) {
        ASSERT_EQ(emit("e" + attempt, {{"key" + attempt, attempt}}), 0);
        const std::vector<Json::Value> events = lines();
        EXPECT_EQ(events.back()["event"], "e" + attempt);
        EXPECT_EQ(events.back()["parameters"]["key" + attempt], attempt);
    }
    EXPECT_EQ(lines().size(), std::size(attempts));
}

TEST_F(EventFileTest, WhatIsNoUtf8IsReplaced) {
    for (const std::string& text : {"\xff"s, "a\xC3"s, "\xED\xA0\x80"s, "\xC0\xAF"s}) {
        ASSERT_EQ(emit("e", {{"k", text}}), 0);
        EXPECT_NE(lines().back()["parameters"]["k"].asString().find("\xEF\xBF\xBD"), std::string::npos);
    }
    for (const char byte : folder_.read(file)) {
        EXPECT_GT(byte, 0) << "the file is ASCII";
    }
}

TEST_F(EventFileTest, AnOverlongEventIsRefusedButHeard) {
    int heard = 0;
    const Subscription subscription = subscribeEvents([&heard](const SystemEvent&) { ++heard; });
    EXPECT_LT(emit("e", {{"k", std::string(70'000, 'x')}}), 0);
    unsubscribe(subscription);
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::event));
    EXPECT_EQ(heard, 1);
    EXPECT_TRUE(lines().empty());
}

TEST_F(EventFileTest, RefusesAnEventWithoutAName) {
    EXPECT_LT(VLIBSyseventEmit(nullptr, nullptr, 1), 0);
    EXPECT_LT(VLIBSyseventEmit("", nullptr, 1), 0);
    EXPECT_EQ(VLIBSyseventEmit("bare", nullptr, 1), 0);
    EXPECT_TRUE(lines().at(0)["parameters"].empty());
}

TEST_F(EventFileTest, AFileThatCannotBeWrittenIsAnError) {
    std::filesystem::create_directories(folder_.path() / "var/log/velt/events.jsonl");
    EXPECT_LT(emit("e", {}), 0);
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::event));
    EXPECT_NE(lastErrorSentence().find("events.jsonl"), std::string::npos);
}

TEST_F(EventFileTest, IsNoReadingForEverybody) {
    umask(0);
    ASSERT_EQ(emit("e", {}), 0);
    umask(022);
    struct stat status {};
    ASSERT_EQ(stat((folder_.path() / "var/log/velt/events.jsonl").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0640U) << "actors and addresses are in it";
}

TEST_F(EventFileTest, FollowsARotation) {
    ASSERT_EQ(emit("old", {}), 0);
    std::filesystem::rename(folder_.path() / "var/log/velt/events.jsonl", folder_.path() / "rotated");
    ASSERT_EQ(emit("new", {}), 0);
    EXPECT_EQ(lines().size(), 1U);
    EXPECT_EQ(lines()[0]["event"], "new");
}

TEST_F(EventFileTest, IsAnEffectThatCanBeLeftUndone) {
    std::string seen;
    int heard = 0;
    const Subscription subscription = subscribeEvents([&heard](const SystemEvent&) { ++heard; });
    setEffectHook([&seen](Effect effect, std::string_view subject) {
        seen = std::string(effectName(effect)) + " " + std::string(subject);
        return EffectDecision(Result<>());
    });
    EXPECT_EQ(emit("velt.service.action", {}), 0);
    unsubscribe(subscription);
    EXPECT_EQ(seen, "event velt.service.action");
    EXPECT_EQ(heard, 0);
    EXPECT_EQ(folder_.read(file), "");
}

TEST_F(EventFileTest, TakesBackALineThatDoesNotFit) {
    ASSERT_EQ(emit("first", {}), 0);
    const std::string before = folder_.read(file);
    const pid_t child = fork();
    if (child == 0) {
        std::signal(SIGXFSZ, SIG_IGN);
        const rlimit limit{before.size() + 20, before.size() + 20};
        setrlimit(RLIMIT_FSIZE, &limit);
        _exit(emit("second", {}) < 0 ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(folder_.read(file), before);
}

TEST_F(EventFileTest, LinesOfTwoProcessesNeverMix) {
    constexpr int each = 300;
    const auto emitAll = [](const std::string& name) {
        for (int i = 0; i < each; ++i) {
            if (emit(name, {{"number", std::to_string(i)}, {"filler", std::string(5000, 'x')}}) != 0) {
                return 1;
            }
        }
        return 0;
    };
    const pid_t child = fork();
    if (child == 0) {
        _exit(emitAll("child"));
    }
    EXPECT_EQ(emitAll("parent"), 0);
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    std::map<std::string, int> next;
    for (const Json::Value& line : lines()) {
        EXPECT_EQ(line["parameters"]["number"].asString(), std::to_string(next[line["event"].asString()]++));
    }
    EXPECT_EQ(next, (std::map<std::string, int>{{"child", each}, {"parent", each}}));
}

} // namespace
} // namespace velt
