// docs/operations.md held against real services: the table on open sessions, and the commands on changes.
#include "schema/settings_table.h"
#include "tests/support/text.h"
#include "tests/system/support/ftp_session.h"
#include "tests/system/support/host_service.h"

#include <array>
#include <filesystem>
#include <fstream>
#include <map>
#include <sstream>

namespace velt::test {
namespace {

namespace fs = std::filesystem;

/// The folder that the build folder was made for.
fs::path sourceFolder() {
    static const std::string key = "CMAKE_HOME_DIRECTORY:INTERNAL=";
    std::ifstream cache(VELT_BUILT_FOLDER "/CMakeCache.txt");
    for (std::string line; std::getline(cache, line);) {
        if (line.starts_with(key)) {
            return line.substr(key.size());
        }
    }
    return {};
}

std::ifstream openPage() {
    return std::ifstream(sourceFolder() / "docs/operations.md");
}

/// What the page says of one setting: "go on", "end", or "" where there is no such change.
struct Promise {
    std::string otherwise; ///< switched on, or with another value
    std::string off;
};

std::vector<std::string> cellsOf(const std::string& line) {
    std::istringstream stream(line);
    std::vector<std::string> cells;
    for (std::string cell; std::getline(stream, cell, '|');) {
        const std::size_t first = cell.find_first_not_of(' ');
        cells.push_back(
            first == std::string::npos ? "" : cell.substr(first, cell.find_last_not_of(' ') - first + 1));
    }
    return cells;
}

/// By "section key", and "chroot_rules".
std::map<std::string, Promise> promises() {
    std::map<std::string, Promise> found;
    std::ifstream page = openPage();
    bool inTable = false;
    for (std::string line; std::getline(page, line);) {
        inTable = line.starts_with("| setting | ") || (inTable && line.starts_with("|"));
        const std::vector<std::string> cells = inTable ? cellsOf(line) : std::vector<std::string>();
        if (cells.size() < 4 || !cells[1].starts_with('`')) {
            continue;
        }
        std::istringstream names(cells[1]);
        std::string name;
        for (bool quoted = false; std::getline(names, name, '`'); quoted = !quoted) {
            if (quoted) {
                EXPECT_TRUE(found.emplace(name, Promise{cells[2], cells[3]}).second) << name << " twice";
            }
        }
    }
    return found;
}

/// A value and another one, of the settings that are no switches.
const std::map<std::string, std::array<Json::Value, 2>> values{
    {"ftp timeout", {300, 400}},
    {"ftp portnum", {2021, 2022}},
    {"ftp custom_port", {"3000:3100", "3000:3200"}},
    {"ftp ext_ip", {"192.0.2.7", "192.0.2.8"}},
    {"ftp utf8_mode", {0, 1}},
    {"ftp maxuploadrate", {0, 7}},
    {"ftp maxdownloadrate", {0, 7}},
    {"ftp max_conn_per_ip", {0, 7}},
    {"security anonymous_chroot_share", {"public", "upload"}},
    {"sftp portnum", {2023, 2024}},
};

class HostOperationsPage : public HostService {
protected:
    static Json::Value base() {
        return jsonOf(R"({
            "ftp": {"enable_ftp": true, "enable_ftps": true, "portnum": 2021, "custom_port_range": true,
                    "custom_port": "3000:3100", "use_ext_ip": true, "ext_ip": "192.0.2.7",
                    "enable_flow_ctrl": true, "enable_fips": false},
            "security": {"anonymous": true, "anonymous_chroot": true, "anonymous_chroot_share": "public"},
            "sftp": {"enable": true, "portnum": 2023}, "chroot_rules": []})");
    }

    Json::Value patch(const Json::Value& body, const std::string& query) const {
        const HttpResult result = curl("/api/settings" + query, textOf(body), {"--request", "PATCH"});
        EXPECT_EQ(result.status, 200) << result.body;
        return result.json;
    }

    /// Whether the plan agrees with the word.
    static void expectPlan(const std::string& word, const Json::Value& plan) {
        const int ended = plan["sessions_ended"].asInt();
        EXPECT_TRUE(word == "go on" ? ended == 0 : ended > 0) << "the page: " << word << '\n' << textOf(plan);
        const std::string effects = textOf(plan["effects"]);
        for (const char* effect : {R"("effect":"stop")", R"("effect":"end sessions")"}) {
            EXPECT_TRUE(word == "end" || !contains(effects, effect)) << effects;
        }
    }

