#include "tests/system/support/plan_service.h"

#include "tests/support/files.h"
#include "tests/support/waiting.h"

#include <algorithm>
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

Lines plannedEffects(const HttpResult& plan) {
    Lines effects;
    for (const Json::Value& each : plan.json["effects"]) {
        effects.push_back(each["effect"].asString() + " " + each["subject"].asString());
    }
    joinPauses(effects);
    // Nothing shows that but the sessions.
    std::erase_if(effects, [](const std::string& effect) { return effect.starts_with("end sessions "); });
    std::ranges::sort(effects);
    return effects;
}

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
            const bool good = std::ranges::adjacent_find(now.listening) == now.listening.end();
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
    const SystemMoment before = settled();
    std::optional<FtpSession> session;
    if (!before.daemons.at("ftp").empty()) {
        session.emplace(aliceAt(before.settings["ftp"]["portnum"].asInt()));
    }
    const HttpResult plan = ask("?dry_run=true");
    ASSERT_EQ(plan.status, 200) << plan.body;
    EXPECT_EQ(differences(before, systemNow()), Lines()) << "after the dry run";
    const HttpResult done = ask("");
    ASSERT_TRUE(done.status == 200 || done.status == 204) << done.body;
    const SystemMoment after = settled();
    if (done.json.isMember("effects")) {
        EXPECT_EQ(done.json["effects"], plan.json["effects"]);
    }
    EXPECT_EQ(plannedEffects(plan), effectsBetween(before, after));
    EXPECT_EQ(textsOf(plan.json["changes"]), textsOf(changesBetween(before, after)));
    EXPECT_EQ(after.changes, before.changes + (plan.json["changes"].empty() ? 0 : 1));
    if (session) {
        const bool ends = plan.json["sessions_ended"].asInt() > 0;
        EXPECT_EQ(session->command("NOOP").code, ends ? 0 : 200) << plan.body;
    }
    for (const Json::Value& each : plan.json["changes"]) {
        covered.insert(each["field"].asString());
    }
}

} // namespace velt::test
