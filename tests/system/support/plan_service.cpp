#include "tests/system/support/plan_service.h"

#include "base/file.h"
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"

#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <filesystem>
#include <optional>

namespace velt::test {
namespace {

using Lines = std::vector<std::string>;

/// A daemon that makes room for a moment is another one after it.
void joinPauses(Lines& effects) {
    for (const char* service : {"ftp", "sftp"}) {
        if (std::erase(effects, std::string("pause ") + service) > 0) {
            std::ranges::replace(effects, std::string("start ") + service,
                                 std::string("hand over ") + service);
        }
    }
}

/// What lets its sessions go on is gone all the same.
void joinCloses(Lines& effects) {
    for (const char* service : {"ftp", "sftp"}) {
        std::ranges::replace(effects, std::string("close ") + service, std::string("stop ") + service);
    }
}

Lines plannedEffects(const HttpResult& plan) {
    Lines effects;
    for (const Json::Value& each : plan.json["effects"]) {
        effects.push_back(each["effect"].asString() + " " + each["subject"].asString());
    }
    joinPauses(effects);
    joinCloses(effects);
    // Nothing shows that but the sessions.
    std::erase_if(effects, [](const std::string& effect) { return effect.starts_with("end sessions "); });
    std::ranges::sort(effects);
    return effects;
}

/// Processes of the services, listeners and sessions.
int daemonsAndSessions() {
    int count = 0;
    for (const auto& entry : std::filesystem::directory_iterator("/proc")) {
        const std::string name = readFile(entry.path() / "comm").valueOr("");
        const bool lives = !readFile(entry.path() / "cmdline").valueOr("").empty();
        count += lives && (name == "proftpd\n" || name.starts_with("sshd")) ? 1 : 0;
    }
    return count;
}

/// Without sessions.
std::ptrdiff_t daemonsIn(const SystemMoment& now) {
    return std::ranges::count_if(now.daemons, [](const auto& each) { return !each.second.empty(); });
}

/// Whether the state file of a daemon has such a line.
bool aStateSays(const SystemMoment& now, const std::string& line) {
    return std::ranges::any_of(now.files, [&](const auto& file) {
        return file.first.ends_with(".state") && contains(file.second, "\n" + line);
    });
}

/// Whether no client is left of those who came before.
bool isDeserted(const SystemMoment& now) {
    return daemonsAndSessions() == daemonsIn(now) && !aStateSays(now, "state closed");
}

/// Clients of both services, as far as these run: of FTP one that is logged in and one that is not, of SFTP
/// one that is not.
class OpenSessions {
public:
    explicit OpenSessions(const SystemMoment& now) {
        if (!now.daemons.at("ftp").empty()) {
            const int port = now.settings["ftp"]["portnum"].asInt();
            alice_.emplace(aliceAt(port));
            connect(port);
        }
        if (!now.daemons.at("sftp").empty()) {
            connect(now.settings["sftp"]["portnum"].asInt());
        }
    }

    /// How many of them were ended.
    int cut() {
        int count = alice_ && alice_->command("NOOP").code == 0 ? 1 : 0;
        for (const UniqueFd& each : others_) {
            count += isCut(each) ? 1 : 0;
        }
        return count;
    }

private:
    void connect(int port) {
        UniqueFd client = connectTo("127.0.0.1", port);
        char greeting = 0;
        EXPECT_EQ(::recv(client.get(), &greeting, 1, 0), 1); // so that the session is there
        others_.push_back(std::move(client));
    }

    static bool isCut(const UniqueFd& client) {
        std::array<char, 512> text{};
        ssize_t length = 1;
        while (length > 0) {
            length = ::recv(client.get(), text.data(), text.size(), MSG_DONTWAIT);
        }
        return length == 0 || errno != EAGAIN;
    }

    std::optional<FtpSession> alice_;
    std::vector<UniqueFd> others_;
};

std::set<std::string> textsOf(const Json::Value& list) {
    std::set<std::string> texts;
    for (const Json::Value& each : list) {
        texts.insert(textOf(each));
    }
    return texts;
}

} // namespace

void PlanService::SetUp() {
    HostService::SetUp();
    if (whyNoWorld().empty()) {
        writeFile(worldRoot / "etc/velt/firewall.conf", "version = 1\nmode = accept\n");
    }
}

void PlanService::TearDown() {
    HostService::TearDown();
    if (whyNoWorld().empty()) {
        runProcess({"nft", "flush", "ruleset"});
    }
}

HttpResult PlanService::patch(const std::string& body, const std::string& query) const {
    return curl("/api/settings" + query, body, {"--request", "PATCH"});
}

SystemMoment PlanService::settled() {
    SystemMoment now = systemNow();
    EXPECT_TRUE(waitUntil(
        [&now] {
            const bool good = std::ranges::adjacent_find(now.listening) == now.listening.end() &&
                              !aStateSays(now, "retired ");
            if (!good) {
                now = systemNow();
            }
            return good;
        },
        patience));
    return now;
}

void PlanService::expectAsPlanned(const std::string& patchBody) {
    expectAsPlanned(patchBody, [&](const std::string& query) { return patch(patchBody, query); });
}

void PlanService::expectAsPlanned(const std::string& what, const Ask& ask) {
    const testing::ScopedTrace trace(__FILE__, __LINE__, what);
    EXPECT_TRUE(waitUntil([] { return isDeserted(systemNow()); }, patience));
    const SystemMoment before = settled();
    OpenSessions sessions(before);
    const HttpResult plan = ask("?dry_run=true");
    ASSERT_EQ(plan.status, 200) << plan.body;
    EXPECT_EQ(differences(before, systemNow()), Lines()) << "after the dry run";
    const HttpResult done = ask("");
    ASSERT_TRUE(done.status == 200 || done.status == 204) << done.body;
    EXPECT_EQ(plan.json["sessions_ended"], sessions.cut()) << plan.body;
    const SystemMoment after = settled();
    if (done.json.isMember("effects")) {
        EXPECT_EQ(done.json["effects"], plan.json["effects"]);
        EXPECT_EQ(done.json["sessions_ended"], plan.json["sessions_ended"]);
    }
    EXPECT_EQ(plannedEffects(plan), effectsBetween(before, after));
    EXPECT_EQ(textsOf(plan.json["changes"]), textsOf(changesBetween(before, after)));
    EXPECT_EQ(after.changes, before.changes + (plan.json["changes"].empty() ? 0 : 1));
    for (const Json::Value& each : plan.json["changes"]) {
        covered.insert(each["field"].asString());
    }
}

} // namespace velt::test