    void check(const std::string& section, const std::string& key, const std::array<Json::Value, 2>& fromTo,
               const std::string& word) const {
        const testing::ScopedTrace trace(__FILE__, __LINE__, section + " " + key + " " + textOf(fromTo[1]));
        ASSERT_TRUE(word == "go on" || word == "end") << "the page says \"" << word << '"';
        Json::Value former = base();
        former[section][key] = fromTo[0];
        patch(former, "?sessions=keep");
        const bool ofSftp = section == "sftp" || section == "confinement";
        const int listening = former[ofSftp ? "sftp" : "ftp"]["portnum"].asInt();
        const UniqueFd session = connectTo("127.0.0.1", listening);
        ASSERT_GE(session.get(), 0);
        char greeting = 0;
        ASSERT_EQ(::read(session.get(), &greeting, 1), 1); // so that the session is there
        Json::Value change;
        change[section][key] = fromTo[1];
        expectPlan(word, patch(change, "?dry_run=true"));
    }
};

TEST_F(HostOperationsPage, sessionsGoOnOrEndAsItSays) {
    auto page = promises();
    for (const schema::SettingGroup* group : schema::groups) {
        for (const schema::Setting& setting : group->settings) {
            if (setting.key == nullptr ||
                (setting.apiVersion != 0 && setting.apiVersion != group->newestApiVersion)) {
                continue;
            }
            const std::string name = std::string(group->name) + " " + setting.key;
            const auto row = page.extract(name);
            ASSERT_FALSE(row.empty()) << "the page does not tell of " << name;
            if (setting.type != schema::SettingType::boolean) {
                check(group->name, setting.key, values.at(name), row.mapped().otherwise);
                EXPECT_EQ(row.mapped().off, "");
                continue;
            }
            check(group->name, setting.key, {true, false}, row.mapped().off);
            if (name == "sftp enable") { // there are no sessions before
                EXPECT_EQ(row.mapped().otherwise, "");
            } else {
                check(group->name, setting.key, {false, true}, row.mapped().otherwise);
            }
        }
    }
    const auto rules = page.extract("chroot_rules");
    ASSERT_FALSE(rules.empty());
    EXPECT_EQ(rules.mapped().otherwise, "end");
    EXPECT_TRUE(page.empty()) << "no setting: " << page.begin()->first;
}

TEST_F(HostOperationsPage, sessionsEndWhenTheRulesChange) {
    patch(base(), "?sessions=keep");
    const FtpSession session(2021);
    const Json::Value rules =
        jsonOf(R"({"chroot_rules": [{"type": "user", "name": "alice", "path": "/public"}]})");
    EXPECT_EQ(patch(rules, "?dry_run=true")["sessions_ended"], 1);
}

TEST_F(HostOperationsPage, sftpSessionsEndWhereTheirViewChanges) {
    Json::Value confined = base();
    confined["confinement"]["sftp"] = true;
    confined["security"]["user_chroot"] = false;
    const auto endedBy = [&](const char* change) {
        patch(confined, "?sessions=keep");
        const UniqueFd session = connectTo("127.0.0.1", 2023);
        char greeting = 0;
        EXPECT_EQ(::read(session.get(), &greeting, 1), 1);
        return patch(jsonOf(change), "?dry_run=true")["sessions_ended"].asInt();
    };
    const char* const rules = R"({"chroot_rules": [{"type": "user", "name": "alice", "path": "/public"}]})";
    EXPECT_EQ(endedBy(rules), 1);
    EXPECT_EQ(endedBy(R"({"security": {"user_chroot": true}})"), 1);
    EXPECT_EQ(endedBy(R"({"security": {"enable_umask": false}})"), 1);
    EXPECT_EQ(endedBy(R"({"ftp": {"enable_fips": true}})"), 1);
    EXPECT_EQ(endedBy(R"({"ftp": {"timeout": 301}})"), 0);
    EXPECT_EQ(endedBy(R"({"confinement": {"sftp": false}})"), 0);
    confined["confinement"]["sftp"] = false;
    EXPECT_EQ(endedBy(rules), 0);
    EXPECT_EQ(endedBy(R"({"security": {"user_chroot": true}})"), 0);
}

TEST_F(HostOperationsPage, itsCommandsOnChangesWork) {
    std::ifstream page = openPage();
    int commands = 0;
    bool inSection = false;
    for (std::string line; std::getline(page, line);) {
        inSection = line.starts_with("## ") ? line.starts_with("## Changing settings") : inSection;
        if (!inSection || !line.starts_with("    veltctl ")) {
            continue;
        }
        ++commands;
        const std::string asRoot = "veltctl() { /mnt/veltctl --socket " +
                                   (worldRoot / "run/velt/veltd.sock").string() + " \"$@\"; }\n";
        const ProcessResult result = runProcess({"bash", "-c", asRoot + line});
        const bool onlyTells = contains(line, "--dry-run") || contains(line, "veltctl diff");
        const bool judges = contains(line, "veltctl doctor") && result.exitCode == 8;
        EXPECT_TRUE(result.exitCode == (onlyTells ? 7 : 0) || judges)
            << line << " ended with " << result.exitCode << '\n'
            << result.output << result.errors;
    }
    EXPECT_GE(commands, 6);
    EXPECT_EQ(jsonOf(exported())["ftp"]["portnum"], port) << "they end where they began";
}

} // namespace
} // namespace velt::test
